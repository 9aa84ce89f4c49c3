// flash erase --mtd: whole erase blocks of one MTD partition by offset and
// length (the whole partition by default, so a whole-chip partition erases
// the chip), bad blocks skipped and named, every erased block read back.
#ifndef STBPLAT_TOOL_MTD_ERASE_H
#define STBPLAT_TOOL_MTD_ERASE_H

#include <string>

#include "device_table.h"

namespace stbtool {

struct RangeEraseArgs {
  std::string label;          // the target as the user gave it
  unsigned long offset = 0;   // physical, on a block
  unsigned long length = 0;   // whole blocks
  bool hasLength = false;     // else to the end of the partition
  bool yes = false;
};

void RunMtdErase(const MtdPartition& partition, const RangeEraseArgs& args);

}  // namespace stbtool

#endif
