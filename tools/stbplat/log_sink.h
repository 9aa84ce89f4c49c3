// The tool's end of the library's logging: the tool defines the log call
// itself, so library messages reach it directly. Errors and traces go to
// standard error; display output (level 4) that a DisplayCapture asked for
// is collected instead, which is how records that only know how to display
// themselves through the log are shown.
#ifndef STBPLAT_TOOL_LOG_SINK_H
#define STBPLAT_TOOL_LOG_SINK_H

#include <functional>
#include <string>

#include "stbplat/log.h"

namespace stbtool {

// Sets the level of every module for messages on standard error.
void SetErrorLogLevel(unsigned int level);

// A library message that comes again right behind itself is not shown
// again, only counted; this writes "last message repeated N times" for the
// count not yet told (at the next other message, and before the tool's own
// last word).
void FlushLogRepeats();

// While alive, the module's display lines are collected (the module's level is
// raised to display for that time) and not printed.
class DisplayCapture {
 public:
  explicit DisplayCapture(etLogUtilModuleId module);
  ~DisplayCapture();
  DisplayCapture(const DisplayCapture&) = delete;
  DisplayCapture& operator=(const DisplayCapture&) = delete;

  // The collected text with "\r\n" line ends turned into "\n" and other
  // unprintable bytes escaped.
  std::string Text() const;

 private:
  etLogUtilModuleId module_;
  unsigned int savedLevel_;
  DisplayCapture* previous_;
  std::string text_;
  friend void Collect(DisplayCapture* capture, etLogUtilModuleId module, unsigned int level,
                      const std::string& text, bool* taken);
};

// While alive, the module's messages are not produced at all (for calls
// whose failure the tool expects and handles).
class QuietLog {
 public:
  explicit QuietLog(etLogUtilModuleId module);
  ~QuietLog();
  QuietLog(const QuietLog&) = delete;
  QuietLog& operator=(const QuietLog&) = delete;

 private:
  etLogUtilModuleId module_;
  unsigned int savedLevel_;
};

// While alive, errors from the flash module are counted (and shown as the
// user's level says): for a library call that retries a failing device write
// without end. Once `limit` errors have come, or `seconds` have passed, the
// call cannot be left any other way: the process ends with exit code 1 after
// printing `report()` (on the time limit, a fixed line, as the report may not
// run there).
class EndlessRetryStop {
 public:
  explicit EndlessRetryStop(std::function<std::string()> report);
  ~EndlessRetryStop();
  EndlessRetryStop(const EndlessRetryStop&) = delete;
  EndlessRetryStop& operator=(const EndlessRetryStop&) = delete;

 private:
  std::function<std::string()> report_;
  unsigned int errors_ = 0;
  unsigned int savedLevel_;
  EndlessRetryStop* previous_;
  friend void CountRetry(unsigned int level);
};

}  // namespace stbtool

#endif
