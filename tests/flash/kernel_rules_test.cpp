// The flash simulator against what the kernel's MTD layer (nandsim behind
// the MTD character device) was seen to do in the system tests: the fault
// handling of the flash code is only as right as these rules.
#include <fcntl.h>
#include <sys/ioctl.h>
#include <mtd/mtd-user.h>

#include <cerrno>

#include "flash_fixture.h"
#include "os/seam.h"

namespace stbplat {
namespace test {
namespace {

using os::Sys;

constexpr uint64_t kBlocks = 8;
constexpr uint64_t kSize = kBlocks * kNandBlock;
constexpr const char* kNode = "/dev/mtd5";

class KernelRulesTest : public ::testing::Test {
 protected:
  KernelRulesTest() {
    sim_.AddMtd(5, "NAND0.SYS.RULES", SimKind::kNand, kSize, kNandBlock, kNandPage);
    fd_ = Sys().open(kNode, O_RDWR, 0);
  }
  ~KernelRulesTest() override { Sys().close(fd_); }

  long WriteAt(uint64_t offset, const std::vector<uint8_t>& data) {
    if (Sys().lseek64(fd_, static_cast<off64_t>(offset), SEEK_SET) < 0) return -2;
    return Sys().write(fd_, data.data(), data.size());
  }
  long ReadAt(uint64_t offset, std::vector<uint8_t>& data) {
    if (Sys().lseek64(fd_, static_cast<off64_t>(offset), SEEK_SET) < 0) return -2;
    return Sys().read(fd_, data.data(), data.size());
  }
  int Erase(uint32_t start, uint32_t length) {
    erase_info_user region{start, length};
    return Sys().ioctl(fd_, MEMERASE, &region);
  }
  mtd_ecc_stats Stats() {
    mtd_ecc_stats stats{};
    EXPECT_EQ(Sys().ioctl(fd_, ECCGETSTATS, &stats), 0);
    return stats;
  }
  int MarkBad(uint64_t offset, int fd = -1) {
    loff_t block = static_cast<loff_t>(offset);
    return Sys().ioctl(fd < 0 ? fd_ : fd, MEMSETBADBLOCK, &block);
  }

