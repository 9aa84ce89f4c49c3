// Temperature readings through smartctl's pipe, simulated: argument checks,
// scanning, 8-bit readings, each vendor's columns and arithmetic, and the
// entry point that finds the disk first.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "disk/fake_system.h"
#include "stbplat/disk.h"
#include "support/log_capture.h"

namespace {

using stbplat::test::FakeSystem;
using stbplat::test::LogCapture;
using Texts = std::vector<std::string>;

std::string Column(int column) { return "{print $" + std::to_string(column) + "}"; }

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
  EXPECT_EQ(sys.commands, (Texts{"smartctl -d ata -A /dev/sde | grep -i Temperature_Celsius | "
                                 "awk '{print $5}' ",
                                 "smartctl -d ata -A /dev/sda | grep -i Temperature_Celsius | "
                                 "awk '{print $4}' "}));
  // Refused before any command runs.
  EXPECT_EQ(HardDriveGetTemperatureData(&sdf, 10, &value), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 13, &value), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 10, nullptr), 0);
  EXPECT_EQ(HardDriveGetTemperatureData(nullptr, 10, &value), 0);
  EXPECT_EQ(sys.commands.size(), 2u);
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 12, &value), 0);  // no "/max)"
  sys.pipeCloseFails = true;
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 10, &value), 0);  // nothing printed
  EXPECT_EQ(value, 123);
  EXPECT_EQ(HardDriveGetTemperatureData(&sde, 5, &value), 0);
  EXPECT_EQ(value, 44);  // stored before the close failed
  sys.pipeOpenFails = true;
  EXPECT_EQ(HardDriveGetTemperatureData(&sda, 5, &value), 0);
  const std::string data = "\n\r[ErrorMsg] [HardDriveGetTemperatureData] ";
  const std::string scanFailed = data + "Scan Data Failed\n\r";
  EXPECT_EQ(log.texts(), (Texts{data + "Failed To Input Wrong Device Node Number (5)\n\r",
                                data + "Failed To Input Wrong Offset (13)\n\r",
                                data + "pData : Null Pointer Assignment\n\r", scanFailed,
                                scanFailed, data + "Failed To Close The Pipe-Smartctl Node[/dev/sda]\n\r",
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
      // Worked out wide and kept in 32 bits.
      {"WD", {"90", "100", "5", ""}, true, 5, 5u - 10u},
      {"Hi", {"", "", "35", "21/47)"}, true, 35, 47},
      {"To", {"", "", "38", "15/52)"}, true, 38, 52},
      // The first failed reading ends it with a zero pair.
      {"WD", {"100", "", "40", ""}, false, 0, 0},
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
  HardDriveNodeInfo drive{};
  unsigned int pair[2] = {0, 0};
  EXPECT_FALSE(HardDriveGetTemperature(&drive, nullptr));
  EXPECT_FALSE(HardDriveGetTemperature(nullptr, pair));
}

TEST(GetHdTemperature, NoDiskOrNoReading) {
  FakeSystem sys;
  int temperature = 99;
  LogCapture log;
  EXPECT_FALSE(GetHdTemperature(&temperature));
  EXPECT_EQ(temperature, 99);
  sys.links["sda"] = stbplat::test::kAtaLink;
  sys.pipes = {{"-c Model=To", "1\n"}, {"grep", "0\n"}, {Column(10), "38\n"}};
  testing::internal::CaptureStdout();
  EXPECT_FALSE(GetHdTemperature(&temperature));  // column 12 prints nothing
  testing::internal::GetCapturedStdout();
  EXPECT_EQ(temperature, 0);
  EXPECT_TRUE(log.Contains("ERROR... HDProbeNodePosition function failed\n"));
  EXPECT_EQ(log.texts().back(), "Drive Temperature was no available\n");
  EXPECT_FALSE(GetHdTemperature(nullptr));
}

}  // namespace
