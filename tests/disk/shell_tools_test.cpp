// The vendor and temperature probes over real pipes: stand-in hdparm and
// smartctl scripts first on PATH print what the real tools print, and the
// real shell, grep and awk pick the columns.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
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

// Shortened outputs of `hdparm -i` and `smartctl -A`; the decoy lines hold
// the words the probes grep for in other columns.
std::string HdparmIdentity(const std::string& device, const std::string& modelLine) {
  return "\n" + device + ":\n\n " + modelLine +
         "\n Config={ HardSect NotMFM HdSw>15uSec Fixed DTR>10Mbs RotSpdTol>.5% }\n"
         " UDMA modes: udma0 udma1 udma2 udma3 udma4 udma5 *udma6 \n\n";
}

std::string SmartctlAttributes(const std::string& temperatureLine) {
  return "smartctl 7.3 2022-02-28 r5338 [x86_64-linux-6.1.0-18-amd64] (local build)\n\n"
         "ID# ATTRIBUTE_NAME          FLAG     VALUE WORST THRESH TYPE      UPDATED  "
         "WHEN_FAILED RAW_VALUE\n"
         "190 Airflow_Temperature_Cel 0x0022   064   047   045    Old_age   Always       -"
         "       36 (Min/Max 18/53)\n" +
         temperatureLine + "\n\n";
}

struct Drive {
  const char* name;
  const char* modelLine;        // as hdparm -i prints it
  const char* temperatureLine;  // attribute 194 as smartctl -A prints it
  unsigned int vendor;
  unsigned int current;
  unsigned int highest;
};

const Drive kSeagate = {
    "Seagate", "Model=ST2000DM001-1CH164, FwRev=CC27, SerialNo=Z1E6ABCD",
    "194 Temperature_Celsius 0x0022 036 053 000 Old_age Always - 36 (Min/Max 18/53)", 0, 36, 53};
const Drive kWesternDigital = {
    "Western Digital", "Model=WDC WD10EZEX-08WN4A0, FwRev=01.01A01, SerialNo=WD-WCC6Y0ABCDEF",
    "194 Temperature_Celsius     0x0022   112   100   000    Old_age   Always       -       35",
    1, 35, 47};
const Drive kHitachi = {
    "Hitachi", "Model=Hitachi HDS721010CLA332, FwRev=JP4OA3MA, SerialNo=JP2940HZ1ABCDE",
    "194 Temperature_Celsius     0x0002   176   176   000    Old_age   Always       -       34 "
    "(Min/Max 21/47)",
    2, 34, 47};
const Drive kToshiba = {
    "Toshiba", "Model=TOSHIBA DT01ACA100, FwRev=MS2OA750, SerialNo=Z3GABCDEF",
    "194 Temperature_Celsius     0x0022   100   100   000    Old_age   Always       -       38 "
    "(Min/Max 15/52)",
    3, 38, 52};

class ShellTools : public testing::Test {
 protected:
  void SetUp() override {
    char pattern[] = "/tmp/stbplat-tools-XXXXXX";
    ASSERT_NE(mkdtemp(pattern), nullptr);
    dir_ = pattern;
    for (const char* tool : {"hdparm", "smartctl"}) {
      const std::string script = dir_ + "/" + tool;
      Write(script, "#!/bin/sh\nprintf '%s\\n' \"$*\" >> \"" + dir_ + "/" + tool +
                        ".args\"\ncat \"" + dir_ + "/" + tool + ".out\"\n");
      ASSERT_EQ(chmod(script.c_str(), 0755), 0);
      Prints(tool, "");
    }
    const char* path = std::getenv("PATH");
    savedPath_ = path != nullptr ? path : "/usr/bin:/bin";
    setenv("PATH", (dir_ + ":" + savedPath_).c_str(), 1);
  }

  void TearDown() override {
    setenv("PATH", savedPath_.c_str(), 1);
    for (const char* file : {"hdparm", "smartctl", "hdparm.out", "smartctl.out", "hdparm.args",
                             "smartctl.args"})
      unlink((dir_ + "/" + file).c_str());
    rmdir(dir_.c_str());
  }

  void Prints(const std::string& tool, const std::string& text) {
    Write(dir_ + "/" + tool + ".out", text);
  }

  void Install(const Drive& drive, const std::string& device) {
    Prints("hdparm", HdparmIdentity(device, drive.modelLine));
    Prints("smartctl", SmartctlAttributes(drive.temperatureLine));
  }

