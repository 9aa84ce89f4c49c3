// The device's flash as the library's FlashInterface sees it: the MTD
// partitions it read from /proc/mtd, grouped by chip, with erase and page
// sizes and bad blocks. mtd list and map draw from it.
#ifndef STBPLAT_TOOL_DEVICE_TABLE_H
#define STBPLAT_TOOL_DEVICE_TABLE_H

#include <string>
#include <vector>

namespace stbtool {

enum class Medium { kNor, kNand, kOther };

struct MtdPartition {
  int number = 0;
  std::string name;        // as FlashInterface holds it: NOR0.BOOT.A, NAND0...
  std::string path;        // /dev/mtdN
  unsigned long size = 0;
  Medium medium = Medium::kOther;
  unsigned long eraseSize = 0;
  unsigned long pageSize = 0;
  bool wholeChip = false;  // the partition that spans its chip
  std::string chip;        // NOR0, NAND0, ...
  std::string slotName;    // PARTITION.SLOT; empty for a whole chip
  std::vector<unsigned long> badBlocks;  // offsets within the partition
  bool badBlocksKnown = false;
};

struct Chip {
  std::string name;
  Medium medium = Medium::kOther;
  unsigned long size = 0;
  unsigned long eraseSize = 0;
  unsigned long pageSize = 0;
  int whole = -1;  // index in DeviceTable::partitions of the whole-chip partition
  // Slot partitions in address order: (offset in the chip, index in
  // DeviceTable::partitions).
  std::vector<std::pair<unsigned long, size_t>> slots;
  std::vector<unsigned long> badBlocks;  // offsets within the chip
};

struct DeviceTable {
  std::vector<MtdPartition> partitions;
  std::vector<Chip> chips;
};

// Reads the table from the library (scanning NAND partitions for bad blocks
// when scanBadBlocks is set).
DeviceTable LoadDeviceTable(bool scanBadBlocks);

const char* MediumName(Medium medium);

}  // namespace stbtool

#endif
