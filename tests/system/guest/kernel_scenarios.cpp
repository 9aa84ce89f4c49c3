// What the kernel's MTD layer does at the edges the flash code relies on,
// measured on nandsim and mtdram with no library code involved. The checks
// pin the behaviour the library's fault handling expects; the INFO lines
// record the rest for comparison with the in-process flash simulator.
#include <cerrno>
#include <cstring>
#include <string>

#include "harness.h"
#include "mtd_device.h"

namespace {

constexpr std::uint64_t kBlock = 0x20000;
constexpr std::size_t kPage = 2048;
constexpr std::uint64_t kDataSize = 32 * kBlock;  // DATA.A, block 4 bad at load
constexpr std::uint64_t kNorChip = 0x400000;
constexpr std::uint64_t kNorPart = 0x80000;
// mtdram is loaded with 64 KiB sectors, unlike the NAND blocks.
constexpr std::uint64_t kNorSector = 0x10000;

std::string Outcome(long rc, int err) {
  return rc < 0 ? std::string("-1 ") + std::strerror(err) : std::to_string(rc);
}

}  // namespace

SCENARIO("kernel.nand_semantics") {
  systest::MtdDevice dev("/dev/mtd12");
  REQUIRE(dev.ok());
  CHECK_EQ(static_cast<int>(dev.info().type), MTD_NANDFLASH);
  CHECK_EQ(dev.info().size, static_cast<__u32>(kDataSize));
  CHECK_EQ(dev.info().erasesize, static_cast<__u32>(kBlock));
  CHECK_EQ(dev.info().writesize, static_cast<__u32>(kPage));
  REQUIRE(dev.EraseAllGood());

  // Bad-block queries.
  CHECK_EQ(dev.IsBad(4 * kBlock), 1);
  CHECK_EQ(dev.IsBad(0), 0);
  CHECK_EQ(dev.IsBad(4 * kBlock + 100), 1);  // any offset inside the block
  errno = 0;
  CHECK_EQ(dev.IsBad(kDataSize), -1);
  CHECK_EQ(errno, EINVAL);

  // Erasing a bad block is refused with EIO (the errno EraseNANDSlot tests).
  errno = 0;
  CHECK_EQ(dev.Erase(4 * kBlock, kBlock), -1);
  CHECK_EQ(errno, EIO);
  // An unaligned erase region is refused with EINVAL.
  errno = 0;
  CHECK_EQ(dev.Erase(100, kBlock), -1);
  CHECK_EQ(errno, EINVAL);

  // Writes must cover whole pages: a short one is refused, nothing written.
  auto small = systest::Pattern(100, 1);
  errno = 0;
  long rc = dev.Write(0, small);
  int err = errno;
  systest::Info("kernel: NAND write of 100 bytes at a page start -> " + Outcome(rc, err));
  CHECK_EQ(rc, -1L);
  CHECK_EQ(err, EINVAL);
  CHECK_BYTES(dev.ReadAll(0, kPage), systest::Erased(kPage));
  auto full = systest::Pattern(kPage, 1);
  CHECK_EQ(dev.Write(0, full), static_cast<long>(kPage));

  // A write that starts inside a page is refused.
  errno = 0;
  rc = dev.Write(kPage + 100, systest::Pattern(kPage, 2));
  err = errno;
  systest::Info("kernel: NAND write at a page offset of 100 -> " + Outcome(rc, err));
  CHECK_EQ(rc, -1L);
  CHECK_EQ(err, EINVAL);

  // Programming a page twice: the cells only go from 1 to 0.
  std::vector<unsigned char> first(kPage, 0xF0), second(kPage, 0x3C);
  CHECK_EQ(dev.Write(2 * kPage, first), static_cast<long>(kPage));
  errno = 0;
  rc = dev.Write(2 * kPage, second);
  CHECK_EQ(rc, static_cast<long>(kPage));
  auto twice = dev.ReadAll(2 * kPage, kPage);
  systest::Info("kernel: NAND second program of a page -> " + Outcome(rc, errno) +
                ", byte reads 0x" + (twice.empty() ? std::string("??") : [&] {
                  char hex[3];
                  std::snprintf(hex, sizeof hex, "%02X", twice[0]);
                  return std::string(hex);
                }()));
  CHECK_BYTES(twice, std::vector<unsigned char>(kPage, 0xF0 & 0x3C));

  // Reads are not limited to pages, and a bad block reads like any other.
  std::vector<unsigned char> some(10);
  CHECK_EQ(dev.Read(50, some), 10L);
  CHECK(std::equal(some.begin(), some.end(), full.begin() + 50));
  std::vector<unsigned char> bad(kPage);
  errno = 0;
  rc = dev.Read(4 * kBlock, bad);
  systest::Info("kernel: NAND read of a bad block -> " + Outcome(rc, errno));

  // Writes at the end of the device are cut short, past it they fail.
  errno = 0;
  rc = dev.Write(kDataSize - kPage, systest::Pattern(2 * kPage, 3));
  systest::Info("kernel: NAND write of 2 pages at the last page -> " + Outcome(rc, errno));
  errno = 0;
  rc = dev.Write(kDataSize, systest::Pattern(kPage, 3));
  systest::Info("kernel: NAND write at the device size -> " + Outcome(rc, errno));
  CHECK_EQ(rc, -1L);
  errno = 0;
  rc = dev.Seek(kDataSize + kPage);
  systest::Info("kernel: NAND lseek past the end -> " + Outcome(rc, errno));

  // Erase regions: partial blocks, empty, and across a bad block.
  errno = 0;
  rc = dev.Erase(0, kBlock + 1);
  systest::Info("kernel: NAND erase of a block and one byte -> " + Outcome(rc, errno));
  CHECK_EQ(rc, -1L);
  errno = 0;
  rc = dev.Erase(0, 0);
  systest::Info("kernel: NAND erase of 0 bytes -> " + Outcome(rc, errno));
  CHECK_EQ(dev.Write(3 * kBlock, systest::Pattern(kPage, 7)), static_cast<long>(kPage));
  errno = 0;
  rc = dev.Erase(3 * kBlock, 2 * kBlock);  // blocks 3 and 4 (bad)
  err = errno;
  auto block3 = dev.ReadAll(3 * kBlock, kPage);
  systest::Info("kernel: NAND erase of blocks 3-4 (4 bad) -> " + Outcome(rc, err) + ", block 3 " +
                (block3 == systest::Erased(kPage) ? "erased" : "kept"));
  CHECK_EQ(rc, -1L);
  CHECK_EQ(err, EIO);

  // Reads at and across the end.
  std::vector<unsigned char> two(2 * kPage);
  errno = 0;
  rc = dev.Read(kDataSize - kPage, two);
  systest::Info("kernel: NAND read of 2 pages at the last page -> " + Outcome(rc, errno));
  CHECK_EQ(rc, static_cast<long>(kPage));
  errno = 0;
  rc = dev.Read(kDataSize, two);
  systest::Info("kernel: NAND read at the device size -> " + Outcome(rc, errno));
  CHECK_EQ(rc, 0L);

  // Marking a block bad sticks, and its erase then fails with EIO.
  CHECK_EQ(dev.MarkBad(6 * kBlock), 0);
  CHECK_EQ(dev.IsBad(6 * kBlock), 1);
  errno = 0;
  CHECK_EQ(dev.Erase(6 * kBlock, kBlock), -1);
  CHECK_EQ(errno, EIO);
  errno = 0;
  rc = dev.MarkBad(6 * kBlock);
  systest::Info("kernel: NAND marking a bad block again -> " + Outcome(rc, errno));
  // Writing into a bad block: the MTD layer does not look at the bad-block
  // table on writes.
  errno = 0;
  rc = dev.Write(6 * kBlock + kPage, systest::Pattern(kPage, 8));
  err = errno;
  auto inBad = dev.ReadAll(6 * kBlock + kPage, kPage);
  systest::Info("kernel: NAND write into a block marked bad -> " + Outcome(rc, err) + ", reads " +
                (inBad == systest::Pattern(kPage, 8) ? "the data" : "other bytes"));
  errno = 0;
  rc = dev.Write(4 * kBlock + kPage, systest::Pattern(kPage, 9));
  systest::Info("kernel: NAND write into a factory-bad block -> " + Outcome(rc, errno));

  std::string bad_list;
  for (auto b : dev.BadBlocks()) bad_list += " " + std::to_string(b);
  systest::Info("kernel: NAND bad blocks of DATA.A now:" + bad_list);
  mtd_ecc_stats stats{};
  CHECK(dev.EccStats(stats));
  systest::Info("kernel: NAND ECC stats corrected " + std::to_string(stats.corrected) +
                ", failed " + std::to_string(stats.failed) + ", badblocks " +
                std::to_string(stats.badblocks) + ", bbtblocks " + std::to_string(stats.bbtblocks));
  CHECK_EQ(stats.failed, 0u);
}