  // The argument lines each stand-in was called with.
  std::vector<std::string> Calls(const std::string& tool) const {
    std::ifstream in(dir_ + "/" + tool + ".args");
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
  }

 private:
  static void Write(const std::string& path, const std::string& text) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    ASSERT_TRUE(out.good()) << path;
  }

  std::string dir_;
  std::string savedPath_;
};

HardDriveNodeInfo Node(unsigned char node) {
  HardDriveNodeInfo drive{};
  drive.deviceNode = node;
  return drive;
}

TEST_F(ShellTools, VendorFromHdparmIdentity) {
  const std::pair<std::string, unsigned int> models[] = {
      {kSeagate.modelLine, 0}, {kWesternDigital.modelLine, 1}, {kHitachi.modelLine, 2},
      {kToshiba.modelLine, 3}, {"MODEL=wdc wd5000aakx-00erma0, FwRev=15.01H15", 1}};
  for (const auto& m : models) {
    SCOPED_TRACE(m.first);
    FakeSystem sys;
    sys.UseRealPipes(true);
    Prints("hdparm", HdparmIdentity("/dev/sdb", m.first));
    HardDriveNodeInfo drive = Node(1);
    unsigned int vendor = 99;
    EXPECT_EQ(HardDriveGetVendorType(&drive, &vendor), 1);
    EXPECT_EQ(vendor, m.second);
  }
  EXPECT_EQ(Calls("hdparm"), std::vector<std::string>(1 + 2 + 3 + 4 + 2, "-i /dev/sdb"));
}

TEST_F(ShellTools, SilentHdparmMeansNoVendor) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  LogCapture log;
  HardDriveNodeInfo drive = Node(0);
  unsigned int vendor = 99;
  EXPECT_EQ(HardDriveGetVendorType(&drive, &vendor), 0);
  EXPECT_EQ(vendor, 4u);
  EXPECT_EQ(Calls("hdparm").size(), 4u);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{
                             "\n\r[ErrorMsg] [HardDriveGetVendorType] Hard Drive Vendor Not "
                             "Found\n\r"}));
}

TEST_F(ShellTools, ColumnsOfTheTemperatureLine) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  Install(kSeagate, "/dev/sdc");
  HardDriveNodeInfo drive = Node(2);
  const std::vector<std::pair<unsigned char, unsigned char>> columns = {
      {1, 194}, {4, 36}, {5, 53}, {6, 0}, {10, 36}, {12, 53}};
  for (const auto& c : columns) {
    unsigned char value = 0xEE;
    EXPECT_EQ(HardDriveGetTemperatureData(&drive, c.first, &value), 1) << int(c.first);
    EXPECT_EQ(value, c.second) << int(c.first);
  }
  unsigned char value = 0xEE;
  EXPECT_EQ(HardDriveGetTemperatureData(&drive, 2, &value), 0);  // "Temperature_Celsius"
  EXPECT_EQ(value, 0xEE);
  EXPECT_EQ(Calls("smartctl").front(), "-d ata -A /dev/sdc");
}

TEST_F(ShellTools, EachVendorsTemperaturePair) {
  for (const Drive* d : {&kSeagate, &kWesternDigital, &kHitachi, &kToshiba}) {
    SCOPED_TRACE(d->name);
    FakeSystem sys;
    sys.UseRealPipes(true);
    Install(*d, "/dev/sda");
    HardDriveNodeInfo drive = Node(0);
    unsigned int pair[2] = {0, 0};
    EXPECT_TRUE(HardDriveGetTemperature(&drive, pair));
    EXPECT_EQ(pair[0], d->current);
    EXPECT_EQ(pair[1], d->highest);
  }
}

TEST_F(ShellTools, SilentSmartctlFailsTheScan) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  Prints("hdparm", HdparmIdentity("/dev/sda", kSeagate.modelLine));
  LogCapture log;
  HardDriveNodeInfo drive = Node(0);
  unsigned int pair[2] = {5, 5};
  EXPECT_FALSE(HardDriveGetTemperature(&drive, pair));
  EXPECT_EQ(pair[0], 0u);
  EXPECT_EQ(pair[1], 0u);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{
                             "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Scan Data Failed\n\r"}));
  EXPECT_EQ(Calls("smartctl"), (std::vector<std::string>{"-d ata -A /dev/sda"}));
}

