#include "harness.h"

#include <cstdarg>
#include <cstring>
#include <map>

#include "stbplat/log.h"

namespace {

std::map<std::string, void (*)()>& Registry() {
  static std::map<std::string, void (*)()> scenarios;
  return scenarios;
}

// The library's messages, one after the other. They may arrive while the
// library's objects are being constructed.
std::string& LogText() {
  static std::string messages;
  return messages;
}

std::string first_failure;
FILE* results = stdout;

void Report(const std::string& line) {
  std::fflush(stdout);
  std::fprintf(results, "%s\n", line.c_str());
  std::fflush(results);
  if (results != stdout) std::printf("systest: %s\n", line.c_str());
}

// Spare entries behind the array the library indexes by module id.
constexpr int kSpare = 64;

}  // namespace

extern "C" {

unsigned int subSystemLogLevel[eLogModuleCount + kSpare] = {0};

void GlobalLogUtilAdd(etLogUtilModuleId moduleId, unsigned int level, const char* /*sourceFile*/,
                      unsigned int /*line*/, const char* functionName, const char* format, ...) {
  char text[1024];
  va_list args;
  va_start(args, format);
  std::vsnprintf(text, sizeof text, format, args);
  va_end(args);
  LogText() += text;
  std::printf("log[%d/%u] %s: %s\n", int(moduleId), level, functionName ? functionName : "", text);
}

}  // extern "C"

bool Register(const char* name, void (*fn)()) { return Registry().emplace(name, fn).second; }

bool Check(bool ok, const char* file, int line, const std::string& what) {
  std::string failure = std::string(file) + ":" + std::to_string(line) + ": " + what;
  if (!ok) std::printf("check failed at %s\n", failure.c_str());
  if (!ok && first_failure.empty()) first_failure = failure;
  return ok;
}

void Info(const std::string& text) { Report("INFO " + text); }

bool LogContains(const std::string& text) { return LogText().find(text) != std::string::npos; }

void ClearLog() { LogText().clear(); }

int main(int argc, char** argv) {
  // Usage: stbplat_systest <scenario>; without one, it lists the scenarios.
  if (argc != 2) {
    for (const auto& entry : Registry()) std::printf("%s\n", entry.first.c_str());
    return 2;
  }
  const char* path = std::getenv("STBPLAT_SYSTEST_RESULTS");
  if (FILE* file = path != nullptr ? std::fopen(path, "a") : nullptr) results = file;
  for (int i = 0; i < eLogModuleCount; ++i) subSystemLogLevel[i] = 99;  // everything
  auto it = Registry().find(argv[1]);
  if (it == Registry().end()) first_failure = "no such scenario";
  if (it != Registry().end()) it->second();
  std::string name = argv[1];
  Report(first_failure.empty() ? "PASS " + name : "FAIL " + name + ": " + first_failure);
  return first_failure.empty() ? 0 : 1;
}
