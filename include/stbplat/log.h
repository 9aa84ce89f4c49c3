/* Logging service of the platform library.
 *
 * GlobalLogUtilAdd and subSystemLogLevel are defined by the platform library
 * (libstbplat-platform) and only referenced by libstbplat, so a host program
 * may interpose its own definitions. A message of level L for module M is
 * produced only when subSystemLogLevel[M] >= L; the library applies that gate
 * before it calls GlobalLogUtilAdd. */
#ifndef STBPLAT_LOG_H
#define STBPLAT_LOG_H

#include "stbplat/export.h"

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  eLogModuleByteStreams = 0,
  eLogModuleFlashAccess = 2,
  eLogModuleRecords = 3,
  eLogModuleHWSpecific = 11,
  eLogModuleDiskProbing = 18,
  eLogModuleCount = 32 /* size of subSystemLogLevel */
} etLogUtilModuleId;

/* Levels used by the library. */
enum {
  eLogLevelAllocation = 1,
  eLogLevelError = 2,
  eLogLevelWarning = 3,
  eLogLevelDisplay = 4,
  eLogLevelSizes = 5,
  eLogLevelTrace = 6
};

/* Per-module level, indexed by etLogUtilModuleId (eLogModuleCount entries). */
extern STBPLAT_EXPORT unsigned int subSystemLogLevel[];

STBPLAT_EXPORT void GlobalLogUtilAdd(etLogUtilModuleId moduleId, unsigned int level,
                                     const char* sourceFile, unsigned int line,
                                     const char* functionName, const char* format, ...)
    __attribute__((format(printf, 6, 7)));

#ifdef __cplusplus
}
#endif

#endif
