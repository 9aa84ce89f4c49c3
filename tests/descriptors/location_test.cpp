// Locations, component locations and the package header: the standard form,
// name strings, comparison, the wire forms written by hand; and the records'
// display lines: labels padded to 20, indents clamped to the line buffer,
// values cut to what is left of it.
#include <gtest/gtest.h>

#include <cstring>

#include "record_test_util.h"
#include "stbplat/bseck_reload.h"
#include "stbplat/code_object_info.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

std::string Name(const unsigned char* n) { return std::string(reinterpret_cast<const char*>(n), 8); }

TEST(Location, NamesTakeTheStandardForm) {
  Location loc(U("nand0"), U("bootloader"), U("a"));
  EXPECT_EQ(Name(loc.deviceName), "NAND0...");
  EXPECT_EQ(Name(loc.partitionName), "BOOTLOAD") << "cut to 8, no padding";
  EXPECT_EQ(Name(loc.slotName), "A.......");
  EXPECT_EQ(loc.GetNameString(), "NAND0.BOOTLOAD.A");
  const std::string nul(8, '\0');
  EXPECT_EQ(Location().GetNameString(), nul + "." + nul + "." + nul) << "only '.' ends a name";
  unsigned char dst[4] = {'#', '#', '#', '#'};
  Location::ConvertToStandardFormat(U("xyzw"), dst, 3);
  EXPECT_EQ(std::string(dst, dst + 4), "XYZ#") << "no terminator, nothing past the width";
  Location::ConvertToStandardFormat(U("q"), dst, 3);
  EXPECT_EQ(std::string(dst, dst + 4), "Q..#");
}

TEST(ComponentLocation, TheOffsetArgumentIsDiscardedAndTagsCompareUpToAZeroByte) {
  ComponentLocation a(U("nor"), U("boot"), U("a"), 0x4000);
  EXPECT_EQ(a.slotOffset, 0u);
  EXPECT_EQ(std::string(a.componentTag, a.componentTag + 4), std::string(4, '\0'));
  EXPECT_EQ(Name(a.location.deviceName), "NOR.....");
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

TEST(CodeObjectInfo, HandWrittenHeaderReadsFieldByFieldAndStoresInStandardForm) {
  Bytes wire = PackageHeaderWire(2);
  In in(wire);
  CodeObjectInfo info;
  ASSERT_EQ(info.Read(in), 0u);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_EQ(info.packageHeaderLocation.location.GetNameString(), "NOR0.BOOT.A");
  const ComponentLocationStorage& root = info.componentLocations[1];
  EXPECT_EQ(std::string(root.componentTag, root.componentTag + 4), "ROOT");
  EXPECT_EQ(Name(root.location.deviceName), "emmc....") << "read raw";
  EXPECT_EQ(root.slotOffset, 0x123456789ul);
  Intruder out(256u, 0u);
  EXPECT_EQ(info.Store(&out), 0u);
  std::memcpy(wire.data() + 2 + 36 + 4 + 36 + 4, "EMMC", 4);
  EXPECT_EQ(Written(out), wire) << "names go out in standard form";
  EXPECT_EQ(Name(root.location.deviceName), "emmc....") << "the record itself is left as it was";
  LogCapture log;
  info.Display(0);
  EXPECT_TRUE(log.Contains("Component 1:\r\n"));
  EXPECT_FALSE(log.Contains("Component 2:")) << "two components, two shown";
  CodeObjectInfo empty;
  Intruder none(64u, 0u);
  EXPECT_EQ(empty.Store(&none), 0u);
  const std::string expected = std::string(6, '\0') + std::string(24, '.') + std::string(12, '\0');
  EXPECT_EQ(Written(none), Bytes(expected.begin(), expected.end()));
}

TEST(CodeObjectInfo, CountsTheRecordCannotHoldOrTheStreamEndsBefore) {
  const Bytes three = PackageHeaderWire(3);
  In in(three);
  CodeObjectInfo info;
  EXPECT_EQ(info.Read(in), 0xA004u);
  EXPECT_EQ(info.componentLocations[1].slotOffset, 0x123456789ul) << "earlier components stay";
  const Bytes many = PackageHeaderWire(17);
  In in2(many);
  EXPECT_EQ(info.Read(in2), 0xA004u);
  EXPECT_EQ(in2.bytesLeft, 72u) << "no component was read";
  Intruder out(4096u, 0u);
  EXPECT_EQ(info.Store(&out), 0xA004u);
  EXPECT_EQ(out.pCurrent, out.pStart);
  Bytes full = PackageHeaderWire(16);  // as many as the record holds
  for (unsigned long i = 2; i < 16; ++i) Put(full, "KRNL", "NAND0...KERNEL..A.......", i);
  In in3(full);
  EXPECT_EQ(info.Read(in3), 0u);
  EXPECT_EQ(info.Store(&out), 0u);
  EXPECT_EQ(info.componentLocations[15].slotOffset, 15u);
  EXPECT_EQ(static_cast<size_t>(out.pCurrent - out.pStart), full.size());
}

TEST(Display, ComponentAndReloadErrorLinesAndTheirIndentClamp) {
  ComponentLocationStorage c;
  c.location = Location(U("nor0"), U("boot"), U("a"));
  std::memcpy(c.componentTag, "BOOT", 4);
  c.slotOffset = 0xABCDEFul;
  BseckReloadError e;
  e.Type = 0x1A;
  e.Error = 0xBEEF;
  LogCapture log;
  e.Display(2);
  c.Display(4);
  c.location.Display(250);
  c.location.Display(190);
  c.location.DisplayCompact(true);
  c.location.DisplayCompact(false);
  const std::string wide(199, ' ');
  EXPECT_EQ(log.texts(), (Texts{"  Type                 = 0x001A\r\n", "  Error                = 0xBEEF\r\n",
                                "    componentTag         = BOOT\r\n",
                                "    deviceName           = NOR0....\r\n",
                                "    partitionName        = BOOT....\r\n",
                                "    slotName             = A.......\r\n",
                                "    slotOffset           = 0xABCDEF\r\n", wide, wide, wide,
                                std::string(190, ' ') + "deviceNa", std::string(190, ' ') + "partitio",
                                std::string(190, ' ') + "slotName", "NOR0.BOOT.A", "\r\n", "NOR0.BOOT.A"}));
  EXPECT_EQ(log.messages()[3].format + " " + log.messages()[3].function, "%s Display");
  EXPECT_EQ(log.messages()[3].level, 4u);
}

}  // namespace
