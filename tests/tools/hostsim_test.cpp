// Host mode: the emulated device over a device root's image files, driven
// through the library's OS seam as the library drives a real one. The device
// rules themselves are pinned in tests/flash/kernel_rules_test.cpp; here is
// what the image files add: OOB dumps, bad-block lists and markers that
// persist, and the paths outside the device. The tool's command table reads
// and writes through the windows of the example device's dump.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "hostsim/host_mode.h"
#include "os/seam.h"
#include "support/scratch_dir.h"

namespace {

using stbplat::os::Sys;
using Bytes = std::vector<unsigned char>;

constexpr size_t kNorSize = 64 * 1024;
constexpr size_t kPage = 512;
constexpr size_t kOob = 16;
constexpr size_t kBlock = 4 * kPage;
constexpr size_t kNandSize = 8 * kBlock;
const char kTableHeader[] = "dev:    size   erasesize  name\n";

Bytes Pattern(size_t size, unsigned char seed) {
  Bytes bytes(size);
  for (size_t i = 0; i < size; ++i) bytes[i] = static_cast<unsigned char>(seed + i * 7);
  return bytes;
}

// NAND data page by page with OOB bytes behind each page, as nanddump --oob
// writes it; on these small pages a bad block has 0x00 in OOB byte 5 of its
// first page, and byte 0 is no marker.
Bytes WithOob(const Bytes& data, unsigned badBlock) {
  Bytes out;
  for (size_t page = 0; page < data.size() / kPage; ++page) {
    out.insert(out.end(), data.begin() + static_cast<long>(page * kPage),
               data.begin() + static_cast<long>((page + 1) * kPage));
    Bytes oob(kOob, 0xFF);
    oob[0] = 0x00;
    if (page == badBlock * kBlock / kPage) oob[5] = 0x00;
    out.insert(out.end(), oob.begin(), oob.end());
  }
  return out;
}

class HostModeTest : public ::testing::Test {
 protected:
  void SetUp() override {
    dir.Write("proc/mtd", std::string(kTableHeader) +
                              "mtd0: 00010000 00004000 \"flash0\"\n"
                              "mtd1: 00004000 00004000 \"flash0.BOOT.A\"\n"
                              "mtd2: 00004000 00000800 \"flash1\"\n"
                              "mtd3: 00001000 00000800 \"flash1.KERNEL.A\"\n"
                              "mtd4: 00004000 00000800 \"NAND1...\"\n");
    dir.Write("dev/mtd0", Pattern(kNorSize, 1));
    dir.Write("dev/mtd1.ini", "image = mtd0\noffset = 0x4000\n");
    dir.Write("dev/mtd2", WithOob(nand, 2));
    dir.Write("dev/mtd2.ini", "medium = nand\nwritesize = 512\noobsize = 16\n");
    dir.Write("dev/mtd3.ini", "image = mtd2\noffset = 0x1000\n");
    dir.Write("dev/mtd4", Pattern(kNandSize, 5));
    dir.Write("dev/mtd4.ini", "medium = nand\nwritesize = 512\noobsize = 16\nlayout = plain\n");
    dir.Write("dev/mtd4.bad", "# factory\n1\n6\n");
    dir.Write("dev/mmca", Pattern(kBlock, 9));
    dir.Write("dev/mmca.ini", "medium = emmc\nsize = 2048\n");
    Attach();
  }
  void TearDown() override { stbplat::hostsim::Detach(); }

  void Attach() {
    std::string error;
    ASSERT_TRUE(stbplat::hostsim::Attach(dir.path(), &error)) << error;
  }
  // Opens path, positioned at offset.
  int OpenAt(const char* path, off64_t offset) {
    int fd = Sys().open(path, O_RDWR, 0);
    EXPECT_EQ(offset, Sys().lseek64(fd, offset, SEEK_SET)) << path;
    return fd;
  }
  Bytes ReadAt(const char* path, off64_t offset, size_t n) {
    Bytes bytes(n);
    int fd = OpenAt(path, offset);
    bytes.resize(static_cast<size_t>(std::max<ssize_t>(0, Sys().read(fd, bytes.data(), n))));
    Sys().close(fd);
    return bytes;
  }
  int Request(const char* path, unsigned long request, long long offset) {
    int fd = Sys().open(path, O_RDWR, 0);
    int result = Sys().ioctl(fd, request, &offset);
    Sys().close(fd);
    return result;
  }

