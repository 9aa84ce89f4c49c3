// Where the disk sits: how many SCSI devices the kernel lists, which of
// sda .. sde is the first ATA or large USB disk, and its SCSI host.
#include <cstdlib>
#include <cstring>

#include "disk/disk_common.h"
#include "os/scoped_file.h"
#include "os/seam.h"

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

// A USB node is taken for the disk only when it answers an ATA identify
// whose checksum is right; an empty card-reader slot does not.
constexpr const char* kChecksumCommand = "hdparm -I %s 2>/dev/null | grep -c 'Checksum: correct'";

// Waiting for the SATA driver: lsmod lists USB storage but no SATA driver.
constexpr const char* kModuleListCommand = "lsmod 2>/dev/null";
constexpr const char* kUsbStorageModules[] = {"usb_storage", "uas"};
constexpr const char* kSataModulePrefixes[] = {"libata", "ahci", "libahci", "sata_"};
constexpr unsigned int kSataLooks = 4;  // the first look and three more
constexpr unsigned int kSataWaitSeconds = 1;

// The N of the first "/hostN/" in the block device's link, or
// HARD_DRIVE_BUS_UNKNOWN.
unsigned int ScsiHostOf(const char* link) {
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

// Runs a command whose output starts with a count; false when it does not.
bool CommandCount(const char* command, int* count) {
  FILE* pipe = os::Sys().popen(command, "r");
  if (pipe == nullptr) return false;
  const bool scanned = std::fscanf(pipe, "%d", count) == 1;
  os::Sys().pclose(pipe);
  return scanned;
}

bool ChecksumCorrect(unsigned int node) {
  char command[kCommandSize];
  std::snprintf(command, sizeof command, kChecksumCommand, kDeviceNodes[node]);
  int count = 0;
  return CommandCount(command, &count) && count > 0;
}

template <size_t N>
bool NameIn(const char* name, size_t length, const char* const (&names)[N], bool prefix) {
  for (const char* candidate : names) {
    const size_t candidateLength = std::strlen(candidate);
    if ((prefix ? length >= candidateLength : length == candidateLength) &&
        std::strncmp(name, candidate, candidateLength) == 0)
      return true;
  }
  return false;
}

// True while lsmod lists a USB storage driver and no SATA driver: the SATA
// driver may still be loading, and its disk is still to come. A SATA driver
// built into the kernel is not listed; then the wait runs out.
bool SataDriverPending() {
  FILE* pipe = os::Sys().popen(kModuleListCommand, "r");
  if (pipe == nullptr) return false;
  bool usbStorage = false;
  bool sata = false;
  char line[kListLineSize];
  bool atLineStart = true;
  while (os::Sys().fgets(line, sizeof line, pipe) != nullptr) {
    const size_t length = std::strcspn(line, " \t\n");
    if (atLineStart) {
      usbStorage = usbStorage || NameIn(line, length, kUsbStorageModules, false);
      sata = sata || NameIn(line, length, kSataModulePrefixes, true);
    }
    atLineStart = std::strchr(line, '\n') != nullptr;
  }
  os::Sys().pclose(pipe);
  return usbStorage && !sata;
}

void Record(HardDriveNodeInfo* drive, unsigned int node, const char* link) {
  drive->deviceNode = static_cast<unsigned char>(node);
  drive->scsiBus = ScsiHostOf(link);
}

// The scan behind HardDriveScanDeviceNode; *ata tells whether the node found
// is an ATA disk.
bool ScanNodes(HardDriveNodeInfo* drive, bool* ata) {
  *ata = false;
  const unsigned int limit =
      drive->scsiDeviceCount != 0 ? drive->scsiDeviceCount : HARD_DRIVE_NODE_COUNT;
  unsigned int present = 0;
  int usbNode = -1;
  char usbLink[kLinkSize] = "";
  for (unsigned int node = 0; node < HARD_DRIVE_NODE_COUNT && present < limit; ++node) {
    char link[kLinkSize];
    // A node the kernel has let go of (a pulled stick) is not one of the
    // devices listed.
    if (!ReadBlockDeviceLink(kNodeNames[node], link)) continue;
    ++present;
    const BlockKind kind = ClassifyBlockDevice(kNodeNames[node], link, true);
    if (kind == BlockKind::kAta) {
      *ata = true;
      Record(drive, node, link);
      return true;
    }
    if (kind == BlockKind::kUsbDisk && usbNode < 0 && ChecksumCorrect(node)) {
      usbNode = static_cast<int>(node);
      std::memcpy(usbLink, link, sizeof usbLink);
    }
  }
  if (usbNode < 0) return false;
  Record(drive, static_cast<unsigned int>(usbNode), usbLink);
  return true;
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
  bool ata = false;
  if (disk::ScanNodes(drive, &ata)) return 1;
  STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Hard Drive Not Found\n\r", __func__);
  return 0;
}

int HardDriveProbeNodePosition(HardDriveNodeInfo* drive) {
  if (drive == nullptr) return 0;
  std::memset(drive, 0, sizeof *drive);
  drive->deviceNode = HARD_DRIVE_NODE_COUNT;
  drive->scsiBus = HARD_DRIVE_BUS_UNKNOWN;
  int found = 0;
  for (unsigned int look = 0; look < disk::kSataLooks; ++look) {
    if (look != 0) Sys().sleep(disk::kSataWaitSeconds);
    // Without the list every node is looked at.
    HardDriveProbeSataPosition(drive);
    bool ata = false;
    found = disk::ScanNodes(drive, &ata) ? 1 : 0;
    if (ata || !disk::SataDriverPending()) break;
  }
  if (found == 0)
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Hard Drive Not Found\n\r", "HardDriveScanDeviceNode");
  return found;
}

}  // extern "C"
