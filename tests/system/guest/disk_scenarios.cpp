// Disk probing against the emulated AHCI disk (/dev/sda, model
// ST1000DM003-1SB102, 256 MiB) and the virtio disk (/dev/vda, 64 MiB).
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "harness.h"
#include "stbplat/disk.h"

using namespace systest;

namespace {

constexpr unsigned int kSeagate = 0;
constexpr const char* kAtaFound = "IsDevHDD(): ATA HDD found \n";

// What smartctl itself prints in one column of the temperature line, as the
// library's pipe would see it.
std::string SmartColumn(int column) {
  std::string out = ShellOutput("smartctl -d ata -A /dev/sda | grep -i Temperature_Celsius | awk '{print $" +
                                std::to_string(column) + "}'");
  while (!out.empty() && (out.back() == '\n' || out.back() == ' ')) out.pop_back();
  return out;
}

}  // namespace

SCENARIO("disk.is_dev_hdd") {
  // The virtio disk sits on neither ATA nor USB.
  const struct {
    const char* name;
    int found;
    const char* printed;
  } disks[] = {{"sda", 1, kAtaFound}, {"vda", 0, ""}, {"sdq", 0, ""}};
  for (const auto& disk : disks) {
    int found = -1;
    CHECK_EQ(CaptureStdout([&] { found = IsDevHDD(disk.name); }), disk.printed);
    CHECK_EQ(found, disk.found);
  }
}

SCENARIO("disk.blk_dev_size") {
  CHECK_EQ(GetBlkDevSize("sda"), 256ul << 20);
  CHECK_EQ(GetBlkDevSize("vda"), 64ul << 20);
  unsigned long size = 0;
  CHECK_EQ(CaptureStdout([&] { size = GetBlkDevSize("sdq"); }), "Device /dev/sdq open failed \n");
  CHECK_EQ(size, ~0ul);
}

SCENARIO("disk.vendor_info") {
  char sda[] = "sda", missing[] = "sdq";
  int rc = -2;
  std::string text = CaptureStdout([&] { rc = GetVendorInfo(sda); });
  CHECK_EQ(rc, 0);
  // ATA strings are space-padded to their field width (40 for the model).
  CHECK(text.find("Hard Disk Model: ST1000DM003-1SB102" + std::string(40 - 18, ' ') + "\n") != std::string::npos);
  CHECK(text.find("  Serial Number: ") != std::string::npos);
  CHECK(text.find("Z9A0SYS1") != std::string::npos);
  Info("GetVendorInfo(sda): " + text.substr(0, text.find('\n')));
  CHECK_EQ(CaptureStdout([&] { rc = GetVendorInfo(missing); }), "ERROR: Cannot open device \n");
  CHECK_EQ(rc, -1);
}

SCENARIO("disk.vendor_type") {
  // sdb does not exist: hdparm finds no model, every pattern misses.
  const struct {
    unsigned char node;
    int found;
    unsigned int vendor;
    const char* logged;
  } drives[] = {{0, 1, kSeagate, ""},
                {1, 0, HARD_DRIVE_VENDOR_NONE, "Hard Drive Vendor Not Found"},
                {5, 0, HARD_DRIVE_VENDOR_NONE, "Failed To Input Wrong Device Node Number (5)"}};
  for (const auto& expected : drives) {
    HardDriveNodeInfo drive{};
    drive.deviceNode = expected.node;
    unsigned int vendor = 99;
    ClearLog();
    CHECK_EQ(HardDriveGetVendorType(&drive, &vendor), expected.found);
    CHECK_EQ(vendor, expected.vendor);
    if (*expected.logged) CHECK_LOG(expected.logged);
  }
}

SCENARIO("disk.node_position") {
  HardDriveNodeInfo drive{};
  CHECK_EQ(HardDriveProbeNodePosition(&drive), 1);
  CHECK_EQ(static_cast<int>(drive.deviceNode), 0);
  Info("HardDriveProbeNodePosition: node " + std::to_string(drive.deviceNode) + ", scsiBus " +
       std::to_string(drive.scsiBus) + ", scsiDeviceCount " + std::to_string(drive.scsiDeviceCount));
  REQUIRE(drive.scsiBus != HARD_DRIVE_BUS_UNKNOWN);
  unsigned int found = 0;
  CHECK_EQ(HardDriveProbeScsiBusPosition(drive.scsiBus, &found), 1);
  CHECK_EQ(found, drive.scsiBus);
  ClearLog();
  CHECK_EQ(HardDriveProbeScsiBusPosition(drive.scsiBus + 7, &found), 0);
  CHECK_EQ(found, 5u);
  CHECK_LOG("Not Found");
}

SCENARIO("disk.temperature") {
  // Expected readings straight from smartctl: raw value (column 10), worst
  // (column 5) and the max of "(Min/Max a/b)" (column 12).
  std::string raw = SmartColumn(10), worst = SmartColumn(5), minmax = SmartColumn(12);
  Info("smartctl Temperature_Celsius columns: raw " + raw + ", worst " + worst + ", min/max " + minmax);
  REQUIRE(!raw.empty() && !worst.empty() && !minmax.empty());
  const unsigned int current = std::stoi(raw), highest = std::stoi(worst);

  HardDriveNodeInfo drive{};
  unsigned char value = 0;
  CHECK_EQ(HardDriveGetTemperatureData(&drive, 10, &value), 1);
  CHECK_EQ(static_cast<unsigned int>(value), current);
  CHECK_EQ(HardDriveGetTemperatureData(&drive, 12, &value), 1);
  CHECK_EQ(static_cast<int>(value), std::stoi(minmax.substr(minmax.find('/') + 1)));
  CHECK_EQ(HardDriveGetTemperatureData(&drive, 13, &value), 0);
  CHECK_LOG("Failed To Input Wrong Offset (13)");

  // Seagate: current from column 10, highest from column 5.
  unsigned int pair[2] = {7, 7};
  CHECK(HardDriveGetTemperature(&drive, pair));
  CHECK_EQ(pair[0], current);
  CHECK_EQ(pair[1], highest);
  int temperature = -1;
  ClearLog();
  CHECK(GetHdTemperature(&temperature));
  CHECK_EQ(temperature, static_cast<int>(current));
  CHECK_LOG("Current Temp = " + std::to_string(current) + "  :  High Temp = " + std::to_string(highest) + "\n");
  Info("GetHdTemperature: " + std::to_string(temperature) + " C");
}

// The diagnostic loop never returns: run it in a child for one round. The
// emulated disk answers SMART READ DATA but has no attribute 194, so the
// round prints only the disk detection line.
SCENARIO("disk.smart_loop") {
  pid_t done = -1;
  std::string text = CaptureStdout([&] {
    pid_t child = fork();
    if (child == 0) {
      std::setvbuf(stdout, nullptr, _IONBF, 0);
      GetHDDTemperature();
      _exit(2);  // it only returns when no disk was found
    }
    sleep(3);
    done = waitpid(child, nullptr, WNOHANG);  // 0: still looping
    if (child > 0) kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
  });
  CHECK_EQ(done, 0);
  CHECK_EQ(text, kAtaFound);
}
