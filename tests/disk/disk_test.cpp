// The disk probes over emulated disks whose hdparm and smartctl output is
// captured text run through the real grep and awk: disk detection and the
// SMART loop, which print; then the probes that log: where the disk sits, the
// SCSI generic bus, the vendor and the temperature. The identity and the
// happy paths are proven on the real kernel (tests/system).
#include <gtest/gtest.h>

#include <string>
#include <tuple>

#include "devmodel/disk_sim.h"
#include "stbplat/disk.h"
#include "support/log_capture.h"

namespace {

using stbplat::test::LogCapture;
using Texts = std::vector<std::string>;

const std::string kError = "\n\r[ErrorMsg] [";
const char* const kAtaLink =
    "../../devices/pci0000:00/0000:00:1f.2/ata1/host0/target0:0:0/0:0:0:0/block/sda";
const char* const kUsbLink =
    "../../devices/pci0000:00/0000:00:14.0/usb2/2-1/2-1:1.0/host6/target6:0:0/6:0:0:0/block/sdb";
const char* const kSmartctl = "smartctl -d ata -A /dev/sda";

struct StopLoop {};

// The emulated machine; nothing the library opened may stay open.
struct Machine : stbplat::devmodel::DiskSim {
  ~Machine() { EXPECT_EQ(OpenCount(), 0u) << "descriptors, streams or pipes left open"; }
};

// smartctl's temperature line with these columns 4 (value), 5 (worst), 10
// (raw) and 11-12 ("(Min/Max a/b)").
std::string SmartLine(const std::string& value, const std::string& worst, const std::string& raw,
                      const std::string& minMax = "") {
  return "194 Temperature_Celsius 0x0022 " + value + " " + worst + " 000 Old_age Always - " + raw +
         (minMax.empty() ? "" : " (Min/Max " + minMax + ")") + "\n";
}

std::string HdparmModel(const std::string& model) {
  return "\n/dev/sda:\n\n Model=" + model + ", FwRev=CC26, SerialNo=Z1E6ABCD\n Config={ Fixed }\n";
}

template <typename Call>
std::string Printed(Call call) {
  testing::internal::CaptureStdout();
  call();
  return testing::internal::GetCapturedStdout();
}

TEST(IsDevHDD, UsbDevicesAbove256GiBAndLinksTooLongToRead) {
  Machine sys;
  // sdb is exactly 256 GiB; sdc does not answer, and its size, compared
  // unsigned, counts as a disk's; sdd's link runs past the 1023 bytes read.
  sys.links = {{"sdb", kUsbLink}, {"sdc", kUsbLink}, {"sdd", std::string(2000, 'x') + "/ata1/"}};
  sys.devices["/dev/sdb"].size = 0x4000000000LL;
  sys.devices["/dev/sdc"].size = -1;
  std::vector<int> results;
  EXPECT_EQ(Printed([&] { for (const char* name : {"sdb", "sdc", "sdd"}) results.push_back(IsDevHDD(name)); }),
            " Get block dev size failed \nExt USB HDD detected \n");
  EXPECT_EQ(results, (std::vector<int>{0, 1, 0}));
}

TEST(GetHDDTemperature, PrintsTheTemperatureEntryEveryTenSeconds) {
  Machine sys;
  testing::internal::CaptureStdout();
  sys.links["sda"] = kAtaLink;
  auto& sda = sys.devices["/dev/sda"];
  // Temperature entries in the table's first and last slots, another one behind the table.
  sda.attributes.assign(30, {9, 0x32, 0, 99, 99, 0x10, 0x27, 0, 0, 0, 0, 0});
  sda.attributes[0] = {194, 0x22, 0, 36, 53, 41, 0, 18, 0, 55, 0, 0};
  sda.attributes[29] = {194, 0x22, 0, 37, 54, 42, 0, 19, 0, 56, 0, 0};
  sda.attributes.push_back({194, 0x22, 0, 1, 2, 3, 4, 5, 6, 7, 8, 0});
  sda.smartReads = 1;  // the second round's request fails and shows the cleared data
  sys.onSleep = [&](unsigned int) { if (sys.sleeps.size() == 2) throw StopLoop(); };
  EXPECT_THROW(GetHDDTemperature(), StopLoop);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "IsDevHDD(): ATA HDD found \nCurrent Val= 36 \n Worst Val= 53 \n "
            "Min = 18, Max = 55, value = 41\nCurrent Val= 37 \n Worst Val= 54 \n "
            "Min = 19, Max = 56, value = 42\nHDIO_DRIVE_CMD failed\n");
  EXPECT_EQ(sys.sleeps, (std::vector<unsigned int>{10, 10}));
  EXPECT_EQ(sys.lastDriveCommand, (std::array<unsigned char, 4>{0xB0, 0, 0xD0, 1}));
}

