// Locations, component locations and the package header: standard form,
// name strings, wire forms written by hand, statuses and display lines.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "stbplat/code_object_info.h"
#include "stbplat/intruder.h"
#include "support/log_capture.h"

using stbplat::test::LogCapture;

namespace {

const unsigned char* U(const char* s) { return reinterpret_cast<const unsigned char*>(s); }
std::string Name(const unsigned char* n) { return std::string(reinterpret_cast<const char*>(n), 8); }

void Append(std::vector<unsigned char>& out, const std::string& s) { out.insert(out.end(), s.begin(), s.end()); }
void AppendBE(std::vector<unsigned char>& out, unsigned long v, int width) {
  for (int i = width - 1; i >= 0; --i) out.push_back(static_cast<unsigned char>(v >> (8 * i)));
}

TEST(Location, NamesTakeTheStandardForm) {
  Location loc(U("nand0"), U("kernel"), U("a"));
  EXPECT_EQ(Name(loc.deviceName), "NAND0...");
  EXPECT_EQ(Name(loc.partitionName), "KERNEL..");
  EXPECT_EQ(Name(loc.slotName), "A.......");
  EXPECT_EQ(loc.GetNameString(), "NAND0.KERNEL.A");
  Location longName(U("spi_nor"), U("bootloader"), U("x"));
  EXPECT_EQ(Name(longName.deviceName), "SPI_NOR.");
  EXPECT_EQ(Name(longName.partitionName), "BOOTLOAD") << "cut to 8, no padding";
  EXPECT_EQ(longName.GetNameString(), "SPI_NOR.BOOTLOAD.X");
  // The default is all zero and its name string keeps the NULs.
  Location empty;
  EXPECT_EQ(Name(empty.deviceName), std::string(8, '\0'));
  std::string expected = std::string(8, '\0') + "." + std::string(8, '\0') + "." + std::string(8, '\0');
  EXPECT_EQ(empty.GetNameString(), expected);
}

TEST(Location, CopiesPassThroughTheStandardFormAgainAndCompareBytes) {
  Location raw;
  std::memcpy(raw.deviceName, "ab\0dEFGH", 8);
  std::memcpy(raw.partitionName, "PART....", 8);
  std::memcpy(raw.slotName, "s1......", 8);
  Location copy(raw);
  EXPECT_EQ(Name(copy.deviceName), "AB......");
  EXPECT_EQ(Name(copy.slotName), "S1......");
  Location assigned;
  assigned = raw;
  EXPECT_EQ(Name(assigned.deviceName), "AB......");
  EXPECT_TRUE(Location(U("nor0"), U("boot"), U("a")) == Location(U("NOR0"), U("BOOT"), U("A")));
  EXPECT_FALSE(Location(U("nor0"), U("boot"), U("a")) == Location(U("NOR0"), U("BOOT"), U("B")));
}

TEST(Location, DisplayLinesAndIndentClamp) {
  Location loc(U("nand0"), U("kernel"), U("a"));
  LogCapture log;
  loc.Display(2);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"  deviceName           = NAND0...\r\n",
                                                   "  partitionName        = KERNEL..\r\n",
                                                   "  slotName             = A.......\r\n"}));
  EXPECT_EQ(log.messages()[0].format, "%s");
  EXPECT_EQ(log.messages()[0].level, 4u);
  EXPECT_EQ(log.messages()[0].sourceFile, "SystemDescriptor");
  log.Clear();
  loc.Display(250);
  ASSERT_EQ(log.messages().size(), 3u);
  EXPECT_EQ(log.texts()[0], std::string(199, ' ')) << "no room is left for the label";
}

TEST(Location, DisplayCompactIsGatedAtLevelFour) {
  Location loc(U("nor0"), U("boot"), U("a"));
  LogCapture log(3);
  loc.DisplayCompact(true);
  EXPECT_TRUE(log.messages().empty());
  log.SetLevel(eLogModuleRecords, 4);
  loc.DisplayCompact(true);
  loc.DisplayCompact(false);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"NOR0.BOOT.A", "\r\n", "NOR0.BOOT.A"}));
}

