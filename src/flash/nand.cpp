// NAND by logical offset over good blocks: reads and writes cut at erase
// blocks, the one-page buffer for writes that end inside a page, and the
// relocation of data away from a block that fails to write.
#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <cstring>
#include <memory>
#include <new>

#include "flash/flash_internal.h"
#include "os/seam.h"
#include "stbplat/location.h"
#include "stbplat/memory_map.h"

using stbplat::os::ScopedFd;
using stbplat::os::Sys;
using namespace stbplat::flash;

namespace {

const char* ResolveNand(FlashInterface& self, const char* name, unsigned long& offset) {
  const char* path = self.LookupMTDPartition(name, &offset);
  if (path == nullptr) path = self.FindOldKernelNANDmtdNameAndAdjustOffset(name, offset);
  return path;
}

bool IsBadBlock(int fd, unsigned long offset) {
  loff_t query = static_cast<loff_t>(offset);
  return Sys().ioctl(fd, MEMGETBADBLOCK, &query) > 0;
}

void ClearPending(FlashInterface& self) {
  self.currNANDBufferOffset = 0;
  self.pendingNANDDevice = nullptr;
  self.pendingNANDOffset = 0;
}

}  // namespace

const char* FlashInterface::FindOldKernelNANDmtdNameAndAdjustOffset(const char* name,
                                                                    unsigned long& offset) {
  int row = -1;
  for (int n = 0; n < mtdCount && n < kMaxMtdDevices; ++n) {
    if (std::strncmp(mtdNames[n], "NAND", 4) == 0) {
      row = n;
      break;
    }
  }
  if (row < 0 || name == nullptr) return nullptr;
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  Location location;
  unsigned long slotAddress = 0;
  if (!map->GetLocation(name, &location)) return nullptr;
  // The device's base address is the one its memory-map record holds (one
  // chip per device name, so index 0).
  const MemoryDeviceEntry* device = map->GetDevice(&location);
  if (device == nullptr || !map->GetPhysAddressFromLocation(&location, 0, &slotAddress, nullptr))
    return nullptr;
  offset += slotAddress - device->physBase;
  return mtdDeviceNames[row];
}

bool FlashInterface::NANDRead(unsigned char* buffer, unsigned long length, const char* name,
                              unsigned long offset) {
  const char* path = ResolveNand(*this, name, offset);
  if (path == nullptr) {
    FLASH_LOG(eLogLevelError, "NANDRead", "NANDRead: LookupMTDPartition for %s failed\r\n", name);
    return false;
  }
  while (length != 0) {
    unsigned long physical = 0;
    if (!ValidBlockOffset(path, offset, physical)) {
      FLASH_LOG(eLogLevelError, "NANDRead",
                "NANDRead: Error finding valid block for offset (0x%08llX) in %s device.\r\n",
                static_cast<unsigned long long>(offset), path);
      break;
    }
    unsigned long chunk = nandSectorSize - physical % nandSectorSize;
    if (chunk > length) chunk = length;
    if (!LinuxFlashRead(path, physical, buffer, chunk)) {
      FLASH_LOG(eLogLevelSizes, "NANDRead",
                "NANDRead: LinuxFlashRead failed in %s at offset 0x%08llX, attempting recovery\r\n",
                path, static_cast<unsigned long long>(physical));
      break;
    }
    offset += chunk;
    buffer += chunk;
    length -= chunk;
  }
  return length == 0;
}

bool FlashInterface::NANDRead(unsigned char* buffer, unsigned long length,
                              const Location* location, unsigned long offset) {
  return NANDRead(buffer, length, NameOf(location).c_str(), offset);
}

