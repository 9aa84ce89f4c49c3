// The memory-map stand-in: loading, refusing bad files, and its queries.
#include "flash_fixture.h"

namespace stbplat {
namespace test {
namespace {

class MemoryMapTest : public ::testing::Test {
 protected:
  void TearDown() override { ExtendedMemoryMapStructure::Reset(); }
  ExtendedMemoryMapStructure& Map() { return *ExtendedMemoryMapStructure::Instance(); }
};

// The refusals; the flash and stream tests make the lookups that succeed.
TEST_F(MemoryMapTest, QueriesOfTheTestDeviceRefuseWhatIsNotThere) {
  ASSERT_TRUE(LoadMap(DeviceMap()));
  ExtendedMemoryMapStructure& map = Map();
  Location location;
  EXPECT_FALSE(map.GetLocation("NAND0.SYS", &location));
  EXPECT_FALSE(map.GetLocation("NAND0.SYS.SPARE.X", &location));
  EXPECT_TRUE(map.DoesDeviceExist("NOR0"));
  EXPECT_FALSE(map.DoesDeviceExist("NAND1..."));
  unsigned long size = 0, offset = 0, address = 0;
  EXPECT_FALSE(map.GetDeviceSize("NOR0....", 1, &size));
  Location config = MakeLocation("NOR0", "BOOT", "CONFIG");
  EXPECT_FALSE(map.GetPhysAddressFromLocation(&config, 0x40001, &address, &size));
  EXPECT_FALSE(map.GetLocationInfoFromPhysAddr(kNorBase + 0x8000 + 0x80000, &location, &offset));
  // A slot without a node of its own, in a partition without one, has none.
  Location tiny = MakeLocation("NOR0", "MISC", "TINY");
  EXPECT_EQ(map.GetMTDorFileName(&tiny, &offset), nullptr);
  EXPECT_FALSE(map.IsSlotAFile(&config));
}

TEST_F(MemoryMapTest, PartitionNodeGivesTheSlotOffsetAsExtra) {
  ASSERT_TRUE(LoadMap("[device NAND0]\ntechnology = NAND\nbase = 0\nsize = 0x100000\n"
                      "[partition NAND0.SYS]\noffset = 0\nsize = 0x100000\nnode = /dev/mtd5\n"
                      "[slot NAND0.SYS.B]\noffset = 0x20000\nsize = 0x20000\n"));
  Location b = MakeLocation("NAND0", "SYS", "B");
  unsigned long extra = 4;
  EXPECT_STREQ(Map().GetMTDorFileName(&b, &extra), "/dev/mtd5");
  EXPECT_EQ(extra, 0x20004UL);
}

TEST_F(MemoryMapTest, BadFilesAreRefusedNamingTheLine) {
  struct Case {
    const char* text;
    const char* message;
  };
  const Case cases[] = {
      {"[device NOR0]\ntechnology = SPI_NOR\nbase = 0\nsize = 0x1000\n"
       "[partition NOR0.A]\noffset = 0x800\nsize = 0x1000\n",
       "line 5: partition beyond its container"},
      {"[device NOR0]\ntechnology = SPI_NOR\nbase = 0\nsize = 0x1000\n"
       "[partition NOR0.A]\nsize = 0x1000\n"
       "[slot NOR0.A.X]\nsize = 0x800\n[slot NOR0.A.Y]\noffset = 0x7FF\nsize = 0x10\n",
       "line 9: slot overlaps another"},
      {"[device NOR0]\ntechnology = SPI_NOR\nbase = 0\nsize = 0x1000\n"
       "[partition NOR0.A]\nsize = 0x1000\n"
       "[slot NOR0.A.X]\noffset = 0xFFFFFFFFFFFFFFF0\nsize = 0x20\n",
       "line 7: slot beyond its container"},
      {"[device NOR0]\ntechnology = SPI_NOR\nbase = 0xFFFFFFFFFFFFF000\nsize = 0x2000\n",
       "line 1: device range wraps or is empty"},
      {"[device NOR0]\ntechnology = SPI_NOR\nsize = 0x2000\n",
       "line 1: device needs technology, base and size"},
      {"[device NOR0]\ntechnology = SPI_NOR\nbase = zero\n", "line 3: bad device entry base"},
      {"[slot NOR0.A.X]\nsize = 1\n", "line 1: slot of undeclared partition NOR0.A"},
      {"[device TOOLONGNAME]\nsize = 1\n", "line 1: bad device name"},
      {"[device NOR0]\nno separator here\n", "line 2: malformed line"},
      {"[volume X]\nsize = 1\n", "line 1: unknown section [volume X]"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    std::string error;
    EXPECT_FALSE(LoadMap(c.text, &error));
    EXPECT_NE(error.find(c.message), std::string::npos) << error;
    EXPECT_FALSE(Map().IsCreated());
  }
  std::string error;
  EXPECT_FALSE(ExtendedMemoryMapStructure::Load("/nonexistent/map.ini", &error));
  EXPECT_NE(error.find("cannot open"), std::string::npos);
}

}  // namespace
}  // namespace test
}  // namespace stbplat
