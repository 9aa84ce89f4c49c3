// Identity, size, disk detection and the SMART loop over the simulated machine.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "disk/fake_system.h"
#include "stbplat/disk.h"

namespace {

using stbplat::test::FakeSystem;
using stbplat::test::kAtaLink;
using stbplat::test::kUsbLink;

TEST(GetVendorInfo, FieldsAtTheirOffsetsCutToTheirWidths) {
  FakeSystem sys;
  std::string identity(512, '#');
  identity.replace(20, 8, "Z1E6ABCD");
  identity.replace(54, 18, "ST2000DM001-1CH164");
  sys.devices["/dev/sda"].identity = identity;
  sys.devices["/dev/sdb"];  // answers no identity request
  char sda[] = "sda", sdb[] = "sdb", sdx[] = "sdx";
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetVendorInfo(sda), 0);
  EXPECT_EQ(GetVendorInfo(sdb), 0);  // the failure message reads "successful", as it always has
  EXPECT_EQ(GetVendorInfo(sdx), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Hard Disk Model: ST2000DM001-1CH164" + std::string(22, '#') +
                "\n  Serial Number: Z1E6ABCD" + std::string(12, '#') +
                "\n ioctl HDIO_GET_IDENTITY successful \nERROR: Cannot open device \n");
}

TEST(IsDevHDD, AtaLinksAndUsbDevicesAbove256GiB) {
  struct Row {
    std::string link;  // empty: no link
    long long size;    // negative: the size request fails
    int result;
    std::string output;
  };
  const Row rows[] = {
      {kAtaLink, 0, 1, "IsDevHDD(): ATA HDD found \n"},
      {kUsbLink, 500107862016LL, 1, "Ext USB HDD detected \n"},
      {kUsbLink, 0x4000000000LL, 0, ""},
      // Compared unsigned, an unreadable size counts as a disk.
      {kUsbLink, -1, 1, " Get block dev size failed \nExt USB HDD detected \n"},
      {std::string(2000, 'x') + "/ata1/", 0, 0, ""},  // beyond the 1023 bytes read
      {"", 0, 0, ""},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.link.substr(0, 60));
    FakeSystem sys;
    if (!row.link.empty()) sys.links["sdb"] = row.link;
    sys.devices["/dev/sdb"].size = row.size;
    testing::internal::CaptureStdout();
    EXPECT_EQ(IsDevHDD("sdb"), row.result);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), row.output);
    // Only a USB device's size is asked for.
    EXPECT_EQ(sys.opened.size(), row.link == kUsbLink ? 1u : 0u);
  }
}

TEST(GetHDDTemperature, PrintsTheTemperatureEntryEveryTenSeconds) {
  FakeSystem sys;
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetHDDTemperature(), -1);
  sys.links["sdb"] = kAtaLink;
  EXPECT_EQ(GetHDDTemperature(), -1);  // sdb is a disk but does not open
  EXPECT_EQ(sys.opened, std::vector<std::string>{"/dev/sdb"});
  sys.links["sda"] = kAtaLink;
  auto& sda = sys.devices["/dev/sda"];
  // The temperature entry in the table's last slot, another one behind the table.
  sda.attributes.assign(29, {9, 0x32, 99, 99, 0x10, 0x27, 0, 0, 0, 0, 0, 0});
  sda.attributes.push_back({194, 0x22, 0, 36, 53, 41, 0, 18, 0, 55, 0, 0});
  sda.attributes.push_back({194, 0x22, 0, 1, 2, 3, 4, 5, 6, 7, 8, 0});
  sda.smartReads = 1;  // the second round's request fails and shows the cleared data
  sys.sleepsLeft = 2;
  EXPECT_THROW(GetHDDTemperature(), stbplat::test::StopLoop);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "ATA HDD not found \nIsDevHDD(): ATA HDD found \nDevice open failed \n"
            "IsDevHDD(): ATA HDD found \nCurrent Val= 36 \n Worst Val= 53 \n "
            "Min = 18, Max = 55, value = 41\nHDIO_DRIVE_CMD failed\n");
  EXPECT_EQ(sys.sleeps, (std::vector<unsigned int>{10, 10}));
  EXPECT_EQ(sys.lastDriveCommand, (std::array<unsigned char, 4>{0xB0, 0, 0xD0, 1}));
}

}  // namespace
