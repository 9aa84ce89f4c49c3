#include "support/log_capture.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace {

std::vector<stbplat::test::LogMessage>& Store() {
  static std::vector<stbplat::test::LogMessage> messages;
  return messages;
}

// Everything off unless a test turns it on.
constexpr unsigned int kQuiet = 0;

// Under AddressSanitizer the platform library registers its own array, which
// resolves to this interposed one, and poisons the bytes behind it as its
// redzone. Spare entries keep that redzone off the next variable.
constexpr int kSpareForPlatformRedzone = 64;

}  // namespace

extern "C" {

// Interposes the platform library's array on purpose; keep AddressSanitizer
// from reporting the two definitions as an ODR violation.
#if defined(__clang__)
__attribute__((no_sanitize("address")))
#endif
unsigned int subSystemLogLevel[eLogModuleCount + kSpareForPlatformRedzone] = {kQuiet};

void GlobalLogUtilAdd(etLogUtilModuleId moduleId, unsigned int level, const char* sourceFile,
                      unsigned int line, const char* functionName, const char* format, ...) {
  (void)line;
  va_list args;
  va_start(args, format);
  va_list copy;
  va_copy(copy, args);
  int needed = std::vsnprintf(nullptr, 0, format, copy);
  va_end(copy);
  std::string text(needed > 0 ? static_cast<size_t>(needed) : 0, '\0');
  if (needed > 0) std::vsnprintf(&text[0], text.size() + 1, format, args);
  va_end(args);
  Store().push_back({static_cast<int>(moduleId), level, sourceFile ? sourceFile : "",
                     functionName ? functionName : "", format ? format : "", text});
}

}  // extern "C"

namespace stbplat {
namespace test {

LogCapture::LogCapture(unsigned int level) {
  std::memcpy(saved_, subSystemLogLevel, sizeof saved_);
  for (int i = 0; i < eLogModuleCount; ++i) subSystemLogLevel[i] = level;
  Store().clear();
}

LogCapture::~LogCapture() {
  std::memcpy(subSystemLogLevel, saved_, sizeof saved_);
  Store().clear();
}

void LogCapture::SetLevel(etLogUtilModuleId module, unsigned int level) {
  subSystemLogLevel[module] = level;
}

const std::vector<LogMessage>& LogCapture::messages() const { return Store(); }

std::vector<std::string> LogCapture::texts() const {
  std::vector<std::string> out;
  for (const LogMessage& m : Store()) out.push_back(m.text);
  return out;
}

bool LogCapture::Contains(const std::string& text) const {
  for (const LogMessage& m : Store())
    if (m.text.find(text) != std::string::npos) return true;
  return false;
}

void LogCapture::Clear() { Store().clear(); }

}  // namespace test
}  // namespace stbplat
