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
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <random>
#include <sstream>
#include <string>
#include <type_traits>
#include <vector>

using Bytes = std::vector<unsigned char>;

// The box's flash in the virtual machine (see init.sh): NAND pages and
// blocks, the NOR chip, its sectors and its partitions.
constexpr unsigned long kPage = 2048;
constexpr unsigned long kBlock = 0x20000;
constexpr unsigned long kNorChip = 0x400000;
constexpr unsigned long kNorSector = 0x10000;
constexpr unsigned long kNorPart = 0x80000;

// Adds a scenario to the program (SCENARIO does it).
bool Register(const char* name, void (*fn)());

// Records a failure of the running scenario (the first one is reported)
// unless ok; returns ok.
bool Check(bool ok, const char* file, int line, const std::string& what);
// A line for the host's summary ("INFO <text>").
void Info(const std::string& text);
// Whether a log message the library produced since the last ClearLog
// contains the text.
bool LogContains(const std::string& text);
void ClearLog();

// Runs a shell command; true when it ran and exited with status 0.
inline bool Shell(const std::string& command) {
  std::fflush(stdout);
  return std::system(command.c_str()) == 0;
}

// Erases a flash partition with mtd-utils (which pass bad blocks over).
inline bool FlashErase(const std::string& node) { return Shell("flash_erase -q " + node + " 0 0"); }

inline Bytes ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), {});
}

inline bool WriteFile(const std::string& path, const Bytes& data) {
  std::ofstream out(path, std::ios::binary);
  return static_cast<bool>(out.write(reinterpret_cast<const char*>(data.data()), data.size()));
}

// What fn printed on file descriptor 1 (child processes included).
inline std::string CaptureStdout(const std::function<void()>& fn) {
  std::fflush(stdout);
  int saved = ::dup(1);
  std::freopen("/tmp/systest-stdout", "w", stdout);
  fn();
  std::fflush(stdout);
  ::dup2(saved, 1);
  ::close(saved);
  Bytes text = ReadFile("/tmp/systest-stdout");
  return std::string(text.begin(), text.end());
}

// What a shell command printed, less trailing white space.
inline std::string ShellOutput(const std::string& command) {
  std::string out = CaptureStdout([&] { Shell(command); });
  while (!out.empty() && out.back() <= ' ') out.pop_back();
  return out;
}

// How long a step takes, in seconds.
inline double Seconds(const std::function<void()>& step) {
  auto start = std::chrono::steady_clock::now();
  step();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

inline Bytes Pattern(std::size_t size, unsigned int seed) {
  Bytes data(size);
  std::generate(data.begin(), data.end(), std::minstd_rand(seed + 1));
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

// Checks a == b; a failure shows both sides (of bytes, the sizes).
template <typename A, typename B>
bool CheckEq(const A& a, const B& b, const char* file, int line, const char* what) {
  std::ostringstream out;
  if constexpr (std::is_same_v<A, Bytes>) out << " (sizes " << a.size() << " and " << b.size() << ")";
  if constexpr (!std::is_same_v<A, Bytes>) out << " (" << a << " vs " << b << ")";
  return a == b || Check(false, file, line, what + out.str());
}

struct MtdDevice {
  // A device that does not open (or, when asked, erase its good blocks with
  // flash_erase) fails the scenario.
  explicit MtdDevice(const std::string& path, bool erase = false) : fd(open(path.c_str(), O_RDWR | O_SYNC)) {
    if (Check(fd >= 0, __FILE_NAME__, __LINE__, "open " + path)) ::ioctl(fd, MEMGETINFO, &info);
    if (erase) Check(FlashErase(path), __FILE_NAME__, __LINE__, "flash_erase " + path);
  }
  ~MtdDevice() { ::close(fd); }
  // Each returns the system call's result; errno tells why it failed.
  long Write(unsigned long at, const Bytes& data) { return ::pwrite(fd, data.data(), data.size(), at); }
  long Read(unsigned long at, Bytes& data) { return ::pread(fd, data.data(), data.size(), at); }
  int Erase(unsigned long at, unsigned long length) {
    return Ioctl(MEMERASE, erase_info_user{__u32(at), __u32(length)});
  }
  int IsBad(unsigned long at) { return Ioctl(MEMGETBADBLOCK, loff_t(at)); }
  int MarkBad(unsigned long at) { return Ioctl(MEMSETBADBLOCK, loff_t(at)); }
  bool EccStats(mtd_ecc_stats& stats) { return ::ioctl(fd, ECCGETSTATS, &stats) == 0; }

  // The bytes at an offset; empty when the read fell short.
  Bytes ReadAll(unsigned long at, std::size_t length) {
    Bytes data(length);
    return Read(at, data) == static_cast<long>(length) ? data : Bytes();
  }
  // Numbers of the bad (or the good) blocks.
  std::vector<unsigned long> Blocks(bool bad = true) {
    std::vector<unsigned long> blocks;
    for (unsigned long at = 0; at < info.size; at += info.erasesize)
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
  template <typename Argument>
  int Ioctl(unsigned long request, Argument argument) {
    return ::ioctl(fd, request, &argument);
  }

  int fd;
  mtd_info_user info{};
};

#define SYSTEST_CAT2(a, b) a##b
#define SYSTEST_CAT(a, b) SYSTEST_CAT2(a, b)
#define SCENARIO(name)                                                                            \
  static void SYSTEST_CAT(scenario_, __LINE__)();                                                 \
  static bool SYSTEST_CAT(added_, __LINE__) = ::Register(name, SYSTEST_CAT(scenario_, __LINE__)); \
  static void SYSTEST_CAT(scenario_, __LINE__)()

#define CHECK(cond) ::Check(static_cast<bool>(cond), __FILE_NAME__, __LINE__, #cond)
#define CHECK_EQ(a, b) ::CheckEq((a), (b), __FILE_NAME__, __LINE__, #a " == " #b)
#define CHECK_LOG(text) ::Check(::LogContains(text), __FILE_NAME__, __LINE__, "log lacks " #text)
// Stops the scenario when the condition fails (later steps would only
// repeat the failure).
#define REQUIRE(cond) if (!CHECK(cond)) return

#endif
