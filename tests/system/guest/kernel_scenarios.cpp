// What the kernel's MTD layer does at the edges the flash code relies on,
// measured on nandsim and mtdram with no library code involved. The checks
// pin the behaviour the library's fault handling and the in-process flash
// simulator expect; the INFO lines record each outcome for comparison.
#include <cerrno>
#include <cstring>

#include "harness.h"

constexpr unsigned long kDataSize = 32 * kBlock;  // DATA.A, block 4 bad at load
const std::string kPageDone = std::to_string(kPage);

static std::string Err(int err) { return "-1 " + std::string(std::strerror(err)); }

// Runs a system call, reports its outcome ("<result>" or "-1 <errno text>")
// as an INFO line and checks it.
static void Expect(const std::string& what, const std::string& expected, const std::function<long()>& call) {
  errno = 0;
  long rc = call();
  std::string outcome = rc < 0 ? Err(errno) : std::to_string(rc);
  Info("kernel: " + what + " -> " + outcome);
  Check(outcome == expected, __FILE_NAME__, __LINE__, what + ": " + outcome + ", not " + expected);
}

SCENARIO("kernel.nand_semantics") {
  // The chip's type and geometry are checked with mtdinfo (smoke.mtd_table).
  MtdDevice dev("/dev/mtd12", true);
  Bytes full = Pattern(kPage, 1), page(kPage), two(2 * kPage), some(10), bits(kPage, 0x3C);

  // Bad-block queries answer for any offset inside the block. An unaligned
  // erase region is refused with EINVAL.
  CHECK_EQ(dev.IsBad(4 * kBlock + 100), 1);
  Expect("NAND MEMGETBADBLOCK at the device size", Err(EINVAL), [&] { return dev.IsBad(kDataSize); });
  Expect("NAND unaligned erase", Err(EINVAL), [&] { return dev.Erase(100, kBlock); });

  // Writes must cover whole pages from a page start; others are refused,
  // with nothing written. A second program of a page only clears bits.
  Expect("NAND write of 10 bytes at a page start", Err(EINVAL), [&] { return dev.Write(0, some); });
  Expect("NAND write at a page offset of 100", Err(EINVAL), [&] { return dev.Write(kPage + 100, full); });
  CHECK_EQ(dev.ReadAll(0, 2 * kPage), Erased(2 * kPage));
  CHECK_EQ(dev.Write(0, full), static_cast<long>(kPage));
  CHECK_EQ(dev.Write(2 * kPage, Bytes(kPage, 0xF0)), static_cast<long>(kPage));
  Expect("NAND second program of a page", kPageDone, [&] { return dev.Write(2 * kPage, bits); });
  CHECK_EQ(dev.ReadAll(2 * kPage, kPage), Bytes(kPage, 0xF0 & 0x3C));

  // Reads are not limited to pages, and a bad block reads like any other.
  CHECK_EQ(dev.ReadAll(50, 10), Slice(full, 50, 10));
  Expect("NAND read of a bad block", kPageDone, [&] { return dev.Read(4 * kBlock, page); });

  // Writes and reads running over the end are cut there; at the end, a
  // write fails with ENOSPC and a read gives 0 bytes.
  Expect("NAND 2-page write at the last page", kPageDone, [&] { return dev.Write(kDataSize - kPage, two); });
  Expect("NAND write at the device size", Err(ENOSPC), [&] { return dev.Write(kDataSize, page); });
  Expect("NAND 2-page read at the last page", kPageDone, [&] { return dev.Read(kDataSize - kPage, two); });
  Expect("NAND read at the device size", "0", [&] { return dev.Read(kDataSize, two); });
  Expect("NAND lseek past the end", Err(EINVAL), [&] { return ::lseek(dev.fd, kDataSize + kPage, SEEK_SET); });

  // Erase regions: partial blocks, empty, and across a bad block, refused
  // with EIO (the errno EraseNANDSlot tests) after erasing the good blocks
  // before it.
  Expect("NAND erase of a block and one byte", Err(EINVAL), [&] { return dev.Erase(0, kBlock + 1); });
  Expect("NAND erase of 0 bytes", "0", [&] { return dev.Erase(0, 0); });
  CHECK_EQ(dev.Write(3 * kBlock, full), static_cast<long>(kPage));
  Expect("NAND erase of blocks 3-4 (4 bad)", Err(EIO), [&] { return dev.Erase(3 * kBlock, 2 * kBlock); });
  CHECK_EQ(dev.ReadAll(3 * kBlock, kPage), Erased(kPage));

  // Marking a block bad sticks (and may be repeated); its erase then fails
  // with EIO. The MTD layer does not look at the bad-block table on writes:
  // writes into bad blocks land.
  CHECK_EQ(dev.MarkBad(6 * kBlock), 0);
  Expect("NAND erase of a block marked bad", Err(EIO), [&] { return dev.Erase(6 * kBlock, kBlock); });
  Expect("NAND marking a bad block again", "0", [&] { return dev.MarkBad(6 * kBlock); });
  Expect("NAND write into a marked-bad block", kPageDone, [&] { return dev.Write(6 * kBlock + kPage, full); });
  CHECK_EQ(dev.ReadAll(6 * kBlock + kPage, kPage), full);
  Expect("NAND write into a factory-bad block", kPageDone, [&] { return dev.Write(4 * kBlock, full); });

  // ECC statistics count the factory-bad block and every successful mark,
  // the repeated one included.
  mtd_ecc_stats stats{};
  CHECK(dev.Blocks() == std::vector<unsigned long>({4, 6}));
  CHECK(dev.EccStats(stats));
  CHECK_EQ(stats.failed, 0u);
  CHECK_EQ(stats.badblocks, 3u);
}

