// eMMC chunking and the erasing of slots and sectors by technology.
#include <cerrno>

#include "flash_fixture.h"

namespace stbplat {
namespace test {
namespace {

using Spans = std::vector<Span>;
constexpr const char* kStoreSlot = "EMMC0.APP.STORE";

using EmmcTest = FlashTest;

TEST_F(EmmcTest, WriteChunksStopAtTheChunkBoundaryRoundedToPages) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(100, 1);
  sim_.Poke(kEmmcNode, 0x7FFF0 + 100, {0xAB, 0xCD});
  sim_.ClearHistory();
  ASSERT_TRUE(flash.EMMCWrite(data.data(), data.size(), kStoreSlot, 0x7FFF0));
  EXPECT_EQ(sim_.Writes(kEmmcNode), Spans{Span(0x7FFF0, 2048)});
  EXPECT_EQ(sim_.Bytes(kEmmcNode, 0x7FFF0, 100), data);
  // The rounded-up tail keeps what the device held.
  EXPECT_EQ(sim_.Bytes(kEmmcNode, 0x7FFF0 + 100, 2), (std::vector<uint8_t>{0xAB, 0xCD}));
  std::vector<uint8_t> big = Pattern(0x90000, 2);
  sim_.ClearHistory();
  ASSERT_TRUE(flash.EMMCWrite(big.data(), big.size(), kStoreSlot, 0x70000));
  EXPECT_EQ(sim_.Writes(kEmmcNode), (Spans{Span(0x70000, 0x10000), Span(0x80000, 0x80000)}));
  std::vector<uint8_t> back(big.size());
  // Any name reads the same bytes: the whole device at that offset.
  ASSERT_TRUE(flash.EMMCRead(back.data(), back.size(), "ANY.NAME.AT", 0x70000));
  EXPECT_EQ(back, big);
  // Without a page size a chunk ends on the chunk boundary; without a chunk
  // size the write is one chunk.
  flash.nandPageSize = 0;
  sim_.ClearHistory();
  ASSERT_TRUE(flash.EMMCWrite(big.data(), 0x80000, kStoreSlot, 1));
  EXPECT_EQ(sim_.Writes(kEmmcNode), (Spans{Span(1, 0x7FFFF), Span(0x80000, 1)}));
  flash.emmcChunkSize = 0;
  sim_.ClearHistory();
  ASSERT_TRUE(flash.EMMCWrite(big.data(), 0x90000, kStoreSlot, 1));
  EXPECT_EQ(sim_.Writes(kEmmcNode), Spans{Span(1, 0x90000)});
}

TEST_F(EmmcTest, FailingChunkIsRetriedUntilItGoesThrough) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(2048, 1);
  sim_.FailCall(SimCall::kWrite, 1, EIO);
  sim_.FailCall(SimCall::kWrite, 2, EIO);
  sim_.ClearHistory();
  ASSERT_TRUE(flash.EMMCWrite(data.data(), data.size(), kStoreSlot, 0));
  EXPECT_EQ(sim_.CallCount(SimCall::kWrite), 3);
  EXPECT_EQ(sim_.Bytes(kEmmcNode, 0, 2048), data);
}

TEST_F(EmmcTest, WriteAndEraseRefuseBadArguments) {
  FlashInterface& flash = Flash();
  LogCapture log;
  unsigned char byte = 0;
  EXPECT_FALSE(flash.EMMCWrite(nullptr, 1, kStoreSlot, 0));
  EXPECT_FALSE(flash.EMMCWrite(&byte, 0, kStoreSlot, 0));
  EXPECT_TRUE(log.Contains("FlashInterface::EMMCWrite: invalid parameters\r\n"));
  EXPECT_FALSE(flash.EMMCWrite(&byte, 1, "EMMC0.APP.NONE", 0));
  EXPECT_TRUE(log.Contains("EMMCWrite: LookupMTDPartition for EMMC0.APP.NONE failed\r\n"));
  Location unknown = MakeLocation("EMMC0", "APP", "NONE");
  EXPECT_FALSE(flash.EMMCErase(&unknown, 0, 16, 0xFF));
  EXPECT_TRUE(log.Contains("EMMCErase: LookupMTDPartition for EMMC0.APP.NONE failed\r\n"));
}

TEST_F(EmmcTest, EraseFillsFromTheSlotOffset) {
  FlashInterface& flash = Flash();
  Location store = MakeLocation("EMMC0", "APP", "STORE");
  LogCapture log;
  sim_.ClearHistory();
  ASSERT_TRUE(flash.EMMCErase(&store, 0, 0, 0xFF));
  EXPECT_TRUE(log.Contains("EMMCErase: [/dev/mtd4] StartAddress=0x100000 len=0x0\r\n"));
  // Every chunk is written from the same pattern.
  ASSERT_TRUE(flash.EMMCErase(&store, 0x10, 0x81000, 0x5A));
  EXPECT_EQ(sim_.Writes(kEmmcNode), (Spans{Span(0x100010, 0x80000), Span(0x180010, 0x1000)}));
  EXPECT_EQ(sim_.Bytes(kEmmcNode, 0x100010, 0x81000), std::vector<uint8_t>(0x81000, 0x5A));
}

using EraseTest = FlashTest;

TEST_F(EraseTest, FileSlotIsDeletedWhateverTheDevice) {
  FlashInterface& flash = Flash();
  sim_.AddFile("/data/user.cfg", {1, 2, 3});
  Location user = MakeLocation("FS0", "CFG", "USER");
  LogCapture log;
  EXPECT_TRUE(flash.EraseSlot(&user));
  EXPECT_FALSE(sim_.HasFile("/data/user.cfg"));
  EXPECT_TRUE(log.Contains("Erasing file slot FS0.CFG.USER\r\n"));
  // Deleting a file that is not there still reports success.
  EXPECT_TRUE(flash.EraseSlot(&user));
  // Its device is not NOR or NAND: a sector erase is refused.
  EXPECT_FALSE(flash.EraseSector(&user));
  EXPECT_TRUE(log.Contains(
      "FlashInterface::EraseSlot: memory technology for FS0.CFG.USER is not NOR or NAND, unable "
      "to erase\n"));
}

TEST_F(EraseTest, NorSlotErasesWholeSectorsOnly) {
  FlashInterface& flash = Flash();
  Location config = MakeLocation("NOR0", "BOOT", "CONFIG");
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSlot(&config));
  ASSERT_EQ(sim_.Erases("/dev/mtd1").size(), 4u);
  EXPECT_EQ(sim_.Erases("/dev/mtd1")[3], Span(3 * kNorSector, kNorSector));
  // The erase stops at the first sector that fails.
  sim_.ClearHistory();
  sim_.FailCall(SimCall::kOpen, 2, EIO);  // the second sector's device
  EXPECT_FALSE(flash.EraseSlot(&config));
  EXPECT_EQ(sim_.Erases("/dev/mtd1").size(), 1u);
  Location tiny = MakeLocation("NOR0", "MISC", "TINY");
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSlot(&tiny));
  EXPECT_EQ(sim_.CallCount(SimCall::kAny), 0);
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSector(&config));
  EXPECT_EQ(sim_.Erases("/dev/mtd1").size(), 1u);
  LogCapture log;
  Location none = MakeLocation("NOR0", "BOOT", "NONE");
  EXPECT_FALSE(flash.EraseSlot(&none));
  EXPECT_TRUE(log.Contains("FlashInterface::EraseSlot: Location NOR0.BOOT.NONE not found\r\n"));
  log.Clear();
  EXPECT_FALSE(flash.EraseSector(&none));
  EXPECT_TRUE(log.Contains("FlashInterface::EraseSlot: Location NOR0.BOOT.NONE not found\r\n"));
  Location nodevice = MakeLocation("XYZ", "A", "B");
  EXPECT_FALSE(flash.EraseSlot(&nodevice));
  EXPECT_FALSE(flash.EraseSector(&nodevice));
  EXPECT_TRUE(log.Contains("Device XYZ.A.B not found\r\n"));
  Location noNode = MakeLocation("NAND0", "SYS", "NONE");
  EXPECT_FALSE(flash.EraseSlot(&noNode));
  EXPECT_TRUE(log.Contains("FlashInterface::EraseSlot: unable to find mtd partition for NAND0.SYS.NONE\n"));
  // Without a sector size a NOR slot erase erases nothing.
  flash.norSectorSize = 0;
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSlot(&config));
  EXPECT_EQ(sim_.CallCount(SimCall::kMemErase), 0);
}

