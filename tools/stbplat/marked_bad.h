// Blocks the library marks bad while it writes NAND: a failed page write
// makes it mark the block bad, move what the block already held to the next
// good one and go on there (or give up). The tool tells which blocks went
// and what the partition holds afterwards, as the write's own report does
// not.
#ifndef STBPLAT_TOOL_MARKED_BAD_H
#define STBPLAT_TOOL_MARKED_BAD_H

#include <string>
#include <vector>

namespace stbtool {

class MarkedBadWatch {
 public:
  // Remembers the partition's bad blocks now; an empty name watches nothing.
  explicit MarkedBadWatch(const std::string& partition);

  // Offsets in the partition of the blocks marked bad since.
  std::vector<unsigned long> Marked() const;

  // "" when none was marked; else a sentence starting with "; " naming
  // them and the good blocks left, for a write that succeeded (`written`)
  // or failed.
  std::string Note(bool written) const;

 private:
  std::string partition_;
  unsigned long countBefore_ = 0;
  std::vector<unsigned long> badBefore_;
};

}  // namespace stbtool

#endif