bool FlashInterface::NANDWrite(const unsigned char* buffer, unsigned long length,
                               const char* name, unsigned long offset) {
  if (buffer == nullptr || length == 0) {
    FLASH_LOG(eLogLevelError, "NANDWrite", "FlashInterface::NANDWrite: invalid parameters\r\n");
    return false;
  }
  const char* path = ResolveNand(*this, name, offset);
  if (path == nullptr) {
    FLASH_LOG(eLogLevelError, "NANDWrite", "NANDWrite: LookupMTDPartition for %s failed\r\n", name);
    return false;
  }
  // The buffered partial page belongs to its own device: a write to another
  // one writes it out first.
  if (currNANDBufferOffset != 0 &&
      (pendingNANDDevice == nullptr || std::strcmp(pendingNANDDevice, path) != 0))
    NANDFlushWrite();
  int failures = 0;
  blocksMarkedBad = 0;
  while (length != 0) {
    unsigned long physical = 0;
    bool fromBuffer = false;
    // Without a page buffer or page size no partial page can be handled.
    if (nandPageBuffer == nullptr || nandPageSize == 0 ||
        !ValidBlockOffset(path, offset, physical)) {
      FLASH_LOG(eLogLevelError, "NANDWrite",
                "NANDWrite: Error finding valid block for offset (0x%08llX) in %s device.\r\n",
                static_cast<unsigned long long>(offset), path);
      break;
    }
    unsigned long chunk = nandSectorSize - physical % nandSectorSize;
    if (chunk > length) chunk = length;
    if (physical % nandPageSize != 0) {
      if (currNANDBufferOffset == 0) {
        FLASH_LOG(eLogLevelError, "NANDWrite",
                  "NANDWrite: writing in the middle of a block and currNANDBufferOffset == 0\r\n");
        return false;
      }
      // Only the bytes that follow the buffered ones on their page continue it.
      if (physical % nandPageSize != currNANDBufferOffset ||
          offset != pendingNANDOffset + currNANDBufferOffset) {
        FLASH_LOG(eLogLevelError, "NANDWrite",
                  "NANDWrite: writing in the middle of a block and write start doesn't align with "
                  "currNANDBufferOffset\r\n");
        return false;
      }
      if (currNANDBufferOffset + chunk < nandPageSize) {
        std::memcpy(nandPageBuffer + currNANDBufferOffset, buffer, chunk);
        currNANDBufferOffset += chunk;
        return true;
      }
      physical -= currNANDBufferOffset;
      chunk = nandPageSize;
      std::memcpy(nandPageBuffer + currNANDBufferOffset, buffer, nandPageSize - currNANDBufferOffset);
      fromBuffer = true;
    } else if (chunk % nandPageSize != 0) {
      if (chunk < nandPageSize) {
        if (currNANDBufferOffset != 0) {
          FLASH_LOG(eLogLevelError, "NANDWrite",
                    "NANDWrite: not writing a full block and currNANDBufferOffset != 0\r\n");
          return false;
        }
        std::memcpy(nandPageBuffer, buffer, chunk);
        currNANDBufferOffset = chunk;
        pendingNANDDevice = path;
        pendingNANDOffset = offset;
        return true;
      }
      chunk -= chunk % nandPageSize;
    }
    // Whole pages elsewhere come from the caller: the buffered page is
    // written out first, at its own place.
    if (!fromBuffer && currNANDBufferOffset != 0) NANDFlushWrite();
    // Only the completed page itself ever comes from the buffer.
    const unsigned char* source = fromBuffer ? nandPageBuffer : buffer;
    if (!LinuxFlashWrite(path, physical, source, chunk)) {
      if (++failures > kMaxNandWriteFailures) {
        FLASH_LOG(eLogLevelError, "NANDWrite", "NANDWrite: too many bad blocks, aborting\r\n");
        break;
      }
      FLASH_LOG(eLogLevelSizes, "NANDWrite",
                "NANDWrite: found a bad block in %s at offset 0x%08llX, attempting recovery\r\n",
                path, static_cast<unsigned long long>(physical));
      if (!HandleBadNANDBlock(path, physical)) break;
      continue;
    }
    unsigned long taken = fromBuffer ? chunk - currNANDBufferOffset : chunk;
    offset += taken;
    buffer += taken;
    failures = 0;
    length = taken > length ? 0 : length - taken;
    if (fromBuffer) ClearPending(*this);
  }
  return length == 0;
}

bool FlashInterface::NANDWrite(const unsigned char* buffer, unsigned long length,
                               const Location* location, unsigned long offset) {
  return NANDWrite(buffer, length, NameOf(location).c_str(), offset);
}

