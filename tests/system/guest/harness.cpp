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

// Messages may arrive while the library's objects are being constructed.
std::vector<std::string>& LogStore() {
  static std::vector<std::string> messages;
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

constexpr unsigned int kEverything = 99;
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
  LogStore().emplace_back(text);
  bool newline = text[0] != '\0' && text[std::strlen(text) - 1] == '\n';
  std::printf("log[%d/%u] %s: %s%s", static_cast<int>(moduleId), level, functionName ? functionName : "",
              text, newline ? "" : "\n");
}

}  // extern "C"

namespace systest {

Registrar::Registrar(const char* name, void (*fn)()) { Registry()[name] = fn; }

bool Check(bool ok, const char* file, int line, const std::string& what) {
  const char* base = std::strrchr(file, '/');
  std::string failure = std::string(base ? base + 1 : file) + ":" + std::to_string(line) + ": " + what;
  if (!ok) std::printf("check failed at %s\n", failure.c_str());
  if (!ok && first_failure.empty()) first_failure = failure;
  return ok;
}

void Info(const std::string& text) { Report("INFO " + text); }

bool LogContains(const std::string& text) {
  auto& log = LogStore();
  return std::any_of(log.begin(), log.end(), [&](const std::string& m) { return m.find(text) != m.npos; });
}

void ClearLog() { LogStore().clear(); }

}  // namespace systest

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: %s <scenario> | --list\n", argv[0]);
    return 2;
  }
  if (std::strcmp(argv[1], "--list") == 0) {
    for (const auto& entry : Registry()) std::printf("%s\n", entry.first.c_str());
    return 0;
  }
  const char* path = std::getenv("STBPLAT_SYSTEST_RESULTS");
  FILE* file = path != nullptr ? std::fopen(path, "a") : nullptr;
  if (file != nullptr) results = file;
  for (int i = 0; i < eLogModuleCount; ++i) subSystemLogLevel[i] = kEverything;
  auto it = Registry().find(argv[1]);
  if (it == Registry().end()) first_failure = "no such scenario";
  if (it != Registry().end()) it->second();
  std::string name = argv[1];
  Report(first_failure.empty() ? "PASS " + name : "FAIL " + name + ": " + first_failure);
  return first_failure.empty() ? 0 : 1;
}
