// NOR flash by physical address: reads and writes split at the first sector
// boundary, sector and range erases.
#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include "flash/flash_internal.h"
#include "os/seam.h"

using stbplat::os::ScopedFd;
using stbplat::os::Sys;
using namespace stbplat::flash;

namespace {

// One device transfer: (path, offset, byte index into the caller's buffer,
// length).
template <typename Transfer>
bool SplitAtSector(unsigned long sectorSize, const char* path, unsigned long offset,
                   unsigned long length, Transfer transfer) {
  // A sector size of 0 cannot come from the defaults or MEMGETINFO; treat
  // it as a single unsplit transfer rather than divide by it.
  if (sectorSize == 0 || offset % sectorSize == 0) return transfer(path, offset, 0, length);
  unsigned long head = sectorSize - offset % sectorSize;
  if (length <= head) return transfer(path, offset, 0, length);
  if (!transfer(path, offset, 0, head)) return false;
  return transfer(path, offset + head, head, length - head);
}

// The address's partition, or the fixed whole-chip mapping when no
// partition holds it (the caller has warned).
const char* NorPathOrFixed(FlashInterface& self, unsigned long address, unsigned long* offset,
                           bool* found) {
  const char* path = self.LookupMTDPartition(address, offset);
  *found = path != nullptr;
  if (path != nullptr) return path;
  *offset = address - kFixedNorBase;
  return kFixedNorDevice;
}

// Issues MEMERASE over [offset, offset + length); the region's fields are
// 32-bit, so both values are truncated. A refused erase is only logged.
bool EraseRegion(const char* path, unsigned long offset, unsigned long length, bool oneSector) {
  const char* function = oneSector ? "EraseNORSector" : "NORErase";
  ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, function,
              oneSector ? "EraseSector: open of mtd partition %s failed\r\n"
                        : "Erase: open of mtd partition %s failed\r\n",
              path);
    return false;
  }
  erase_info_user region{static_cast<__u32>(offset), static_cast<__u32>(length)};
  if (Sys().ioctl(fd.get(), MEMERASE, &region) != 0)
    FLASH_LOG(eLogLevelError, function,
              oneSector ? "EraseSector: Flash erase error in %s \r\n"
                        : "Erase: Flash erase error in %s \r\n",
              path);
  return true;
}

}  // namespace

bool FlashInterface::WriteToNORFlashAtAddr(unsigned long address, const unsigned char* buffer,
                                           unsigned long length) {
  if (buffer == nullptr) {
    FLASH_LOG(eLogLevelError, "WriteToNORFlashAtAddr", "pBuffer is NULL\r\n");
    return false;
  }
  unsigned long offset = 0;
  bool found = false;
  const char* path = NorPathOrFixed(*this, address, &offset, &found);
  if (!found)
    FLASH_LOG(eLogLevelWarning, "WriteToNORFlashAtAddr",
              "WriteToNORFlashAtAddr: mtd name for address 0x%08llX not found, using /dev/mtd0\r\n",
              static_cast<unsigned long long>(address));
  return SplitAtSector(norSectorSize, path, offset, length,
                       [this, buffer](const char* p, unsigned long o, unsigned long at,
                                      unsigned long n) {
                         return LinuxFlashWrite(p, o, buffer + at, n);
                       });
}

bool FlashInterface::ReadFromNORFlashAtAddr(unsigned long address, unsigned char* buffer,
                                            unsigned long length) {
  unsigned long offset = 0;
  bool found = false;
  const char* path = NorPathOrFixed(*this, address, &offset, &found);
  if (!found)
    FLASH_LOG(eLogLevelWarning, "ReadFromNORFlashAtAddr",
              "ReadFromNORFlashAtAddr: mtd name for address 0x%08llX not found, using /dev/mtd0\r\n",
              static_cast<unsigned long long>(address));
  return SplitAtSector(norSectorSize, path, offset, length,
                       [this, buffer](const char* p, unsigned long o, unsigned long at,
                                      unsigned long n) {
                         return LinuxFlashRead(p, o, buffer == nullptr ? nullptr : buffer + at, n);
                       });
}

bool FlashInterface::EraseNORSector(unsigned long address) {
  unsigned long offset = 0;
  const char* path = LookupMTDPartition(address, &offset);
  if (path == nullptr) {
    FLASH_LOG(eLogLevelError, "EraseNORSector",
              "EraseSector: LookupMTDPartition for address 0x%08llX failed\r\n",
              static_cast<unsigned long long>(address));
    return false;
  }
  return EraseRegion(path, offset, norSectorSize, true);
}

bool FlashInterface::NORErase(unsigned long address, unsigned long numBytes) {
  unsigned long offset = 0;
  const char* path = LookupMTDPartition(address, &offset);
  if (path == nullptr) {
    FLASH_LOG(eLogLevelError, "NORErase", "Erase: LookupMTDPartition for address 0x%08llX failed\r\n",
              static_cast<unsigned long long>(address));
    return false;
  }
  unsigned long sectors = norSectorSize == 0 ? 0 : numBytes / norSectorSize;
  if (sectors == 0) {
    FLASH_LOG(eLogLevelError, "NORErase", "Can't erase less than one flash sector, numBytes = %llu\r\n",
              static_cast<unsigned long long>(numBytes));
    return false;
  }
  if (numBytes % norSectorSize != 0) ++sectors;
  return EraseRegion(path, offset, sectors * norSectorSize, false);
}
