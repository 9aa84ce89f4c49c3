// Erasing by Location (the method follows the device's memory technology)
// and whole NAND partitions by path.
#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <cerrno>
#include <cstring>

#include "flash/flash_internal.h"
#include "os/seam.h"
#include "stbplat/location.h"
#include "stbplat/memory_map.h"

using stbplat::os::ScopedFd;
using stbplat::os::Sys;
using namespace stbplat::flash;

namespace {

enum class Technology { kNor, kNand, kEmmc, kOther };

bool Named(const unsigned char* technology, const char* name) {
  return std::memcmp(technology, name, kNameWidth) == 0;
}

Technology TechnologyOf(const MemoryDeviceEntry& device) {
  const unsigned char* t = device.technology;
  if (Named(t, "SPI_NOR.") || Named(t, "NOR.....")) return Technology::kNor;
  if (Named(t, "NAND....") || Named(t, "VNAND...")) return Technology::kNand;
  if (Named(t, "EMMC....") || Named(t, "VEMMC...") || Named(t, "GP1_EMMC") ||
      Named(t, "GP3_EMMC"))
    return Technology::kEmmc;
  return Technology::kOther;
}

// MEMERASE of one NAND block; a block the device fails with EIO is marked
// bad, any other refusal is ignored. True when the erase failed with EIO.
bool EraseNandBlock(int fd, unsigned long offset, unsigned long blockSize) {
  erase_info_user region{static_cast<__u32>(offset), static_cast<__u32>(blockSize)};
  if (Sys().ioctl(fd, MEMERASE, &region) == 0 || errno != EIO) return false;
  return true;
}

void MarkBad(int fd, unsigned long offset) {
  loff_t bad = static_cast<loff_t>(offset);
  Sys().ioctl(fd, MEMSETBADBLOCK, &bad);
}

int BlockState(int fd, unsigned long offset) {
  loff_t query = static_cast<loff_t>(offset);
  return Sys().ioctl(fd, MEMGETBADBLOCK, &query);
}

}  // namespace

bool FlashInterface::EraseSlot(const Location* location) {
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  std::string name = NameOf(location);
  if (map->IsSlotAFile(location)) {
    FLASH_LOG(eLogLevelTrace, "EraseSlot", "Erasing file slot %s\r\n", name.c_str());
    unsigned long extraOffset = 0;
    const char* file = map->GetMTDorFileName(location, &extraOffset);
    if (file == nullptr) {
      FLASH_LOG(eLogLevelError, "EraseSlot", "Unable to retrieve file name for %s\r\n",
                name.c_str());
      return false;
    }
    Sys().unlink(file);
    return true;
  }
  const MemoryDeviceEntry* device = map->GetDevice(location);
  if (device == nullptr) {
    FLASH_LOG(eLogLevelError, "EraseSlot", "Device %s not found\r\n", name.c_str());
    return false;
  }
  switch (TechnologyOf(*device)) {
    case Technology::kNor: {
      FLASH_LOG(eLogLevelTrace, "EraseSlot", "Erasing NOR slot %s\r\n", name.c_str());
      unsigned long address = 0;
      unsigned long size = 0;
      if (!map->GetPhysAddressFromLocation(location, 0, &address, &size)) {
        FLASH_LOG(eLogLevelError, "EraseSlot", "FlashInterface::EraseSlot: Location %s not found\r\n",
                  name.c_str());
        return false;
      }
      // A trailing part sector is left as it is.
      unsigned long sectors = norSectorSize == 0 ? 0 : size / norSectorSize;
      for (unsigned long i = 0; i < sectors; ++i)
        if (!EraseNORSector(address + i * norSectorSize)) return false;
      return true;
    }
    case Technology::kNand: {
      FLASH_LOG(eLogLevelTrace, "EraseSlot", "Erasing NAND slot %s\r\n", name.c_str());
      unsigned long offset = 0;
      const char* path = LookupMTDPartition(location, &offset);
      if (path == nullptr) {
        FLASH_LOG(eLogLevelError, "EraseSlot",
                  "FlashInterface::EraseSlot: unable to find mtd partition for %s\n", name.c_str());
        return false;
      }
      return EraseNANDSlot(path);
    }
    default:
      FLASH_LOG(eLogLevelError, "EraseSlot",
                "FlashInterface::EraseSlot: memory technology for %s is not NOR or NAND, unable to "
                "erase\n",
                name.c_str());
      return false;
  }
}