SCENARIO("kernel.nor_semantics") {
  systest::MtdDevice chip("/dev/mtd8");
  REQUIRE(chip.ok());
  CHECK_EQ(static_cast<int>(chip.info().type), MTD_RAM);
  CHECK_EQ(chip.info().size, static_cast<__u32>(kNorChip));
  CHECK_EQ(chip.info().erasesize, static_cast<__u32>(kNorSector));
  systest::Info("kernel: NOR (mtdram) writesize " + std::to_string(chip.info().writesize));
  CHECK_EQ(chip.Erase(0, kNorChip), 0);
  CHECK_BYTES(chip.ReadAll(0, 4096), systest::Erased(4096));

  // Writing over written bytes.
  CHECK_EQ(chip.Write(16, std::vector<unsigned char>(4, 0xF0)), 4L);
  CHECK_EQ(chip.Write(16, std::vector<unsigned char>(4, 0x0F)), 4L);
  auto over = chip.ReadAll(16, 1);
  systest::Info(std::string("kernel: NOR (mtdram) write of 0x0F over 0xF0 reads ") +
                (over.empty() ? "??" : (over[0] == 0x0F ? "0x0F (overwrite)" : over[0] == 0 ? "0x00 (AND)" : "other")));

  // Unaligned and oversized erase regions.
  errno = 0;
  int rc = chip.Erase(16, kNorSector);
  systest::Info("kernel: NOR unaligned erase -> " + Outcome(rc, errno));
  CHECK_EQ(rc, -1);
  errno = 0;
  rc = chip.Erase(kNorChip - kNorSector, 2 * kNorSector);
  systest::Info("kernel: NOR erase past the end -> " + Outcome(rc, errno));
  CHECK_EQ(rc, -1);

  errno = 0;
  rc = chip.IsBad(0);
  systest::Info("kernel: NOR MEMGETBADBLOCK -> " + Outcome(rc, errno));
  errno = 0;
  rc = chip.MarkBad(0);
  systest::Info("kernel: NOR MEMSETBADBLOCK -> " + Outcome(rc, errno));
  mtd_ecc_stats stats{};
  errno = 0;
  bool ecc = chip.EccStats(stats);
  systest::Info(std::string("kernel: NOR ECCGETSTATS -> ") + (ecc ? "ok" : std::strerror(errno)));

  // A partition is a window on the chip.
  systest::MtdDevice part("/dev/mtd1");
  REQUIRE(part.ok());
  CHECK_EQ(part.info().size, static_cast<__u32>(kNorPart));
  auto data = systest::Pattern(300, 4);
  CHECK_EQ(part.Write(0x100, data), 300L);
  CHECK_BYTES(chip.ReadAll(kNorPart + 0x100, 300), data);
}

