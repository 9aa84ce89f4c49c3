// A simulated machine for the disk probes: block-device links, device nodes
// with identity, size, SMART data and SCSI bus numbers, files and pipes. It
// replaces the OS seam for its lifetime; anything it does not simulate fails
// like a missing file.
#ifndef STBPLAT_TESTS_DISK_FAKE_SYSTEM_H
#define STBPLAT_TESTS_DISK_FAKE_SYSTEM_H

#include <array>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "os/seam.h"

namespace stbplat {
namespace test {

// What smartctl-free SMART reading returns: one attribute entry.
struct SmartAttribute {
  unsigned char id;
  unsigned char current;
  unsigned char worst;
  std::array<unsigned char, 6> raw;
};

struct FakeDevice {
  bool opens = true;
  // BLKGETSIZE64
  bool sizeFails = false;
  unsigned long long size = 0;
  // HDIO_GET_IDENTITY
  bool identityFails = false;
  std::string model;   // written at byte 54, space padded to 40
  std::string serial;  // written at byte 20, space padded to 20
  std::vector<unsigned char> identity;  // when set, used as the whole block
  // HDIO_DRIVE_CMD (SMART READ DATA): entries placed from slot 0
  bool smartFails = false;
  std::vector<SmartAttribute> attributes;
  // SCSI_IOCTL_GET_BUS_NUMBER
  bool busFails = false;
  int bus = 0;
};

class FakeSystem {
 public:
  FakeSystem();
  ~FakeSystem();
  FakeSystem(const FakeSystem&) = delete;
  FakeSystem& operator=(const FakeSystem&) = delete;

  static FakeSystem& Current();

  // /sys/class/block/<name> -> target
  void AddBlockLink(const std::string& name, const std::string& target);
  FakeDevice& AddDevice(const std::string& path);
  void AddFile(const std::string& path, const std::string& text);
  // Pipes: with none registered and realPipes set, popen runs the command.
  void SetPipeOutput(const std::string& commandPart, const std::string& output);
  void FailPipeOpen(bool fail) { failPipeOpen_ = fail; }
  void FailPipeClose(bool fail) { failPipeClose_ = fail; }
  void UseRealPipes(bool real) { realPipes_ = real; }
  // sleep throws StopLoop once it has been called this many times.
  void StopAfterSleeps(int sleeps) { sleepsLeft_ = sleeps; }

  const std::vector<std::string>& opened() const { return opened_; }
  const std::vector<std::string>& commands() const { return commands_; }
  const std::vector<std::string>& linksRead() const { return linksRead_; }
  const std::vector<unsigned int>& sleeps() const { return sleepSeconds_; }
  const std::vector<int>& openFlags() const { return openFlags_; }
  const std::vector<mode_t>& openModes() const { return openModes_; }
  size_t openDescriptors() const { return openFds_.size(); }
  size_t openStreams() const { return openStreams_.size(); }
  // The last SMART command block's first four bytes.
  std::array<unsigned char, 4> lastDriveCommand() const { return lastDriveCommand_; }

 private:
  friend struct FakeCalls;
  std::map<std::string, std::string> links_;
  std::map<std::string, FakeDevice> devices_;
  std::map<std::string, std::string> files_;
  std::vector<std::pair<std::string, std::string>> pipeOutputs_;
  std::map<int, std::string> openFds_;
  std::set<FILE*> openStreams_;
  std::set<FILE*> pipes_;
  std::vector<std::string> opened_;
  std::vector<int> openFlags_;
  std::vector<mode_t> openModes_;
  std::vector<std::string> commands_;
  std::vector<std::string> linksRead_;
  std::vector<unsigned int> sleepSeconds_;
  std::array<unsigned char, 4> lastDriveCommand_{};
  bool failPipeOpen_ = false;
  bool failPipeClose_ = false;
  bool realPipes_ = false;
  int sleepsLeft_ = 1;
  int nextFd_ = 100;
  std::unique_ptr<os::ScopedSysCalls> guard_;
};

// Thrown by the fake sleep to leave an endless monitoring loop.
struct StopLoop {};

// A real ATA disk's link and a USB stick's link.
extern const char* const kAtaLink;
extern const char* const kUsbLink;

}  // namespace test
}  // namespace stbplat

#endif
