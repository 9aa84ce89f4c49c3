// What the kernel's MTD layer does at the edges the flash code relies on,
// measured on nandsim and mtdram with no library code involved. The checks
// pin the behaviour the library's fault handling and the in-process flash
// simulator expect; the INFO lines record each outcome for comparison.
#include <cerrno>
#include <cstring>
#include <string>

#include "harness.h"

using namespace systest;

namespace {

constexpr unsigned long kDataSize = 32 * kBlock;  // DATA.A, block 4 bad at load
const std::string kPageDone = std::to_string(kPage);

std::string Err(int err) { return "-1 " + std::string(std::strerror(err)); }

// A system call's result as "<value>" or "-1 <errno text>"; with a
// description, also reported as an INFO line.
std::string Outcome(const std::function<long()>& call, const std::string& what = "") {
  errno = 0;
  long rc = call();
  std::string outcome = rc < 0 ? Err(errno) : std::to_string(rc);
  if (!what.empty()) Info("kernel: " + what + " -> " + outcome);
  return outcome;
}

}  // namespace

SCENARIO("kernel.nand_semantics") {
  MtdDevice dev("/dev/mtd12");
  CHECK_EQ(static_cast<int>(dev.info.type), MTD_NANDFLASH);
  CHECK_EQ(dev.info.size, kDataSize);
  CHECK_EQ(dev.info.erasesize, kBlock);
  CHECK_EQ(dev.info.writesize, kPage);
  REQUIRE(FlashErase("/dev/mtd12"));
  Bytes full = Pattern(kPage, 1), page(kPage), some(10);

  // Bad-block queries answer for any offset inside the block. Erasing a bad
  // block is refused with EIO (the errno EraseNANDSlot tests), an unaligned
  // region with EINVAL.
  CHECK_EQ(dev.IsBad(0), 0);
  CHECK_EQ(dev.IsBad(4 * kBlock), 1);
  CHECK_EQ(dev.IsBad(4 * kBlock + 100), 1);
  CHECK_EQ(Outcome([&] { return dev.IsBad(kDataSize); }), Err(EINVAL));
  CHECK_EQ(Outcome([&] { return dev.Erase(4 * kBlock, kBlock); }), Err(EIO));
  CHECK_EQ(Outcome([&] { return dev.Erase(100, kBlock); }), Err(EINVAL));

  // Writes must cover whole pages from a page start; others are refused,
  // with nothing written. A second program of a page only clears bits.
  CHECK_EQ(Outcome([&] { return dev.Write(0, some); }, "NAND write of 10 bytes at a page start"), Err(EINVAL));
  CHECK_EQ(Outcome([&] { return dev.Write(kPage + 100, full); }, "NAND write at a page offset of 100"),
           Err(EINVAL));
  CHECK_EQ(dev.ReadAll(0, 2 * kPage), Erased(2 * kPage));
  CHECK_EQ(dev.Write(0, full), static_cast<long>(kPage));
  CHECK_EQ(dev.Write(2 * kPage, Bytes(kPage, 0xF0)), static_cast<long>(kPage));
  CHECK_EQ(Outcome([&] { return dev.Write(2 * kPage, Bytes(kPage, 0x3C)); }, "NAND second program of a page"),
           kPageDone);
  CHECK_EQ(dev.ReadAll(2 * kPage, kPage), Bytes(kPage, 0xF0 & 0x3C));

  // Reads are not limited to pages, and a bad block reads like any other.
  CHECK_EQ(dev.Read(50, some), 10L);
  CHECK_EQ(some, Slice(full, 50, 10));
  CHECK_EQ(Outcome([&] { return dev.Read(4 * kBlock, page); }, "NAND read of a bad block"), kPageDone);

  // Writes and reads running over the end are cut there; at the end, a
  // write fails with ENOSPC and a read gives 0 bytes.
  Bytes two = Pattern(2 * kPage, 3);
  CHECK_EQ(Outcome([&] { return dev.Write(kDataSize - kPage, two); }, "NAND write of 2 pages at the last page"),
           kPageDone);
  CHECK_EQ(Outcome([&] { return dev.Write(kDataSize, page); }, "NAND write at the device size"), Err(ENOSPC));
  CHECK_EQ(Outcome([&] { return dev.Read(kDataSize - kPage, two); }, "NAND read of 2 pages at the last page"),
           kPageDone);
  CHECK_EQ(Outcome([&] { return dev.Read(kDataSize, two); }, "NAND read at the device size"), "0");
  Outcome([&] { return ::lseek64(dev.fd, kDataSize + kPage, SEEK_SET); }, "NAND lseek past the end");

  // Erase regions: partial blocks, empty, and across a bad block (the good
  // blocks before it are erased).
  CHECK_EQ(Outcome([&] { return dev.Erase(0, kBlock + 1); }, "NAND erase of a block and one byte"), Err(EINVAL));
  CHECK_EQ(Outcome([&] { return dev.Erase(0, 0); }, "NAND erase of 0 bytes"), "0");
  CHECK_EQ(dev.Write(3 * kBlock, full), static_cast<long>(kPage));
  CHECK_EQ(Outcome([&] { return dev.Erase(3 * kBlock, 2 * kBlock); }, "NAND erase of blocks 3-4 (4 bad)"),
           Err(EIO));
  CHECK_EQ(dev.ReadAll(3 * kBlock, kPage), Erased(kPage));

  // Marking a block bad sticks (and may be repeated); its erase then fails
  // with EIO. The MTD layer does not look at the bad-block table on writes:
  // writes into bad blocks land.
  CHECK_EQ(dev.MarkBad(6 * kBlock), 0);
  CHECK_EQ(dev.IsBad(6 * kBlock), 1);
  CHECK_EQ(Outcome([&] { return dev.Erase(6 * kBlock, kBlock); }), Err(EIO));
  CHECK_EQ(Outcome([&] { return dev.MarkBad(6 * kBlock); }, "NAND marking a bad block again"), "0");
  CHECK_EQ(Outcome([&] { return dev.Write(6 * kBlock + kPage, full); }, "NAND write into a block marked bad"),
           kPageDone);
  CHECK_EQ(dev.ReadAll(6 * kBlock + kPage, kPage), full);
  CHECK_EQ(Outcome([&] { return dev.Write(4 * kBlock + kPage, full); }, "NAND write into a factory-bad block"),
           kPageDone);

  std::string badList;
  for (auto b : dev.Blocks()) badList += " " + std::to_string(b);
  Info("kernel: NAND bad blocks of DATA.A now:" + badList);
  mtd_ecc_stats stats{};
  CHECK(dev.EccStats(stats));
  Info("kernel: NAND ECC stats corrected " + std::to_string(stats.corrected) + ", failed " +
       std::to_string(stats.failed) + ", badblocks " + std::to_string(stats.badblocks));
  CHECK_EQ(stats.failed, 0u);
}

