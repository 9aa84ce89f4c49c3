// Where the disk sits: how many SCSI devices the kernel lists, which of
// sda .. sde is the first ATA or large USB disk, and its SCSI host.
#include <cstdlib>
#include <cstring>

#include "disk/disk_common.h"
#include "os/scoped_file.h"

namespace stbplat {
namespace disk {
namespace {

constexpr const char* kScsiDeviceList = "/proc/scsi/scsi";
// Each attached device starts with "Host: scsiN Channel: .. Id: .. Lun: ..".
constexpr const char* kDeviceEntry = "Host:";
constexpr int kListLineSize = 256;

constexpr const char* kNodeNames[HARD_DRIVE_NODE_COUNT] = {"sda", "sdb", "sdc", "sdd", "sde"};
constexpr const char* kHostComponent = "/host";
constexpr int kDecimal = 10;


// The N of the first "/hostN/" in the block device's link, or
// HARD_DRIVE_BUS_UNKNOWN.
unsigned int ScsiHostOf(const char* name) {
  char link[kLinkSize];
  if (!ReadBlockDeviceLink(name, link)) return HARD_DRIVE_BUS_UNKNOWN;
  for (const char* p = std::strstr(link, kHostComponent); p != nullptr;
       p = std::strstr(p + 1, kHostComponent)) {
    const char* digits = p + std::strlen(kHostComponent);
    char* end = nullptr;
    const unsigned long host = std::strtoul(digits, &end, kDecimal);
    if (end != digits && *end == '/' && host < HARD_DRIVE_BUS_UNKNOWN)
      return static_cast<unsigned int>(host);
  }
  return HARD_DRIVE_BUS_UNKNOWN;
}

}  // namespace
}  // namespace disk
}  // namespace stbplat

using stbplat::os::Sys;
namespace disk = stbplat::disk;

extern "C" {

int HardDriveProbeSataPosition(HardDriveNodeInfo* drive) {
  if (drive == nullptr) return 0;
  drive->scsiDeviceCount = 0;
  stbplat::os::ScopedFile list(Sys().fopen64(disk::kScsiDeviceList, "r"));
  if (list.get() == nullptr) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Open %s\n\r", __func__,
                       disk::kScsiDeviceList);
    return 0;
  }
  char line[disk::kListLineSize];
  const size_t entryLength = std::strlen(disk::kDeviceEntry);
  bool atLineStart = true;
  while (Sys().fgets(line, sizeof line, list.get()) != nullptr) {
    if (atLineStart && std::strncmp(line, disk::kDeviceEntry, entryLength) == 0)
      ++drive->scsiDeviceCount;
    // A line longer than the buffer arrives in pieces; only a line's first
    // piece can start an entry.
    atLineStart = std::strchr(line, '\n') != nullptr;
  }
  if (drive->scsiDeviceCount == 0) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] No Scsi Device Attached\n\r", __func__);
    return 0;
  }
  return 1;
}

int HardDriveScanDeviceNode(HardDriveNodeInfo* drive) {
  if (drive == nullptr) return 0;
  unsigned int limit = HARD_DRIVE_NODE_COUNT;
  if (drive->scsiDeviceCount != 0 && drive->scsiDeviceCount < limit)
    limit = drive->scsiDeviceCount;
  for (unsigned int node = 0; node < limit; ++node) {
    if (IsDevHDD(disk::kNodeNames[node]) == 0) continue;
    drive->deviceNode = static_cast<unsigned char>(node);
    drive->scsiBus = disk::ScsiHostOf(disk::kNodeNames[node]);
    return 1;
  }
  STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Hard Drive Not Found\n\r", __func__);
  return 0;
}

int HardDriveProbeNodePosition(HardDriveNodeInfo* drive) {
  if (drive == nullptr) return 0;
  std::memset(drive, 0, sizeof *drive);
  drive->deviceNode = HARD_DRIVE_NODE_COUNT;
  drive->scsiBus = HARD_DRIVE_BUS_UNKNOWN;
  // Without the list every node is looked at.
  HardDriveProbeSataPosition(drive);
  return HardDriveScanDeviceNode(drive);
}

}  // extern "C"
