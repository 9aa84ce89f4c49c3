// The one place where the library applies the per-module level gate before
// calling the platform's log service.
#ifndef STBPLAT_SRC_UTIL_LOG_GATE_H
#define STBPLAT_SRC_UTIL_LOG_GATE_H

#include "stbplat/log.h"

namespace stbplat {

inline bool LogEnabled(etLogUtilModuleId module, unsigned int level) {
  return subSystemLogLevel[module] >= level;
}

}  // namespace stbplat

// STBPLAT_LOG(module, level, sourceFile, functionName, format, ...)
// Arguments are evaluated only when the message is produced.
#define STBPLAT_LOG(module, level, sourceFile, functionName, ...)                      \
  do {                                                                                  \
    if (::stbplat::LogEnabled((module), (level)))                                       \
      GlobalLogUtilAdd((module), (level), (sourceFile), __LINE__, (functionName),       \
                       __VA_ARGS__);                                                    \
  } while (0)

#endif
