// Minimal scenario harness of the guest programs: scenarios register by name,
// checks record failures with the expression and line, and the program
// reports one "PASS <name>" or "FAIL <name>: <why>" line to the results
// channel (STBPLAT_SYSTEST_RESULTS, else standard output). MtdDevice reaches
// an MTD character device directly, without the library in between, so
// scenarios can prepare and inspect flash independently of the code under
// test.
#ifndef STBPLAT_SYSTEST_HARNESS_H
#define STBPLAT_SYSTEST_HARNESS_H

#include <fcntl.h>
#include <mtd/mtd-abi.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cctype>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <iterator>
#include <random>
#include <sstream>
#include <string>
#include <vector>

namespace systest {

using Bytes = std::vector<unsigned char>;

// The box's flash in the virtual machine (see init.sh): NAND pages and
// blocks, the NOR chip, its sectors and its partitions.
constexpr unsigned long kPage = 2048;
constexpr unsigned long kBlock = 0x20000;
constexpr unsigned long kNorChip = 0x400000;
constexpr unsigned long kNorSector = 0x10000;
constexpr unsigned long kNorPart = 0x80000;

struct Registrar {
  Registrar(const char* name, void (*fn)());
};

// Records a failure of the running scenario (the first one is reported)
// unless ok; returns ok.
bool Check(bool ok, const char* file, int line, const std::string& what);
// A line for the host's summary ("INFO <text>").
void Info(const std::string& text);
// Log messages the library produced since the last ClearLog.
bool LogContains(const std::string& text);
void ClearLog();

// Runs a shell command, returns its exit status (-1 when it could not run).
inline int Shell(const std::string& command) {
  std::fflush(stdout);
  int status = std::system(command.c_str());
  return status == -1 || !WIFEXITED(status) ? -1 : WEXITSTATUS(status);
}

// Erases a flash partition with mtd-utils (which pass bad blocks over).
inline bool FlashErase(const std::string& node) { return Shell("flash_erase -q " + node + " 0 0") == 0; }

inline Bytes ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), {});
}

inline bool WriteFile(const std::string& path, const Bytes& data) {
  std::ofstream out(path, std::ios::binary);
  out.write(reinterpret_cast<const char*>(data.data()), static_cast<std::streamsize>(data.size()));
  return static_cast<bool>(out);
}

// What fn printed on file descriptor 1 (child processes included).
inline std::string CaptureStdout(const std::function<void()>& fn) {
  std::fflush(stdout);
  int saved = ::dup(1), fd = ::open("/tmp/systest-stdout", O_WRONLY | O_CREAT | O_TRUNC, 0644);
  ::dup2(fd, 1);
  ::close(fd);
  fn();
  std::fflush(stdout);
  ::dup2(saved, 1);
  ::close(saved);
  Bytes text = ReadFile("/tmp/systest-stdout");
  std::fwrite(text.data(), 1, text.size(), stdout);  // keep it in the console log too
  return std::string(text.begin(), text.end());
}

// What a shell command printed, less trailing white space.
inline std::string ShellOutput(const std::string& command) {
  std::string out = CaptureStdout([&] { Shell(command); });
  while (!out.empty() && std::isspace(static_cast<unsigned char>(out.back()))) out.pop_back();
  return out;
}

