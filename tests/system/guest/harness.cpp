#include "harness.h"

#include <sys/wait.h>
#include <fcntl.h>
#include <unistd.h>

#include <chrono>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <map>

#include "stbplat/log.h"

namespace {

struct Scenario {
  systest::ScenarioFn fn;
};

std::map<std::string, Scenario>& Registry() {
  static std::map<std::string, Scenario> scenarios;
  return scenarios;
}

std::string& FirstFailure() {
  static std::string failure;
  return failure;
}

std::vector<std::string>& LogStore() {
  static std::vector<std::string> messages;
  return messages;
}

FILE* Results() {
  static FILE* out = nullptr;
  if (out == nullptr) {
    const char* path = std::getenv("STBPLAT_SYSTEST_RESULTS");
    if (path != nullptr) out = std::fopen(path, "a");
    if (out == nullptr) out = stdout;
  }
  return out;
}

void Report(const std::string& line) {
  std::fprintf(Results(), "%s\n", line.c_str());
  std::fflush(Results());
  if (Results() != stdout) std::printf("systest: %s\n", line.c_str());
  std::fflush(stdout);
}

constexpr unsigned int kEverything = 99;
// Spare entries behind the array the library indexes by module id.
constexpr int kSpare = 64;

}  // namespace

extern "C" {

unsigned int subSystemLogLevel[eLogModuleCount + kSpare] = {0};

void GlobalLogUtilAdd(etLogUtilModuleId moduleId, unsigned int level, const char* sourceFile,
                      unsigned int line, const char* functionName, const char* format, ...) {
  (void)sourceFile;
  (void)line;
  char text[1024];
  va_list args;
  va_start(args, format);
  std::vsnprintf(text, sizeof text, format, args);
  va_end(args);
  LogStore().emplace_back(text);
  std::printf("log[%d/%u] %s: %s", static_cast<int>(moduleId), level,
              functionName ? functionName : "", text);
  std::size_t len = std::strlen(text);
  if (len == 0 || text[len - 1] != '\n') std::printf("\n");
}

}  // extern "C"

namespace systest {

Registrar::Registrar(const char* name, ScenarioFn fn) { Registry()[name] = Scenario{fn}; }

void Fail(const char* file, int line, const std::string& what) {
  const char* base = std::strrchr(file, '/');
  std::string where = std::string(base ? base + 1 : file) + ":" + std::to_string(line);
  std::printf("check failed at %s: %s\n", where.c_str(), what.c_str());
  if (FirstFailure().empty()) FirstFailure() = where + ": " + what;
}

bool Failed() { return !FirstFailure().empty(); }

void Info(const std::string& text) { Report("INFO " + text); }

const std::vector<std::string>& Log() { return LogStore(); }

bool LogContains(const std::string& text) {
  for (const auto& m : LogStore())
    if (m.find(text) != std::string::npos) return true;
  return false;
}

void ClearLog() { LogStore().clear(); }

void SetLogLevel(unsigned int level) {
  for (int i = 0; i < eLogModuleCount; ++i) subSystemLogLevel[i] = level;
}

int Shell(const std::string& command) {
  std::fflush(stdout);
  int status = std::system(command.c_str());
  if (status == -1 || !WIFEXITED(status)) return -1;
  return WEXITSTATUS(status);
}

std::string ShellOutput(const std::string& command) {
  std::string out;
  FILE* pipe = popen(command.c_str(), "r");
  if (pipe == nullptr) return out;
  char buf[4096];
  std::size_t n;
  while ((n = std::fread(buf, 1, sizeof buf, pipe)) > 0) out.append(buf, n);
  pclose(pipe);
  return out;
}

std::vector<unsigned char> Pattern(std::size_t size, unsigned int seed) {
  std::vector<unsigned char> data(size);
  std::uint32_t x = seed * 2654435761u + 1;
  for (auto& b : data) {
    x ^= x << 13;
    x ^= x >> 17;
    x ^= x << 5;
    b = static_cast<unsigned char>(x);
  }
  return data;
}

std::vector<unsigned char> ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return std::vector<unsigned char>(std::istreambuf_iterator<char>(in), {});
}

bool WriteFile(const std::string& path, const std::vector<unsigned char>& data) {
  std::ofstream out(path, std::ios::binary);
  out.write(reinterpret_cast<const char*>(data.data()), static_cast<std::streamsize>(data.size()));
  return static_cast<bool>(out);
}

std::string Describe(const std::vector<unsigned char>& a, const std::vector<unsigned char>& b) {
  std::ostringstream out;
  if (a.size() != b.size()) out << "sizes " << a.size() << " and " << b.size() << "; ";
  std::size_t n = a.size() < b.size() ? a.size() : b.size();
  for (std::size_t i = 0; i < n; ++i)
    if (a[i] != b[i]) {
      out << "first difference at " << i << " (0x" << std::hex << int(a[i]) << " vs 0x"
          << int(b[i]) << ")";
      return out.str();
    }
  out << "equal over " << n << " bytes";
  return out.str();
}

double NowSeconds() {
  using namespace std::chrono;
  return duration<double>(steady_clock::now().time_since_epoch()).count();
}

StdoutCapture::StdoutCapture() : saved_(-1), path_("/tmp/systest-stdout") {
  std::fflush(stdout);
  int fd = ::open(path_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
  if (fd < 0) return;
  saved_ = ::dup(1);
  ::dup2(fd, 1);
  ::close(fd);
}

StdoutCapture::~StdoutCapture() { Restore(); }

void StdoutCapture::Restore() {
  if (saved_ < 0) return;
  std::fflush(stdout);
  ::dup2(saved_, 1);
  ::close(saved_);
  saved_ = -1;
}

std::string StdoutCapture::Text() {
  Restore();
  auto bytes = ReadFile(path_);
  std::string text(bytes.begin(), bytes.end());
  std::printf("%s", text.c_str());  // keep it in the console log too
  return text;
}

}  // namespace systest

int main(int argc, char** argv) {
  if (argc == 2 && std::strcmp(argv[1], "--list") == 0) {
    for (const auto& entry : Registry()) std::printf("%s\n", entry.first.c_str());
    return 0;
  }
  if (argc != 2) {
    std::fprintf(stderr, "usage: %s <scenario> | --list\n", argv[0]);
    return 2;
  }
  auto it = Registry().find(argv[1]);
  if (it == Registry().end()) {
    Report(std::string("FAIL ") + argv[1] + ": no such scenario");
    return 1;
  }
  systest::SetLogLevel(kEverything);
  it->second.fn();
  if (systest::Failed()) {
    Report(std::string("FAIL ") + argv[1] + ": " + FirstFailure());
    return 1;
  }
  Report(std::string("PASS ") + argv[1]);
  return 0;
}
