// eMMC: reads of the whole device, and writes cut into chunks that never
// cross an emmcChunkSize boundary and are rounded up to whole pages.
#include <algorithm>
#include <cstring>
#include <memory>
#include <new>
#include <vector>

#include "flash/flash_internal.h"
#include "stbplat/location.h"
#include "stbplat/memory_map.h"

using namespace stbplat::flash;

namespace {

enum class ChunkWriter { kFlashWrite, kEmmcWrite };

unsigned long NextChunk(const FlashInterface& self, unsigned long position, unsigned long left) {
  unsigned long chunk = self.emmcChunkSize;
  if (chunk != 0 && position % chunk != 0) chunk -= position % chunk;
  if (chunk > left || chunk == 0) chunk = left;
  if (self.nandPageSize != 0 && chunk % self.nandPageSize != 0)
    chunk += self.nandPageSize - chunk % self.nandPageSize;
  return chunk;
}

// Writes length bytes at position in chunks. The source holds sourceSize
// readable bytes from where it stands; a chunk rounded up past them is
// completed with what the device already holds there. A failing chunk is
// tried again until it succeeds.
void ChunkedWrite(FlashInterface& self, const char* path, unsigned long position,
                  const unsigned char* source, unsigned long length, bool advanceSource,
                  unsigned long sourceSize, ChunkWriter writer) {
  std::vector<unsigned char> padded;
  while (length != 0) {
    unsigned long chunk = NextChunk(self, position, length);
    unsigned long available = advanceSource ? length : sourceSize;
    const unsigned char* from = source;
    if (chunk > available) {
      padded.assign(chunk, 0);
      if (!self.LinuxEMMCRead(path, position, padded.data(), chunk))
        std::fill(padded.begin(), padded.end(), 0);
      std::memcpy(padded.data(), source, available);
      from = padded.data();
    }
    bool written = writer == ChunkWriter::kFlashWrite
                       ? self.LinuxFlashWrite(path, position, from, chunk)
                       : self.LinuxEMMCWrite(path, position, from, chunk);
    if (!written) continue;
    position += chunk;
    if (advanceSource) source += chunk;
    length = chunk > length ? 0 : length - chunk;
  }
}

}  // namespace

bool FlashInterface::EMMCRead(unsigned char* buffer, unsigned long length, const char*,
                              unsigned long offset) {
  // The partition name is not used: offsets count from the start of the
  // whole device.
  return LinuxEMMCRead(kWholeEmmcDevice, offset, buffer, length);
}

bool FlashInterface::EMMCRead(unsigned char* buffer, unsigned long length,
                              const Location* location, unsigned long offset) {
  return EMMCRead(buffer, length, NameOf(location).c_str(), offset);
}

bool FlashInterface::EMMCWrite(const unsigned char* buffer, unsigned long length,
                               const char* name, unsigned long offset) {
  if (buffer == nullptr || length == 0) {
    FLASH_LOG(eLogLevelError, "EMMCWrite", "FlashInterface::EMMCWrite: invalid parameters\r\n");
    return false;
  }
  unsigned long partitionOffset = 0;
  const char* path = LookupMTDPartition(name, &partitionOffset);
  if (path == nullptr) {
    FLASH_LOG(eLogLevelError, "EMMCWrite", "EMMCWrite: LookupMTDPartition for %s failed\r\n", name);
    return false;
  }
  ChunkedWrite(*this, path, offset + partitionOffset, buffer, length, true, length,
               ChunkWriter::kFlashWrite);
  return true;
}

bool FlashInterface::EMMCWrite(const unsigned char* buffer, unsigned long length,
                               const Location* location, unsigned long offset) {
  return EMMCWrite(buffer, length, NameOf(location).c_str(), offset);
}

bool FlashInterface::EMMCErase(const Location* location, unsigned long offset,
                               unsigned long length, unsigned char fill) {
  unsigned long partitionOffset = 0;
  const char* path = LookupMTDPartition(location, &partitionOffset);
  if (path == nullptr) {
    FLASH_LOG(eLogLevelError, "EMMCErase", "EMMCErase: LookupMTDPartition for %s failed\r\n",
              NameOf(location).c_str());
    return false;
  }
  offset += partitionOffset;
  unsigned long slotSize = 0;
  unsigned long slotOffset = 0;
  if (!ExtendedMemoryMapStructure::Instance()->GetSlotSizeAndOffset(location, &slotSize,
                                                                    &slotOffset)) {
    FLASH_LOG(eLogLevelError, "EMMCErase", "EMMCErase: GetSlotSizeAndOffset %s failed\r\n",
              NameOf(location).c_str());
    return false;
  }
  std::unique_ptr<unsigned char[]> pattern(new (std::nothrow) unsigned char[emmcChunkSize]);
  if (pattern == nullptr) {
    FLASH_LOG(eLogLevelError, "EMMCErase", "EMMCErase Gen 0xFF pattern failed\r\n");
    return false;
  }
  std::memset(pattern.get(), fill, emmcChunkSize);
  unsigned long position = slotOffset + offset;
  FLASH_LOG(eLogLevelTrace, "EMMCErase", "EMMCErase: [%s] StartAddress=0x%llX len=0x%llX\r\n", path,
            static_cast<unsigned long long>(position), static_cast<unsigned long long>(length));
  ChunkedWrite(*this, path, position, pattern.get(), length, false, emmcChunkSize,
               ChunkWriter::kEmmcWrite);
  return true;
}
