// Identity, size, disk detection and the SMART loop over the simulated machine.
#include <fcntl.h>
#include <gtest/gtest.h>

#include <string>

#include "disk/fake_system.h"
#include "stbplat/disk.h"

namespace {

using stbplat::test::FakeSystem;
using stbplat::test::kAtaLink;
using stbplat::test::kUsbLink;
using stbplat::test::StopLoop;

constexpr unsigned long kFailedSize = ~0UL;

std::string Padded(const std::string& text, size_t width) {
  return text + std::string(width - text.size(), ' ');
}

TEST(GetVendorInfo, PrintsModelAndSerialOrFails) {
  FakeSystem sys;
  auto& sda = sys.AddDevice("/dev/sda");
  sda.model = "ST2000DM001-1CH164";
  sda.serial = "Z1E6ABCD";
  char name[] = "sda";
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetVendorInfo(name), 0);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Hard Disk Model: " + Padded("ST2000DM001-1CH164", 40) + "\n  Serial Number: " +
                Padded("Z1E6ABCD", 20) + "\n");
  ASSERT_EQ(sys.opened().size(), 1u);
  EXPECT_EQ(sys.opened()[0], "/dev/sda");
  EXPECT_EQ(sys.openFlags()[0], O_RDONLY | O_NONBLOCK);
  sys.AddDevice("/dev/sdb").identityFails = true;
  char sdb[] = "sdb";
  char sdx[] = "sdx";
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetVendorInfo(sdb), 0);
  EXPECT_EQ(GetVendorInfo(sdx), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            " ioctl HDIO_GET_IDENTITY successful \nERROR: Cannot open device \n");
}

TEST(GetVendorInfo, FieldsWithoutTerminatorStopAtTheirWidth) {
  FakeSystem sys;
  auto& sda = sys.AddDevice("/dev/sda");
  sda.identity.assign(512, 'A');
  char name[] = "sda";
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetVendorInfo(name), 0);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "Hard Disk Model: " + std::string(40, 'A') +
                                                        "\n  Serial Number: " +
                                                        std::string(20, 'A') + "\n");
}

TEST(GetBlkDevSize, SizeOrAllBitsSet) {
  FakeSystem sys;
  sys.AddDevice("/dev/sda").size = 500107862016ULL;
  sys.AddDevice("/dev/sdb").sizeFails = true;
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetBlkDevSize("sda"), 500107862016UL);
  EXPECT_EQ(GetBlkDevSize("sdb"), kFailedSize);
  EXPECT_EQ(GetBlkDevSize("sdz"), kFailedSize);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            " Get block dev size failed \nDevice /dev/sdz open failed \n");
  EXPECT_EQ(sys.openFlags()[0], O_RDONLY);
}

TEST(IsDevHDD, AtaDisksAndLargeUsbDisks) {
  FakeSystem sys;
  sys.AddBlockLink("sda", kAtaLink);
  sys.AddBlockLink("sdb", kUsbLink);
  sys.AddBlockLink("sdc", kUsbLink);
  sys.AddBlockLink("sdd", kUsbLink);
  sys.AddBlockLink("vda", "../../devices/pci0000:00/0000:00:04.0/virtio1/block/vda");
  sys.AddDevice("/dev/sdb").size = 16ULL << 30;           // 16 GiB stick
  sys.AddDevice("/dev/sdc").size = 500107862016ULL;       // 500 GB disk
  sys.AddDevice("/dev/sdd").size = 0x4000000000ULL;       // exactly 256 GiB

  testing::internal::CaptureStdout();
  EXPECT_EQ(IsDevHDD("sda"), 1);
  EXPECT_EQ(IsDevHDD("sdb"), 0);
  EXPECT_EQ(IsDevHDD("sdc"), 1);
  EXPECT_EQ(IsDevHDD("sdd"), 0);
  EXPECT_EQ(IsDevHDD("vda"), 0);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "IsDevHDD(): ATA HDD found \nExt USB HDD detected \n");
  // The ATA decision needs no device access.
  EXPECT_EQ(sys.opened(), (std::vector<std::string>{"/dev/sdb", "/dev/sdc", "/dev/sdd"}));
  EXPECT_EQ(sys.linksRead()[0], "/sys/class/block/sda");
}

