// The disk probes over the simulated machine: identity, size, disk
// detection and the SMART loop, which print; then the probes that log: where
// the disk sits (the SCSI device count, the scan of sda .. sde, the SCSI
// generic bus), its vendor asked of hdparm, and its temperature read from
// smartctl's pipe.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "disk/fake_system.h"
#include "stbplat/disk.h"
#include "support/log_capture.h"

namespace {

using stbplat::test::FakeSystem;
using stbplat::test::kAtaLink;
using stbplat::test::kUsbLink;
using stbplat::test::LogCapture;
using stbplat::test::Texts;

const std::string kError = "\n\r[ErrorMsg] [";

std::string Column(int column) { return "{print $" + std::to_string(column) + "}"; }

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
    std::string link;
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
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.link.substr(0, 60));
    FakeSystem sys;
    sys.links["sdb"] = row.link;
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
  sys.links["sda"] = kAtaLink;
  auto& sda = sys.devices["/dev/sda"];
  // Temperature entries in the table's first and last slots, another one behind the table.
  sda.attributes.assign(30, {9, 0x32, 0, 99, 99, 0x10, 0x27, 0, 0, 0, 0, 0});
  sda.attributes[0] = {194, 0x22, 0, 36, 53, 41, 0, 18, 0, 55, 0, 0};
  sda.attributes[29] = {194, 0x22, 0, 37, 54, 42, 0, 19, 0, 56, 0, 0};
  sda.attributes.push_back({194, 0x22, 0, 1, 2, 3, 4, 5, 6, 7, 8, 0});
  sda.smartReads = 1;  // the second round's request fails and shows the cleared data
  sys.sleepsLeft = 2;
  EXPECT_THROW(GetHDDTemperature(), stbplat::test::StopLoop);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "ATA HDD not found \nIsDevHDD(): ATA HDD found \nDevice open failed \n"
            "IsDevHDD(): ATA HDD found \nCurrent Val= 36 \n Worst Val= 53 \n "
            "Min = 18, Max = 55, value = 41\nCurrent Val= 37 \n Worst Val= 54 \n "
            "Min = 19, Max = 56, value = 42\nHDIO_DRIVE_CMD failed\n");
  EXPECT_EQ(sys.sleeps, (std::vector<unsigned int>{10, 10}));
  EXPECT_EQ(sys.lastDriveCommand, (std::array<unsigned char, 4>{0xB0, 0, 0xD0, 1}));
}

TEST(HardDriveProbeNodePosition, CountsListedDevicesScansNoMoreNodesAndFindsTheHost) {
  FakeSystem sys;
  HardDriveNodeInfo drive;
  std::memset(&drive, 0xEE, sizeof drive);
  LogCapture log;
  EXPECT_EQ(HardDriveProbeNodePosition(&drive), 0);  // no list: all five nodes looked at
  const HardDriveNodeInfo cleared{0, HARD_DRIVE_BUS_UNKNOWN, HARD_DRIVE_NODE_COUNT, {}};
  EXPECT_EQ(std::memcmp(&drive, &cleared, sizeof drive), 0);
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 0);
  // The first entry's line is read in pieces of 255; the next piece starts with "Host:".
  sys.files["/proc/scsi/scsi"] = "Attached devices:\nHost: scsi0 " + std::string(243, 'x') +
                                 "Host: scsi9\nHost: scsi1 Channel: 00\n";
  sys.links["sda"] = kUsbLink;  // a small stick
  sys.devices["/dev/sda"].size = 8LL << 30;
  // Only a "/hostN/" component below 2^32 - 1 names the host.
  sys.links["sdc"] = "../../devices/hostx/host7x/host4294967295/ata3/host12/target12:0:0/block/sdc";
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 1);
  EXPECT_EQ(drive.scsiDeviceCount, 2u);
  EXPECT_EQ(HardDriveScanDeviceNode(&drive), 0);  // sdc lies beyond the two devices listed
  sys.files["/proc/scsi/scsi"] = "Attached devices:\n";
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 0);
  EXPECT_EQ(HardDriveScanDeviceNode(&drive), 1);  // every node again
  EXPECT_EQ(drive.deviceNode, 2);
  EXPECT_EQ(drive.scsiBus, 12u);
  const std::string sata = kError + "HardDriveProbeSataPosition] ";
  const std::string notFound = kError + "HardDriveScanDeviceNode] Hard Drive Not Found\n\r";
  const std::string noList = sata + "Failed To Open /proc/scsi/scsi\n\r";
  EXPECT_EQ(log.texts(),
            (Texts{noList, notFound, noList, notFound, sata + "No Scsi Device Attached\n\r"}));
  EXPECT_EQ(log.messages()[0].module, 18);
  EXPECT_EQ(log.messages()[0].level, 6u);
  EXPECT_EQ(log.messages()[0].sourceFile, "HardDriveTempUtils");
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
}

