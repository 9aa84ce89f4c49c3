// The records' display lines: labels padded to 20, indents clamped to the
// line buffer, values cut to what is left of it, and the level-4 gate.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "record_test_util.h"
#include "stbplat/bseck_reload.h"
#include "stbplat/code_object_info.h"
#include "stbplat/front_panel.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

const unsigned char* U(const char* s) { return reinterpret_cast<const unsigned char*>(s); }

TEST(Display, ComponentLinesTheirIndentClampAndTheLevelGate) {
  ComponentLocationStorage c;
  c.location = Location(U("nor0"), U("boot"), U("a"));
  std::memcpy(c.componentTag, "BOOT", 4);
  c.slotOffset = 0xABCDEFul;
  LogCapture log;
  c.Display(4);
  c.location.Display(250);
  c.location.Display(190);
  c.location.DisplayCompact(true);
  c.location.DisplayCompact(false);
  const std::string wide(199, ' ');
  EXPECT_EQ(log.texts(), (Texts{"    componentTag         = BOOT\r\n",
                                "    deviceName           = NOR0....\r\n",
                                "    partitionName        = BOOT....\r\n",
                                "    slotName             = A.......\r\n",
                                "    slotOffset           = 0xABCDEF\r\n", wide, wide, wide,
                                std::string(190, ' ') + "deviceNa", std::string(190, ' ') + "partitio",
                                std::string(190, ' ') + "slotName", "NOR0.BOOT.A", "\r\n", "NOR0.BOOT.A"}));
  EXPECT_EQ(log.messages()[1].format + " " + log.messages()[1].function, "%s Display");
  EXPECT_EQ(log.messages()[1].level, 4u);
  log.SetLevel(eLogModuleRecords, 3);
  c.Display(0);
  c.location.DisplayCompact(true);
  EXPECT_EQ(log.messages().size(), 14u);
}

TEST(Display, PackageHeaderIndentsWrapsAndShowsAtMostSixteenComponents) {
  CodeObjectInfo info;
  info.numComponents = 1;
  LogCapture log;
  info.Display(254);
  const Texts lines = log.texts();
  ASSERT_EQ(lines.size(), 2u + 5 + 2 + 5);
  EXPECT_EQ(lines[0], std::string(99, ' '));
  EXPECT_EQ(lines[1], "Header:\r\n");
  EXPECT_EQ(lines[2].substr(0, 13), "componentTag ") << "254 + 2 wraps to an indent of 0";
  EXPECT_EQ(lines[7], std::string(99, ' '));
  EXPECT_EQ(lines[8], "Component 0:\r\n");
  info.numComponents = 17;
  log.Clear();
  info.Display(0);
  EXPECT_EQ(log.messages().size(), 2u + 5 + 16 * (2 + 5));
}

TEST(Display, ReloadErrorsInHexAndFrontPanelTextBoundedByItsLength) {
  BseckReloadError e;
  e.Type = 0x1A;
  e.Error = 0xBEEF;
  AnimatedFrontPanelDisplayEntry panel;
  panel.text.CreateData(3, U("ABC"));
  LogCapture log;
  e.Display(2);
  e.Display(255);
  e.Display(190);
  panel.Display(3);
  panel.Display(200);
  const std::string wide(199, ' ');
  const std::string cut(190, ' ');
  const std::string text = "AnimatedFrontPanelDisplayEntry text = ABC\r\n";
  EXPECT_EQ(log.texts(), (Texts{"  Type                 = 0x001A\r\n", "  Error                = 0xBEEF\r\n",
                                wide, wide, cut + "Type    ", cut + "Error   ", "   ", text,
                                std::string(99, ' '), text}));
  EXPECT_EQ(log.messages()[0].format, "%s");
  log.SetLevel(eLogModuleRecords, 3);
  e.Display(0);
  panel.Display(0);
  EXPECT_EQ(log.messages().size(), 10u);
}

}  // namespace
