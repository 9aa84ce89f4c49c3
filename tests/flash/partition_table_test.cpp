// The partition table read from /proc/mtd, the measured sizes and the three
// lookups.
#include <cstring>

#include "flash_fixture.h"

namespace stbplat {
namespace test {
namespace {

using PartitionTableTest = FlashTest;

// The names become memory-map devices; the count follows the last line,
// and rows numbered past the table are left out.
TEST_F(PartitionTableTest, NamesAreNormalisedAndTheCountFollowsTheLastLine) {
  sim_.SetProcMtd(
      "dev:    size   erasesize  name\n"
      "mtd0: 00040000 00010000 \"NOR0\"\n"
      "mtd1: 00040000 00010000 \"flash0.kernel\"\n"
      "mtd2: 00040000 00010000 \"flash1\"\n"
      "mtd3: 00040000 00010000 \"flash1.rootfs\"\n"
      "mtd4: 00040000 00010000 \"NOR0x\"\n"
      "mtd5: 00040000 00010000 \"NOR0.BOOT.FSBL\"\n"
      "mtd12: 00001000 00010000 \"other name\"\n"
      "mtd30: 00002000 00010000 \"flash0.HIGH\"\n"
      "mtd7: 00003000 00010000 \"flash0.C\"\n");
  FlashInterface& flash = Flash();
  const char* const names[] = {"NOR0....", "NOR0.kernel", "NAND0...", "NAND0.rootfs", "NOR0....",
                               "NOR0.BOOT.FSBL", "", "NOR0.C"};
  for (int n = 0; n < 8; ++n) EXPECT_STREQ(flash.mtdNames[n], names[n]) << n;
  // The name ends at the first blank; the closing quote is not there to trim.
  EXPECT_STREQ(flash.mtdNames[12], "othe");
  EXPECT_EQ(flash.mtdSizes[12], 0x1000UL);
  EXPECT_EQ(flash.mtdSizes[7], 0x3000UL);
  EXPECT_EQ(flash.mtdCount, 8);
  EXPECT_STREQ(flash.aliasNames[0], "") << "where a row mtd30 would land";
}

TEST_F(PartitionTableTest, DefaultsAndMeasuredSizes) {
  LogCapture log;
  FlashInterface& flash = Flash();
  EXPECT_EQ(FlashInterface::Instance(), &flash);  // one object, made once
  EXPECT_FALSE(log.Contains("Memory allocation failure"));
  EXPECT_EQ(flash.norSectorSize, kNorSector);
  EXPECT_EQ(flash.nandSectorSize, kNandBlock);
  EXPECT_EQ(flash.nandPageSize, kNandPage);
  EXPECT_EQ(flash.emmcChunkSize, 0x80000UL);
  EXPECT_EQ(flash.spareSectorSize, 0x20000UL);
  EXPECT_EQ(flash.aliasCount, 0);
  EXPECT_NE(flash.nandPageBuffer, nullptr);
  EXPECT_EQ(flash.GetNORSectorSize(), kNorSector);
  EXPECT_EQ(flash.GetNORChipSize(), 0x400000UL);
  EXPECT_TRUE(log.Contains("mtdNames[8] = [NOR0....]\r\n"));
  EXPECT_TRUE(log.Contains("mtd = [flash0\"]\r\n"));
  for (const auto& message : log.messages()) {
    EXPECT_EQ(message.module, eLogModuleFlashAccess);
    EXPECT_EQ(message.sourceFile, "../FlashInterface");
  }
}

TEST_F(PartitionTableTest, NoProcMtdLeavesTheTableEmptyAndDefaultsStand) {
  sim_.RemoveProcMtd();
  LogCapture log;
  FlashInterface& flash = Flash();
  EXPECT_EQ(flash.mtdCount, 0);
  EXPECT_EQ(flash.norSectorSize, 0x20000UL);
  EXPECT_EQ(flash.nandSectorSize, 0x80000UL);
  EXPECT_TRUE(log.Contains(
      "FlashInterface::FlashInterface: Can't open any partition in NAND0, unable to get sector "
      "size\r\n"));
  EXPECT_NE(flash.nandPageBuffer, nullptr);
}

TEST_F(PartitionTableTest, WithoutNandDeviceThereIsNoNandGeometry) {
  ASSERT_TRUE(LoadMap(
      "[device NOR0]\ntechnology = SPI_NOR\nbase = 0xE0000000\nsize = 0x400000\n"));
  FlashInterface& flash = Flash();
  EXPECT_EQ(flash.nandSectorSize, 0UL);
  EXPECT_EQ(flash.nandPageBuffer, nullptr);
  unsigned long physical = 0;
  EXPECT_FALSE(flash.ValidBlockOffset(kNandData, 0, physical));
  unsigned char byte = 0;
  EXPECT_FALSE(flash.NANDWrite(&byte, 1, "NAND0.SYS.DATA", 0));
  // Erasing without a block size erases nothing, and says so.
  LogCapture log;
  sim_.ClearHistory();
  EXPECT_FALSE(flash.EraseNANDSlot(kNandData));
  EXPECT_FALSE(flash.EraseNANDSector(kNandData));
  EXPECT_TRUE(log.Contains("EraseNANDSlot: no NAND block size, /dev/mtd2 not erased\n"));
  EXPECT_TRUE(log.Contains("EraseNANDSector: no NAND block size, /dev/mtd2 not erased\n"));
  EXPECT_TRUE(sim_.Erases(kNandData).empty());
}

TEST_F(PartitionTableTest, NorOpenFailureIsReportedAndDefaultKept) {
  sim_.FailCall(SimCall::kOpen, 1, EACCES);
  LogCapture log;
  FlashInterface& flash = Flash();
  EXPECT_EQ(flash.norSectorSize, 0x20000UL);
  EXPECT_TRUE(log.Contains(
      "FlashInterface::FlashInterface: can't open /dev/mtd8, unable to get NOR sector size\r\n"));
}

TEST_F(PartitionTableTest, NorEraseSizeOfZeroKeepsTheDefault) {
  sim_.AddMtd(8, "flash0", SimKind::kNor, 0x400000, 0);
  EXPECT_EQ(Flash().norSectorSize, 0x20000UL);
}

TEST_F(PartitionTableTest, NandDescriptorZeroCountsAsNotOpened) {
  sim_.SetFirstDescriptor(0);
  // The NOR measurement takes descriptor 0 and gives it back; the NAND one
  // then gets 0 again and moves on to the next slot (descriptor 0 again).
  LogCapture log;
  FlashInterface& flash = Flash();
  EXPECT_EQ(flash.norSectorSize, kNorSector);
  EXPECT_EQ(flash.nandSectorSize, 0x80000UL);
  EXPECT_TRUE(log.Contains(
      "FlashInterface::FlashInterface: Can't open any partition in NAND0, unable to get sector "
      "size\r\n"));
}

TEST_F(PartitionTableTest, NandDescriptorOneCountsAsOpened) {
  sim_.SetFirstDescriptor(1);
  EXPECT_EQ(Flash().nandSectorSize, kNandBlock);
}

TEST_F(PartitionTableTest, LookupByNameSearchesEveryRowAndLeavesOffset) {
  FlashInterface& flash = Flash();
  unsigned long offset = 0x55;
  EXPECT_STREQ(flash.LookupMTDPartition("NAND0.SYS.SPARE", &offset), "/dev/mtd3");
  EXPECT_EQ(offset, 0x55UL);
  EXPECT_EQ(flash.LookupMTDPartition("NAND0.SYS.NONE", &offset), nullptr);
  EXPECT_EQ(offset, 0x55UL);
  Location location = MakeLocation("NOR0", "BOOT", "CONFIG");
  EXPECT_STREQ(flash.LookupMTDPartition(&location, &offset), "/dev/mtd1");
  // Rows past mtdCount are searched too.
  std::strcpy(flash.mtdNames[29], "LATE.ROW.X");
  EXPECT_STREQ(flash.LookupMTDPartition("LATE.ROW.X", &offset), "/dev/mtd29");
  // Alias names count only up to aliasCount (0).
  std::strcpy(flash.aliasNames[0], "LATE");
  EXPECT_EQ(flash.LookupMTDPartition("LATE.ROW.Y", &offset), nullptr);
}

TEST_F(PartitionTableTest, UpgradeModeResolvesSlotsToWholeDevices) {
  FlashInterface& flash = Flash();
  isRDLQUpgradeInProgress = true;
  LogCapture log;
  unsigned long offset = 0x10;
  EXPECT_STREQ(flash.LookupMTDPartition("NAND0.SYS.SPARE", &offset), "/dev/mtd9");
  EXPECT_EQ(offset, 0x100010UL);
  EXPECT_EQ(flash.LookupMTDPartition("NAND0.SYS.NONE", &offset), nullptr);
  EXPECT_TRUE(log.Contains(
      "FlashInterface::LookupMTDPartition: GetLocation failed for NAND0.SYS.NONE\r\n"));
  EXPECT_EQ(flash.LookupMTDPartition("EMMC0.APP.STORE", &offset), nullptr);
  EXPECT_TRUE(log.Contains("FlashInterface::LookupMTDPartition: unknown device type\r\n"));
}

TEST_F(PartitionTableTest, AddressLookupUsesTheMemoryMapThenTheTableWalk) {
  FlashInterface& flash = Flash();
  unsigned long offset = 0;
  EXPECT_STREQ(flash.LookupMTDPartition(kNorBase + 0x40010, &offset), "/dev/mtd1");
  EXPECT_EQ(offset, 0x10UL);
  // No slot holds this address: the walk over the table finds mtd0.
  EXPECT_STREQ(flash.LookupMTDPartition(kNorBase + 0x30004, &offset), "/dev/mtd0");
  EXPECT_EQ(offset, 0x30004UL);
  // Below the chip nothing matches; the walk stops at the first NAND row.
  EXPECT_EQ(flash.LookupMTDPartition(kNorBase - 1, &offset), nullptr);
  EXPECT_EQ(flash.LookupMTDPartition(kNorBase + 0x100000, &offset), nullptr);
  flash.mtdCount = 0;  // rows past the count are not walked
  EXPECT_EQ(flash.LookupMTDPartition(kNorBase + 0x30004, &offset), nullptr);
}

TEST_F(PartitionTableTest, AddressLookupBeforeTheMapIsLoadedIsFixed) {
  ExtendedMemoryMapStructure::Reset();
  FlashInterface& flash = Flash();
  unsigned long offset = 0;
  EXPECT_STREQ(flash.LookupMTDPartition(kNorBase + 0x40010, &offset), "/dev/mtd8");
  EXPECT_EQ(offset, 0x40010UL);
  EXPECT_EQ(flash.GetNORChipSize(), 0UL);
}

}  // namespace
}  // namespace test
}  // namespace stbplat