TEST(IsDevHDD, NoLinkUnknownUsbSizeAndOverlongLink) {
  FakeSystem sys;
  sys.AddBlockLink("sdb", kUsbLink);  // no device: unknown size counts as a disk
  sys.AddBlockLink("sda", std::string(2000, 'x') + "/ata1/");
  testing::internal::CaptureStdout();
  EXPECT_EQ(IsDevHDD("sdq"), 0);
  EXPECT_EQ(IsDevHDD("sdb"), 1);
  EXPECT_EQ(IsDevHDD("sda"), 0);  // "ata" lies beyond the 1023 bytes read
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Device /dev/sdb open failed \nExt USB HDD detected \n");
  EXPECT_EQ(sys.opened(), (std::vector<std::string>{"/dev/sdb"}));
}

TEST(GetHDDTemperature, NoDiskOrNoDevice) {
  FakeSystem sys;
  testing::internal::CaptureStdout();
  EXPECT_EQ(GetHDDTemperature(), -1);
  sys.AddBlockLink("sdb", kAtaLink);
  EXPECT_EQ(GetHDDTemperature(), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "ATA HDD not found \nIsDevHDD(): ATA HDD found \nDevice open failed \n");
  EXPECT_EQ(sys.opened().back(), "/dev/sdb");
}

TEST(GetHDDTemperature, PrintsTheTemperatureAttributeEveryTenSeconds) {
  FakeSystem sys;
  sys.AddBlockLink("sda", kAtaLink);
  auto& sda = sys.AddDevice("/dev/sda");
  sda.attributes = {{9, 99, 99, {0x10, 0x27, 0, 0, 0, 0}},
                    {194, 36, 53, {36, 0, 18, 0, 53, 0}},
                    {197, 100, 100, {0, 0, 0, 0, 0, 0}}};
  sys.StopAfterSleeps(2);
  testing::internal::CaptureStdout();
  EXPECT_THROW(GetHDDTemperature(), StopLoop);
  const std::string once = "Current Val= 36 \n Worst Val= 53 \n Min = 18, Max = 53, value = 36\n";
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "IsDevHDD(): ATA HDD found \n" + once + once);
  EXPECT_EQ(sys.sleeps(), (std::vector<unsigned int>{10, 10}));
  EXPECT_EQ(sys.lastDriveCommand(), (std::array<unsigned char, 4>{0xB0, 0, 0xD0, 1}));
  EXPECT_EQ(sys.openFlags().back(), O_RDONLY | O_NONBLOCK);
}

TEST(GetHDDTemperature, LastTableSlotIsReadAndFailedReadsPrintNoValues) {
  FakeSystem sys;
  sys.AddBlockLink("sda", kAtaLink);
  auto& sda = sys.AddDevice("/dev/sda");
  sda.attributes.assign(29, {1, 100, 100, {0, 0, 0, 0, 0, 0}});
  sda.attributes.push_back({194, 40, 60, {41, 0, 20, 0, 55, 0}});
  testing::internal::CaptureStdout();
  EXPECT_THROW(GetHDDTemperature(), StopLoop);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "IsDevHDD(): ATA HDD found \nCurrent Val= 40 \n Worst Val= 60 \n "
            "Min = 20, Max = 55, value = 41\n");

  sda.smartFails = true;
  testing::internal::CaptureStdout();
  EXPECT_THROW(GetHDDTemperature(), StopLoop);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "IsDevHDD(): ATA HDD found \nHDIO_DRIVE_CMD failed\n");
}

}  // namespace
