#include "log_sink.h"

#include <signal.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <utility>

#include "output.h"
#include "tool.h"

namespace stbtool {
namespace {

DisplayCapture* activeCapture = nullptr;
EndlessRetryStop* activeRetryStop = nullptr;

// A device that fails this often in a row within one call does not recover
// by being asked again; a few tries leave room for a passing hiccup.
constexpr unsigned int kRetryErrorLimit = 8;
// No one call moves more than a transfer piece (a megabyte): a call that
// takes this long is retrying without errors that reach the log.
constexpr unsigned int kRetrySeconds = 15;
constexpr char kRetryTimeout[] =
    "stbplat: the device did not take a write within 15 s (the library tries a failing write again without "
    "end); stopped. The range written may be partly changed\n";

void OnRetryTimeout(int) {
  ssize_t ignored = write(STDERR_FILENO, kRetryTimeout, sizeof kRetryTimeout - 1);
  (void)ignored;
  _exit(kExitFailed);
}

// The level the user asked for, per module; a capture raises the library's
// gate above it for display lines only.
unsigned int errorLevels[eLogModuleCount];
bool errorLevelsKnown = false;

unsigned int ErrorLevel(etLogUtilModuleId module) {
  if (!errorLevelsKnown) {
    for (int i = 0; i < eLogModuleCount; ++i) errorLevels[i] = subSystemLogLevel[i];
    errorLevelsKnown = true;
  }
  return module < eLogModuleCount ? errorLevels[module] : 0;
}

// The last message shown on standard error, and how often it came again
// since.
std::string lastShown;
unsigned long repeats = 0;

std::string WithoutCarriageReturns(const std::string& text) {
  std::string out;
  out.reserve(text.size());
  for (char c : text)
    if (c != '\r') out += c;
  return out;
}

}  // namespace

void Collect(DisplayCapture* capture, etLogUtilModuleId module, unsigned int level,
             const std::string& text, bool* taken) {
  *taken = false;
  for (DisplayCapture* c = capture; c != nullptr; c = c->previous_) {
    if (c->module_ == module && level == eLogLevelDisplay) {
      c->text_ += text;
      *taken = true;
      return;
    }
  }
}

void FlushLogRepeats() {
  if (repeats > 0)
    std::fprintf(stderr, "stbplat: library: last message repeated %lu time%s\n", repeats, repeats == 1 ? "" : "s");
  repeats = 0;
}

void SetErrorLogLevel(unsigned int level) {
  for (int i = 0; i < eLogModuleCount; ++i) {
    errorLevels[i] = level;
    subSystemLogLevel[i] = level;
  }
  errorLevelsKnown = true;
}

DisplayCapture::DisplayCapture(etLogUtilModuleId module)
    : module_(module), savedLevel_(subSystemLogLevel[module]), previous_(activeCapture) {
  ErrorLevel(module);  // remember the user's levels before raising any
  if (subSystemLogLevel[module] < eLogLevelDisplay) subSystemLogLevel[module] = eLogLevelDisplay;
  activeCapture = this;
}

DisplayCapture::~DisplayCapture() {
  subSystemLogLevel[module_] = savedLevel_;
  activeCapture = previous_;
}

QuietLog::QuietLog(etLogUtilModuleId module) : module_(module), savedLevel_(subSystemLogLevel[module]) {
  ErrorLevel(module);
  subSystemLogLevel[module] = 0;
}

QuietLog::~QuietLog() { subSystemLogLevel[module_] = savedLevel_; }

EndlessRetryStop::EndlessRetryStop(std::function<std::string()> report)
    : report_(std::move(report)), savedLevel_(subSystemLogLevel[eLogModuleFlashAccess]), previous_(activeRetryStop) {
  ErrorLevel(eLogModuleFlashAccess);  // the user's level decides what is shown
  if (subSystemLogLevel[eLogModuleFlashAccess] < eLogLevelError) subSystemLogLevel[eLogModuleFlashAccess] = eLogLevelError;
  activeRetryStop = this;
  signal(SIGALRM, OnRetryTimeout);
  alarm(kRetrySeconds);
}

EndlessRetryStop::~EndlessRetryStop() {
  alarm(0);
  subSystemLogLevel[eLogModuleFlashAccess] = savedLevel_;
  activeRetryStop = previous_;
}

// Counts a flash error for the innermost stop; at its limit the report is
// taken (its own library calls no longer counted) and the process ends.
void CountRetry(unsigned int level) {
  EndlessRetryStop* stop = activeRetryStop;
  if (stop == nullptr || level > eLogLevelError || ++stop->errors_ < kRetryErrorLimit) return;
  alarm(0);
  activeRetryStop = nullptr;
  std::string message;
  {
    QuietLog quiet(eLogModuleFlashAccess);
    message = stop->report_();
  }
  FlushLogRepeats();
  std::fprintf(stderr, "stbplat: %s\n", message.c_str());
  std::fflush(nullptr);
  std::_Exit(kExitFailed);
}

std::string DisplayCapture::Text() const { return PrintableLines(WithoutCarriageReturns(text_)); }

}  // namespace stbtool

extern "C" void GlobalLogUtilAdd(etLogUtilModuleId moduleId, unsigned int level,
                                 const char* sourceFile, unsigned int line,
                                 const char* functionName, const char* format, ...) {
  (void)sourceFile;
  (void)line;
  (void)functionName;
  va_list args;
  va_start(args, format);
  va_list copy;
  va_copy(copy, args);
  int needed = std::vsnprintf(nullptr, 0, format, copy);
  va_end(copy);
  std::string text(needed > 0 ? static_cast<size_t>(needed) : 0, '\0');
  if (needed > 0) std::vsnprintf(&text[0], text.size() + 1, format, args);
  va_end(args);

  if (moduleId == eLogModuleFlashAccess) stbtool::CountRetry(level);
  bool taken = false;
  stbtool::Collect(stbtool::activeCapture, moduleId, level, text, &taken);
  if (taken || level > stbtool::ErrorLevel(moduleId)) return;
  std::string shown = stbtool::PrintableLines(stbtool::WithoutCarriageReturns(text));
  if (!shown.empty() && shown.back() != '\n') shown += '\n';
  if (shown == stbtool::lastShown) {
    ++stbtool::repeats;
    return;
  }
  stbtool::FlushLogRepeats();
  stbtool::lastShown = shown;
  std::fprintf(stderr, "stbplat: library: %s", shown.c_str());
}
