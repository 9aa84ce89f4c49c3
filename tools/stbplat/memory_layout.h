// The device's storage as the platform memory map describes it (devices,
// partitions, slots, with offsets), joined with what FlashInterface knows of
// each slot's MTD partition and the NAND chips' bad blocks. map draws it.
#ifndef STBPLAT_TOOL_MEMORY_LAYOUT_H
#define STBPLAT_TOOL_MEMORY_LAYOUT_H

#include <string>
#include <vector>

#include "device_table.h"

namespace stbtool {

struct LayoutSlot {
  std::string name;        // A
  unsigned long offset;    // in the device
  unsigned long size;
  std::string node;        // /dev/mtd1, /dev/mmca, a file
};

struct LayoutPartition {
  std::string name;        // FSBLINFO
  unsigned long offset;    // in the device
  unsigned long size;
  std::vector<LayoutSlot> slots;
};

struct LayoutDevice {
  std::string name;        // NOR0
  std::string technology;  // SPI_NOR.
  Medium medium = Medium::kOther;
  unsigned long base = 0;
  unsigned long size = 0;
  unsigned long eraseSize = 0;
  unsigned long pageSize = 0;
  std::string wholeNode;   // MTD partition spanning the chip, if any
  std::vector<LayoutPartition> partitions;
  std::vector<unsigned long> badBlocks;  // offsets in the device
};

// From the memory map when one is loaded, else from the MTD table alone
// (slots in the kernel's order, one partition each).
std::vector<LayoutDevice> LoadLayout(const DeviceTable& table, bool* fromMemoryMap);

}  // namespace stbtool

#endif
