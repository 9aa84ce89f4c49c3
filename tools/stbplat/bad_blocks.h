// Where NAND bad blocks put a partition's bytes. The flash layer counts
// offsets over good blocks only (a bad block is passed over, not read); the
// kernel's nodes and mtd-utils count every block. Bad blocks are given as
// sorted offsets in the partition.
#ifndef STBPLAT_TOOL_BAD_BLOCKS_H
#define STBPLAT_TOOL_BAD_BLOCKS_H

#include <string>
#include <vector>

namespace stbtool {

// Where the flash layer puts an offset counted over good blocks.
unsigned long PhysicalOffset(const std::vector<unsigned long>& bad, unsigned long eraseSize, unsigned long logical);

// The offset over good blocks of a physical one. A physical offset at the
// start of a bad block moves to the next good block; false for one inside a
// bad block.
bool LogicalOffset(const std::vector<unsigned long>& bad, unsigned long eraseSize, unsigned long physical,
                   unsigned long* logical);

// The bad blocks that a transfer of `length` bytes from a good-block offset
// passes over: every one before its last byte, since each moved its bytes.
std::vector<unsigned long> PassedBadBlocks(const std::vector<unsigned long>& bad, unsigned long eraseSize,
                                           unsigned long logical, unsigned long length);

// "2 (at 0x40000), 5 (at 0xA0000)": blocks by number and offset.
std::string BlockList(const std::vector<unsigned long>& offsets, unsigned long eraseSize);

// "bad block 2 (at 0x40000)", "bad blocks 2 (at 0x40000), 5 (at 0xA0000)".
std::string BadBlockText(const std::vector<unsigned long>& offsets, unsigned long eraseSize);

}  // namespace stbtool

#endif
