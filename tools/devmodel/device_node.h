// One emulated device node and the rules the kernel applies to it, as the
// system tests saw them on nandsim and mtdram:
// - NOR: any offset and length; programming only clears bits (the caller
//   erases first); erase sets 0xFF; no bad blocks (MEMSETBADBLOCK is refused
//   with EOPNOTSUPP, MEMGETBADBLOCK answers 0). The kernel's mtdram overwrites
//   instead and reports MTD_RAM with a write size of 1; real NOR clears bits,
//   as here.
// - RAM (an MTD over a block device, as block2mtd makes): writes replace
//   bytes; MEMGETINFO says MTD_RAM.
// - NAND: writes start on a page and are whole pages (EINVAL otherwise);
//   programming a written page clears bits (AND), and when the page was not
//   erased and the new data differs (all 0xFF excepted, which programs
//   nothing) its stored ECC no longer matches: the page fails ECC until its
//   block is erased, as on nandsim; a block marked bad still
//   takes writes (only erases look at the bad-block table); MEMSETBADBLOCK
//   erases the block before it marks it; a weak page fails the write with
//   EIO after the pages before it and the weak page itself were programmed.
//   Partitions of one chip share its bad-block table.
// - A chip that is full from an offset on takes the bytes of a write before
//   that offset (a short write) and fails a write starting at or past it
//   with ENOSPC, as a device at its end does; erases go on.
// - A power cut after N writes (write calls and MEMERASE reaching the chip,
//   through any of its partitions): those N land, every later one fails
//   with EIO without changing anything (and the simulator fails every
//   other call too, see FlashSim::CutPowerAfter).
// - Erase: a region of 0 bytes inside the device succeeds and does nothing;
//   otherwise block-aligned (EINVAL); blocks are erased in order, and a bad
//   one stops the erase with EIO after the good blocks before it.
// - A page with an ECC failure reads back scrambled (every byte differs), the
//   read itself succeeds, and ECCGETSTATS' failed counter grows by one per
//   256-byte ECC step of the page on every read touching it. Partitions of
//   one chip share its failing pages; an erase clears them.
// - A store that cannot be written (a device root's image the user may not
//   write) is a write-protected chip: opens go on as before (the library
//   opens nodes for writing just to ask MEMGETINFO), and writes, erases and
//   bad-block marks fail with EROFS, the MTD layer's answer for a partition
//   without MTD_WRITEABLE.
// - ECCGETSTATS' bad-block count starts at the bad blocks the node holds and
//   grows with every successful MEMSETBADBLOCK, a block marked twice counting
//   twice.
// - Writes past the end are cut at the end; a write starting at the end
//   fails with ENOSPC. A read at the end returns 0 bytes.
// - OOB reads (MEMREADOOB, MEMREADOOB64) are NAND's (EOPNOTSUPP elsewhere),
//   at most 4096 bytes a request, from an offset in a page's OOB area on
//   through the following pages. A dump with OOB bytes gives its own; any
//   other store shows erased OOB bytes, with the bad-block marker cleared in
//   the first page of a bad block, where marking a block bad writes it.
// eMMC block nodes and plain files take writes as they come; files grow.
#ifndef STBPLAT_DEVMODEL_DEVICE_NODE_H
#define STBPLAT_DEVMODEL_DEVICE_NODE_H

#include <mtd/mtd-user.h>

#include <cstdint>
#include <memory>
#include <set>
#include <utility>
#include <vector>

#include "sim_storage.h"

namespace stbplat {
namespace devmodel {

enum class SimKind { kNor, kNand, kRam, kEmmc, kFile };

struct DeviceNode {
  SimKind kind = SimKind::kFile;
  uint32_t eraseSize = 0;
  uint32_t writeSize = 1;
  uint32_t oobSize = 0;
  std::unique_ptr<SimStorage> storage;
  // A partition keeps its chip (and so the chip's bytes) alive.
  std::shared_ptr<DeviceNode> chip;
  // Block start offsets in the chip; the partitions of a chip share it.
  std::shared_ptr<std::set<uint64_t>> badBlocks = std::make_shared<std::set<uint64_t>>();
  uint64_t chipOffset = 0;
  bool readOnly = false;
  // Chip offsets of the pages that fail ECC, shared like badBlocks.
  std::shared_ptr<std::set<uint64_t>> eccFailures = std::make_shared<std::set<uint64_t>>();
  // Faults of the chip, shared by its partitions; offsets in the chip.
  struct ChipFaults {
    std::set<uint64_t> weakPages;  // any offset in the page
    uint64_t fullFrom = UINT64_MAX;
    uint64_t powerCut = UINT64_MAX;  // writes that land before the cut
    uint64_t writes = 0;             // writes that reached the chip
    bool PowerGone() const { return writes >= powerCut; }
  };
  std::shared_ptr<ChipFaults> faults = std::make_shared<ChipFaults>();
  uint32_t eccFailed = 0;
  uint32_t badBlockCount = 0;
  uint32_t garbageReads = 0;
  // Writes (write and MEMERASE) that reached the node, as (offset, length),
  // while recordHistory is set.
  bool recordHistory = true;
  std::vector<std::pair<uint64_t, uint64_t>> writes;
  std::vector<std::pair<uint64_t, uint64_t>> erases;

  bool IsMtd() const { return kind == SimKind::kNor || kind == SimKind::kNand || kind == SimKind::kRam; }
  uint64_t Size() const { return storage->Size(); }
  bool IsBadBlock(uint64_t offset) const;
  // Records a bad block (without the erase MEMSETBADBLOCK does); counts it
  // when it is new or countAgain is set.
  void AddBad(uint64_t offset, bool countAgain);
  // Takes the bad blocks inside the node's range from the table its store
  // or chip holds, and counts them.
  void LoadBadBlocks();
  // Every read touching the page that holds offset fails ECC until the
  // page's block is erased.
  void AddEccFailure(uint64_t offset) { eccFailures->insert(chipOffset + PageOf(offset)); }

  // Transfers: 0 or an errno value, *done = bytes moved.
  int Read(uint64_t offset, void* buffer, size_t count, size_t* done);
  int Write(uint64_t offset, const void* data, size_t count, size_t* done);
  // The MTD requests: 0 or an errno value.
  int Erase(uint64_t start, uint64_t length);
  int GetBadBlock(uint64_t offset, bool* bad) const;
  // OOB bytes from `offset` (a page's start plus an offset in its OOB area).
  int ReadOob(uint64_t offset, void* buffer, size_t length);
  int SetBadBlock(uint64_t offset);
  mtd_info_user Info() const;
  mtd_ecc_stats Stats() const;

 private:
  uint64_t BlockOf(uint64_t offset) const { return eraseSize == 0 ? offset : offset - offset % eraseSize; }
  uint64_t PageOf(uint64_t offset) const { return offset - offset % writeSize; }
  void ScrambleFailedPages(uint64_t offset, size_t n, uint8_t* bytes);
  int Program(uint64_t offset, const uint8_t* data, size_t count);
  // Notes a NAND page programmed again with other data over cells that were
  // not erased.
  void CheckReprogram(uint64_t page, const uint8_t* cells, const uint8_t* data);
  int EraseBlock(uint64_t block);
  // A write or erase reaching the chip: counted, or EIO after a power cut.
  int Reach();
};

}  // namespace devmodel
}  // namespace stbplat

#endif
