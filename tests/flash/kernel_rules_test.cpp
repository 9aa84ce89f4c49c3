// The emulated device against what the kernel's MTD layer (nandsim behind
// the MTD character device) was seen to do in the system tests: the fault
// handling of the flash code is only as right as these rules.
#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <cerrno>

#include "flash_fixture.h"
#include "os/seam.h"

namespace stbplat {
namespace test {
namespace {

using os::Sys;
using Bytes = std::vector<uint8_t>;

constexpr uint64_t kSize = 8 * kNandBlock;
constexpr const char* kNode = "/dev/mtd5";
constexpr long kPage = static_cast<long>(kNandPage);

// A call that fails with the given errno.
::testing::AssertionResult Fails(long result, int error) {
  if (result == -1 && errno == error) return ::testing::AssertionSuccess();
  return ::testing::AssertionFailure() << "result " << result << ", errno " << errno;
}

class KernelRulesTest : public ::testing::Test {
 protected:
  KernelRulesTest() {
    sim_.AddMtd(5, "NAND0.SYS.RULES", SimKind::kNand, kSize, kNandBlock, kNandPage);
    fd_ = Sys().open(kNode, O_RDWR, 0);
  }
  ~KernelRulesTest() override { Sys().close(fd_); }

  long WriteAt(uint64_t offset, const Bytes& data) {
    Sys().lseek64(fd_, static_cast<off64_t>(offset), SEEK_SET);
    return Sys().write(fd_, data.data(), data.size());
  }
  long ReadAt(uint64_t offset, Bytes& data) {
    Sys().lseek64(fd_, static_cast<off64_t>(offset), SEEK_SET);
    return Sys().read(fd_, data.data(), data.size());
  }
  long Request(unsigned long request, uint64_t offset, uint64_t length = 0, int fd = -1) {
    erase_info_user region{static_cast<uint32_t>(offset), static_cast<uint32_t>(length)};
    loff_t at = static_cast<loff_t>(offset);
    void* argument = request == MEMERASE ? static_cast<void*>(&region) : static_cast<void*>(&at);
    return Sys().ioctl(fd < 0 ? fd_ : fd, request, argument);
  }
  mtd_ecc_stats Stats() {
    mtd_ecc_stats stats{};
    EXPECT_EQ(Sys().ioctl(fd_, ECCGETSTATS, &stats), 0);
    return stats;
  }

