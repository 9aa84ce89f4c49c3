// Where the disk sits: the SCSI device count, the scan of sda .. sde, the
// vendor asked of hdparm and the SCSI generic bus probe.
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
using Texts = std::vector<std::string>;

const std::string kError = "\n\r[ErrorMsg] [";

TEST(HardDriveProbeNodePosition, CountsListedDevicesAndScansNoMoreNodes) {
  FakeSystem sys;
  HardDriveNodeInfo drive;
  std::memset(&drive, 0xEE, sizeof drive);
  LogCapture log;
  EXPECT_EQ(HardDriveProbeNodePosition(&drive), 0);  // no list: all five nodes looked at
  EXPECT_EQ(sys.linksRead.size(), 5u);
  EXPECT_EQ(drive.scsiDeviceCount, 0u);
  EXPECT_EQ(drive.scsiBus, HARD_DRIVE_BUS_UNKNOWN);
  EXPECT_EQ(drive.deviceNode, HARD_DRIVE_NODE_COUNT);
  EXPECT_EQ(drive.reserved[0], 0);
  // The first entry's line is read in pieces of 255; the next piece starts with "Host:".
  sys.files["/proc/scsi/scsi"] = "Attached devices:\nHost: scsi0 " + std::string(243, 'x') +
                                 "Host: scsi9\n  Vendor: ATA\n";
  sys.links["sdb"] = kAtaLink;
  EXPECT_EQ(HardDriveProbeNodePosition(&drive), 0);
  EXPECT_EQ(drive.scsiDeviceCount, 1u);
  sys.files["/proc/scsi/scsi"] = "Attached devices:\n";
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 0);
  const std::string sata = kError + "HardDriveProbeSataPosition] ";
  const std::string notFound = kError + "HardDriveScanDeviceNode] Hard Drive Not Found\n\r";
  EXPECT_EQ(log.texts(), (Texts{sata + "Failed To Open /proc/scsi/scsi\n\r", notFound, notFound,
                                sata + "No Scsi Device Attached\n\r"}));
  EXPECT_EQ(log.messages()[0].module, 18);
  EXPECT_EQ(log.messages()[0].level, 6u);
  EXPECT_EQ(log.messages()[0].sourceFile, "HardDriveTempUtils");
  EXPECT_EQ(HardDriveProbeNodePosition(nullptr), 0);
}

TEST(HardDriveScanDeviceNode, FirstDiskAndTheHostOfItsLink) {
  FakeSystem sys;
  sys.links["sda"] = kUsbLink;  // a small stick
  sys.devices["/dev/sda"].size = 8LL << 30;
  // Only a "/hostN/" component below 2^32 - 1 names the host.
  sys.links["sdb"] = "../../devices/hostx/host7x/host4294967295/ata3/host12/target12:0:0/block/sdb";
  HardDriveNodeInfo drive{};
  testing::internal::CaptureStdout();
  EXPECT_EQ(HardDriveScanDeviceNode(&drive), 1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "IsDevHDD(): ATA HDD found \n");
  EXPECT_EQ(drive.deviceNode, 1);
  EXPECT_EQ(drive.scsiBus, 12u);
}

TEST(HardDriveGetVendorType, FirstPatternHdparmCountsAndEachFailure) {
  FakeSystem sys;
  sys.pipes = {{"-c Model=To", "1\n"}, {"grep", "0\n"}};
  HardDriveNodeInfo sdd{0, 0, 3, {}};
  unsigned int vendor = 99;
  EXPECT_EQ(HardDriveGetVendorType(&sdd, &vendor), 1);
  EXPECT_EQ(vendor, 3u);
  Texts commands;
  for (const char* model : {"ST", "WD", "Hi", "To"})
    commands.push_back(std::string("hdparm -i /dev/sdd 2>/dev/null | grep -i -c Model=") + model);
  EXPECT_EQ(sys.commands, commands);
  LogCapture log;
  HardDriveNodeInfo sda{}, sdf{0, 0, 5, {}};
  EXPECT_EQ(HardDriveGetVendorType(&sdf, &vendor), 0);
  sys.pipes = {{"grep", "0\n"}};
  EXPECT_EQ(HardDriveGetVendorType(&sda, &vendor), 0);
  sys.pipes.clear();
  EXPECT_EQ(HardDriveGetVendorType(&sda, &vendor), 0);  // hdparm prints nothing
  sys.pipeCloseFails = true;
  EXPECT_EQ(HardDriveGetVendorType(&sda, &vendor), 0);
  sys.pipes = {{"Model=ST", "1\n"}};
  EXPECT_EQ(HardDriveGetVendorType(&sda, &vendor), 0);  // a match is lost with its pipe
  EXPECT_EQ(vendor, 4u);
  sys.pipeOpenFails = true;
  EXPECT_EQ(HardDriveGetVendorType(&sda, &vendor), 0);
  const std::string type = kError + "HardDriveGetVendorType] ";
  const std::string closeFailed = type + "Failed To Close The Pipe-Hdparm Node[/dev/sda]\n\r";
  EXPECT_EQ(log.texts(), (Texts{type + "Failed To Input Wrong Device Node Number (5)\n\r",
                                type + "Hard Drive Vendor Not Found\n\r",
                                type + "Scan Model Failed\n\r", type + "Scan Model Failed\n\r",
                                closeFailed, closeFailed,
                                type + "Failed To Open The Pipe-Hdparm Node[/dev/sda]\n\r"}));
  EXPECT_EQ(HardDriveGetVendorType(nullptr, &vendor), 0);
  EXPECT_EQ(HardDriveGetVendorType(&sda, nullptr), 0);
}

TEST(HardDriveProbeScsiBusPosition, BusAmongTheGenericDevices) {
  FakeSystem sys;
  sys.devices["/dev/sg1"].bus = 0;
  sys.devices["/dev/sg2"].bus = 3;
  LogCapture log;
  unsigned int found = 0;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(3, &found), 1);
  EXPECT_EQ(found, 3u);  // the bus, not the device's index
  EXPECT_EQ(HardDriveProbeScsiBusPosition(7, &found), 0);
  EXPECT_EQ(found, 5u);
  sys.devices["/dev/sg0"].bus = -1;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(3, &found), 0);
  const std::string probe = kError + "HardDriveProbeScsiBusPosition] ";
  EXPECT_EQ(log.texts(), (Texts{probe + "Scsi Device7 Bus3 Not Found\n\r",
                                probe + "Failed On SCSI_IOCTL_GET_BUS_NUMBER\n\r"}));
  EXPECT_EQ(sys.opened, (Texts{"/dev/sg0", "/dev/sg1", "/dev/sg2", "/dev/sg0", "/dev/sg1",
                               "/dev/sg2", "/dev/sg3", "/dev/sg4", "/dev/sg0"}));
  EXPECT_EQ(HardDriveProbeScsiBusPosition(0, nullptr), 0);
}

}  // namespace
