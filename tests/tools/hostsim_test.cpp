// The emulated device of host mode, driven through the library's OS seam as
// the library drives a real one.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "hostsim/host_mode.h"
#include "os/seam.h"
#include "scratch_dir.h"

namespace {

using stbplat::os::Sys;
using stbplat::test::ScratchDir;

constexpr size_t kNorSize = 64 * 1024;
constexpr size_t kNorSector = 16 * 1024;
constexpr size_t kPage = 512;
constexpr size_t kOob = 16;
constexpr size_t kBlock = 4 * kPage;
constexpr size_t kNandSize = 8 * kBlock;

std::vector<unsigned char> Pattern(size_t size, unsigned char seed) {
  std::vector<unsigned char> bytes(size);
  for (size_t i = 0; i < size; ++i) bytes[i] = static_cast<unsigned char>(seed + i * 7);
  return bytes;
}

// NAND data laid out page by page with OOB bytes behind each page.
std::vector<unsigned char> WithOob(const std::vector<unsigned char>& data, std::vector<unsigned> badBlocks) {
  std::vector<unsigned char> out;
  for (size_t page = 0; page < data.size() / kPage; ++page) {
    out.insert(out.end(), data.begin() + static_cast<long>(page * kPage),
               data.begin() + static_cast<long>((page + 1) * kPage));
    std::vector<unsigned char> oob(kOob, 0xFF);
    for (unsigned bad : badBlocks)
      if (page == bad * kBlock / kPage) oob[0] = 0x00;
    out.insert(out.end(), oob.begin(), oob.end());
  }
  return out;
}

class HostModeTest : public ::testing::Test {
 protected:
  void SetUp() override {
    dir.Write("proc/mtd",
              "dev:    size   erasesize  name\n"
              "mtd0: 00010000 00004000 \"flash0\"\n"
              "mtd1: 00004000 00004000 \"flash0.BOOT.A\"\n"
              "mtd2: 00004000 00000800 \"flash1\"\n"
              "mtd3: 00001000 00000800 \"flash1.KERNEL.A\"\n"
              "mtd4: 00004000 00000800 \"NAND1...\"\n");
    nor = Pattern(kNorSize, 1);
    dir.Write("dev/mtd0", nor);
    dir.Write("dev/mtd1.ini", "image = mtd0\noffset = 0x4000\n");
    nand = Pattern(kNandSize, 3);
    dir.Write("dev/mtd2", WithOob(nand, {2}));
    dir.Write("dev/mtd2.ini", "medium = nand\nwritesize = 512\noobsize = 16\n");
    dir.Write("dev/mtd3.ini", "image = mtd2\noffset = 0x1000\n");
    dir.Write("dev/mtd4", Pattern(kNandSize, 5));
    dir.Write("dev/mtd4.ini", "medium = nand\nwritesize = 512\noobsize = 16\n");
    dir.Write("dev/mtd4.bad", "# factory\n1\n6\n");
    std::string error;
    ASSERT_TRUE(stbplat::hostsim::Attach(dir.path(), &error)) << error;
  }
  void TearDown() override { stbplat::hostsim::Detach(); }

  int Open(const char* path) { return Sys().open(path, O_RDWR | O_SYNC, 0644); }

  std::vector<unsigned char> ReadAt(int fd, off64_t offset, size_t n) {
    std::vector<unsigned char> bytes(n);
    EXPECT_EQ(offset, Sys().lseek64(fd, offset, SEEK_SET));
    EXPECT_EQ(static_cast<ssize_t>(n), Sys().read(fd, bytes.data(), n));
    return bytes;
  }

  int IsBad(int fd, long long offset) { return Sys().ioctl(fd, MEMGETBADBLOCK, &offset); }