SCENARIO("kernel.nor_semantics") {
  // mtdram: type MTD_RAM, bytes written one at a time and overwritten (real
  // NOR would AND them).
  MtdDevice chip("/dev/mtd8"), part("/dev/mtd1");
  CHECK_EQ(static_cast<int>(chip.info.type), MTD_RAM);
  CHECK_EQ(chip.info.size, kNorChip);
  CHECK_EQ(chip.info.erasesize, kNorSector);
  CHECK_EQ(chip.info.writesize, 1u);
  CHECK_EQ(chip.Erase(0, kNorChip), 0);
  CHECK_EQ(chip.ReadAll(0, kPage), Erased(kPage));
  CHECK_EQ(chip.Write(16, Bytes(4, 0xF0)), 4L);
  CHECK_EQ(chip.Write(16, Bytes(4, 0x0F)), 4L);
  CHECK_EQ(chip.ReadAll(16, 4), Bytes(4, 0x0F));

  CHECK_EQ(Outcome([&] { return chip.Erase(16, kNorSector); }, "NOR unaligned erase"), Err(EINVAL));
  CHECK_EQ(Outcome([&] { return chip.Erase(kNorChip - kNorSector, 2 * kNorSector); }, "NOR erase past the end"),
           Err(EINVAL));
  Outcome([&] { return chip.IsBad(0); }, "NOR MEMGETBADBLOCK");
  Outcome([&] { return chip.MarkBad(0); }, "NOR MEMSETBADBLOCK");
  mtd_ecc_stats stats{};
  Outcome([&] { return chip.EccStats(stats) ? 0 : -1; }, "NOR ECCGETSTATS");

  // A partition is a window on the chip.
  auto data = Pattern(300, 4);
  CHECK_EQ(part.info.size, kNorPart);
  CHECK_EQ(part.Write(0x100, data), 300L);
  CHECK_EQ(chip.ReadAll(kNorPart + 0x100, 300), data);
}

// Needs nandsim loaded with the fault set of the "faults" phase (see
// scenarios.sh): DATA.A block 2 page 5 fails every write, block 6 fails
// every erase, block 8 page 10 returns garbage on every read.
SCENARIO("kernel.nand_faults") {
  MtdDevice dev("/dev/mtd12");
  CHECK_EQ(dev.Erase(2 * kBlock, kBlock), 0);
  CHECK_EQ(dev.Erase(8 * kBlock, kBlock), 0);

  // The weak page: the write fails with EIO after programming the pages up
  // to and including it; the later ones stay erased.
  auto data = Pattern(8 * kPage, 5);
  CHECK_EQ(Outcome([&] { return dev.Write(2 * kBlock, data); }, "NAND write over a weak page"), Err(EIO));
  CHECK_EQ(dev.ReadAll(2 * kBlock, 8 * kPage), Slice(data, 0, 6 * kPage) + Erased(2 * kPage));

  // The weak block: every erase fails with EIO, and that does not mark it.
  CHECK_EQ(Outcome([&] { return dev.Erase(6 * kBlock, kBlock); }), Err(EIO));
  CHECK_EQ(dev.IsBad(6 * kBlock), 0);

  // The grave page: the read itself succeeds, the failed-ECC counter grows.
  // Its neighbour reads clean.
  CHECK_EQ(dev.Write(8 * kBlock + 10 * kPage, Slice(data, 0, kPage)), static_cast<long>(kPage));
  mtd_ecc_stats before{}, after{};
  auto readPage = [&](unsigned long page) {
    Bytes got(kPage);
    CHECK(dev.EccStats(before));
    std::string outcome = Outcome([&] { return dev.Read(8 * kBlock + page * kPage, got); });
    CHECK(dev.EccStats(after));
    return outcome;
  };
  CHECK_EQ(readPage(10), kPageDone);
  Info("kernel: NAND read of a grave page: ECC failed " + std::to_string(before.failed) + " -> " +
       std::to_string(after.failed) + ", corrected " + std::to_string(before.corrected) + " -> " +
       std::to_string(after.corrected));
  CHECK(after.failed > before.failed);
  CHECK_EQ(readPage(11), kPageDone);
  CHECK_EQ(after.failed, before.failed);
}