  FlashSim sim_;
  int fd_ = -1;
};

TEST_F(KernelRulesTest, WritesClearBitsLandInBadBlocksAndAreCutAtTheEnd) {
  ASSERT_EQ(WriteAt(0, Bytes(kNandPage, 0xF0)), kPage);
  ASSERT_EQ(WriteAt(0, Bytes(kNandPage, 0x3C)), kPage);
  EXPECT_EQ(sim_.Bytes(kNode, 0, kNandPage), Bytes(kNandPage, 0x30));
  // Programmed again with other data, the page fails ECC until its block
  // is erased; the same data or all 0xFF again changes nothing.
  Bytes page(kNandPage);
  for (const Bytes& again : {Pattern(kNandPage, 4), Pattern(kNandPage, 4), Bytes(kNandPage, 0xFF)})
    ASSERT_EQ(WriteAt(kNandPage, again), kPage);
  ASSERT_EQ(ReadAt(0, page) + ReadAt(kNandPage, page), 2 * kPage);
  EXPECT_EQ(page, Pattern(kNandPage, 4));
  EXPECT_EQ(Stats().failed, kNandPage / 256);  // page 0's steps
  ASSERT_EQ(Request(MEMERASE, 0, kNandBlock), 0);
  ASSERT_EQ(ReadAt(0, page), kPage);
  EXPECT_EQ(Stats().failed, kNandPage / 256);
  // Only erases consult the bad-block table.
  ASSERT_EQ(Request(MEMSETBADBLOCK, 2 * kNandBlock), 0);
  EXPECT_EQ(WriteAt(2 * kNandBlock + kNandPage, Pattern(kNandPage, 8)), kPage);
  EXPECT_EQ(sim_.Bytes(kNode, 2 * kNandBlock + kNandPage, kNandPage), Pattern(kNandPage, 8));
  EXPECT_TRUE(Fails(WriteAt(kNandPage + 1, Bytes(kNandPage)), EINVAL));

  Bytes two = Pattern(2 * kNandPage, 3);
  EXPECT_EQ(WriteAt(kSize - kNandPage, two), kPage);
  EXPECT_EQ(Sys().lseek64(fd_, 0, SEEK_CUR), static_cast<off64_t>(kSize));
  EXPECT_TRUE(Fails(Sys().write(fd_, two.data(), kNandPage), ENOSPC));
  EXPECT_EQ(ReadAt(kSize - kNandPage, two), kPage);
  EXPECT_EQ(ReadAt(kSize, two), 0);
  EXPECT_TRUE(Fails(Sys().lseek64(fd_, static_cast<off64_t>(kSize + kNandPage), SEEK_SET), EINVAL));
}

TEST_F(KernelRulesTest, EraseRegions) {
  EXPECT_EQ(Request(MEMERASE, 100, 0), 0);  // nothing to erase, so nothing to align
  EXPECT_TRUE(Fails(Request(MEMERASE, kSize, 0), EINVAL));
  EXPECT_TRUE(Fails(Request(MEMERASE, 0, kNandBlock + 1), EINVAL));
  // Blocks 3 and 4 written, 5 bad: erasing 3-6 erases 3 and 4, then stops.
  for (uint64_t block : {3, 4, 6}) ASSERT_EQ(WriteAt(block * kNandBlock, Pattern(kNandPage, 1)), kPage);
  sim_.MarkBad(kNode, 5 * kNandBlock);
  EXPECT_TRUE(Fails(Request(MEMERASE, 3 * kNandBlock, 4 * kNandBlock), EIO));
  EXPECT_EQ(sim_.Bytes(kNode, 3 * kNandBlock, 2 * kNandBlock), Bytes(2 * kNandBlock, 0xFF));
  EXPECT_EQ(sim_.Bytes(kNode, 6 * kNandBlock, kNandPage), Pattern(kNandPage, 1));
}

TEST_F(KernelRulesTest, MarkingBadErasesTheBlockAndCountsEveryMark) {
  sim_.MarkBad(kNode, 4 * kNandBlock);  // from the factory: counted once
  sim_.MarkBad(kNode, 4 * kNandBlock);
  EXPECT_EQ(Stats().badblocks, 1u);
  ASSERT_EQ(WriteAt(6 * kNandBlock, Bytes(kNandPage, 0x00)), kPage);
  ASSERT_EQ(Request(MEMSETBADBLOCK, 6 * kNandBlock), 0);
  ASSERT_EQ(Request(MEMSETBADBLOCK, 6 * kNandBlock), 0);
  EXPECT_EQ(Stats().badblocks, 3u);
  EXPECT_EQ(sim_.Bytes(kNode, 6 * kNandBlock, kNandPage), Bytes(kNandPage, 0xFF));
  EXPECT_TRUE(Fails(Request(MEMERASE, 6 * kNandBlock, kNandBlock), EIO));
}

TEST_F(KernelRulesTest, ReadOnlyPartitionsAndDescriptorModes) {
  sim_.SetReadOnly(kNode);
  EXPECT_TRUE(Fails(Sys().open(kNode, O_RDWR, 0), EACCES));
  EXPECT_EQ(Sys().fopen64(kNode, "r+b"), nullptr);
  int reader = Sys().open(kNode, O_RDONLY, 0);
  Bytes page(kNandPage);
  EXPECT_EQ(Sys().read(reader, page.data(), page.size()), kPage);
  EXPECT_TRUE(Fails(Sys().write(reader, page.data(), page.size()), EBADF));
  EXPECT_TRUE(Fails(Request(MEMERASE, 0, kNandBlock, reader), EPERM));
  Sys().close(reader);
}

}  // namespace
}  // namespace test
}  // namespace stbplat
