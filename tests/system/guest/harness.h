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

#include <cstdint>
#include <functional>
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

// Runs a shell command, returns its exit status (-1 when it could not run),
// or what it printed.
int Shell(const std::string& command);
std::string ShellOutput(const std::string& command);
// What fn printed on file descriptor 1 (child processes included).
std::string CaptureStdout(const std::function<void()>& fn);
// How long a step takes, in seconds.
double Seconds(const std::function<void()>& step);

Bytes Pattern(std::size_t size, unsigned int seed);
Bytes Slice(const Bytes& data, std::size_t from, std::size_t length);
inline Bytes Erased(std::size_t size) { return Bytes(size, 0xFF); }
inline Bytes operator+(Bytes a, const Bytes& b) {
  a.insert(a.end(), b.begin(), b.end());
  return a;
}
Bytes ReadFile(const std::string& path);
bool WriteFile(const std::string& path, const Bytes& data);

template <typename A, typename B>
std::string Pair(const A& a, const B& b) {
  std::ostringstream out;
  out << a << " vs " << b;
  return out.str();
}
std::string Pair(const Bytes& a, const Bytes& b);

template <typename A, typename B>
bool CheckEq(const A& a, const B& b, const char* file, int line, const char* what) {
  return Check(a == b, file, line, std::string(what) + " (" + Pair(a, b) + ")");
}

class MtdDevice {
 public:
  explicit MtdDevice(const std::string& path) : fd_(::open(path.c_str(), O_RDWR | O_SYNC)) {
    if (fd_ >= 0) ::ioctl(fd_, MEMGETINFO, &info_);
  }
  ~MtdDevice() {
    if (fd_ >= 0) ::close(fd_);
  }
  bool ok() const { return fd_ >= 0; }
  int fd() const { return fd_; }
  const mtd_info_user& info() const { return info_; }
  // Each returns the system call's result; errno tells why it failed.
  long Write(std::uint64_t at, const Bytes& data) { return ::pwrite(fd_, data.data(), data.size(), at); }
  long Read(std::uint64_t at, Bytes& data) { return ::pread(fd_, data.data(), data.size(), at); }
  int Erase(std::uint64_t at, std::uint64_t length) {
    erase_info_user region{static_cast<__u32>(at), static_cast<__u32>(length)};
    return ::ioctl(fd_, MEMERASE, &region);
  }
  int IsBad(std::uint64_t at) { return BlockIoctl(MEMGETBADBLOCK, at); }
  int MarkBad(std::uint64_t at) { return BlockIoctl(MEMSETBADBLOCK, at); }
  bool EccStats(mtd_ecc_stats& stats) { return ::ioctl(fd_, ECCGETSTATS, &stats) == 0; }
  // The bytes at an offset; empty when the read fell short.
  Bytes ReadAll(std::uint64_t at, std::size_t length);
  // Numbers of the bad (or the good) blocks.
  std::vector<std::uint64_t> Blocks(bool bad = true);
  // Erases every good block; false when an erase failed.
  bool EraseAllGood();
  // The good blocks' contents one after the other, as nanddump
  // --bb=skipbad gives them.
  Bytes GoodBlocks();
  // The offset counted over good blocks (as the library addresses a NAND
  // slot) of a physical block.
  std::uint64_t LogicalOf(std::uint64_t block);

 private:
  int BlockIoctl(unsigned long request, std::uint64_t at) {
    loff_t offset = static_cast<loff_t>(at);
    return ::ioctl(fd_, request, &offset);
  }
  int fd_;
  mtd_info_user info_{};
};

}  // namespace systest

#define SYSTEST_CAT2(a, b) a##b
#define SYSTEST_CAT(a, b) SYSTEST_CAT2(a, b)
#define SCENARIO(name)                                                                   \
  static void SYSTEST_CAT(scenario_, __LINE__)();                                         \
  static ::systest::Registrar SYSTEST_CAT(registrar_, __LINE__)(name,                     \
                                                                SYSTEST_CAT(scenario_, __LINE__)); \
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
