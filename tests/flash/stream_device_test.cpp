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

// Each kind of place: the stream stores where the slot and offset say,
// through the mode it opens in, and reads back what it stored.
TEST_F(StreamDeviceTest, EveryKindOfPlaceStoresWhereItsSlotLies) {
  struct Place {
    const char* device;
    const char* partition;
    const char* slot;
    unsigned long offset;
    const char* node;  // null: physical memory
    unsigned long at;  // where the bytes land in the node (or memory)
  };
  const Place places[] = {
      {"NOR0", "BOOT", "CONFIG", 0x20, "/dev/mtd1", 0x20},
      {"NAND0", "SYS", "DATA", 0, kNandData, kNandBlock},  // block 0 is bad
      {"EMMC0", "APP", "STORE", 0x800, kEmmcNode, 0x100800},
      {"FS0", "CFG", "USER", 4, "/data/user.cfg", 4},
      {"SDRAM0", "RESV", "ARGS", 0x8, nullptr, kSdramBase + 0x1018},
  };
  sim_.MarkBad(kNandData, 0);
  for (const Place& place : places) {
    SCOPED_TRACE(place.device);
    ComponentLocation component = Component(place.device, place.partition, place.slot, place.offset);
    RoundTrip(component);
    const uint8_t* memory = place.node == nullptr ? sim_.Memory(place.at) : nullptr;
    std::vector<uint8_t> stored =
        memory != nullptr ? std::vector<uint8_t>(memory, memory + 4) : sim_.Bytes(place.node, place.at, 4);
    EXPECT_EQ(stored, (std::vector<uint8_t>{'V', 'E', 'R', 'S'}));
    EXPECT_EQ(sim_.OpenCount(), 0);
  }
  ComponentLocation store = Component("EMMC0", "APP", "STORE", 0x800);
  Extruder emmc(&store, false);
  EXPECT_EQ(emmc.currNandOffset, 0x100800UL);
  ComponentLocation data = Component("NAND0", "SYS", "DATA", 0);
  Extruder nand(&data, false);
  EXPECT_TRUE(nand.isNand);
  EXPECT_EQ(nand.partitionName, "NAND0.SYS.DATA");
}

TEST_F(StreamDeviceTest, FailuresToOpenSayWhy) {
  // A file slot is created only by a writable stream.
  ComponentLocation user = Component("FS0", "CFG", "USER", 4);
  Extruder reader(&user, false);
  EXPECT_FALSE(reader.isInitedOK);
  ComponentLocation args = Component("SDRAM0", "RESV", "ARGS", 0x8);
  sim_.FailCall(SimCall::kMmap, 1, ENOMEM);
  LogCapture log;
  Extruder memory(&args, false);
  EXPECT_FALSE(memory.isInitedOK);
  EXPECT_TRUE(log.Contains("mmap failed: errno = 12\r\n"));
  EXPECT_EQ(memory.memFd, 0);
  EXPECT_EQ(sim_.OpenCount(), 0);
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