TEST(LocationStorage, ReadsRawAndStopsAtTheFirstShortName) {
  const std::string wire = "nand0...ker";
  std::vector<unsigned char> bytes(wire.begin(), wire.end());
  Extruder in(bytes.data(), 10);
  LocationStorage loc{Location()};
  LogCapture log;
  log.SetLevel(eLogModuleByteStreams, 0);
  EXPECT_EQ(loc.Read(in), 0xA012u);
  EXPECT_EQ(Name(loc.deviceName), "nand0...") << "read as stored, no case conversion";
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Error reading partitionName\r\n"});
  EXPECT_EQ(log.messages().back().function, "Read");
}

TEST(LocationStorage, StoreReportsTheNameThatDidNotFit) {
  LocationStorage loc(Location(U("nor0"), U("boot"), U("a")));
  unsigned char buffer[20];
  Intruder out(buffer, sizeof buffer);
  LogCapture log;
  EXPECT_EQ(loc.Store(&out), 0xA012u);
  EXPECT_TRUE(log.Contains("Error writing slotName\r\n"));
  EXPECT_EQ(std::string(reinterpret_cast<char*>(buffer), 16), "NOR0....BOOT....");
}

TEST(ComponentLocation, TheOffsetArgumentIsDiscarded) {
  ComponentLocation c(U("nor"), U("boot"), U("a"), 0x4000);
  EXPECT_EQ(c.slotOffset, 0u);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(c.componentTag), 4), std::string(4, '\0'));
  EXPECT_EQ(Name(c.location.deviceName), "NOR.....");
}

TEST(ComponentLocation, TagsCompareUpToAZeroByte) {
  ComponentLocation a(U("nor"), U("boot"), U("a"), 0);
  ComponentLocation b(a);
  std::memcpy(a.componentTag, "AB\0X", 4);
  std::memcpy(b.componentTag, "AB\0Y", 4);
  EXPECT_TRUE(a == b);
  b.slotOffset = 1;
  EXPECT_FALSE(a == b);
  b.slotOffset = 0;
  b.location = Location(U("nor"), U("boot"), U("b"));
  EXPECT_FALSE(a == b);
}

std::vector<unsigned char> ComponentWire(const std::string& tag, const std::string& names, unsigned long offset) {
  std::vector<unsigned char> out;
  Append(out, tag);
  Append(out, names);
  AppendBE(out, offset, 8);
  return out;
}

TEST(ComponentLocationStorage, ReadStatusesDependOnWhereTheStreamEnds) {
  std::vector<unsigned char> wire =
      ComponentWire("KRNL", "NAND0...KERNEL..A.......", 0x0000000100000200ul);
  ASSERT_EQ(wire.size(), 36u);
  {
    Extruder in(wire.data(), 36);
    ComponentLocationStorage c;
    EXPECT_EQ(c.Read(in), 0u);
    EXPECT_EQ(c.slotOffset, 0x100000200ul);
    EXPECT_EQ(c.location.GetNameString(), "NAND0.KERNEL.A");
  }
  {
    Extruder in(wire.data(), 20);
    ComponentLocationStorage c;
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(c.Read(in), 0xA004u);
    EXPECT_EQ(log.texts(), (std::vector<std::string>{"Error reading slotName\r\n",
                                                     "Error reading (*pLocationStorage)\r\n"}));
  }
  {
    Extruder in(wire.data(), 31);
    ComponentLocationStorage c;
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(c.Read(in), 0xA012u);
    EXPECT_EQ(log.texts(), std::vector<std::string>{"Error reading slotOffset\r\n"});
  }
}

TEST(ComponentLocation, DisplayShowsFiveIndentedLines) {
  ComponentLocationStorage c;
  c.location = Location(U("nor0"), U("boot"), U("a"));
  std::memcpy(c.componentTag, "BOOT", 4);
  c.slotOffset = 0xABCDEFul;
  LogCapture log;
  c.Display(4);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"    componentTag         = BOOT\r\n",
                                                   "    deviceName           = NOR0....\r\n",
                                                   "    partitionName        = BOOT....\r\n",
                                                   "    slotName             = A.......\r\n",
                                                   "    slotOffset           = 0xABCDEF\r\n"}));
}

// A package header with two components, laid out by hand from the wire form.
std::vector<unsigned char> PackageHeaderWire() {
  std::vector<unsigned char> out;
  AppendBE(out, 0x0102, 2);
  auto header = ComponentWire("PKGH", "NOR0....BOOT....A.......", 0x40);
  out.insert(out.end(), header.begin(), header.end());
  AppendBE(out, 2, 4);
  auto kernel = ComponentWire("KRNL", "NAND0...KERNEL..A.......", 0x800);
  auto rootfs = ComponentWire("ROOT", "EMMC....ROOTFS..B.......", 0x123456789ul);
  out.insert(out.end(), kernel.begin(), kernel.end());
  out.insert(out.end(), rootfs.begin(), rootfs.end());
  return out;
}

