#include "log_sink.h"

#include <cstdarg>
#include <cstdio>
#include <string>

#include "output.h"

namespace stbtool {
namespace {

DisplayCapture* activeCapture = nullptr;

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
