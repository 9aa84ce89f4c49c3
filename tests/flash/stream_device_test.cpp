// Streams opened on component locations: records through NOR, NAND (with a
// bad block), eMMC, slot files and physical memory.
#include <cstring>

#include "flash_fixture.h"
#include "stbplat/component_location.h"
#include "stbplat/extruder.h"
#include "stbplat/intruder.h"

namespace stbplat {
namespace test {
namespace {

ComponentLocation Component(const char* device, const char* partition, const char* slot,
                            unsigned long offset) {
  ComponentLocation component;
  component.location = MakeLocation(device, partition, slot);
  component.slotOffset = offset;
  return component;
}

// Stores two values, reads them back through a fresh stream.
void RoundTrip(const ComponentLocation& component) {
  {
    Intruder out(&component);
    ASSERT_TRUE(out.isInitedOK);
    unsigned int word = 0x56455253;
    unsigned long wide = 0x0102030405060708UL;
    EXPECT_EQ(out.intrude(word), 1u);
    EXPECT_EQ(out.intrude(wide), 1u);
  }
  FlashInterface::Instance()->NANDFlushWrite();
  Extruder in(&component, false);
  ASSERT_TRUE(in.isInitedOK);
  unsigned int word = 0;
  unsigned long wide = 0;
  EXPECT_EQ(in.extrude(&word), 0u);
  EXPECT_EQ(in.extrude(&wide), 0u);
  EXPECT_EQ(word, 0x56455253u);
  EXPECT_EQ(wide, 0x0102030405060708UL);
}

using StreamDeviceTest = FlashTest;

TEST_F(StreamDeviceTest, NorComponentGoesThroughTheFlashAddress) {
  ComponentLocation component = Component("NOR0", "BOOT", "CONFIG", 0x20);
  RoundTrip(component);
  EXPECT_EQ(sim_.Bytes("/dev/mtd1", 0x20, 4), (std::vector<uint8_t>{'V', 'E', 'R', 'S'}));
  EXPECT_EQ(sim_.OpenCount(), 0);
}

TEST_F(StreamDeviceTest, NandComponentSkipsBadBlocks) {
  sim_.MarkBad(kNandData, 0);
  ComponentLocation component = Component("NAND0", "SYS", "DATA", 0);
  RoundTrip(component);
  EXPECT_EQ(sim_.Bytes(kNandData, kNandBlock, 4), (std::vector<uint8_t>{'V', 'E', 'R', 'S'}));
  Extruder in(&component, false);
  EXPECT_TRUE(in.isNand);
  EXPECT_EQ(in.partitionName, "NAND0.SYS.DATA");
}

TEST_F(StreamDeviceTest, EmmcComponentStartsAtTheSlotOffset) {
  ComponentLocation component = Component("EMMC0", "APP", "STORE", 0x800);
  RoundTrip(component);
  EXPECT_EQ(sim_.Bytes(kEmmcNode, 0x100800, 4), (std::vector<uint8_t>{'V', 'E', 'R', 'S'}));
  Extruder in(&component, false);
  EXPECT_EQ(in.currNandOffset, 0x100800UL);
}

TEST_F(StreamDeviceTest, FileSlotIsCreatedWhenWritable) {
  ComponentLocation component = Component("FS0", "CFG", "USER", 4);
  {
    Extruder reader(&component, false);
    EXPECT_FALSE(reader.isInitedOK);
  }
  RoundTrip(component);
  EXPECT_EQ(sim_.Bytes("/data/user.cfg", 4, 4), (std::vector<uint8_t>{'V', 'E', 'R', 'S'}));
  EXPECT_EQ(sim_.OpenCount(), 0);
}

TEST_F(StreamDeviceTest, SdramComponentIsMappedMemory) {
  ComponentLocation component = Component("SDRAM0", "RESV", "ARGS", 0x8);
  RoundTrip(component);
  EXPECT_EQ(std::memcmp(sim_.Memory(kSdramBase + 0x1018), "VERS", 4), 0);
  sim_.FailCall(SimCall::kMmap, 1, ENOMEM);
  LogCapture log;
  Extruder in(&component, false);
  EXPECT_FALSE(in.isInitedOK);
  EXPECT_TRUE(log.Contains("mmap failed: errno = 12\r\n"));
  EXPECT_EQ(in.memFd, 0);
  EXPECT_EQ(sim_.OpenCount(), 0);
}

TEST_F(StreamDeviceTest, UnknownPlacesFailWithTheirMessages) {
  LogCapture log;
  ComponentLocation noDevice = Component("XYZ", "A", "B", 0);
  Extruder a(&noDevice, false);
  EXPECT_FALSE(a.isInitedOK);
  EXPECT_TRUE(log.Contains("Device XYZ..... not found\r\n"));
  ComponentLocation noSlot = Component("NOR0", "BOOT", "NONE", 0);
  Extruder b(&noSlot, false);
  EXPECT_FALSE(b.isInitedOK);
  EXPECT_TRUE(log.Contains("Package location NOR0.BOOT.NONE not found\r\n"));
  ComponentLocation noNode = Component("NAND0", "SYS", "NONE", 0);
  Extruder c(&noNode, false);
  EXPECT_FALSE(c.isInitedOK);
  EXPECT_TRUE(log.Contains("Can't find mtd partition or file name for NAND0.SYS.NONE\r\n"));
}

}  // namespace
}  // namespace test
}  // namespace stbplat