void FlashInterface::NANDFlushWrite() {
  if (currNANDBufferOffset == 0) return;
  int failures = 0;
  for (;;) {
    unsigned long physical = 0;
    if (!ValidBlockOffset(pendingNANDDevice, pendingNANDOffset, physical)) {
      FLASH_LOG(eLogLevelError, "NANDFlushWrite",
                "NANDFlushWrite: Error finding valid block for offset (0x%08llX) in %s device.\r\n",
                static_cast<unsigned long long>(pendingNANDOffset), pendingNANDDevice);
      break;
    }
    if (LinuxFlashWrite(pendingNANDDevice, physical, nandPageBuffer, nandPageSize)) break;
    if (++failures > kMaxNandWriteFailures) {
      FLASH_LOG(eLogLevelError, "NANDFlushWrite", "NANDFlushWrite: too many bad blocks, aborting\r\n");
      break;
    }
    FLASH_LOG(eLogLevelSizes, "NANDFlushWrite",
              "NANDFlushWrite: found a bad block in %s at offset 0x%08llX, attempting recovery\r\n",
              pendingNANDDevice, static_cast<unsigned long long>(physical));
    if (!HandleBadNANDBlock(pendingNANDDevice, physical)) break;
  }
  ClearPending(*this);
}

bool FlashInterface::HandleBadNANDBlock(const char* path, unsigned long failedOffset) {
  unsigned long size = GetDevSize(path);
  if (size == 0 || nandSectorSize == 0) return false;
  unsigned long blockStart = BlockStart(failedOffset, nandSectorSize);
  if (failedOffset != blockStart) {
    unsigned long count = failedOffset - blockStart;
    FLASH_LOG(eLogLevelSizes, "HandleBadNANDBlock",
              "HandleBadNANDBlock: moving block data (%lld bytes) to next block\r\n",
              static_cast<long long>(count));
    std::unique_ptr<unsigned char[]> saved(new (std::nothrow) unsigned char[count]);
    if (saved == nullptr) {
      FLASH_LOG(eLogLevelAllocation, "HandleBadNANDBlock", "Memory allocation failure\r\n");
      return false;
    }
    if (!LinuxFlashRead(path, blockStart, saved.get(), count)) {
      FLASH_LOG(eLogLevelError, "HandleBadNANDBlock",
                "HandleBadNANDBlock: unable to read bad block at offset 0x%08llX, size = "
                "0x%08llX\r\n",
                static_cast<unsigned long long>(blockStart), static_cast<unsigned long long>(count));
      return false;
    }
    unsigned long dest = blockStart + nandSectorSize;
    {
      ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
      if (!fd.valid()) {
        FLASH_LOG(eLogLevelDisplay, "HandleBadNANDBlock",
                  "NANDWrite: Unable to open the flash device: %s\r\n", path);
        return false;
      }
      for (;;) {
        if (dest >= size) {
          FLASH_LOG(eLogLevelError, "HandleBadNANDBlock",
                    "FlashInterface::NANDWrite: unable to find a good block\r\n");
          return false;
        }
        if (!IsBadBlock(fd.get(), dest)) break;
        FLASH_LOG(eLogLevelTrace, "HandleBadNANDBlock",
                  "HandleBadNANDBlock: Skipping a bad block at offset 0x%08llX\r\n",
                  static_cast<unsigned long long>(dest));
        dest += nandSectorSize;
      }
    }
    if (!LinuxFlashWrite(path, dest, saved.get(), count)) {
      FLASH_LOG(eLogLevelError, "HandleBadNANDBlock",
                "HandleBadNANDBlock: unable to store bad block data in next block at offset "
                "0x%08llX, dataSize = 0x%08llX\r\n",
                static_cast<unsigned long long>(dest), static_cast<unsigned long long>(count));
      return false;
    }
  }
  ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, "HandleBadNANDBlock", "Unable to open the flash device: %s\r\n", path);
    return false;
  }
  FLASH_LOG(eLogLevelSizes, "HandleBadNANDBlock",
            "HandleBadNANDBlock: marking block at offset 0x%08X as bad\r\n",
            static_cast<unsigned int>(blockStart));
  loff_t bad = static_cast<loff_t>(blockStart);
  Sys().ioctl(fd.get(), MEMSETBADBLOCK, &bad);
  fd.Reset();
  ++blocksMarkedBad;
  return true;
}