TEST_F(ShellTools, NodeFiveRunsNoTool) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  Install(kSeagate, "/dev/sda");
  LogCapture log;
  HardDriveNodeInfo drive = Node(5);
  unsigned int pair[2] = {5, 5};
  unsigned char value = 0;
  EXPECT_FALSE(HardDriveGetTemperature(&drive, pair));
  EXPECT_EQ(HardDriveGetTemperatureData(&drive, 10, &value), 0);
  EXPECT_TRUE(Calls("hdparm").empty());
  EXPECT_TRUE(Calls("smartctl").empty());
  EXPECT_EQ(log.texts(),
            (std::vector<std::string>{"\n\r[ErrorMsg] [HardDriveGetVendorType] Failed To Input "
                                      "Wrong Device Node Number (5)\n\r",
                                      "\n\r[ErrorMsg] [HardDriveGetTemperatureData] Failed To "
                                      "Input Wrong Device Node Number (5)\n\r"}));
}

const char* const kScsiList =
    "Attached devices:\n"
    "Host: scsi0 Channel: 00 Id: 00 Lun: 00\n"
    "  Vendor: ATA      Model: ST2000DM001-1CH1 Rev: CC27\n"
    "  Type:   Direct-Access                    ANSI  SCSI revision: 05\n"
    "Host: scsi6 Channel: 00 Id: 00 Lun: 00\n"
    "  Vendor: WDC WD10 Model: EZEX-08WN4A0     Rev: 1A01\n"
    "  Type:   Direct-Access                    ANSI  SCSI revision: 06\n";

TEST_F(ShellTools, GetHdTemperatureEndToEnd) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  sys.AddBlockLink("sda", kAtaLink);
  sys.AddFile("/proc/scsi/scsi", kScsiList);
  Install(kSeagate, "/dev/sda");
  LogCapture log;
  int temperature = -1;
  testing::internal::CaptureStdout();
  EXPECT_TRUE(GetHdTemperature(&temperature));
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "IsDevHDD(): ATA HDD found \n");
  EXPECT_EQ(temperature, 36);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"Current Temp = 36  :  High Temp = 53\n"}));
  EXPECT_EQ(log.messages()[0].function, "GetHdTemperature");
  EXPECT_EQ(Calls("hdparm"), (std::vector<std::string>{"-i /dev/sda"}));
  EXPECT_EQ(Calls("smartctl"),
            (std::vector<std::string>{"-d ata -A /dev/sda", "-d ata -A /dev/sda"}));
}

TEST_F(ShellTools, GetHdTemperatureOfAUsbDiskOnTheSecondNode) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  sys.AddBlockLink("sda", "../../devices/platform/soc/mmc0/block/sda");
  sys.AddBlockLink("sdb", kUsbLink);
  sys.AddDevice("/dev/sdb").size = 1000204886016ULL;
  sys.AddFile("/proc/scsi/scsi", kScsiList);
  Install(kWesternDigital, "/dev/sdb");
  LogCapture log;
  int temperature = -1;
  testing::internal::CaptureStdout();
  EXPECT_TRUE(GetHdTemperature(&temperature));
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "Ext USB HDD detected \n");
  EXPECT_EQ(temperature, 35);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"Current Temp = 35  :  High Temp = 47\n"}));
  EXPECT_EQ(Calls("smartctl").size(), 3u);
  EXPECT_EQ(Calls("smartctl").back(), "-d ata -A /dev/sdb");
}

TEST_F(ShellTools, GetHdTemperatureFailures) {
  FakeSystem sys;
  sys.UseRealPipes(true);
  sys.AddFile("/proc/scsi/scsi", kScsiList);
  int temperature = 99;
  {
    LogCapture log;
    EXPECT_FALSE(GetHdTemperature(&temperature));
    EXPECT_EQ(temperature, 99);
    EXPECT_TRUE(log.Contains("ERROR... HDProbeNodePosition function failed\n"));
    EXPECT_TRUE(Calls("hdparm").empty());
  }
  sys.AddBlockLink("sda", kAtaLink);
  Prints("hdparm", HdparmIdentity("/dev/sda", kToshiba.modelLine));  // smartctl prints nothing
  LogCapture log;
  testing::internal::CaptureStdout();
  EXPECT_FALSE(GetHdTemperature(&temperature));
  testing::internal::GetCapturedStdout();
  EXPECT_EQ(temperature, 0);
  EXPECT_EQ(log.texts().back(), "Drive Temperature was no available\n");
  EXPECT_FALSE(GetHdTemperature(nullptr));
}

}  // namespace
