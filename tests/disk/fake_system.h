// A simulated machine for the disk probes: block-device links, device nodes
// answering the identity, size, SMART and SCSI bus requests, files and pipes
// with fixed output. It replaces the OS seam for its lifetime; anything it
// does not simulate fails like a missing file. Tests fill the public tables
// and read back what the library did.
#ifndef STBPLAT_TESTS_DISK_FAKE_SYSTEM_H
#define STBPLAT_TESTS_DISK_FAKE_SYSTEM_H

#include <array>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "os/seam.h"

namespace stbplat {
namespace test {

// One SMART attribute entry as the drive returns it (id, flags, current,
// worst, six raw bytes, reserved).
using SmartEntry = std::array<unsigned char, 12>;

struct FakeDevice {
  long long size = 0;    // BLKGETSIZE64; the request fails when negative
  std::string identity;  // the 512-byte identity block; the request fails when empty
  int smartReads = 1000;  // SMART READ DATA succeeds this many times, then fails
  std::vector<SmartEntry> attributes;  // from slot 0 of the attribute table
  int bus = 0;  // SCSI_IOCTL_GET_BUS_NUMBER; the request fails when negative
};

struct FakeSystem {
  FakeSystem();
  ~FakeSystem();

  std::map<std::string, std::string> links;   // /sys/class/block/<name> -> target
  std::map<std::string, FakeDevice> devices;  // by path
  std::map<std::string, std::string> files;   // readable with fopen64
  // popen output: the first entry whose key the command contains; else empty.
  std::vector<std::pair<std::string, std::string>> pipes;
  bool pipeOpenFails = false;
  bool pipeCloseFails = false;
  int sleepsLeft = 1;  // sleep throws StopLoop when this reaches 0
  std::function<void()> onSleep;  // what changes while the caller sleeps

  std::vector<std::string> opened;  // open and fopen64 paths
  std::vector<std::string> commands;
  std::vector<unsigned int> sleeps;
  std::array<unsigned char, 4> lastDriveCommand{};
  std::map<int, std::string> openFds;
  std::set<FILE*> openStreams;  // files and pipes
  std::unique_ptr<os::ScopedSysCalls> guard;
};

// Thrown by the fake sleep to leave an endless monitoring loop.
struct StopLoop {};

// A real ATA disk's link and a USB disk's link.
inline const char* const kAtaLink =
    "../../devices/pci0000:00/0000:00:1f.2/ata1/host0/target0:0:0/0:0:0:0/block/sda";
inline const char* const kUsbLink =
    "../../devices/pci0000:00/0000:00:14.0/usb2/2-1/2-1:1.0/host6/target6:0:0/6:0:0:0/block/sdb";

using Texts = std::vector<std::string>;

}  // namespace test
}  // namespace stbplat

#endif
