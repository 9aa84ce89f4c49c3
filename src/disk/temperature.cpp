// The disk's temperature from smartctl's attribute table, read with the
// columns each vendor fills.
#include <cstdio>

#include "disk/disk_common.h"

namespace stbplat {
namespace disk {
namespace {

// Columns of smartctl's attribute line, as awk numbers them:
//   194 Temperature_Celsius 0x0022 036 053 000 Old_age Always - 36 (Min/Max 18/53)
//   $1  $2                  $3     $4  $5  $6  $7      $8     $9 $10 $11     $12
constexpr unsigned char kColumnValue = 4;
constexpr unsigned char kColumnWorst = 5;
constexpr unsigned char kColumnRaw = 10;
constexpr unsigned char kColumnMinMax = 12;  // "18/53)"
constexpr unsigned char kColumnLimit = 13;

enum Vendor : unsigned int { kSeagate = 0, kWesternDigital = 1, kHitachi = 2, kToshiba = 3 };

int ScanReading(FILE* pipe, unsigned char column, unsigned int* reading) {
  if (column == kColumnMinMax) {
    unsigned int low = 0;
    if (std::fscanf(pipe, "%2u/%2u)", &low, reading) != 2) return 0;
    return 1;
  }
  return std::fscanf(pipe, "%3u", reading) == 1 ? 1 : 0;
}

// The current temperature is the raw value and the highest one is read from
// a second column: Seagate's worst normalised value, or the maximum of the
// "(Min/Max a/b)" that Hitachi and Toshiba put in the raw value.
int ReadRawAndHighest(const HardDriveNodeInfo* drive, unsigned char highestColumn,
                      unsigned int* pair) {
  pair[0] = pair[1] = 0;
  unsigned char highest = 0;
  unsigned char raw = 0;
  if (HardDriveGetTemperatureData(drive, highestColumn, &highest) != 1) return 0;
  if (HardDriveGetTemperatureData(drive, kColumnRaw, &raw) != 1) return 0;
  pair[0] = raw;
  pair[1] = highest;
  return 1;
}

// Western Digital: the highest temperature is the current one plus the
// distance between the normalised value and its worst.
int ReadWesternDigital(const HardDriveNodeInfo* drive, unsigned int* pair) {
  pair[0] = pair[1] = 0;
  unsigned char value = 0;
  unsigned char worst = 0;
  unsigned char raw = 0;
  if (HardDriveGetTemperatureData(drive, kColumnValue, &value) != 1) return 0;
  if (HardDriveGetTemperatureData(drive, kColumnWorst, &worst) != 1) return 0;
  if (HardDriveGetTemperatureData(drive, kColumnRaw, &raw) != 1) return 0;
  pair[0] = raw;
  pair[1] = static_cast<unsigned int>(static_cast<int>(raw) + (static_cast<int>(value) -
                                                               static_cast<int>(worst)));
  return 1;
}

}  // namespace
}  // namespace disk
}  // namespace stbplat

using stbplat::os::Sys;
namespace disk = stbplat::disk;

extern "C" {

int HardDriveGetTemperatureData(const HardDriveNodeInfo* drive, unsigned char column,
                                unsigned char* value) {
  if (drive == nullptr) return 0;
  const unsigned int node = drive->deviceNode;
  if (node >= HARD_DRIVE_NODE_COUNT) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Input Wrong Device Node Number (%d)\n\r",
                       __func__, static_cast<int>(node));
    return 0;
  }
  if (column >= disk::kColumnLimit) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Input Wrong Offset (%d)\n\r", __func__,
                       static_cast<int>(column));
    return 0;
  }
  if (value == nullptr) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] pData : Null Pointer Assignment\n\r", __func__);
    return 0;
  }
  const char* device = disk::kDeviceNodes[node];
  char command[disk::kCommandSize];
  std::snprintf(command, sizeof command,
                "smartctl -d ata -A %s | grep -i Temperature_Celsius | awk '{print $%d}' ",
                device, static_cast<int>(column));
  FILE* pipe = Sys().popen(command, "r");
  if (pipe == nullptr) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Open The Pipe-Smartctl Node[%s]\n\r",
                       __func__, device);
    return 0;
  }
  unsigned int reading = 0;
  if (disk::ScanReading(pipe, column, &reading) != 1) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Scan Data Failed\n\r", __func__);
    if (Sys().pclose(pipe) == -1)
      STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Close The Pipe-Smartctl Node[%s]\n\r",
                         __func__, device);
    return 0;
  }
  // Readings are kept in 8 bits.
  *value = static_cast<unsigned char>(reading);
  if (Sys().pclose(pipe) == -1) {
    STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s] Failed To Close The Pipe-Smartctl Node[%s]\n\r",
                       __func__, device);
    return 0;
  }
  return 1;
}

bool HardDriveGetTemperature(const HardDriveNodeInfo* drive, unsigned int* pair) {
  if (drive == nullptr || pair == nullptr) return false;
  unsigned int vendor = HARD_DRIVE_VENDOR_NONE;
  if (HardDriveGetVendorType(drive, &vendor) < 1) return false;
  switch (vendor) {
    case disk::kSeagate:
      return disk::ReadRawAndHighest(drive, disk::kColumnWorst, pair) == 1;
    case disk::kWesternDigital:
      return disk::ReadWesternDigital(drive, pair) == 1;
    case disk::kHitachi:
    case disk::kToshiba:
      return disk::ReadRawAndHighest(drive, disk::kColumnMinMax, pair) == 1;
    default:
      STBPLAT_DISK_TRACE("\n\r[ErrorMsg] [%s]: Unknow Hard Drive Vendor\n\r", __func__);
      return false;
  }
}

bool GetHdTemperature(int* temperature) {
  if (temperature == nullptr) return false;
  HardDriveNodeInfo drive;
  if (HardDriveProbeNodePosition(&drive) != 1) {
    STBPLAT_DISK_TRACE("ERROR... HDProbeNodePosition function failed\n");
    return false;
  }
  unsigned int pair[2] = {0, 0};
  if (!HardDriveGetTemperature(&drive, pair)) {
    STBPLAT_DISK_TRACE("Drive Temperature was no available\n");
    *temperature = 0;
    return false;
  }
  STBPLAT_DISK_TRACE("Current Temp = %d  :  High Temp = %d\n", static_cast<int>(pair[0]),
                     static_cast<int>(pair[1]));
  *temperature = static_cast<int>(pair[0]);
  return true;
}

}  // extern "C"
