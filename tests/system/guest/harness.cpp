#include "harness.h"

#include <sys/wait.h>

#include <algorithm>
#include <chrono>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <map>
#include <random>

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

int Shell(const std::string& command) {
  std::fflush(stdout);
  int status = std::system(command.c_str());
  return status == -1 || !WIFEXITED(status) ? -1 : WEXITSTATUS(status);
}

std::string ShellOutput(const std::string& command) {
  std::string out;
  FILE* pipe = popen(command.c_str(), "r");
  for (int c; pipe != nullptr && (c = std::fgetc(pipe)) != EOF;) out += static_cast<char>(c);
  if (pipe != nullptr) pclose(pipe);
  return out;
}

std::string CaptureStdout(const std::function<void()>& fn) {
  const char* path = "/tmp/systest-stdout";
  std::fflush(stdout);
  int saved = ::dup(1), fd = ::open(path, O_WRONLY | O_CREAT | O_TRUNC, 0644);
  ::dup2(fd, 1);
  ::close(fd);
  fn();
  std::fflush(stdout);
  ::dup2(saved, 1);
  ::close(saved);
  auto bytes = ReadFile(path);
  std::string text(bytes.begin(), bytes.end());
  std::printf("%s", text.c_str());  // keep it in the console log too
  return text;
}

double Seconds(const std::function<void()>& step) {
  auto start = std::chrono::steady_clock::now();
  step();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

Bytes Pattern(std::size_t size, unsigned int seed) {
  std::minstd_rand generator(seed + 1);
  Bytes data(size);
  for (auto& b : data) b = static_cast<unsigned char>(generator() >> 8);
  return data;
}

Bytes Slice(const Bytes& data, std::size_t from, std::size_t length) {
  return Bytes(data.begin() + from, data.begin() + from + length);
}

Bytes ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), {});
}

bool WriteFile(const std::string& path, const Bytes& data) {
  std::ofstream out(path, std::ios::binary);
  out.write(reinterpret_cast<const char*>(data.data()), static_cast<std::streamsize>(data.size()));
  return static_cast<bool>(out);
}

std::string Pair(const Bytes& a, const Bytes& b) {
  auto first = std::mismatch(a.begin(), a.end(), b.begin(), b.end()).first - a.begin();
  return "sizes " + std::to_string(a.size()) + " and " + std::to_string(b.size()) + ", first difference at " +
         std::to_string(first);
}

Bytes MtdDevice::ReadAll(std::uint64_t at, std::size_t length) {
  Bytes data(length);
  if (Read(at, data) != static_cast<long>(length)) data.clear();
  return data;
}

std::vector<std::uint64_t> MtdDevice::Blocks(bool bad) {
  std::vector<std::uint64_t> blocks;
  for (std::uint64_t at = 0; at < info_.size; at += info_.erasesize)
    if ((IsBad(at) > 0) == bad) blocks.push_back(at / info_.erasesize);
  return blocks;
}

bool MtdDevice::EraseAllGood() {
  bool all = true;
  for (auto block : Blocks(false)) all = Erase(block * info_.erasesize, info_.erasesize) == 0 && all;
  return all;
}

Bytes MtdDevice::GoodBlocks() {
  Bytes all;
  for (auto block : Blocks(false)) {
    Bytes one = ReadAll(block * info_.erasesize, info_.erasesize);
    all.insert(all.end(), one.begin(), one.end());
  }
  return all;
}

std::uint64_t MtdDevice::LogicalOf(std::uint64_t block) {
  auto good = Blocks(false);
  return std::count_if(good.begin(), good.end(), [&](std::uint64_t b) { return b < block; }) * info_.erasesize;
}

}  // namespace systest

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: %s <scenario> | --list\n", argv[0]);
    return 2;
  }
  for (const auto& entry : Registry())
    if (std::strcmp(argv[1], "--list") == 0) std::printf("%s\n", entry.first.c_str());
  if (std::strcmp(argv[1], "--list") == 0) return 0;
  const char* path = std::getenv("STBPLAT_SYSTEST_RESULTS");
  FILE* file = path != nullptr ? std::fopen(path, "a") : nullptr;
  if (file != nullptr) results = file;
  for (int i = 0; i < eLogModuleCount; ++i) subSystemLogLevel[i] = kEverything;
  auto it = Registry().find(argv[1]);
  if (it == Registry().end()) first_failure = "no such scenario";
  if (it != Registry().end()) it->second();
  Report(first_failure.empty() ? "PASS " + std::string(argv[1]) : "FAIL " + std::string(argv[1]) + ": " + first_failure);
  return first_failure.empty() ? 0 : 1;
}