bool FlashInterface::EraseSector(const Location* location) {
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  std::string name = NameOf(location);
  const MemoryDeviceEntry* device = map->GetDevice(location);
  if (device == nullptr) {
    FLASH_LOG(eLogLevelError, "EraseSector", "Device %s not found\r\n", name.c_str());
    return false;
  }
  switch (TechnologyOf(*device)) {
    case Technology::kNor: {
      unsigned long address = 0;
      unsigned long size = 0;
      if (map->GetPhysAddressFromLocation(location, 0, &address, &size))
        return EraseNORSector(address);
      FLASH_LOG(eLogLevelError, "EraseSector", "FlashInterface::EraseSlot: Location %s not found\r\n",
                name.c_str());
      return false;
    }
    case Technology::kNand: {
      unsigned long offset = 0;
      const char* path = LookupMTDPartition(location, &offset);
      if (path != nullptr) return EraseNANDSector(path);
      FLASH_LOG(eLogLevelError, "EraseSector",
                "FlashInterface::EraseSlot: unable to find mtd partition for %s\n", name.c_str());
      return false;
    }
    case Technology::kEmmc:
      FLASH_LOG(eLogLevelTrace, "EraseSector",
                "FlashInterface::EraseSlot: memory technology for %s is EMMC did not erase\r\n",
                name.c_str());
      return true;
    default:
      FLASH_LOG(eLogLevelError, "EraseSector",
                "FlashInterface::EraseSlot: memory technology for %s is not NOR or NAND, unable to "
                "erase\n",
                name.c_str());
      return false;
  }
}

bool FlashInterface::EraseNANDSlot(const char* path) {
  unsigned long size = GetDevSize(path);
  ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
  if (fd.get() == -1) {
    FLASH_LOG(eLogLevelError, "EraseNANDSlot", "EraseNANDSlot: open of mtd partition %s failed\n",
              path);
    return false;
  }
  // A block size of 0 (no NAND device in the memory map) erases nothing:
  // say so rather than report an erase that did not happen.
  if (nandSectorSize == 0) {
    FLASH_LOG(eLogLevelError, "EraseNANDSlot", "EraseNANDSlot: no NAND block size, %s not erased\n", path);
    return false;
  }
  for (unsigned long offset = 0; offset < size; offset += nandSectorSize) {
    if (BlockState(fd.get(), offset) != 0) continue;
    if (!EraseNandBlock(fd.get(), offset, nandSectorSize)) continue;
    FLASH_LOG(eLogLevelError, "EraseNANDSlot", "Flash erase error @ 0x%08llX\n",
              static_cast<unsigned long long>(offset));
    FLASH_LOG(eLogLevelSizes, "EraseNANDSlot", "NANDErase: marking block at offset 0x%08llX as bad\n",
              static_cast<unsigned long long>(offset));
    MarkBad(fd.get(), offset);
  }
  return true;
}

bool FlashInterface::EraseNANDSector(const char* path) {
  ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
  if (fd.get() == -1) {
    FLASH_LOG(eLogLevelError, "EraseNANDSector",
              "EraseNANDSector: open of mtd partition %s failed\n", path);
    return false;
  }
  if (nandSectorSize == 0) {
    FLASH_LOG(eLogLevelError, "EraseNANDSector", "EraseNANDSector: no NAND block size, %s not erased\n",
              path);
    return false;
  }
  if (BlockState(fd.get(), 0) != 0) return true;
  FLASH_LOG(eLogLevelTrace, "EraseNANDSector", "Erasing block 0x%08X\n", 0U);
  if (EraseNandBlock(fd.get(), 0, nandSectorSize)) {
    FLASH_LOG(eLogLevelError, "EraseNANDSector", "Flash erase error in %s\n", path);
    FLASH_LOG(eLogLevelSizes, "EraseNANDSector", "NANDErase: marking block 0 in %s as bad\n", path);
    MarkBad(fd.get(), 0);
  }
  return true;
}