// Nodes sda .. sde as one letter each: '-' absent, 'a' an ATA disk, 's' a
// small USB stick, 'U' a large USB disk whose identity checksum is right, 'r'
// an empty card-reader slot (USB, does not open, an identity of zeros).
// A list of `listed` devices replaces /proc/scsi/scsi unless that is 0.
void Attach(Machine& sys, const std::string& nodes, size_t listed) {
  if (listed != 0) sys.files["/proc/scsi/scsi"] = "Attached devices:\n";
  for (size_t i = 0; i < listed; ++i) sys.files["/proc/scsi/scsi"] += "Host: scsi0 Channel: 00 Id: 00 Lun: 00\n";
  for (size_t i = 0; i < nodes.size(); ++i) {
    const std::string name = std::string("sd") + static_cast<char>('a' + i), path = "/dev/" + name;
    if (nodes[i] == '-') continue;
    sys.links[name] = nodes[i] == 'a' ? kAtaLink : kUsbLink;
    if (nodes[i] == 's' || nodes[i] == 'U') sys.devices[path].size = 1LL << (nodes[i] == 's' ? 33 : 40);
    sys.tools["hdparm -I " + path] = "\n" + path + ":\n\nATA device, with non-removable media\n" +
                                     (nodes[i] == 'U' ? "Checksum: correct\n" : "");
  }
}

TEST(HardDriveProbeNodePosition, FindsTheDiskWhateverSitsBeforeItQuietly) {
  // listed: the devices in /proc/scsi/scsi, 0 for no list; lateNodes: what the first wait brings;
  // node -1: not found; bus: the host in the link, 0 for the ATA disk and 6 for USB.
  struct Row {
    const char* what; unsigned int listed; std::string nodes, lsmod, lateNodes; int node; unsigned bus; size_t waits;
  };
  const std::string usbOnly = "Module  Size  Used by\nusb_storage 77824 0\nsd_mod 1 2\n";
  const unsigned int none = HARD_DRIVE_BUS_UNKNOWN;
  const Row rows[] = {
      {"a stick pulled from sda", 1, "-a", "", "", 1, 0, 0},
      {"an empty card reader before the disk", 2, "ra", "", "", 1, 0, 0},
      {"only the card reader", 1, "r", "", "", -1, none, 0},
      {"a large USB disk", 1, "U", "", "", 0, 6, 0},
      {"an ATA disk wins over an earlier USB disk", 2, "Ua", "", "", 1, 0, 0},
      {"the list bounds the nodes looked at", 1, "sa", "", "", -1, none, 0},
      {"no list: every node", 0, "----a", "", "", 4, 0, 0},
      {"the SATA driver loads after USB storage", 1, "s", usbOnly, "sa", 1, 0, 1},
      {"it never comes", 1, "U", usbOnly, "", 0, 6, 3},
      {"it is loaded", 1, "s", usbOnly + "ahci 1 0\n", "", -1, none, 0},
      {"a name that only starts like a module", 1, "s", "usb_storage_x 1 0\n", "", -1, none, 0},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    Machine sys;
    Attach(sys, row.nodes, row.listed);
    sys.tools["lsmod"] = row.lsmod;
    sys.onSleep = [&](unsigned int) { Attach(sys, row.lateNodes, row.lateNodes.size()); };
    HardDriveNodeInfo drive;
    int found = -1;
    EXPECT_EQ(Printed([&] { found = HardDriveProbeNodePosition(&drive); }), "");
    EXPECT_EQ(found, row.node >= 0 ? 1 : 0);
    EXPECT_EQ(drive.deviceNode, row.node >= 0 ? row.node : HARD_DRIVE_NODE_COUNT);
    EXPECT_EQ(drive.scsiBus, row.bus);
    EXPECT_EQ(sys.sleeps, std::vector<unsigned int>(row.waits, 1));
  }
}