TEST(HardDriveGetVendorType, FirstPatternHdparmCountsAndEachPipeFailure) {
  FakeSystem sys;
  sys.pipes = {{"-c Model=To", "1\n"}, {"grep", "0\n"}};
  HardDriveNodeInfo sdd{0, 0, 3, {}};
  unsigned int vendor = 99;
  EXPECT_EQ(HardDriveGetVendorType(&sdd, &vendor), 1);
  EXPECT_EQ(vendor, 3u);
  EXPECT_EQ(sys.commands.size(), 4u);  // the vendors' columns below prove the patterns' order
  EXPECT_EQ(sys.commands.back(), "hdparm -i /dev/sdd 2>/dev/null | grep -i -c Model=To");
  LogCapture log;
  HardDriveNodeInfo sda{};
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
  EXPECT_EQ(log.texts(), (Texts{type + "Scan Model Failed\n\r", type + "Scan Model Failed\n\r",
                                closeFailed, closeFailed,
                                type + "Failed To Open The Pipe-Hdparm Node[/dev/sda]\n\r"}));
  EXPECT_EQ(HardDriveGetVendorType(nullptr, &vendor), 0);
}

TEST(HardDriveGetTemperatureData, OneReadingOrTheFailureOfEachStep) {
  FakeSystem sys;
  sys.pipes = {{Column(5), "300\n"}, {Column(4), "1234\n"}, {Column(12), "21\n"}};
  HardDriveNodeInfo sda{}, sde{0, 0, 4, {}}, sdf{0, 0, 5, {}};
  unsigned char value = 0;
  LogCapture log;
  EXPECT_EQ(HardDriveGetTemperatureData(&sde, 5, &value), 1);
  EXPECT_EQ(value, 300 & 0xFF);  // kept in 8 bits
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 4, &value), 1);
  EXPECT_EQ(value, 123);  // three digits at most
  EXPECT_EQ(sys.commands[0],
            "smartctl -d ata -A /dev/sde | grep -i Temperature_Celsius | awk '{print $5}' ");
  // Refused before any command runs.
  EXPECT_EQ(HardDriveGetTemperatureData(&sdf, 10, &value), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 10, nullptr), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 12, &value), 0);  // no "/max)"
  sys.pipeCloseFails = true;
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 10, &value), 0);  // nothing printed
  EXPECT_EQ(value, 123);
  EXPECT_EQ(HardDriveGetTemperatureData(&sde, 5, &value), 0);
  EXPECT_EQ(value, 44);  // stored before the close failed
  sys.pipeOpenFails = true;
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 5, &value), 0);
  const std::string data = kError + "HardDriveGetTemperatureData] ";
  const std::string scanFailed = data + "Scan Data Failed\n\r";
  EXPECT_EQ(log.texts(), (Texts{data + "Failed To Input Wrong Device Node Number (5)\n\r",
                                data + "pData : Null Pointer Assignment\n\r", scanFailed, scanFailed,
                                data + "Failed To Close The Pipe-Smartctl Node[/dev/sda]\n\r",
                                data + "Failed To Close The Pipe-Smartctl Node[/dev/sde]\n\r",
                                data + "Failed To Open The Pipe-Smartctl Node[/dev/sda]\n\r"}));
}

TEST(HardDriveGetTemperature, EachVendorsColumnsAndPair) {
  struct Row {
    const char* model;
    Texts columns;  // what awk prints for columns 4, 5, 10 and 12
    bool result;
    unsigned int current, highest;
  };
  const Row rows[] = {
      {"ST", {"", "53", "36", ""}, true, 36, 53},
      {"WD", {"100", "98", "40", ""}, true, 40, 42},
      {"WD", {"90", "100", "5", ""}, true, 5, 5u - 10u},  // worked out wide, kept in 32 bits
      {"Hi", {"", "", "35", "21/47)"}, true, 35, 47},
      {"To", {"", "", "38", "15/52)"}, true, 38, 52},
      // The first failed reading ends it with a zero pair.
      {"WD", {"", "98", "40", ""}, false, 0, 0},
      {"WD", {"100", "", "40", ""}, false, 0, 0},
      {"WD", {"100", "98", "", ""}, false, 0, 0},
      {"ST", {"", "53", "", ""}, false, 0, 0},
      {"Hi", {"", "", "35", ""}, false, 0, 0},
      {"XX", {"", "53", "36", ""}, false, 7, 7},  // no vendor: the pair is left alone
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(std::string(row.model) + " " + std::to_string(row.current));
    FakeSystem sys;
    sys.pipes = {{std::string("-c Model=") + row.model, "1\n"}, {"grep -i -c", "0\n"},
                 {Column(4), row.columns[0]}, {Column(5), row.columns[1]},
                 {Column(10), row.columns[2]}, {Column(12), row.columns[3]}};
    HardDriveNodeInfo drive{};
    unsigned int pair[2] = {7, 7};
    EXPECT_EQ(HardDriveGetTemperature(&drive, pair), row.result);
    EXPECT_EQ(pair[0], row.current);
    EXPECT_EQ(pair[1], row.highest);
  }
}

TEST(GetHdTemperature, NoDiskOrNoReading) {
  FakeSystem sys;
  int temperature = 99;
  LogCapture log;
  EXPECT_FALSE(GetHdTemperature(nullptr));
  EXPECT_FALSE(GetHdTemperature(&temperature));
  EXPECT_EQ(temperature, 99);
  sys.links["sda"] = kAtaLink;
  sys.pipes = {{"-c Model=To", "1\n"}, {"grep", "0\n"}, {Column(10), "38\n"}};
  EXPECT_FALSE(GetHdTemperature(&temperature));  // column 12 prints nothing
  EXPECT_EQ(temperature, 0);
  EXPECT_TRUE(log.Contains("ERROR... HDProbeNodePosition function failed\n"));
  EXPECT_EQ(log.texts().back(), "Drive Temperature was no available\n");
}

}  // namespace