  FlashSim sim_;
  int fd_ = -1;
};

TEST_F(KernelRulesTest, ProgrammingClearsBitsAndIgnoresTheBadBlockTable) {
  ASSERT_EQ(WriteAt(0, std::vector<uint8_t>(kNandPage, 0xF0)), static_cast<long>(kNandPage));
  ASSERT_EQ(WriteAt(0, std::vector<uint8_t>(kNandPage, 0x3C)), static_cast<long>(kNandPage));
  EXPECT_EQ(sim_.Bytes(kNode, 0, kNandPage), std::vector<uint8_t>(kNandPage, 0x30));

  // Only erases consult the table; a write into a block marked bad lands.
  ASSERT_EQ(MarkBad(2 * kNandBlock), 0);
  std::vector<uint8_t> data = Pattern(kNandPage, 8);
  EXPECT_EQ(WriteAt(2 * kNandBlock + kNandPage, data), static_cast<long>(kNandPage));
  EXPECT_EQ(sim_.Bytes(kNode, 2 * kNandBlock + kNandPage, kNandPage), data);
}

TEST_F(KernelRulesTest, WeakPageFailsAfterProgrammingUpToItself) {
  sim_.FailWritesAt(kNode, kNandBlock + 5 * kNandPage + 7);
  std::vector<uint8_t> data = Pattern(8 * kNandPage, 5);
  errno = 0;
  EXPECT_EQ(WriteAt(kNandBlock, data), -1);
  EXPECT_EQ(errno, EIO);
  EXPECT_EQ(Sys().lseek64(fd_, 0, SEEK_CUR), static_cast<off64_t>(kNandBlock));
  std::vector<uint8_t> back = sim_.Bytes(kNode, kNandBlock, data.size());
  EXPECT_TRUE(std::equal(data.begin(), data.begin() + 6 * kNandPage, back.begin()));
  EXPECT_EQ(std::vector<uint8_t>(back.begin() + 6 * kNandPage, back.end()),
            std::vector<uint8_t>(2 * kNandPage, 0xFF));
}

TEST_F(KernelRulesTest, TransfersAtTheEndAreCutShort) {
  std::vector<uint8_t> two = Pattern(2 * kNandPage, 3);
  EXPECT_EQ(WriteAt(kSize - kNandPage, two), static_cast<long>(kNandPage));
  EXPECT_EQ(Sys().lseek64(fd_, 0, SEEK_CUR), static_cast<off64_t>(kSize));
  errno = 0;
  EXPECT_EQ(Sys().write(fd_, two.data(), kNandPage), -1);
  EXPECT_EQ(errno, ENOSPC);
  EXPECT_EQ(ReadAt(kSize - kNandPage, two), static_cast<long>(kNandPage));
  EXPECT_EQ(ReadAt(kSize, two), 0);
  errno = 0;
  EXPECT_EQ(Sys().lseek64(fd_, static_cast<off64_t>(kSize + kNandPage), SEEK_SET), -1);
  EXPECT_EQ(errno, EINVAL);
}

TEST_F(KernelRulesTest, EraseRegions) {
  EXPECT_EQ(Erase(0, 0), 0);
  EXPECT_EQ(Erase(100, 0), 0);  // nothing to erase, so nothing to align
  errno = 0;
  EXPECT_EQ(Erase(static_cast<uint32_t>(kSize), 0), -1);
  EXPECT_EQ(errno, EINVAL);
  errno = 0;
  EXPECT_EQ(Erase(0, kNandBlock + 1), -1);
  EXPECT_EQ(errno, EINVAL);

  // Blocks 3 and 4 written, 5 bad: erasing 3-6 erases 3 and 4, then stops.
  ASSERT_EQ(WriteAt(3 * kNandBlock, Pattern(kNandPage, 1)), static_cast<long>(kNandPage));
  ASSERT_EQ(WriteAt(4 * kNandBlock, Pattern(kNandPage, 2)), static_cast<long>(kNandPage));
  ASSERT_EQ(WriteAt(6 * kNandBlock, Pattern(kNandPage, 3)), static_cast<long>(kNandPage));
  sim_.MarkBad(kNode, 5 * kNandBlock);
  errno = 0;
  EXPECT_EQ(Erase(3 * kNandBlock, 4 * kNandBlock), -1);
  EXPECT_EQ(errno, EIO);
  EXPECT_EQ(sim_.Bytes(kNode, 3 * kNandBlock, 2 * kNandBlock),
            std::vector<uint8_t>(2 * kNandBlock, 0xFF));
  EXPECT_EQ(sim_.Bytes(kNode, 6 * kNandBlock, kNandPage), Pattern(kNandPage, 3));
}

TEST_F(KernelRulesTest, UnreadablePageCountsEveryEccStepAndReadsGarbage) {
  std::vector<uint8_t> page = Pattern(kNandPage, 6);
  ASSERT_EQ(WriteAt(10 * kNandPage, page), static_cast<long>(kNandPage));
  sim_.AddEccFailure(kNode, 10 * kNandPage + 100);
  std::vector<uint8_t> got(kNandPage);
  EXPECT_EQ(ReadAt(10 * kNandPage, got), static_cast<long>(kNandPage));
  EXPECT_EQ(Stats().failed, 8u);  // 2 KiB in 256-byte steps
  for (size_t i = 0; i < got.size(); ++i) ASSERT_NE(got[i], page[i]) << i;
  // A few bytes of the page cost the whole page; its neighbour is clean.
  std::vector<uint8_t> few(4);
  EXPECT_EQ(ReadAt(10 * kNandPage + 2000, few), 4);
  EXPECT_EQ(Stats().failed, 16u);
  ASSERT_EQ(ReadAt(11 * kNandPage, got), static_cast<long>(kNandPage));
  EXPECT_EQ(Stats().failed, 16u);
  EXPECT_EQ(got, std::vector<uint8_t>(kNandPage, 0xFF));
}

TEST_F(KernelRulesTest, MarkingBadErasesTheBlockAndCountsEveryMark) {
  sim_.MarkBad(kNode, 4 * kNandBlock);  // from the factory: counted once
  sim_.MarkBad(kNode, 4 * kNandBlock);
  EXPECT_EQ(Stats().badblocks, 1u);
  ASSERT_EQ(WriteAt(6 * kNandBlock, std::vector<uint8_t>(kNandPage, 0x00)), static_cast<long>(kNandPage));
  ASSERT_EQ(MarkBad(6 * kNandBlock), 0);
  ASSERT_EQ(MarkBad(6 * kNandBlock), 0);
  EXPECT_EQ(Stats().badblocks, 3u);
  EXPECT_EQ(sim_.Bytes(kNode, 6 * kNandBlock, kNandPage), std::vector<uint8_t>(kNandPage, 0xFF));
  errno = 0;
  EXPECT_EQ(Erase(6 * kNandBlock, kNandBlock), -1);
  EXPECT_EQ(errno, EIO);
}

TEST_F(KernelRulesTest, PartitionsOfAChipShareItsBytesAndBadBlocks) {
  sim_.AddPartition(6, "NAND0.SYS.LOW", kNode, 0, 4 * kNandBlock);
  sim_.AddPartition(7, "NAND0.SYS.HIGH", kNode, 4 * kNandBlock, 4 * kNandBlock);
  int high = Sys().open("/dev/mtd7", O_RDWR, 0);
  ASSERT_EQ(MarkBad(kNandBlock, high), 0);
  loff_t inChip = 5 * kNandBlock;
  EXPECT_EQ(Sys().ioctl(fd_, MEMGETBADBLOCK, &inChip), 1);
  ASSERT_EQ(WriteAt(4 * kNandBlock, std::vector<uint8_t>(kNandPage, 0x5A)), static_cast<long>(kNandPage));
  EXPECT_EQ(sim_.Bytes("/dev/mtd7", 0, 1), std::vector<uint8_t>{0x5A});
  Sys().close(high);
}

TEST_F(KernelRulesTest, ReadOnlyPartitionsAndDescriptorModes) {
  sim_.SetReadOnly(kNode);
  errno = 0;
  EXPECT_EQ(Sys().open(kNode, O_RDWR, 0), -1);
  EXPECT_EQ(errno, EACCES);
  EXPECT_EQ(Sys().fopen64(kNode, "r+b"), nullptr);
  int reader = Sys().open(kNode, O_RDONLY, 0);
  ASSERT_GE(reader, 0);
  std::vector<uint8_t> page(kNandPage);
  EXPECT_EQ(Sys().read(reader, page.data(), page.size()), static_cast<long>(kNandPage));
  errno = 0;
  EXPECT_EQ(Sys().write(reader, page.data(), page.size()), -1);
  EXPECT_EQ(errno, EBADF);
  erase_info_user region{0, static_cast<uint32_t>(kNandBlock)};
  errno = 0;
  EXPECT_EQ(Sys().ioctl(reader, MEMERASE, &region), -1);
  EXPECT_EQ(errno, EPERM);
  Sys().close(reader);
}

}  // namespace
}  // namespace test
}  // namespace stbplat
