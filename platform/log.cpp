// Logging part of the platform stand-in: writes every produced message to
// standard error with a short prefix. Levels come from STBPLAT_LOG_LEVEL:
// either one level for every module ("4") or module=level pairs separated by
// commas ("2=6,3=4"); unset modules keep the default (errors).
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "stbplat/log.h"

namespace {

constexpr unsigned int kDefaultLevel = eLogLevelError;
constexpr const char* kLevelEnv = "STBPLAT_LOG_LEVEL";

void ApplyLevelSetting(unsigned int* levels, const char* setting) {
  if (setting == nullptr || *setting == '\0') return;
  if (std::strchr(setting, '=') == nullptr) {
    char* end = nullptr;
    unsigned long level = std::strtoul(setting, &end, 10);
    if (end != setting)
      for (int i = 0; i < eLogModuleCount; ++i) levels[i] = static_cast<unsigned int>(level);
    return;
  }
  const char* p = setting;
  while (*p != '\0') {
    char* end = nullptr;
    unsigned long module = std::strtoul(p, &end, 10);
    if (end == p || *end != '=') return;
    p = end + 1;
    unsigned long level = std::strtoul(p, &end, 10);
    if (end == p) return;
    if (module < static_cast<unsigned long>(eLogModuleCount))
      levels[module] = static_cast<unsigned int>(level);
    p = end;
    if (*p == ',') ++p;
  }
}

struct LevelsFromEnvironment {
  LevelsFromEnvironment() { ApplyLevelSetting(subSystemLogLevel, std::getenv(kLevelEnv)); }
};

}  // namespace

extern "C" {

STBPLAT_EXPORT unsigned int subSystemLogLevel[eLogModuleCount] = {
    kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel,
    kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel,
    kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel,
    kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel,
    kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel, kDefaultLevel,
    kDefaultLevel, kDefaultLevel};

STBPLAT_EXPORT void GlobalLogUtilAdd(etLogUtilModuleId moduleId, unsigned int level,
                                     const char* sourceFile, unsigned int line,
                                     const char* functionName, const char* format, ...) {
  (void)sourceFile;
  (void)line;
  std::fprintf(stderr, "[m%d l%u %s] ", static_cast<int>(moduleId), level,
               functionName != nullptr ? functionName : "?");
  va_list args;
  va_start(args, format);
  std::vfprintf(stderr, format, args);
  va_end(args);
}

}  // extern "C"

// Runs when the platform library is loaded, before any library code logs.
static LevelsFromEnvironment levelsFromEnvironment;