TEST_F(EraseTest, NandSlotErasesGoodBlocksAndMarksEioFailures) {
  FlashInterface& flash = Flash();
  sim_.MarkBad(kNandData, kNandBlock);
  sim_.FailCall(SimCall::kMemErase, 3, EIO);
  sim_.FailCall(SimCall::kMemErase, 4, EINVAL);
  Location data = MakeLocation("NAND0", "SYS", "DATA");
  LogCapture log;
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSlot(&data));
  EXPECT_EQ(sim_.CallCount(SimCall::kMemErase), 7);  // 8 blocks less the bad one
  EXPECT_TRUE(sim_.IsBad(kNandData, 3 * kNandBlock));
  EXPECT_FALSE(sim_.IsBad(kNandData, 4 * kNandBlock));
}

TEST_F(EraseTest, NandSectorErasesBlockZeroOnly) {
  FlashInterface& flash = Flash();
  Location data = MakeLocation("NAND0", "SYS", "DATA");
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSector(&data));
  ASSERT_EQ(sim_.Erases(kNandData).size(), 1u);
  EXPECT_EQ(sim_.Erases(kNandData)[0], Span(0, kNandBlock));
  sim_.MarkBad(kNandData, 0);
  sim_.ClearHistory();
  EXPECT_TRUE(flash.EraseSector(&data));
  EXPECT_EQ(sim_.CallCount(SimCall::kMemErase), 0);
  LogCapture log;
  EXPECT_FALSE(flash.EraseNANDSector("/dev/none"));
  EXPECT_TRUE(log.Contains("EraseNANDSector: open of mtd partition /dev/none failed\n"));
  EXPECT_FALSE(flash.EraseNANDSlot("/dev/none"));
  EXPECT_TRUE(log.Contains("EraseNANDSlot: open of mtd partition /dev/none failed\n"));
}

}  // namespace
}  // namespace test
}  // namespace stbplat
