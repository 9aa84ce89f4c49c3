// Emulated hard disks, bound into the library through its OS seam over
// whatever was bound before (the emulated flash device, or the C library):
//   - /dev/sdX and /dev/sgN nodes answering the identity, size, SMART and
//     SCSI bus requests;
//   - /sys/class/block links and readable files such as /proc/scsi/scsi;
//   - the shell tools the disk probes run (hdparm, smartctl, lsmod): the
//     tool's part of the command line is replaced by its captured output
//     and the rest (grep, awk) runs in the real shell, as on the box.
// Paths and commands it does not hold go to the previous binding; a tool
// with no captured output prints nothing. Host mode fills it from a device
// root; the unit tests fill its tables and read back what the library did.
#ifndef STBPLAT_DEVMODEL_DISK_SIM_H
#define STBPLAT_DEVMODEL_DISK_SIM_H

#include <array>
#include <cstdio>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "os/seam.h"

namespace stbplat {
namespace devmodel {

// One SMART attribute entry as the drive returns it (id, flags, current,
// worst, six raw bytes, reserved).
using SmartEntry = std::array<unsigned char, 12>;

struct SimDisk {
  long long size = 0;     // BLKGETSIZE64; the request fails when negative
  std::string identity;   // the 512-byte identity block; the request fails when empty
  int smartReads = 1000;  // SMART READ DATA succeeds this many times, then fails
  std::vector<SmartEntry> attributes;  // from slot 0 of the attribute table
  int bus = 0;  // SCSI_IOCTL_GET_BUS_NUMBER; the request fails when negative
};

// The identity block of a disk with this model and serial number.
std::string IdentityBlock(const std::string& model, const std::string& serial);

class DiskSim {
 public:
  DiskSim();
  ~DiskSim();
  DiskSim(const DiskSim&) = delete;
  DiskSim& operator=(const DiskSim&) = delete;

  std::map<std::string, std::string> links;   // /sys/class/block/<name> -> target
  std::map<std::string, SimDisk> devices;     // by path
  std::map<std::string, std::string> files;   // readable with fopen64, by path
  // Captured output by the command line's tool part, such as
  // "hdparm -i /dev/sda", "smartctl -d ata -A /dev/sda" or "lsmod".
  std::map<std::string, std::string> tools;
  bool pipeOpenFails = false;
  bool pipeCloseFails = false;
  bool pipeSilent = false;  // pipelines print nothing (a shell without grep or awk)
  // Called for a sleep instead of sleeping (which it does when unset).
  std::function<void(unsigned int)> onSleep;

  // What the library did.
  std::vector<std::string> opened;  // open and fopen64 paths it holds
  std::vector<std::string> commands;
  std::vector<unsigned int> sleeps;
  std::array<unsigned char, 4> lastDriveCommand{};
  // Descriptors, streams and pipes of its own still open.
  size_t OpenCount() const { return fds_.size() + streams_.size(); }

  static DiskSim* Current();
  int Open(const char* path, int flags, mode_t mode);
  int Close(int fd);
  int Ioctl(int fd, unsigned long request, void* argument);
  ssize_t Readlink(const char* path, char* buffer, size_t size);
  FILE* Fopen(const char* path, const char* mode);
  int Fclose(FILE* file);
  FILE* Popen(const char* command, const char* mode);
  int Pclose(FILE* pipe);
  unsigned int Sleep(unsigned int seconds);

 private:
  bool Answer(SimDisk& disk, unsigned long request, unsigned char* bytes);

  os::SysCalls previous_;
  DiskSim* outer_;
  std::map<int, std::string> fds_;
  std::map<FILE*, std::string> streams_;  // and the captured output's file, for pipes
  int nextFd_;
  std::unique_ptr<os::ScopedSysCalls> binding_;
};

}  // namespace devmodel
}  // namespace stbplat

#endif
