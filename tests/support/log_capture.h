// Captures the library's log messages in tests. The test executables define
// GlobalLogUtilAdd and subSystemLogLevel themselves (interposing the platform
// library's), so every produced message lands here.
#ifndef STBPLAT_TESTS_SUPPORT_LOG_CAPTURE_H
#define STBPLAT_TESTS_SUPPORT_LOG_CAPTURE_H

#include <string>
#include <vector>

#include "stbplat/log.h"

namespace stbplat {
namespace test {

struct LogMessage {
  int module;
  unsigned int level;
  std::string sourceFile;
  std::string function;
  std::string format;
  std::string text;  // the formatted message
};

// While alive: every module's level is set to `level` (default: everything)
// and messages are recorded. Restores the previous levels on destruction.
class LogCapture {
 public:
  explicit LogCapture(unsigned int level = 99);
  ~LogCapture();
  LogCapture(const LogCapture&) = delete;
  LogCapture& operator=(const LogCapture&) = delete;

  void SetLevel(etLogUtilModuleId module, unsigned int level);
  const std::vector<LogMessage>& messages() const;
  // Formatted texts, in order.
  std::vector<std::string> texts() const;
  bool Contains(const std::string& text) const;
  void Clear();

 private:
  unsigned int saved_[eLogModuleCount];
};

}  // namespace test
}  // namespace stbplat

#endif