SCENARIO("kernel.nor_semantics") {
  // mtdram: type MTD_RAM, bytes written one at a time and overwritten (real
  // NOR would AND them). Its size and sectors are in /proc/mtd
  // (smoke.mtd_table); its partitions are windows on it (the flash.nor*
  // scenarios read the library's writes there).
  MtdDevice chip("/dev/mtd8");
  CHECK_EQ(static_cast<int>(chip.info.type), MTD_RAM);
  CHECK_EQ(chip.info.writesize, 1u);
  CHECK_EQ(chip.Erase(0, kNorChip), 0);
  CHECK_EQ(chip.Write(16, Bytes(4, 0xF0)), 4L);
  CHECK_EQ(chip.Write(16, Bytes(4, 0x0F)), 4L);
  CHECK_EQ(chip.ReadAll(16, 4), Bytes(4, 0x0F));

  Expect("NOR unaligned erase", Err(EINVAL), [&] { return chip.Erase(16, kNorSector); });
  Expect("NOR erase past the end", Err(EINVAL), [&] { return chip.Erase(kNorChip - kNorPart, kNorChip); });
  // No bad blocks, none to mark; ECC statistics (all zero) are answered.
  mtd_ecc_stats stats{};
  Expect("NOR MEMGETBADBLOCK", "0", [&] { return chip.IsBad(0); });
  Expect("NOR MEMSETBADBLOCK", Err(EOPNOTSUPP), [&] { return chip.MarkBad(0); });
  Expect("NOR ECCGETSTATS", "0", [&] { return chip.EccStats(stats) ? 0 : -1; });
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
  Expect("NAND write over a weak page", Err(EIO), [&] { return dev.Write(2 * kBlock, data); });
  CHECK_EQ(dev.ReadAll(2 * kBlock, 8 * kPage), Slice(data, 0, 6 * kPage) + Erased(2 * kPage));

  // The weak block: every erase fails with EIO, and that does not mark it.
  Expect("NAND erase of a weak block", Err(EIO), [&] { return dev.Erase(6 * kBlock, kBlock); });
  CHECK_EQ(dev.IsBad(6 * kBlock), 0);

  // The grave page: the read itself succeeds, the failed-ECC counter grows
  // by 8 (2 KiB in 256-byte steps). Its neighbour reads clean.
  CHECK_EQ(dev.Write(8 * kBlock + 10 * kPage, Slice(data, 0, kPage)), static_cast<long>(kPage));
  mtd_ecc_stats before{}, after{};
  Bytes got(kPage);
  CHECK(dev.EccStats(before));
  Expect("NAND read of a grave page", kPageDone, [&] { return dev.Read(8 * kBlock + 10 * kPage, got); });
  CHECK(dev.EccStats(after));
  CHECK_EQ(after.failed - before.failed, 8u);
  CHECK_EQ(dev.Read(8 * kBlock + 11 * kPage, got), static_cast<long>(kPage));
  CHECK(dev.EccStats(before));
  CHECK_EQ(before.failed, after.failed);
}
