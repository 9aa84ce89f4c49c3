// Finding the disk's node: the SCSI device count and the scan of sda .. sde.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "disk/fake_system.h"
#include "stbplat/disk.h"
#include "support/log_capture.h"

namespace {

using stbplat::test::FakeSystem;
using stbplat::test::kAtaLink;
using stbplat::test::kUsbLink;
using stbplat::test::LogCapture;

const char* const kTwoDevices =
    "Attached devices:\n"
    "Host: scsi0 Channel: 00 Id: 00 Lun: 00\n"
    "  Vendor: ATA      Model: ST2000DM001-1CH1 Rev: CC27\n"
    "  Type:   Direct-Access                    ANSI  SCSI revision: 05\n"
    "Host: scsi1 Channel: 00 Id: 00 Lun: 00\n"
    "  Vendor: QEMU     Model: QEMU DVD-ROM     Rev: 2.5+\n"
    "  Type:   CD-ROM                           ANSI  SCSI revision: 05\n";

std::vector<std::string> SysBlock(const std::vector<std::string>& names) {
  std::vector<std::string> paths;
  for (const std::string& name : names) paths.push_back("/sys/class/block/" + name);
  return paths;
}

TEST(HardDriveProbeSataPosition, CountsTheListedDevicesLongLinesOnce) {
  FakeSystem sys;
  sys.AddFile("/proc/scsi/scsi", kTwoDevices);
  HardDriveNodeInfo drive{};
  drive.scsiDeviceCount = 9;
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 1);
  EXPECT_EQ(drive.scsiDeviceCount, 2u);
  // The 255-character reads of the first entry's line end right before "Host: scsi9".
  sys.AddFile("/proc/scsi/scsi", "Attached devices:\nHost: scsi0 " + std::string(243, 'x') +
                                     "Host: scsi9\nHost: scsi1 Channel: 00\n");
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 1);
  EXPECT_EQ(drive.scsiDeviceCount, 2u);
}

TEST(HardDriveProbeSataPosition, EmptyOrMissingList) {
  FakeSystem sys;
  HardDriveNodeInfo drive{};
  {
    LogCapture log;
    EXPECT_EQ(HardDriveProbeSataPosition(&drive), 0);
    EXPECT_EQ(log.texts(), (std::vector<std::string>{"\n\r[ErrorMsg] [HardDriveProbeSataPosition] "
                                                     "Failed To Open /proc/scsi/scsi\n\r"}));
  }
  sys.AddFile("/proc/scsi/scsi", "Attached devices:\n");
  LogCapture log;
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 0);
  EXPECT_EQ(drive.scsiDeviceCount, 0u);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"\n\r[ErrorMsg] [HardDriveProbeSataPosition] No "
                                                   "Scsi Device Attached\n\r"}));
  EXPECT_EQ(HardDriveProbeSataPosition(nullptr), 0);
}

TEST(HardDriveScanDeviceNode, LooksAtNoMoreNodesThanDevicesListed) {
  FakeSystem sys;
  sys.AddBlockLink("sdc", kAtaLink);
  HardDriveNodeInfo drive{};
  drive.scsiDeviceCount = 2;
  LogCapture log;
  testing::internal::CaptureStdout();
  EXPECT_EQ(HardDriveScanDeviceNode(&drive), 0);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
  EXPECT_EQ(sys.linksRead(), SysBlock({"sda", "sdb"}));
  EXPECT_EQ(log.texts(), (std::vector<std::string>{
                             "\n\r[ErrorMsg] [HardDriveScanDeviceNode] Hard Drive Not Found\n\r"}));
}

TEST(HardDriveScanDeviceNode, RecordsTheFirstDiskAndItsScsiHost) {
  FakeSystem sys;
  sys.AddBlockLink("sda", kUsbLink);  // a small stick
  sys.AddDevice("/dev/sda").size = 8ULL << 30;
  sys.AddBlockLink("sdb", "../../devices/platform/ahci/ata3/host12/target12:0:0/12:0:0:0/block/sdb");
  sys.AddBlockLink("sdc", kAtaLink);
  HardDriveNodeInfo drive{};
  testing::internal::CaptureStdout();
  EXPECT_EQ(HardDriveScanDeviceNode(&drive), 1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "IsDevHDD(): ATA HDD found \n");
  EXPECT_EQ(drive.deviceNode, 1);
  EXPECT_EQ(drive.scsiBus, 12u);
}

TEST(HardDriveProbeNodePosition, ScansEveryNodeWithoutTheList) {
  FakeSystem sys;
  sys.AddBlockLink("sde", "../../devices/platform/sata/ata5/block/sde");  // no host
  HardDriveNodeInfo drive;
  std::memset(&drive, 0xEE, sizeof drive);
  testing::internal::CaptureStdout();
  EXPECT_EQ(HardDriveProbeNodePosition(&drive), 1);
  testing::internal::GetCapturedStdout();
  EXPECT_EQ(drive.scsiDeviceCount, 0u);
  EXPECT_EQ(drive.deviceNode, 4);
  EXPECT_EQ(drive.scsiBus, HARD_DRIVE_BUS_UNKNOWN);
  EXPECT_EQ(drive.reserved[0], 0);
}

TEST(HardDriveProbeNodePosition, NothingFound) {
  FakeSystem sys;
  HardDriveNodeInfo drive{};
  EXPECT_EQ(HardDriveProbeNodePosition(&drive), 0);
  EXPECT_EQ(drive.deviceNode, HARD_DRIVE_NODE_COUNT);
  EXPECT_EQ(sys.linksRead(), SysBlock({"sda", "sdb", "sdc", "sdd", "sde"}));
  EXPECT_EQ(HardDriveProbeNodePosition(nullptr), 0);
}

}  // namespace