TEST(CodeObjectInfo, ReadsAHandWrittenHeaderAndStoresItByteForByte) {
  std::vector<unsigned char> wire = PackageHeaderWire();
  ASSERT_EQ(wire.size(), 2u + 36 + 4 + 2 * 36);
  Extruder in(wire.data(), static_cast<unsigned int>(wire.size()));
  CodeObjectInfo info;
  ASSERT_EQ(info.Read(in), 0u);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_EQ(info.unused, 0x0102);
  EXPECT_EQ(info.packageHeaderLocation.location.GetNameString(), "NOR0.BOOT.A");
  EXPECT_EQ(info.packageHeaderLocation.slotOffset, 0x40u);
  EXPECT_EQ(info.numComponents, 2u);
  EXPECT_EQ(std::string(reinterpret_cast<char*>(info.componentLocations[1].componentTag), 4), "ROOT");
  EXPECT_EQ(info.componentLocations[1].location.GetNameString(), "EMMC.ROOTFS.B");
  EXPECT_EQ(info.componentLocations[1].slotOffset, 0x123456789ul);

  std::vector<unsigned char> stored(wire.size());
  Intruder out(stored.data(), static_cast<unsigned int>(stored.size()));
  EXPECT_EQ(info.Store(&out), 0u);
  EXPECT_EQ(stored, wire);
}

TEST(CodeObjectInfo, EmptyHeaderIs42Bytes) {
  CodeObjectInfo info;
  Intruder out(64u, 0u);
  EXPECT_EQ(info.Store(&out), 0u);
  EXPECT_EQ(out.pCurrent - out.pStart, 42);
  Extruder in(out.pStart, 42);
  CodeObjectInfo back;
  EXPECT_EQ(back.Read(in), 0u);
  EXPECT_EQ(back.numComponents, 0u);
}

TEST(CodeObjectInfo, AFailingComponentLeavesTheEarlierOnesFilled) {
  std::vector<unsigned char> wire = PackageHeaderWire();
  wire[2 + 36 + 3] = 3;  // claims three components, holds two
  Extruder in(wire.data(), static_cast<unsigned int>(wire.size()));
  CodeObjectInfo info;
  LogCapture log;
  log.SetLevel(eLogModuleByteStreams, 0);
  EXPECT_EQ(info.Read(in), 0xA004u);
  EXPECT_EQ(info.componentLocations[1].location.GetNameString(), "EMMC.ROOTFS.B");
  EXPECT_EQ(log.texts(), (std::vector<std::string>{"Error reading componentTag\r\n",
                                                   "Error reading componentLocations[i]\r\n"}));
}

TEST(CodeObjectInfo, ACountAboveSixteenIsRefusedBeforeAnyComponent) {
  std::vector<unsigned char> wire = PackageHeaderWire();
  wire[2 + 36 + 3] = 17;
  Extruder in(wire.data(), static_cast<unsigned int>(wire.size()));
  CodeObjectInfo info;
  EXPECT_EQ(info.Read(in), 0xA004u);
  EXPECT_EQ(in.bytesLeft, 72u) << "no component was read";
  Intruder out(4096u, 0u);
  EXPECT_EQ(info.Store(&out), 0xA004u);
  EXPECT_EQ(out.pCurrent, out.pStart);
  LogCapture log;
  info.Display(0);  // at most the 16 components the array holds
  EXPECT_EQ(log.messages().size(), 2u + 5 + 16 * (2 + 5));
}

TEST(CodeObjectInfo, DisplayIndentsAndWraps) {
  CodeObjectInfo info;
  info.numComponents = 1;
  LogCapture log;
  info.Display(254);
  std::vector<std::string> lines = log.texts();
  ASSERT_EQ(lines.size(), 2u + 5 + 2 + 5);
  EXPECT_EQ(lines[0], std::string(99, ' '));
  EXPECT_EQ(lines[1], "Header:\r\n");
  EXPECT_EQ(lines[2].substr(0, 13), "componentTag ") << "254 + 2 wraps to an indent of 0";
  EXPECT_EQ(lines[7], std::string(99, ' '));
  EXPECT_EQ(lines[8], "Component 0:\r\n");
}

}  // namespace
