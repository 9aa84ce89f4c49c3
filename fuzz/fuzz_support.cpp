#include "fuzz_support.h"

#include <cstdarg>
#include <cstdio>

extern "C" {

// Every level on: the message paths run, and their formatting is checked.
// The array interposes the platform library's; as in the unit tests, keep it
// out of AddressSanitizer's global registration and leave room behind it for
// the platform library's redzone.
constexpr int kSpareForPlatformRedzone = 64;
__attribute__((no_sanitize("address")))
unsigned int subSystemLogLevel[eLogModuleCount + kSpareForPlatformRedzone] = {
    99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99,
    99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99};

void GlobalLogUtilAdd(etLogUtilModuleId, unsigned int, const char*, unsigned int, const char*,
                      const char* format, ...) {
  char line[512];
  va_list args;
  va_start(args, format);
  std::vsnprintf(line, sizeof line, format, args);
  va_end(args);
}

}  // extern "C"
