#include "emmc_slot.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "log_sink.h"
#include "output.h"
#include "stbplat/flash_interface.h"
#include "stbplat/memory_map.h"
#include "tool.h"

namespace stbtool {
namespace {

// What an erased eMMC slot holds, as erased flash does.
constexpr unsigned char kErasedByte = 0xFF;
// Fills go a megabyte at a time: the pattern buffer stays small and
// progress can be shown.
constexpr unsigned long kFillPiece = 1024 * 1024;

}  // namespace

bool FindEmmcSlotNode(const Location& location, EmmcSlotNode* node) {
  FlashInterface* flash = FlashInterface::Instance();
  Location slot = location;
  unsigned long base = 0;
  const char* path = flash->LookupMTDPartition(&slot, &base);
  if (path == nullptr) return false;
  const char* number = path + std::strcspn(path, "0123456789");
  const int index = std::atoi(number);
  if (*number == '\0' || index < 0 || index >= FlashInterface::kMaxMtdDevices) return false;
  node->name = location.GetNameString();
  node->path = path;
  node->size = flash->mtdSizes[index] > base ? flash->mtdSizes[index] - base : 0;
  unsigned long slotSize = 0, slotOffset = 0;
  if (ExtendedMemoryMapStructure::Instance()->GetSlotSizeAndOffset(&slot, &slotSize, &slotOffset))
    node->size = std::min(node->size, slotSize);
  return true;
}

unsigned long EmmcWriteUnit() {
  const unsigned long page = FlashInterface::Instance()->nandPageSize;
  return page != 0 ? page : 1;
}

unsigned long EmmcWriteRoom(unsigned long size, unsigned long offset) {
  if (offset >= size) return 0;
  const unsigned long left = size - offset;
  return left - left % EmmcWriteUnit();
}

bool WriteEmmcSlot(const EmmcSlotNode& node, unsigned long offset, const unsigned char* data, unsigned long n,
                   const std::function<std::string()>& report) {
  EndlessRetryStop stop(report);
  return FlashInterface::Instance()->EMMCWrite(data, n, node.name.c_str(), offset);
}

bool FillEmmcSlot(const EmmcSlotNode& node, const std::string& command, const std::string& label) {
  const std::vector<unsigned char> pattern(std::min(kFillPiece, node.size), kErasedByte);
  Progress progress(label, node.size);
  for (unsigned long done = 0; done < node.size;) {
    const unsigned long n = std::min(kFillPiece, node.size - done);
    const bool written = WriteEmmcSlot(node, done, pattern.data(), n, [&]() {
      return command + ": " + node.name + ": filling with " + Hex(kErasedByte, 2) + " kept failing at " +
             Hex(done) + " (" + node.path + "); the bytes before are erased, the " + Hex(n) +
             " bytes from there may be partly erased, the rest is as it was";
    });
    if (!written) return false;
    done += n;
    progress.Update(done);
  }
  return true;
}

}  // namespace stbtool
