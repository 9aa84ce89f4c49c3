#include "bad_blocks.h"

#include <algorithm>

#include "output.h"

namespace stbtool {

unsigned long PhysicalOffset(const std::vector<unsigned long>& bad, unsigned long eraseSize, unsigned long logical) {
  // As the flash layer walks: every bad block at or before the moving
  // target pushes it one block on.
  unsigned long physical = logical;
  for (unsigned long block : bad) {
    if (block > physical - physical % eraseSize) break;
    physical += eraseSize;
  }
  return physical;
}

bool LogicalOffset(const std::vector<unsigned long>& bad, unsigned long eraseSize, unsigned long physical,
                   unsigned long* logical) {
  const unsigned long start = physical - physical % eraseSize;
  const bool inBad = std::binary_search(bad.begin(), bad.end(), start);
  if (inBad && physical != start) return false;
  const auto before = static_cast<unsigned long>(std::lower_bound(bad.begin(), bad.end(), start) - bad.begin());
  *logical = physical - before * eraseSize;
  return true;
}

std::vector<unsigned long> PassedBadBlocks(const std::vector<unsigned long>& bad, unsigned long eraseSize,
                                           unsigned long logical, unsigned long length) {
  if (length == 0 || eraseSize == 0) return {};
  const unsigned long last = PhysicalOffset(bad, eraseSize, logical + length - 1);
  return {bad.begin(), std::lower_bound(bad.begin(), bad.end(), last)};
}

std::string BlockList(const std::vector<unsigned long>& offsets, unsigned long eraseSize) {
  std::string text;
  for (size_t i = 0; i < offsets.size(); ++i)
    text += (i == 0 ? "" : ", ") + std::to_string(offsets[i] / eraseSize) + " (at " + Hex(offsets[i]) + ")";
  return text;
}

std::string BadBlockText(const std::vector<unsigned long>& offsets, unsigned long eraseSize) {
  return (offsets.size() == 1 ? "bad block " : "bad blocks ") + BlockList(offsets, eraseSize);
}

}  // namespace stbtool
