#include "device_table.h"

#include <algorithm>
#include <cstring>
#include <map>

#include "log_sink.h"
#include "stbplat/flash_interface.h"

namespace stbtool {
namespace {

constexpr int kMaxMtd = 30;
constexpr size_t kNameWidth = 100;
constexpr size_t kDeviceNameWidth = 8;

Medium MediumOfName(const std::string& name) {
  if (name.compare(0, 4, "NAND") == 0) return Medium::kNand;
  if (name.compare(0, 3, "NOR") == 0) return Medium::kNor;
  return Medium::kOther;
}

// Bad blocks of a NAND partition, from where the library's bad-block
// skipping puts good blocks: logical block k lands on the k-th good one, so
// the blocks between two consecutive landing places are bad. Each lookup
// walks the partition from its start; bisecting between landing places
// keeps the lookups to a few per bad block.
class BadBlockScan {
 public:
  BadBlockScan(FlashInterface* flash, const MtdPartition& p)
      : flash_(flash), path_(p.path), block_(p.eraseSize), blocks_(p.size / p.eraseSize) {}

  std::vector<unsigned long> Run() {
    std::vector<unsigned long> bad;
    // Running off the good blocks is how the search ends; its message is
    // no news.
    QuietLog quiet(eLogModuleFlashAccess);
    unsigned long first = 0;
    if (!Physical(0, &first)) {
      for (unsigned long b = 0; b < blocks_; ++b) bad.push_back(b * block_);
      return bad;
    }
    for (unsigned long b = 0; b < first; ++b) bad.push_back(b * block_);
    // The last logical block that still lands: bisect on success.
    unsigned long lo = 0, hi = blocks_;  // lands at lo, not at hi
    while (hi - lo > 1) {
      unsigned long mid = lo + (hi - lo) / 2;
      unsigned long ignored = 0;
      if (Physical(mid, &ignored)) lo = mid; else hi = mid;
    }
    unsigned long last = 0;
    Physical(lo, &last);
    Between(0, first, lo, last, &bad);
    for (unsigned long b = last + 1; b < blocks_; ++b) bad.push_back(b * block_);
    std::sort(bad.begin(), bad.end());
    return bad;
  }

 private:
  // Physical block of logical block k.
  bool Physical(unsigned long k, unsigned long* block) {
    unsigned long physical = 0;
    if (!flash_->ValidBlockOffset(path_.c_str(), k * block_, physical)) return false;
    *block = physical / block_;
    return true;
  }

  // Bad blocks between logical blocks a and b landing at pa and pb.
  void Between(unsigned long a, unsigned long pa, unsigned long b, unsigned long pb,
               std::vector<unsigned long>* bad) {
    if (pb - pa == b - a) return;  // no block skipped in between
    if (b - a == 1) {
      for (unsigned long block = pa + 1; block < pb; ++block) bad->push_back(block * block_);
      return;
    }
    unsigned long mid = a + (b - a) / 2;
    unsigned long pm = 0;
    if (!Physical(mid, &pm)) return;
    Between(a, pa, mid, pm, bad);
    Between(mid, pm, b, pb, bad);
  }

  FlashInterface* flash_;
  std::string path_;
  unsigned long block_;
  unsigned long blocks_;
};

std::vector<unsigned long> ScanBadBlocks(FlashInterface* flash, const MtdPartition& p) {
  if (p.eraseSize == 0 || p.size < p.eraseSize) return {};
  return BadBlockScan(flash, p).Run();
}

}  // namespace

const char* MediumName(Medium medium) {
  switch (medium) {
    case Medium::kNor: return "NOR";
    case Medium::kNand: return "NAND";
    case Medium::kOther: break;
  }
  return "other";
}

DeviceTable LoadDeviceTable(bool scanBadBlocks) {
  DeviceTable table;
  FlashInterface* flash = FlashInterface::Instance();
  if (flash == nullptr) return table;
  for (int n = 0; n < kMaxMtd; ++n) {
    std::string name(flash->mtdNames[n], strnlen(flash->mtdNames[n], kNameWidth));
    if (name.empty()) continue;
    MtdPartition p;
    p.number = n;
    p.name = name;
    p.path = "/dev/mtd" + std::to_string(n);
    p.size = flash->mtdSizes[n];
    p.medium = MediumOfName(name);
    if (p.medium == Medium::kNor) p.eraseSize = flash->norSectorSize;
    if (p.medium == Medium::kNand) {
      p.eraseSize = flash->nandSectorSize;
      p.pageSize = flash->nandPageSize;
    }
    // "NOR0...." and "NAND0..." (the device name alone) span the chip.
    size_t dot = name.find('.');
    p.chip = name.substr(0, dot);
    std::string rest = dot == std::string::npos ? "" : name.substr(dot + 1);
    p.wholeChip = name.size() == kDeviceNameWidth && rest.find_first_not_of('.') == std::string::npos;
    if (!p.wholeChip) p.slotName = rest;
    // Without a measured block size (no NAND device in the memory map) the
    // flash layer cannot find bad blocks.
    if (scanBadBlocks && p.medium == Medium::kNand && p.eraseSize != 0) {
      p.badBlocks = ScanBadBlocks(flash, p);
      p.badBlocksKnown = true;
    }
    table.partitions.push_back(p);
  }

  // Chips in the order they first appear; their slot partitions follow each
  // other in the table in address order, as the kernel lists them.
  for (size_t i = 0; i < table.partitions.size(); ++i) {
    const MtdPartition& p = table.partitions[i];
    auto chip = std::find_if(table.chips.begin(), table.chips.end(),
                             [&](const Chip& c) { return c.name == p.chip; });
    if (chip == table.chips.end()) {
      table.chips.push_back(Chip());
      chip = table.chips.end() - 1;
      chip->name = p.chip;
      chip->medium = p.medium;
      chip->eraseSize = p.eraseSize;
      chip->pageSize = p.pageSize;
    }
    if (p.wholeChip) {
      chip->whole = static_cast<int>(i);
      chip->size = p.size;
    } else {
      unsigned long offset =
          chip->slots.empty() ? 0 : chip->slots.back().first + table.partitions[chip->slots.back().second].size;
      chip->slots.push_back({offset, i});
    }
  }
  for (Chip& chip : table.chips) {
    unsigned long end =
        chip.slots.empty() ? 0 : chip.slots.back().first + table.partitions[chip.slots.back().second].size;
    if (chip.size < end) chip.size = end;
    if (chip.whole >= 0) {
      chip.badBlocks = table.partitions[static_cast<size_t>(chip.whole)].badBlocks;
    } else {
      for (const auto& slot : chip.slots)
        for (unsigned long bad : table.partitions[slot.second].badBlocks) chip.badBlocks.push_back(slot.first + bad);
    }
  }
  return table;
}

}  // namespace stbtool