// How long a step takes, in seconds.
inline double Seconds(const std::function<void()>& step) {
  auto start = std::chrono::steady_clock::now();
  step();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

inline Bytes Pattern(std::size_t size, unsigned int seed) {
  std::minstd_rand generator(seed + 1);
  Bytes data(size);
  for (auto& b : data) b = static_cast<unsigned char>(generator() >> 8);
  return data;
}

inline Bytes Slice(const Bytes& data, std::size_t from, std::size_t length) {
  return Bytes(data.begin() + from, data.begin() + from + length);
}

inline Bytes Erased(std::size_t size) { return Bytes(size, 0xFF); }

inline Bytes operator+(const Bytes& a, const Bytes& b) {
  Bytes sum(a.size() + b.size());
  std::copy(b.begin(), b.end(), std::copy(a.begin(), a.end(), sum.begin()));
  return sum;
}

template <typename A, typename B>
std::string Pair(const A& a, const B& b) {
  std::ostringstream out;
  out << a << " vs " << b;
  return out.str();
}

inline std::string Pair(const Bytes& a, const Bytes& b) {
  auto first = std::mismatch(a.begin(), a.end(), b.begin(), b.end()).first - a.begin();
  return "sizes " + std::to_string(a.size()) + " and " + std::to_string(b.size()) + ", first difference at " +
         std::to_string(first);
}

template <typename A, typename B>
bool CheckEq(const A& a, const B& b, const char* file, int line, const char* what) {
  return Check(a == b, file, line, std::string(what) + " (" + Pair(a, b) + ")");
}

struct MtdDevice {
  // A device that does not open fails the scenario.
  explicit MtdDevice(const std::string& path) : fd(::open(path.c_str(), O_RDWR | O_SYNC)) {
    if (Check(fd >= 0, __FILE__, __LINE__, "open " + path)) ::ioctl(fd, MEMGETINFO, &info);
  }
  ~MtdDevice() {
    if (fd >= 0) ::close(fd);
  }
  // Each returns the system call's result; errno tells why it failed.
  long Write(std::uint64_t at, const Bytes& data) { return ::pwrite(fd, data.data(), data.size(), at); }
  long Read(std::uint64_t at, Bytes& data) { return ::pread(fd, data.data(), data.size(), at); }
  int Erase(std::uint64_t at, std::uint64_t length) {
    erase_info_user region{static_cast<__u32>(at), static_cast<__u32>(length)};
    return ::ioctl(fd, MEMERASE, &region);
  }
  int IsBad(std::uint64_t at) { return BlockIoctl(MEMGETBADBLOCK, at); }
  int MarkBad(std::uint64_t at) { return BlockIoctl(MEMSETBADBLOCK, at); }
  bool EccStats(mtd_ecc_stats& stats) { return ::ioctl(fd, ECCGETSTATS, &stats) == 0; }

  // The bytes at an offset; empty when the read fell short.
  Bytes ReadAll(std::uint64_t at, std::size_t length) {
    Bytes data(length);
    return Read(at, data) == static_cast<long>(length) ? data : Bytes();
  }
  // Numbers of the bad (or the good) blocks.
  std::vector<std::uint64_t> Blocks(bool bad = true) {
    std::vector<std::uint64_t> blocks;
    for (std::uint64_t at = 0; at < info.size; at += info.erasesize)
      if ((IsBad(at) > 0) == bad) blocks.push_back(at / info.erasesize);
    return blocks;
  }
  // The good blocks' contents one after the other, as nanddump
  // --bb=skipbad gives them.
  Bytes GoodBlocks() {
    Bytes all;
    for (auto block : Blocks(false)) all = all + ReadAll(block * info.erasesize, info.erasesize);
    return all;
  }
  // The offset counted over good blocks (as the library addresses a NAND
  // slot) of a physical block.
  std::uint64_t LogicalOf(std::uint64_t block) {
    auto good = Blocks(false);
    return std::count_if(good.begin(), good.end(), [&](std::uint64_t b) { return b < block; }) * info.erasesize;
  }
  int BlockIoctl(unsigned long request, std::uint64_t at) {
    loff_t offset = static_cast<loff_t>(at);
    return ::ioctl(fd, request, &offset);
  }

  int fd;
  mtd_info_user info{};
};

}  // namespace systest

#define SYSTEST_CAT2(a, b) a##b
#define SYSTEST_CAT(a, b) SYSTEST_CAT2(a, b)
#define SCENARIO(name)                                                                              \
  static void SYSTEST_CAT(scenario_, __LINE__)();                                                    \
  static ::systest::Registrar SYSTEST_CAT(registrar_, __LINE__)(name, SYSTEST_CAT(scenario_, __LINE__)); \
  static void SYSTEST_CAT(scenario_, __LINE__)()

#define CHECK(cond) ::systest::Check(static_cast<bool>(cond), __FILE__, __LINE__, #cond)
#define CHECK_EQ(a, b) ::systest::CheckEq((a), (b), __FILE__, __LINE__, #a " == " #b)
#define CHECK_LOG(text) \
  ::systest::Check(::systest::LogContains(text), __FILE__, __LINE__, std::string("log lacks: ") + (text))
// Stops the scenario when the condition fails (later steps would only
// repeat the failure).
#define REQUIRE(cond) \
  if (!CHECK(cond)) return

#endif
