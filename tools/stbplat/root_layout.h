// A new device root from a geometry: the chips (NOR, NAND with its page and
// OOB sizes, eMMC) and the slots laid out on them in the order given, as
// the files of docs/device-root.md. Every slot gets a /proc/mtd row of its
// own (a window of its chip's image), so that the flash layer can write it,
// eMMC slots included.
#ifndef STBPLAT_TOOL_ROOT_LAYOUT_H
#define STBPLAT_TOOL_ROOT_LAYOUT_H

#include <map>
#include <string>
#include <vector>

namespace stbtool {

struct ChipGeometry {
  bool given = false;
  unsigned long size = 0;
  unsigned long eraseSize = 0;  // NOR sector, NAND block
  unsigned long pageSize = 0;   // NAND only
  unsigned long oobSize = 0;    // NAND only
  unsigned long base = 0;       // NOR only: its physical address
};

struct SlotGeometry {
  std::string device, partition, slot;  // NOR0, NAND0 or EMMC0; upper case
  unsigned long size = 0;
};

struct RootGeometry {
  ChipGeometry nor, nand, emmc;
  std::vector<SlotGeometry> slots;
};

// The root's files by path under the root (proc/mtd, memory-map.ini,
// dev/...), images included. Throws UsageError for a geometry the device
// could not have, before anything is written.
std::map<std::string, std::string> LayOutRoot(const RootGeometry& geometry);

}  // namespace stbtool

#endif
