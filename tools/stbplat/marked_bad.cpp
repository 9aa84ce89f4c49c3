#include "marked_bad.h"

#include <algorithm>

#include "device_table.h"
#include "output.h"
#include "stbplat/flash_interface.h"

namespace stbtool {
namespace {

const MtdPartition* Find(const DeviceTable& table, const std::string& name) {
  for (const MtdPartition& p : table.partitions)
    if (p.name == name) return &p;
  return nullptr;
}

}  // namespace

MarkedBadWatch::MarkedBadWatch(const std::string& partition) : partition_(partition) {
  if (partition_.empty()) return;
  countBefore_ = FlashInterface::Instance()->blocksMarkedBad;
  const DeviceTable table = LoadDeviceTable(true);
  if (const MtdPartition* p = Find(table, partition_)) badBefore_ = p->badBlocks;
}

std::vector<unsigned long> MarkedBadWatch::Marked() const {
  // The library counts its marks: without one, no scan is needed.
  if (partition_.empty() || FlashInterface::Instance()->blocksMarkedBad == countBefore_) return {};
  const DeviceTable table = LoadDeviceTable(true);
  const MtdPartition* p = Find(table, partition_);
  std::vector<unsigned long> marked;
  if (p == nullptr) return marked;
  for (unsigned long block : p->badBlocks)
    if (std::find(badBefore_.begin(), badBefore_.end(), block) == badBefore_.end()) marked.push_back(block);
  return marked;
}

std::string MarkedBadWatch::Note(bool written) const {
  const std::vector<unsigned long> marked = Marked();
  if (marked.empty()) return "";
  std::string at;
  for (unsigned long block : marked) at += (at.empty() ? "+" : ", +") + Hex(block);
  const DeviceTable table = LoadDeviceTable(true);
  const MtdPartition* p = Find(table, partition_);
  const unsigned long blocks = p != nullptr && p->eraseSize != 0 ? p->size / p->eraseSize : 0;
  const unsigned long good = p != nullptr && blocks >= p->badBlocks.size() ? blocks - p->badBlocks.size() : 0;
  const std::string which = marked.size() == 1 ? "the block at " : "the blocks at ";
  if (good == 0)
    return "; writes failed in " + which + at + ", which the library marked bad; " + partition_ +
           " has no good block left, so nothing in it can be read";
  return "; writes failed in " + which + at + ", which the library marked bad" +
         (written ? " (the data went on in the next good blocks)" : "") + "; " + partition_ + " now has " +
         std::to_string(good) + " good block" + (good == 1 ? "" : "s") + " (" + std::to_string(good * p->eraseSize) +
         " bytes)";
}

}  // namespace stbtool
