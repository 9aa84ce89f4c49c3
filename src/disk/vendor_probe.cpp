// Which vendor made the disk (asked of hdparm) and which SCSI generic device
// sits on a given bus.
#include <cstdio>
#include <fcntl.h>

#include "disk/disk_common.h"

namespace stbplat {
namespace disk {
namespace {

// hdparm -i prints "Model=<name>"; the index of the matching pattern is the
// vendor index.
constexpr const char* kVendorPatterns[] = {"Model=ST", "Model=WD", "Model=Hi", "Model=To"};
static_assert(sizeof kVendorPatterns / sizeof kVendorPatterns[0] == HARD_DRIVE_VENDOR_NONE,
              "one pattern per vendor");

constexpr const char* const kScsiGenericNodes[] = {"/dev/sg0", "/dev/sg1", "/dev/sg2",
                                                   "/dev/sg3", "/dev/sg4"};
constexpr unsigned int kScsiGenericCount =
    sizeof kScsiGenericNodes / sizeof kScsiGenericNodes[0];
constexpr mode_t kScsiGenericMode = 0644;

}  // namespace
}  // namespace disk
}  // namespace stbplat

using stbplat::os::ScopedFd;
using stbplat::os::Sys;
namespace disk = stbplat::disk;

extern "C" {

int HardDriveGetVendorType(const HardDriveNodeInfo* drive, unsigned int* vendor) {
  if (drive == nullptr || vendor == nullptr) return 0;
  *vendor = HARD_DRIVE_VENDOR_NONE;
  const unsigned int node = drive->deviceNode;
  if (node >= HARD_DRIVE_NODE_COUNT) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Input Wrong Device Node Number (%d)\n\r",
                       __func__, static_cast<int>(node));
    return 0;
  }
  const char* device = disk::kDeviceNodes[node];
  for (unsigned int i = 0; i < HARD_DRIVE_VENDOR_NONE; ++i) {
    char command[disk::kCommandSize];
    std::snprintf(command, sizeof command, "hdparm -i %s 2>/dev/null | grep -i -c %s", device,
                  disk::kVendorPatterns[i]);
    FILE* pipe = Sys().popen(command, "r");
    if (pipe == nullptr) {
      STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Open The Pipe-Hdparm Node[%s]\n\r",
                         __func__, device);
      return 0;
    }
    int count = 0;
    if (std::fscanf(pipe, "%d", &count) != 1) {
      STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Scan Model Failed\n\r", __func__);
      if (Sys().pclose(pipe) == -1)
        STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Close The Pipe-Hdparm Node[%s]\n\r",
                           __func__, device);
      return 0;
    }
    if (Sys().pclose(pipe) == -1) {
      STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Close The Pipe-Hdparm Node[%s]\n\r",
                         __func__, device);
      return 0;
    }
    if (count != 0) {
      *vendor = i;
      return 1;
    }
  }
  STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Hard Drive Vendor Not Found\n\r", __func__);
  return 0;
}

int HardDriveProbeScsiBusPosition(unsigned int bus, unsigned int* found) {
  if (found == nullptr) return 0;
  *found = HARD_DRIVE_NODE_COUNT;
  int busNumber = -1;
  for (unsigned int i = 0; i < disk::kScsiGenericCount; ++i) {
    ScopedFd fd(Sys().open(disk::kScsiGenericNodes[i], O_RDONLY | O_NONBLOCK,
                           disk::kScsiGenericMode));
    if (!fd.valid()) continue;
    busNumber = -1;
    if (Sys().ioctl(fd.get(), disk::kScsiIoctlGetBusNumber, &busNumber) < 0) {
      STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed On SCSI_IOCTL_GET_BUS_NUMBER\n\r", __func__);
      return 0;
    }
    if (static_cast<unsigned int>(busNumber) == bus) {
      *found = static_cast<unsigned int>(busNumber);
      return 1;
    }
  }
  STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Scsi Device%d Bus%d Not Found\n\r", __func__,
                     static_cast<int>(bus), busNumber);
  return 0;
}

}  // extern "C"
