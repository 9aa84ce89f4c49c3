// Shared by the disk-probing sources: device names, request codes and the
// trace log of the vendor, bus, position and temperature probes.
#ifndef STBPLAT_SRC_DISK_DISK_COMMON_H
#define STBPLAT_SRC_DISK_DISK_COMMON_H

#include <cstdio>

#include "os/seam.h"
#include "stbplat/disk.h"
#include "util/log_gate.h"

namespace stbplat {
namespace disk {

constexpr const char* kSourceFile = "HardDriveTempUtils";

// Device paths of node numbers 0 .. HARD_DRIVE_NODE_COUNT - 1.
extern const char* const kDeviceNodes[HARD_DRIVE_NODE_COUNT];

// Linux request codes (linux/hdreg.h, linux/fs.h, scsi/scsi_ioctl.h).
constexpr unsigned long kHdioGetIdentity = 0x030D;
constexpr unsigned long kHdioDriveCmd = 0x031F;
constexpr unsigned long kBlkGetSize64 = 0x80081272;
constexpr unsigned long kScsiIoctlGetBusNumber = 0x5386;

// Shell command lines are formatted into buffers of this size.
constexpr size_t kCommandSize = 128;
// Room for "/dev/" or "/sys/class/block/" plus a device name.
constexpr size_t kPathSize = 256;

constexpr const char* kDevPrefix = "/dev/";
// Room for a /sys/class/block link target such as
// "../../devices/pci0000:00/0000:00:1f.2/ata1/host0/target0:0:0/0:0:0:0/block/sda".
constexpr size_t kLinkSize = 1024;

// Formats prefix + name into out (cut to kPathSize - 1 characters).
void DevicePath(char (&out)[kPathSize], const char* prefix, const char* name);

// Reads the /sys/class/block link of a device name into link, terminated.
// False when there is no such link.
bool ReadBlockDeviceLink(const char* name, char (&link)[kLinkSize]);

// What IsDevHDD decides about a block device: an ATA disk, a USB device
// above 256 GiB (or whose size cannot be read), or neither.
enum class BlockKind { kOther, kAta, kUsbDisk };

// The size of /dev/<name> in bytes, or all bits set. Quiet prints nothing;
// otherwise GetBlkDevSize's texts.
unsigned long BlockDeviceSize(const char* name, bool quiet);

// Classifies a device whose /sys/class/block link is `link`. Quiet prints
// nothing; otherwise IsDevHDD's texts.
BlockKind ClassifyBlockDevice(const char* name, const char* link, bool quiet);

}  // namespace disk
}  // namespace stbplat

// Level-6 trace of the disk probes, under the calling function's name.
#define STBPLAT_DISK_TRACE(...)                                                         \
  STBPLAT_LOG(eLogModuleDiskProbing, eLogLevelTrace, ::stbplat::disk::kSourceFile,       \
              __func__, __VA_ARGS__)

#endif