TEST(HardDriveProbeNodePosition, ListReadInPiecesHostNumbersAndMessages) {
  Machine sys;
  HardDriveNodeInfo drive;
  LogCapture log;
  EXPECT_EQ(HardDriveProbeNodePosition(&drive), 0);
  // The first entry's line is read in pieces of 255; the next piece starts with "Host:".
  sys.files["/proc/scsi/scsi"] = "Attached devices:\nHost: scsi0 " + std::string(243, 'x') +
                                 "Host: scsi9\nHost: scsi1 Channel: 00\n";
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 1);
  EXPECT_EQ(drive.scsiDeviceCount, 2u);
  // Only a "/hostN/" component below 2^32 - 1 names the host.
  sys.links["sdc"] = "../../devices/hostx/host7x/host4294967295/ata3/host12/target12:0:0/block/sdc";
  sys.files["/proc/scsi/scsi"] = "Attached devices:\n";
  EXPECT_EQ(HardDriveProbeSataPosition(&drive), 0);
  EXPECT_EQ(HardDriveScanDeviceNode(&drive), 1);
  EXPECT_EQ(drive.deviceNode, 2);
  EXPECT_EQ(drive.scsiBus, 12u);
  const std::string sata = kError + "HardDriveProbeSataPosition] ";
  EXPECT_EQ(log.texts(), (Texts{sata + "Failed To Open /proc/scsi/scsi\n\r",
                                kError + "HardDriveScanDeviceNode] Hard Drive Not Found\n\r",
                                sata + "No Scsi Device Attached\n\r"}));
  const stbplat::test::LogMessage& m = log.messages().at(0);
  EXPECT_EQ(std::make_tuple(m.module, m.level, m.sourceFile), std::make_tuple(18, 6u, "HardDriveTempUtils"));
}

TEST(HardDriveProbeScsiBusPosition, NotFoundFailedRequestsAndMissingArguments) {
  Machine sys;
  sys.devices["/dev/sg1"].bus = 0;
  sys.devices["/dev/sg2"].bus = 3;
  LogCapture log;
  unsigned int found = 0;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(7, &found), 0);
  EXPECT_EQ(found, 5u);
  sys.devices["/dev/sg0"].bus = -1;
  EXPECT_EQ(HardDriveProbeScsiBusPosition(3, &found), 0);
  // The message names the bus asked for as the device and the last bus read.
  const std::string probe = kError + "HardDriveProbeScsiBusPosition] ";
  EXPECT_EQ(log.texts(), (Texts{probe + "Scsi Device7 Bus3 Not Found\n\r",
                                probe + "Failed On SCSI_IOCTL_GET_BUS_NUMBER\n\r"}));
  EXPECT_EQ(sys.opened.size(), 6u);  // all five, then sg0
  HardDriveNodeInfo drive{};  // and no place for an answer
  EXPECT_EQ(HardDriveProbeScsiBusPosition(3, nullptr) + HardDriveProbeNodePosition(nullptr) +
                HardDriveScanDeviceNode(nullptr) + HardDriveProbeSataPosition(nullptr) +
                HardDriveGetVendorType(nullptr, &found) + HardDriveGetVendorType(&drive, nullptr) +
                HardDriveGetTemperatureData(nullptr, 10, nullptr) + HardDriveGetTemperatureData(&drive, 10, nullptr),
            0);
  EXPECT_FALSE(GetHdTemperature(nullptr) || HardDriveGetTemperature(nullptr, &found) ||
               HardDriveGetTemperature(&drive, nullptr));
}