// Needs nandsim loaded with the fault set of the "faults" phase (see
// scenarios.sh): DATA.A block 2 page 5 fails every write, block 6 fails
// every erase, block 8 page 10 returns garbage on every read.
SCENARIO("kernel.nand_faults") {
  systest::MtdDevice dev("/dev/mtd12");
  REQUIRE(dev.ok());
  CHECK_EQ(dev.Erase(2 * kBlock, kBlock), 0);
  CHECK_EQ(dev.Erase(8 * kBlock, kBlock), 0);

  // The weak page: the write fails with EIO after programming the pages
  // before it, and the failing page itself still gets the data.
  auto data = systest::Pattern(8 * kPage, 5);
  errno = 0;
  long rc = dev.Write(2 * kBlock, data);
  int err = errno;
  systest::Info("kernel: NAND write over a weak page -> " + Outcome(rc, err));
  CHECK_EQ(rc, -1L);
  CHECK_EQ(err, EIO);
  auto back = dev.ReadAll(2 * kBlock, 8 * kPage);
  REQUIRE(back.size() == data.size());
  CHECK(std::equal(data.begin(), data.begin() + 5 * kPage, back.begin()));
  bool weak_programmed = std::equal(data.begin() + 5 * kPage, data.begin() + 6 * kPage,
                                    back.begin() + 5 * kPage);
  bool after_erased = back[6 * kPage] == 0xFF && back[8 * kPage - 1] == 0xFF;
  systest::Info(std::string("kernel: after it the weak page holds ") +
                (weak_programmed ? "the data" : "other bytes") + ", later pages are " +
                (after_erased ? "erased" : "written"));
  CHECK(after_erased);

  // The weak block: every erase fails with EIO.
  errno = 0;
  CHECK_EQ(dev.Erase(6 * kBlock, kBlock), -1);
  CHECK_EQ(errno, EIO);
  CHECK_EQ(dev.IsBad(6 * kBlock), 0);  // failing to erase does not mark it

  // The grave page: the read itself succeeds, the failed-ECC counter grows.
  auto page = systest::Pattern(kPage, 6);
  CHECK_EQ(dev.Write(8 * kBlock + 10 * kPage, page), static_cast<long>(kPage));
  mtd_ecc_stats before{}, after{};
  REQUIRE(dev.EccStats(before));
  std::vector<unsigned char> got(kPage);
  errno = 0;
  rc = dev.Read(8 * kBlock + 10 * kPage, got);
  err = errno;
  REQUIRE(dev.EccStats(after));
  systest::Info("kernel: NAND read of a grave page -> " + Outcome(rc, err) + ", ECC failed " +
                std::to_string(before.failed) + " -> " + std::to_string(after.failed) +
                ", corrected " + std::to_string(before.corrected) + " -> " +
                std::to_string(after.corrected));
  CHECK_EQ(rc, static_cast<long>(kPage));
  CHECK(after.failed > before.failed);
  // Its neighbour reads clean.
  REQUIRE(dev.EccStats(before));
  CHECK_EQ(dev.Read(8 * kBlock + 11 * kPage, got), static_cast<long>(kPage));
  REQUIRE(dev.EccStats(after));
  CHECK_EQ(after.failed, before.failed);
}
