// Temperature readings through smartctl's pipe, simulated: column checks,
// scanning, 8-bit readings and each vendor's arithmetic.
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

std::string Smartctl(const char* device, int column) {
  return std::string("smartctl -d ata -A ") + device +
         " | grep -i Temperature_Celsius | awk '{print $" + std::to_string(column) + "}' ";
}

// Simulated answers of hdparm (one vendor matches) and of each awk column.
void Vendor(FakeSystem& sys, const char* pattern) {
  sys.SetPipeOutput(std::string("-c ") + pattern, "1\n");
  sys.SetPipeOutput("grep -i -c", "0\n");
}
void Column(FakeSystem& sys, int column, const std::string& output) {
  sys.SetPipeOutput("{print $" + std::to_string(column) + "}", output);
}

TEST(HardDriveGetTemperatureData, ArgumentChecksComeBeforeAnyCommand) {
  FakeSystem sys;
  unsigned char value = 7;
  HardDriveNodeInfo bad = Drive(5);
  HardDriveNodeInfo good = Drive(0);
  LogCapture log;
  EXPECT_EQ(HardDriveGetTemperatureData(&bad, 13, &value), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(&good, 13, &value), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(&good, 10, nullptr), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(nullptr, 10, &value), 0);
  EXPECT_TRUE(sys.commands().empty());
  EXPECT_EQ(value, 7);
  EXPECT_EQ(log.texts(),
            (std::vector<std::string>{
                "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Failed To Input Wrong Device Node "
                "Number (5)\n\r",
                "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Failed To Input Wrong Offset "
                "(13)\n\r",
                "\n\r[ErrorMsg] [HardDriveGetTemperatureData] pData : Null Pointer "
                "Assignment\n\r"}));
}

TEST(HardDriveGetTemperatureData, ScansOneColumnIntoEightBits) {
  FakeSystem sys;
  Column(sys, 10, "36\n");
  Column(sys, 5, "300\n");
  Column(sys, 4, "1234\n");
  Column(sys, 12, "21/47)\n");
  HardDriveNodeInfo drive = Drive(1);
  unsigned char value = 0;
  EXPECT_EQ(HardDriveGetTemperatureData(&drive, 10, &value), 1);
  EXPECT_EQ(value, 36);
  EXPECT_EQ(HardDriveGetTemperatureData(&drive, 5, &value), 1);
  EXPECT_EQ(value, 300 & 0xFF);
  EXPECT_EQ(HardDriveGetTemperatureData(&drive, 4, &value), 1);
  EXPECT_EQ(value, 123);  // three digits at most
  EXPECT_EQ(HardDriveGetTemperatureData(&drive, 12, &value), 1);
  EXPECT_EQ(value, 47);
  EXPECT_EQ(sys.commands()[0], Smartctl("/dev/sdb", 10));
  EXPECT_EQ(sys.commands()[3], Smartctl("/dev/sdb", 12));
}

TEST(HardDriveGetTemperatureData, ScanAndPipeFailures) {
  FakeSystem sys;
  Column(sys, 12, "21\n");  // no "/max)" part
  HardDriveNodeInfo drive = Drive(0);
  unsigned char value = 9;
  {
    LogCapture log;
    EXPECT_EQ(HardDriveGetTemperatureData(&drive, 10, &value), 0);  // prints nothing
    EXPECT_EQ(HardDriveGetTemperatureData(&drive, 12, &value), 0);
    EXPECT_EQ(log.texts(), (std::vector<std::string>(
                               2, "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Scan Data "
                                  "Failed\n\r")));
    EXPECT_EQ(value, 9);
  }
  {
    LogCapture log;
    sys.FailPipeOpen(true);
    EXPECT_EQ(HardDriveGetTemperatureData(&drive, 10, &value), 0);
    EXPECT_EQ(log.texts(), (std::vector<std::string>{
                               "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Failed To Open The "
                               "Pipe-Smartctl Node[/dev/sda]\n\r"}));
    sys.FailPipeOpen(false);
  }
  {
    LogCapture log;
    Column(sys, 10, "40\n");
    sys.FailPipeClose(true);
    EXPECT_EQ(HardDriveGetTemperatureData(&drive, 10, &value), 0);
    EXPECT_EQ(log.texts(), (std::vector<std::string>{
                               "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Failed To Close The "
                               "Pipe-Smartctl Node[/dev/sda]\n\r"}));
  }
}

TEST(HardDriveGetTemperature, WesternDigitalDifferenceWrapsInThirtyTwoBits) {
  FakeSystem sys;
  Vendor(sys, "Model=WD");
  Column(sys, 4, "90\n");
  Column(sys, 5, "100\n");
  Column(sys, 10, "5\n");
  HardDriveNodeInfo drive = Drive(0);
  unsigned int pair[2] = {0, 0};
  EXPECT_TRUE(HardDriveGetTemperature(&drive, pair));
  EXPECT_EQ(pair[0], 5u);
  EXPECT_EQ(pair[1], static_cast<unsigned int>(5 + (90 - 100)));
}

TEST(HardDriveGetTemperature, AFailedReadingStopsWithAZeroPair) {
  FakeSystem sys;
  Vendor(sys, "Model=WD");
  Column(sys, 4, "100\n");  // column 5 prints nothing
  Column(sys, 10, "40\n");
  HardDriveNodeInfo drive = Drive(0);
  unsigned int pair[2] = {7, 7};
  EXPECT_FALSE(HardDriveGetTemperature(&drive, pair));
  EXPECT_EQ(pair[0], 0u);
  EXPECT_EQ(pair[1], 0u);
  EXPECT_EQ(sys.commands().back(), Smartctl("/dev/sda", 5));
}

TEST(HardDriveGetTemperature, UnknownVendorLeavesThePair) {
  FakeSystem sys;
  sys.SetPipeOutput("grep -i -c", "0\n");
  HardDriveNodeInfo drive = Drive(0);
  unsigned int pair[2] = {7, 7};
  EXPECT_FALSE(HardDriveGetTemperature(&drive, pair));
  EXPECT_EQ(pair[0], 7u);
  EXPECT_EQ(sys.commands().size(), 4u);
  EXPECT_FALSE(HardDriveGetTemperature(&drive, nullptr));
  EXPECT_FALSE(HardDriveGetTemperature(nullptr, pair));
}

}  // namespace