// The pipe-reading probes: each row gives hdparm's or smartctl's output and
// the pipe's faults, makes one call, and checks its result and messages.
TEST(PipeProbes, VendorAndReadingsOrTheFailureOfEachStep) {
  const std::string type = kError + "HardDriveGetVendorType] ", data = kError + "HardDriveGetTemperatureData] ";
  const std::string toshiba = HdparmModel("TOSHIBA DT01ACA100"), seagate = HdparmModel("ST2000DM001");
  const std::string hdparmClose = type + "Failed To Close The Pipe-Hdparm Node[/dev/sda]\n\r";
  enum Fault { kNone, kOpen, kClose, kSilentClose };  // silent: the pipeline prints nothing
  struct Row { unsigned char node, column; std::string output; Fault fault; int result, value; Texts log; };
  const Row rows[] = {  // column 0 asks for the vendor; value: the vendor or the reading
      {4, 0, toshiba, kNone, 1, 3, {}},
      {5, 0, toshiba, kNone, 0, 4, {type + "Failed To Input Wrong Device Node Number (5)\n\r"}},
      {0, 0, seagate, kSilentClose, 0, 4, {type + "Scan Model Failed\n\r", hdparmClose}},
      {0, 0, seagate, kClose, 0, 4, {hdparmClose}},  // a match is lost with its pipe
      {0, 0, seagate, kOpen, 0, 4, {type + "Failed To Open The Pipe-Hdparm Node[/dev/sda]\n\r"}},
      {4, 5, SmartLine("100", "300", "36"), kNone, 1, 300 & 0xFF, {}},  // kept in 8 bits
      {0, 4, SmartLine("1234", "98", "36"), kNone, 1, 123, {}},        // three digits at most
      {0, 12, SmartLine("100", "98", "36", "21/47"), kNone, 1, 47, {}},
      // Refused before any command runs.
      {5, 10, "", kNone, 0, 0, {data + "Failed To Input Wrong Device Node Number (5)\n\r"}},
      {0, 13, "", kNone, 0, 0, {data + "Failed To Input Wrong Offset (13)\n\r"}},
      {0, 12, SmartLine("100", "98", "21"), kNone, 0, 0, {data + "Scan Data Failed\n\r"}},
      {0, 10, SmartLine("100", "98", "36"), kSilentClose, 0, 0,
       {data + "Scan Data Failed\n\r", data + "Failed To Close The Pipe-Smartctl Node[/dev/sda]\n\r"}},
      // Stored before the close failed.
      {4, 10, SmartLine("100", "98", "44"), kClose, 0, 44,
       {data + "Failed To Close The Pipe-Smartctl Node[/dev/sde]\n\r"}},
      {0, 5, SmartLine("100", "98", "36"), kOpen, 0, 0, {data + "Failed To Open The Pipe-Smartctl Node[/dev/sda]\n\r"}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(std::to_string(row.node) + " " + std::to_string(row.column));
    Machine sys;
    const std::string device = row.node == 4 ? "/dev/sde" : "/dev/sda";
    sys.tools[(row.column == 0 ? "hdparm -i " : "smartctl -d ata -A ") + device] = row.output;
    sys.pipeSilent = row.fault == kSilentClose;
    sys.pipeOpenFails = row.fault == kOpen;
    sys.pipeCloseFails = row.fault == kClose || row.fault == kSilentClose;
    HardDriveNodeInfo drive{0, 0, row.node, {}};
    unsigned int vendor = 99;
    unsigned char value = 0;
    LogCapture log;
    EXPECT_EQ(row.column == 0 ? HardDriveGetVendorType(&drive, &vendor)
                              : HardDriveGetTemperatureData(&drive, row.column, &value),
              row.result);
    EXPECT_EQ(row.column == 0 ? static_cast<int>(vendor) : value, row.value);
    EXPECT_EQ(log.texts(), row.log);
  }
}

TEST(HardDriveGetTemperature, EachVendorsColumnsInOrderAndPair) {
  // columns: 4, 5, 10 and 12, where "x" reads as no number; asked: the columns asked for, in order.
  struct Row { const char* model; Texts columns; std::string asked; bool result; unsigned int current, highest; };
  const Row rows[] = {
      {"ST2000DM001", {"100", "53", "36", ""}, "5 10", true, 36, 53},
      {"WDC WD5000", {"100", "98", "40", ""}, "4 5 10", true, 40, 42},
      {"WDC WD5000", {"90", "100", "5", ""}, "4 5 10", true, 5, 5u - 10u},  // worked out wide
      {"Hitachi HDS72", {"100", "98", "35", "21/47"}, "12 10", true, 35, 47},
      {"TOSHIBA DT01", {"100", "98", "38", "15/52"}, "12 10", true, 38, 52},
      // The first failed reading ends it with a zero pair.
      {"WDC WD5000", {"x", "98", "40", ""}, "4", false, 0, 0},
      {"WDC WD5000", {"100", "x", "40", ""}, "4 5", false, 0, 0},
      {"WDC WD5000", {"100", "98", "x", ""}, "4 5 10", false, 0, 0},
      {"ST2000DM001", {"100", "53", "x", ""}, "5 10", false, 0, 0},
      {"Hitachi HDS72", {"100", "98", "35", ""}, "12", false, 0, 0},
      {"Maxtor 6Y080", {"100", "53", "36", ""}, "", false, 7, 7},  // no vendor: the pair stays
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(std::string(row.model) + " " + row.asked);
    Machine sys;
    sys.tools["hdparm -i /dev/sda"] = HdparmModel(row.model);
    sys.tools[kSmartctl] = SmartLine(row.columns[0], row.columns[1], row.columns[2], row.columns[3]);
    HardDriveNodeInfo drive{};
    unsigned int pair[2] = {7, 7};
    EXPECT_EQ(HardDriveGetTemperature(&drive, pair), row.result);
    EXPECT_EQ(std::make_pair(pair[0], pair[1]), std::make_pair(row.current, row.highest));
    std::string asked;  // the N of each command's awk "print $N", in order
    for (const std::string& command : sys.commands)
      if (command.find("print $") != std::string::npos)
        asked += (asked.empty() ? "" : " ") + std::to_string(std::stoi(command.substr(command.find('$') + 1)));
    EXPECT_EQ(asked, row.asked);
  }
}

TEST(GetHdTemperature, NoDiskOrNoReadingIsFalseAndPrintsNothing) {
  Machine sys;
  int temperature = 99;
  LogCapture log;
  EXPECT_FALSE(GetHdTemperature(&temperature));
  EXPECT_EQ(temperature, 99);
  sys.links["sda"] = kAtaLink;
  sys.tools["hdparm -i /dev/sda"] = HdparmModel("TOSHIBA DT01");
  sys.tools[kSmartctl] = SmartLine("100", "98", "38");  // no "(Min/Max a/b)"
  EXPECT_EQ(Printed([&] { EXPECT_FALSE(GetHdTemperature(&temperature)); }), "");  // a poll prints nothing
  EXPECT_EQ(temperature, 0);
  EXPECT_EQ(log.texts().at(2), "ERROR... HDProbeNodePosition function failed\n");
  EXPECT_EQ(log.texts().back(), "Drive Temperature was no available\n");
}

}  // namespace