  stbplat::test::ScratchDir dir;
  Bytes nand = Pattern(kNandSize, 3);
};

TEST_F(HostModeTest, BadBlocksComeFromTheDumpsMarkersAndTheList) {
  EXPECT_EQ(0, Request("/dev/mtd2", MEMGETBADBLOCK, 0));
  EXPECT_EQ(1, Request("/dev/mtd2", MEMGETBADBLOCK, 2 * kBlock + kPage));
  EXPECT_EQ(1, Request("/dev/mtd3", MEMGETBADBLOCK, 0));  // the window starts at block 2
  EXPECT_EQ(1, Request("/dev/mtd4", MEMGETBADBLOCK, 6 * kBlock));
  EXPECT_EQ(0, Request("/dev/mtd4", MEMGETBADBLOCK, 5 * kBlock));
  int fd = Sys().open("/dev/mtd2", O_RDONLY, 0);
  mtd_ecc_stats stats;
  ASSERT_EQ(0, Sys().ioctl(fd, ECCGETSTATS, &stats));
  Sys().close(fd);
  EXPECT_EQ(1u, stats.badblocks);
  // A window takes its size from the table, its geometry from its image.
  fd = Sys().open("/dev/mtd3", O_RDONLY, 0);
  mtd_info_user info;
  ASSERT_EQ(0, Sys().ioctl(fd, MEMGETINFO, &info));
  Sys().close(fd);
  EXPECT_EQ(0x1000u, info.size);
  EXPECT_EQ(kOob, info.oobsize);
  // Across a page boundary of the dump: the OOB bytes between are not data.
  EXPECT_EQ(Bytes(nand.begin() + kPage - 4, nand.begin() + kPage + 4), ReadAt("/dev/mtd2", kPage - 4, 8));
}

TEST_F(HostModeTest, MarksAndErasesReachTheImagesAndLastBeyondTheRun) {
  ASSERT_EQ(0, Request("/dev/mtd2", MEMSETBADBLOCK, 5 * kBlock));
  ASSERT_EQ(0, Request("/dev/mtd4", MEMSETBADBLOCK, 3 * kBlock));
  ASSERT_EQ(0, Request("/dev/mtd3", MEMSETBADBLOCK, kBlock));  // the window's block 1 is block 3
  Bytes dump = dir.Read("dev/mtd2");
  size_t block5 = 5 * (kBlock / kPage) * (kPage + kOob);
  EXPECT_EQ(0x00, dump[block5 + kPage + 5]);  // the marker, in an erased block
  EXPECT_EQ(Bytes(kPage, 0xFF), Bytes(dump.begin() + block5, dump.begin() + block5 + kPage));

  stbplat::hostsim::Detach();
  Attach();
  EXPECT_EQ(1, Request("/dev/mtd2", MEMGETBADBLOCK, 5 * kBlock));
  EXPECT_EQ(1, Request("/dev/mtd4", MEMGETBADBLOCK, 3 * kBlock));
  EXPECT_EQ(1, Request("/dev/mtd2", MEMGETBADBLOCK, 3 * kBlock));
}

TEST_F(HostModeTest, OtherPathsLieUnderTheRootOrPassThrough) {
  // The eMMC device is its image; writes past its end are cut.
  Bytes mmc = Pattern(kBlock, 9);
  EXPECT_EQ(Bytes(mmc.begin() + 100, mmc.begin() + 104), ReadAt("/dev/mmca", 100, 4));
  int fd = OpenAt("/dev/mmca", kBlock - 2);
  EXPECT_EQ(2, Sys().write(fd, "abcd", 4));
  Sys().close(fd);

  // A node the device lacks is not made by a write.
  EXPECT_EQ(-1, Sys().open("/dev/mtd9", O_RDWR | O_CREAT, 0644));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(nullptr, Sys().fopen64("/dev/mtd9", "w"));
  EXPECT_FALSE(std::filesystem::exists(dir / "dev/mtd9"));
  EXPECT_EQ(nullptr, Sys().popen("true", "r"));
  FILE* file = Sys().fopen64(dir.Write("outside.txt", "plain file").c_str(), "r");
  ASSERT_NE(nullptr, file);
  Sys().fclose(file);

  stbplat::hostsim::Detach();
  EXPECT_FALSE(stbplat::hostsim::IsAttached());
  EXPECT_EQ(stbplat::os::LibcSysCalls().open, Sys().open);
}

// Images the user may not write are read, and every change fails as on a
// write-protected chip. Root may write anything: a root run drops to another
// user, in a child.
TEST_F(HostModeTest, ImagesTheUserMayNotWriteAreWriteProtected) {
  ASSERT_EQ(0, std::system(("chmod -R a-w " + dir / "dev" + " && chmod a+rx " + dir.path()).c_str()));
  EXPECT_EXIT(
      {
        if (geteuid() == 0 && setuid(65534) != 0) std::_Exit(2);
        Attach();
        int fd = OpenAt("/dev/mtd3", 0);
        bool ok = ReadAt("/dev/mtd3", 0, 4) == ReadAt("/dev/mtd2", 0x1000, 4);
        ok = ok && Sys().write(fd, nand.data(), kPage) == -1 && errno == EROFS;
        std::_Exit(ok && Request("/dev/mtd4", MEMSETBADBLOCK, 0) == -1 && errno == EROFS ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
  ASSERT_EQ(0, std::system(("chmod -R u+w " + dir / "dev").c_str()));
}

// Each row changes one or two files of a good root; the message names the
// file and line at fault ("" when the root loads).
TEST(HostModeAttach, ReportsWhichFileIsWrong) {
  const std::string head = std::string(kTableHeader) +
                           "mtd0: 00010000 00004000 \"flash0\"\n"
                           "mtd1: 00040000 00004000 \"flash1\"\n";
  const std::string table = head + "mtd2: 00008000 00004000 \"A\"\n";
  const std::string dump = "writesize = 512\noobsize = 16\n";
  struct Case {
    std::string file, contents, message, file2 = "", contents2 = "";
  };
  const Case cases[] = {
      {"dev/mtd1.ini", "oobsize = 64\nlayout = plain\n", ""},
      {"proc/mtd", table + "mtd3: 00008000 00004000 B\n", "proc/mtd:5: cannot read line"},
      {"proc/mtd", table + "mtd30: 00008000 00004000 \"B\"\n", "proc/mtd:5: cannot read line"},
      {"proc/mtd", table + "mtd0: 00008000 00004000 \"B\"\n", "proc/mtd:5: mtd0 listed again (first at line 2)"},
      {"proc/mtd", table + "mtd3: 00008000 00004000 \"B\"\n", "dev/mtd3: No such file"},
      {"proc/mtd", head + "mtd2: 00006000 00004000 \"A\"\n", "proc/mtd:4: mtd2 (A) size 0x6000 is not whole erase"},
      {"proc/mtd", head + "mtd2: 00008000 00008000 \"A\"\n", "proc/mtd:4: mtd2 (A) erase size 0x8000 differs"},
      {"dev/mtd2.ini", "image = mtd0\noffset = 0x2000\n", "dev/mtd2.ini:2: offset 0x2000 is not on an erase block"},
      {"dev/mtd2.ini", "image = mtd0\noffset = 0xC000\n", "dev/mtd2.ini:2: mtd2 (A): 0x8000 bytes at 0xC000"},
      {"dev/mtd2.ini", "image = mtd0\nwritesize = 1\n", "dev/mtd2.ini:2: writesize belongs in mtd0.ini"},
      {"dev/mtd2.ini", "image = ../mtd0\n", "dev/mtd2.ini:1: image = ../mtd0"},
      {"dev/mtd0.ini", "offset = 0\n", "dev/mtd0.ini:1: offset without image"},
      {"dev/mtd0.ini", "\nerasesize = -1\n", "dev/mtd0.ini:2: erasesize = -1: not a decimal or 0x hex"},
      {"dev/mtd0.ini", "writesize = 0x100000000\n", "dev/mtd0.ini:1: writesize = 0x100000000: out of range"},
      {"dev/mtd0.ini", "writesize = 3000\n", "dev/mtd0.ini:1: page size 3000 is not a power of two"},
      {"dev/mtd0.ini", "writesize = 0x8000\n", "dev/mtd0.ini:1: page size 32768 is not a power of two dividing"},
      {"dev/mtd1.ini", "medium = nand\nerasesize = 0x3000\n", "dev/mtd1.ini:2: erase size 0x3000"},
      {"dev/mtd0.ini", "size = 0x10\nsize = 0x10\n", "dev/mtd0.ini:2: size given again (first at line 1)"},
      {"dev/mtd0.ini", "writsize = 1\n", "dev/mtd0.ini:1: unknown key 'writsize'"},
      {"dev/mtd0.ini", "medium = flash\n", "dev/mtd0.ini:1: medium = flash (expected"},
      {"dev/mtd1.ini", "layout = oob\n", "dev/mtd1.ini:1: layout = oob needs a NAND image whose oobsize"},
      {"dev/mtd1.ini", dump, "dev/mtd1: 262144 bytes, expected 270336 with the OOB bytes"},
      {"dev/mtd1.ini", dump, "dev/mtd1: 50688 bytes, expected 270336; a dump short of whole blocks", "dev/mtd1",
       std::string(3 * 32 * (512 + 16), 'x')},
      // Block lists: decimal (010 is block 10) or 0x hex, one number a line.
      {"dev/mtd1.bad", "010 # factory\n0xA\n", "dev/mtd1.bad:2: block 0xA listed again (first at line 1)"},
      {"dev/mtd1.bad", "\n5x\n", "dev/mtd1.bad:2: '5x' is not a block number of this image (0 to 15)"},
      {"dev/mtd1.bad", "3.5\n", "dev/mtd1.bad:1: '3.5' is not"},
      {"dev/mtd1.bad", "1 2\n", "dev/mtd1.bad:1: '1 2' is not"},
      {"dev/mtd1.bad", "16\n", "dev/mtd1.bad:1: '16' is not"},
      {"dev/mtd9.ini", "medium = nand\n", "dev/mtd9.ini: an image no partition uses"},
      {"memory-map.ini", "[device NOR0]\nsize = 0x10000\n", "memory-map.ini: line 1: device needs technology"},
  };
  for (const Case& c : cases) {
    stbplat::test::ScratchDir dir;
    dir.Write("proc/mtd", table);
    dir.Write("dev/mtd0", std::string(0x10000, 'x'));
    dir.Write("dev/mtd1", std::string(0x40000, 'x'));
    dir.Write("dev/mtd2.ini", "image = mtd0\noffset = 0x4000\n");
    for (const auto& file : {std::make_pair(c.file, c.contents), std::make_pair(c.file2, c.contents2)})
      if (!file.first.empty()) dir.Write(file.first, file.second);
    std::string error;
    EXPECT_EQ(c.message.empty(), stbplat::hostsim::Attach(dir.path(), &error)) << c.contents << ": " << error;
    EXPECT_NE(std::string::npos, error.find(c.message)) << c.contents << ": " << error;
    stbplat::hostsim::Detach();
  }
}

}  // namespace
