// Vendor lookup through hdparm's pipe and the SCSI generic bus probe, with
// simulated pipes and devices.
#include <fcntl.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "disk/fake_system.h"
#include "stbplat/disk.h"
#include "support/log_capture.h"

namespace {

using stbplat::test::FakeSystem;
using stbplat::test::LogCapture;

HardDriveNodeInfo Drive(unsigned char node) {
  HardDriveNodeInfo drive{};
  drive.deviceNode = node;
  return drive;
}

void ExpectTraces(const LogCapture& log, const std::vector<std::string>& texts) {
  EXPECT_EQ(log.texts(), texts);
  for (const auto& m : log.messages()) {
    EXPECT_EQ(m.module, 18);
    EXPECT_EQ(m.level, 6u);
    EXPECT_EQ(m.sourceFile, "HardDriveTempUtils");
  }
}

TEST(HardDriveGetVendorType, PipeFailures) {
  FakeSystem sys;
  HardDriveNodeInfo drive = Drive(0);
  unsigned int vendor = 0;
  {
    LogCapture log;
    sys.FailPipeOpen(true);
    EXPECT_EQ(HardDriveGetVendorType(&drive, &vendor), 0);
    ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveGetVendorType] Failed To Open The Pipe-Hdparm "
                       "Node[/dev/sda]\n\r"});
    sys.FailPipeOpen(false);
  }
  {
    LogCapture log;  // nothing to scan
    EXPECT_EQ(HardDriveGetVendorType(&drive, &vendor), 0);
    ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveGetVendorType] Scan Model Failed\n\r"});
  }
  {
    LogCapture log;  // nothing to scan and the close fails too
    sys.FailPipeClose(true);
    EXPECT_EQ(HardDriveGetVendorType(&drive, &vendor), 0);
    ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveGetVendorType] Scan Model Failed\n\r",
                       "\n\r[ErrorMsg] [HardDriveGetVendorType] Failed To Close The Pipe-Hdparm "
                       "Node[/dev/sda]\n\r"});
  }
  {
    LogCapture log;  // a match is lost when its pipe does not close
    sys.SetPipeOutput("Model=ST", "1\n");
    EXPECT_EQ(HardDriveGetVendorType(&drive, &vendor), 0);
    EXPECT_EQ(vendor, 4u);
    ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveGetVendorType] Failed To Close The Pipe-Hdparm "
                       "Node[/dev/sda]\n\r"});
  }
  EXPECT_EQ(HardDriveGetVendorType(nullptr, &vendor), 0);
  EXPECT_EQ(HardDriveGetVendorType(&drive, nullptr), 0);
}

TEST(HardDriveProbeScsiBusPosition, FindsTheBusAmongTheGenericDevices) {
  FakeSystem sys;
  sys.AddDevice("/dev/sg1").bus = 0;
  sys.AddDevice("/dev/sg2").bus = 3;
  LogCapture log;
  unsigned int found = 0;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(3, &found), 1);
  EXPECT_EQ(found, 3u);
  EXPECT_EQ(sys.opened(), (std::vector<std::string>{"/dev/sg0", "/dev/sg1", "/dev/sg2"}));
  EXPECT_EQ(sys.openFlags()[1], O_RDONLY | O_NONBLOCK);
  EXPECT_EQ(sys.openModes()[1], 0644u);
  EXPECT_TRUE(log.messages().empty());
}

TEST(HardDriveProbeScsiBusPosition, MissingBusNamesTheLastNumberRead) {
  FakeSystem sys;
  sys.AddDevice("/dev/sg0").bus = 0;
  sys.AddDevice("/dev/sg3").bus = 2;
  LogCapture log;
  unsigned int found = 0;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(7, &found), 0);
  EXPECT_EQ(found, 5u);
  EXPECT_EQ(sys.opened().size(), 5u);
  ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveProbeScsiBusPosition] Scsi Device7 Bus2 Not "
                     "Found\n\r"});
}

TEST(HardDriveProbeScsiBusPosition, NoGenericDevicesOrAFailedRequest) {
  FakeSystem sys;
  unsigned int found = 0;
  {
    LogCapture log;
    EXPECT_EQ(HardDriveProbeScsiBusPosition(0, &found), 0);
    ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveProbeScsiBusPosition] Scsi Device0 Bus-1 Not "
                       "Found\n\r"});
  }
  sys.AddDevice("/dev/sg0").busFails = true;
  sys.AddDevice("/dev/sg1").bus = 0;
  LogCapture log;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(0, &found), 0);
  EXPECT_EQ(found, 5u);
  ExpectTraces(log, {"\n\r[ErrorMsg] [HardDriveProbeScsiBusPosition] Failed On "
                     "SCSI_IOCTL_GET_BUS_NUMBER\n\r"});
  EXPECT_EQ(HardDriveProbeScsiBusPosition(0, nullptr), 0);
}

}  // namespace
