// eMMC slots as the tool changes them. The library's eMMC write finds its
// node by the slot's full name and writes at the given offset inside that
// node: the node must be the slot's own (a /proc/mtd row named
// DEVICE.PARTITION.SLOT, holding the slot from its first byte), and the
// offset the one inside the slot. The library's streams would add the slot's
// place on the device to that offset once more, so the tool calls the write
// itself. The write goes in whole pages from the offset and tries a failing
// chunk again without end: the tool checks the rounded range against the
// node before the first change, and stops a call that keeps failing.
#ifndef STBPLAT_TOOL_EMMC_SLOT_H
#define STBPLAT_TOOL_EMMC_SLOT_H

#include <functional>
#include <string>

#include "stbplat/location.h"

namespace stbtool {

struct EmmcSlotNode {
  std::string name;        // the slot's full name, which is its node's
  std::string path;        // /dev/mtdN
  unsigned long size = 0;  // bytes the tool may write there: the node, never more than the slot
};

// The slot's own node, or false when /proc/mtd has no row of that name.
bool FindEmmcSlotNode(const Location& location, EmmcSlotNode* node);

// The library's unit of eMMC writes: a write of n bytes changes n rounded up
// to it.
unsigned long EmmcWriteUnit();

// The most bytes a write at offset may hold so that what it changes stays in
// a node of `size` bytes.
unsigned long EmmcWriteRoom(unsigned long size, unsigned long offset);

// Writes n bytes at offset inside the node; false when the library refused
// the call. A write that keeps failing ends the process with exit code 1 and
// report()'s message (the library does not return from it).
bool WriteEmmcSlot(const EmmcSlotNode& node, unsigned long offset, const unsigned char* data, unsigned long n,
                   const std::function<std::string()>& report);

// eMMC has no erase: fills the whole node (whole write units) with the
// erased byte, through the same write, showing progress under `label`;
// false as for WriteEmmcSlot, whose failure message names `command`.
bool FillEmmcSlot(const EmmcSlotNode& node, const std::string& command, const std::string& label);

}  // namespace stbtool

#endif