  ScratchDir dir;
  std::vector<unsigned char> nor, nand;
};

TEST_F(HostModeTest, PartitionInfoComesFromTheTableAndTheImage) {
  int fd = Open("/dev/mtd3");
  ASSERT_GE(fd, 0);
  mtd_info_user info;
  ASSERT_EQ(0, Sys().ioctl(fd, MEMGETINFO, &info));
  EXPECT_EQ(MTD_NANDFLASH, info.type);
  EXPECT_EQ(0x1000u, info.size);
  EXPECT_EQ(kBlock, info.erasesize);
  EXPECT_EQ(kPage, info.writesize);
  EXPECT_EQ(kOob, info.oobsize);
  EXPECT_EQ(0, Sys().close(fd));

  fd = Open("/dev/mtd0");
  ASSERT_EQ(0, Sys().ioctl(fd, MEMGETINFO, &info));
  EXPECT_EQ(MTD_NORFLASH, info.type);
  EXPECT_EQ(kNorSector, info.erasesize);
  Sys().close(fd);
}

TEST_F(HostModeTest, WindowsReadTheirPartOfTheImageAndStopAtTheirEnd) {
  int fd = Open("/dev/mtd1");
  ASSERT_GE(fd, 0);
  EXPECT_EQ(std::vector<unsigned char>(nor.begin() + 0x4000, nor.begin() + 0x4010), ReadAt(fd, 0, 16));
  unsigned char tail[32];
  ASSERT_EQ(0x4000 - 8, Sys().lseek64(fd, 0x4000 - 8, SEEK_SET));
  EXPECT_EQ(8, Sys().read(fd, tail, sizeof tail));
  EXPECT_EQ(0, Sys().read(fd, tail, sizeof tail));
  Sys().close(fd);
}

TEST_F(HostModeTest, OobDumpReadsAsPlainDataAndMarksBadBlocksByTheFirstOobByte) {
  int fd = Open("/dev/mtd2");
  ASSERT_GE(fd, 0);
  // Across a page boundary: the OOB bytes between the pages are not data.
  EXPECT_EQ(std::vector<unsigned char>(nand.begin() + kPage - 4, nand.begin() + kPage + 4), ReadAt(fd, kPage - 4, 8));
  EXPECT_EQ(0, IsBad(fd, 0));
  EXPECT_EQ(1, IsBad(fd, 2 * kBlock));
  EXPECT_EQ(1, IsBad(fd, 2 * kBlock + kPage));  // any offset inside the block
  EXPECT_EQ(0, IsBad(fd, 3 * kBlock));
  long long outside = kNandSize;
  EXPECT_EQ(-1, Sys().ioctl(fd, MEMGETBADBLOCK, &outside));
  EXPECT_EQ(EINVAL, errno);
  mtd_ecc_stats stats;
  ASSERT_EQ(0, Sys().ioctl(fd, ECCGETSTATS, &stats));
  EXPECT_EQ(1u, stats.badblocks);
  EXPECT_EQ(0u, stats.failed);
  Sys().close(fd);

  // The window at 0x1000 starts at block 2 of the chip.
  fd = Open("/dev/mtd3");
  EXPECT_EQ(1, IsBad(fd, 0));
  EXPECT_EQ(0, IsBad(fd, kBlock));
  Sys().close(fd);
}

TEST_F(HostModeTest, PlainNandTakesItsBadBlocksFromTheList) {
  int fd = Open("/dev/mtd4");
  ASSERT_GE(fd, 0);
  EXPECT_EQ(0, IsBad(fd, 0));
  EXPECT_EQ(1, IsBad(fd, kBlock));
  EXPECT_EQ(1, IsBad(fd, 6 * kBlock));
  long long block3 = 3 * kBlock;
  ASSERT_EQ(0, Sys().ioctl(fd, MEMSETBADBLOCK, &block3));
  Sys().close(fd);

  // Marked bad stays bad for the next user of the image.
  stbplat::hostsim::Detach();
  std::string error;
  ASSERT_TRUE(stbplat::hostsim::Attach(dir.path(), &error)) << error;
  fd = Open("/dev/mtd4");
  EXPECT_EQ(1, IsBad(fd, 3 * kBlock));
  Sys().close(fd);
}

TEST_F(HostModeTest, MarkingBadInAnOobDumpWritesTheMarkerByte) {
  int fd = Open("/dev/mtd2");
  long long block5 = 5 * kBlock;
  ASSERT_EQ(0, Sys().ioctl(fd, MEMSETBADBLOCK, &block5));
  Sys().close(fd);
  std::vector<unsigned char> dump = dir.Read("dev/mtd2");
  EXPECT_EQ(0x00, dump[5 * (kBlock / kPage) * (kPage + kOob) + kPage]);
}

TEST_F(HostModeTest, ProgrammingClearsBitsOnlyAndEraseSetsABlockToOnes) {
  int fd = Open("/dev/mtd1");
  ASSERT_GE(fd, 0);
  erase_info_user region = {0, static_cast<__u32>(kNorSector)};
  ASSERT_EQ(0, Sys().ioctl(fd, MEMERASE, &region));
  EXPECT_EQ(std::vector<unsigned char>(4, 0xFF), ReadAt(fd, 100, 4));
  const unsigned char first[] = {0xF0, 0x0F, 0xFF, 0x00};
  const unsigned char second[] = {0x3C, 0xFF, 0x0F, 0xFF};
  Sys().lseek64(fd, 100, SEEK_SET);
  ASSERT_EQ(4, Sys().write(fd, first, 4));
  Sys().lseek64(fd, 100, SEEK_SET);
  ASSERT_EQ(4, Sys().write(fd, second, 4));
  EXPECT_EQ((std::vector<unsigned char>{0x30, 0x0F, 0x0F, 0x00}), ReadAt(fd, 100, 4));

  erase_info_user unaligned = {100, static_cast<__u32>(kNorSector)};
  EXPECT_EQ(-1, Sys().ioctl(fd, MEMERASE, &unaligned));
  EXPECT_EQ(EINVAL, errno);
  Sys().close(fd);
  // The window wrote into the chip image at its offset.
  EXPECT_EQ(0x30, dir.Read("dev/mtd0")[0x4000 + 100]);
}

TEST_F(HostModeTest, NandFollowsTheKernelAtItsEdges) {
  int fd = Open("/dev/mtd2");
  std::vector<unsigned char> page(kPage, 0x00);
  Sys().lseek64(fd, 10, SEEK_SET);
  EXPECT_EQ(-1, Sys().write(fd, page.data(), kPage));
  EXPECT_EQ(EINVAL, errno);
  // Erasing blocks 1 and 2 (bad) erases block 1, then fails.
  Sys().lseek64(fd, kBlock, SEEK_SET);
  ASSERT_EQ(static_cast<ssize_t>(kPage), Sys().write(fd, page.data(), kPage));
  erase_info_user across = {static_cast<__u32>(kBlock), static_cast<__u32>(2 * kBlock)};
  EXPECT_EQ(-1, Sys().ioctl(fd, MEMERASE, &across));
  EXPECT_EQ(EIO, errno);
  EXPECT_EQ(std::vector<unsigned char>(4, 0xFF), ReadAt(fd, kBlock, 4));
  erase_info_user empty = {static_cast<__u32>(kBlock + 10), 0};
  EXPECT_EQ(0, Sys().ioctl(fd, MEMERASE, &empty));
  // Writes ignore the bad-block table, and are cut at the end.
  Sys().lseek64(fd, 2 * kBlock + kPage, SEEK_SET);
  EXPECT_EQ(static_cast<ssize_t>(kPage), Sys().write(fd, page.data(), kPage));
  EXPECT_EQ(1, IsBad(fd, 2 * kBlock));
  std::vector<unsigned char> two(2 * kPage, 0x00);
  Sys().lseek64(fd, kNandSize - kPage, SEEK_SET);
  EXPECT_EQ(static_cast<ssize_t>(kPage), Sys().write(fd, two.data(), two.size()));
  EXPECT_EQ(-1, Sys().write(fd, two.data(), kPage));
  EXPECT_EQ(ENOSPC, errno);

  erase_info_user good = {static_cast<__u32>(kBlock), static_cast<__u32>(kBlock)};
  ASSERT_EQ(0, Sys().ioctl(fd, MEMERASE, &good));
  Sys().lseek64(fd, kBlock, SEEK_SET);
  ASSERT_EQ(static_cast<ssize_t>(kPage), Sys().write(fd, page.data(), kPage));
  EXPECT_EQ(0, IsBad(fd, kBlock));  // erasing left the OOB marker erased
  EXPECT_EQ(std::vector<unsigned char>(4, 0x00), ReadAt(fd, kBlock, 4));
  EXPECT_EQ(std::vector<unsigned char>(4, 0xFF), ReadAt(fd, kBlock + kPage, 4));
  Sys().close(fd);
}

TEST_F(HostModeTest, DevicePathsLieUnderTheRootAndOthersPassThrough) {
  FILE* table = Sys().fopen64("/proc/mtd", "r");
  ASSERT_NE(nullptr, table);
  char line[100];
  ASSERT_NE(nullptr, Sys().fgets(line, sizeof line, table));
  EXPECT_STREQ("dev:    size   erasesize  name\n", line);
  Sys().fclose(table);

  EXPECT_EQ(-1, Open("/dev/mtd9"));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(-1, Sys().open("/dev/mmca", O_RDONLY, 0));  // no eMMC image in this root
  EXPECT_EQ(nullptr, Sys().popen("true", "r"));

  std::string outside = dir.Write("outside.txt", "plain file");
  FILE* file = Sys().fopen64(outside.c_str(), "r");
  ASSERT_NE(nullptr, file);
  Sys().fclose(file);
}

TEST_F(HostModeTest, DetachPutsTheCLibraryBack) {
  stbplat::hostsim::Detach();
  EXPECT_FALSE(stbplat::hostsim::IsAttached());
  EXPECT_EQ(stbplat::os::LibcSysCalls().open, Sys().open);
}

TEST(HostModeAttach, ReportsWhichFileIsWrong) {
  ScratchDir dir;
  std::string error;
  EXPECT_FALSE(stbplat::hostsim::Attach(dir.path(), &error));
  EXPECT_NE(std::string::npos, error.find("proc/mtd")) << error;

  dir.Write("proc/mtd", "dev:    size   erasesize  name\nmtd0: 00010000 00004000 \"flash0\"\n");
  dir.Write("dev/mtd0", std::string(100, 'x'));
  EXPECT_FALSE(stbplat::hostsim::Attach(dir.path(), &error));
  EXPECT_NE(std::string::npos, error.find("dev/mtd0: 100 bytes, expected 65536")) << error;

  // A NAND dump with OOB that is a block short: nanddump's default left the
  // bad block out.
  dir.Write("proc/mtd", "dev:    size   erasesize  name\nmtd0: 00010000 00004000 \"flash1\"\n");
  dir.Write("dev/mtd0.ini", "medium = nand\nwritesize = 512\noobsize = 16\n");
  dir.Write("dev/mtd0", std::string(3 * 32 * (512 + 16), 'x'));
  EXPECT_FALSE(stbplat::hostsim::Attach(dir.path(), &error));
  EXPECT_NE(std::string::npos, error.find("take it with nanddump --oob --bb=dumpbad")) << error;

  dir.Write("proc/mtd", "dev:    size   erasesize  name\nmtd0: 00010000 00004000 \"flash0\"\n");
  dir.Write("dev/mtd0", std::vector<unsigned char>(0x10000, 0xFF));
  dir.Write("dev/mtd0.ini", "medium = flash\n");
  EXPECT_FALSE(stbplat::hostsim::Attach(dir.path(), &error));
  EXPECT_NE(std::string::npos, error.find("medium = flash")) << error;

  dir.Write("dev/mtd0.ini", "medium = nor\n");
  EXPECT_TRUE(stbplat::hostsim::Attach(dir.path(), &error)) << error;
  stbplat::hostsim::Detach();

  dir.Write("memory-map.ini", "[device NOR0]\ntechnology = SPI_NOR.\nsize = 0x10000\n");
  EXPECT_FALSE(stbplat::hostsim::Attach(dir.path(), &error));
  EXPECT_NE(std::string::npos, error.find("needs technology, base and size")) << error;
}

}  // namespace
