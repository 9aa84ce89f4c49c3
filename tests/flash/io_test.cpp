// Low-level transfers, NOR by address, and the C entry points.
#include <cerrno>
#include <cstring>

#include "flash_fixture.h"
#include "stbplat/flash_c.h"

namespace stbplat {
namespace test {
namespace {

using DeviceIoTest = FlashTest;

TEST_F(DeviceIoTest, EccFailureDuringReadRejectsFilledBuffer) {
  FlashInterface& flash = Flash();
  sim_.Poke(kNandData, 0x800, {1, 2, 3, 4});
  sim_.AddEccFailure(kNandData, 0x802);
  LogCapture log;
  unsigned char buffer[4] = {};
  EXPECT_FALSE(flash.LinuxFlashRead(kNandData, 0x800, buffer, 4));
  // The unreadable page's bytes are passed on as read; its eight ECC steps
  // all fail.
  EXPECT_NE(std::vector<uint8_t>(buffer, buffer + 4), (std::vector<uint8_t>{1, 2, 3, 4}));
  EXPECT_TRUE(log.Contains(
      "ECC error reading the flash device /dev/mtd2, failed = 0x0, stats.failed = 8\r\n"));
  // The counter does not move on a clean read.
  EXPECT_TRUE(flash.LinuxFlashRead(kNandData, 0x0, buffer, 4));
  // Without a count from before the read, any failed count is an error.
  sim_.FailCall(SimCall::kEccGetStats, 1, ENOTTY);
  log.Clear();
  EXPECT_FALSE(flash.LinuxFlashRead(kNandData, 2 * kNandPage, buffer, 4));
  EXPECT_TRUE(log.Contains(
      "ECC error reading the flash device /dev/mtd2, failed = 0x0, stats.failed = 8\r\n"));
}

TEST_F(DeviceIoTest, ReadFailuresAreReportedWithTheirTexts) {
  FlashInterface& flash = Flash();
  LogCapture log;
  unsigned char buffer[8];
  EXPECT_FALSE(flash.LinuxFlashRead(kNandData, 0, nullptr, 8));
  EXPECT_TRUE(log.Contains("pBuffer is NULL\r\n"));
  EXPECT_FALSE(flash.LinuxFlashRead("/dev/none", 0, buffer, 8));
  EXPECT_TRUE(log.Contains("Unable to open the flash device: /dev/none"));
  EXPECT_FALSE(log.Contains("Unable to read"));
  EXPECT_FALSE(flash.LinuxEMMCRead(kNandData, kNandSize + 1, buffer, 8));
  EXPECT_TRUE(log.Contains("Unable to seek the flash to 0x100001"));
  errno = 0;  // a short read sets no errno; the message shows what is there
  EXPECT_FALSE(flash.LinuxEMMCRead(kNandData, kNandSize - 4, buffer, 8));
  EXPECT_TRUE(log.Contains(
      "Unable to read the flash device: /dev/mtd2, 3, asked: 8, got: 4, errno = 0\r\n"));
}

TEST_F(DeviceIoTest, WriteReportsShortWrites) {
  FlashInterface& flash = Flash();
  LogCapture log;
  std::vector<uint8_t> data = Pattern(kNandPage, 1);
  EXPECT_TRUE(flash.LinuxFlashWrite(kNandData, kNandPage, data.data(), data.size()));
  EXPECT_EQ(sim_.Bytes(kNandData, kNandPage, kNandPage), data);
  // Not a whole page: the kernel refuses it.
  EXPECT_FALSE(flash.LinuxFlashWrite(kNandData, 0, data.data(), 100));
  EXPECT_TRUE(log.Contains(
      "Unable to write the flash device /dev/mtd2 at offset 0x00000000, asked: 100, got: "
      "18446744073709551615\r\n"));
}

TEST_F(DeviceIoTest, DeviceSizeIsTheThirtyTwoBitField) {
  FlashInterface& flash = Flash();
  EXPECT_EQ(flash.GetDevSize(kNandData), kNandSize);
  LogCapture log;
  EXPECT_EQ(flash.GetDevSize(kEmmcNode), 0UL);
  EXPECT_TRUE(log.Contains("GetDevSize: MEMGETINFO of mtd partition /dev/mmca failed\r\n"));
  EXPECT_EQ(flash.GetDevSize("/dev/none"), 0UL);
  EXPECT_TRUE(log.Contains("GetDevSize: Failed to obtain file handle for /dev/none\r\n"));
}

TEST_F(DeviceIoTest, ValidBlockOffsetSkipsBadBlocksUpToTheMovedOffset) {
  FlashInterface& flash = Flash();
  unsigned long physical = 0;
  ASSERT_TRUE(flash.ValidBlockOffset(kNandData, 0x100, physical));
  EXPECT_EQ(physical, 0x100UL);
  EXPECT_EQ(flash.badBlocksSkipped, 0UL);
  sim_.MarkBad(kNandData, 0);
  // Block 0 bad moves offset 0x100 into block 1, which is bad too: skipped.
  sim_.MarkBad(kNandData, kNandBlock);
  ASSERT_TRUE(flash.ValidBlockOffset(kNandData, 0x100, physical));
  EXPECT_EQ(physical, 2 * kNandBlock + 0x100);
  EXPECT_EQ(flash.badBlocksSkipped, 2UL);
  // A bad block beyond the moved offset is not counted.
  sim_.MarkBad(kNandData, 4 * kNandBlock);
  ASSERT_TRUE(flash.ValidBlockOffset(kNandData, 0x100, physical));
  EXPECT_EQ(flash.badBlocksSkipped, 2UL);
  LogCapture log;
  EXPECT_FALSE(flash.ValidBlockOffset(kNandData, kNandSize, physical));
  EXPECT_TRUE(log.Contains(
      "ValidBlockOffset: offset (0x00100000) > device size (0x00100000) for /dev/mtd2\r\n"));
  EXPECT_FALSE(flash.ValidBlockOffset(kNandData, kNandSize - 1, physical));
  EXPECT_TRUE(log.Contains(
      "ValidBlockOffset: final offset (0x0015FFFF) > device size (0x00100000) for /dev/mtd2\r\n"));
}

using NorTest = FlashTest;

TEST_F(NorTest, WriteSplitsOnceAtTheFirstSectorBoundary) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(3 * kNorSector, 9);
  sim_.ClearHistory();
  ASSERT_TRUE(flash.WriteToNORFlashAtAddr(kNorBase + kNorSector - 16, data.data(), data.size()));
  const auto& writes = sim_.Writes("/dev/mtd0");
  ASSERT_EQ(writes.size(), 2u);
  EXPECT_EQ(writes[0], Span(kNorSector - 16, 16));
  EXPECT_EQ(writes[1], Span(kNorSector, 3 * kNorSector - 16));
  std::vector<uint8_t> back(data.size());
  ASSERT_TRUE(flash.ReadFromNORFlashAtAddr(kNorBase + kNorSector - 16, back.data(), back.size()));
  EXPECT_EQ(back, data);
  // Aligned, ending on the boundary, or with no sector size: one write.
  sim_.ClearHistory();
  ASSERT_TRUE(flash.WriteToNORFlashAtAddr(kNorBase + 0x40000, data.data(), 2 * kNorSector));
  ASSERT_TRUE(flash.WriteToNORFlashAtAddr(kNorBase + 0x70000 - 16, data.data(), 16));
  flash.norSectorSize = 0;
  ASSERT_TRUE(flash.WriteToNORFlashAtAddr(kNorBase + 0x40010, data.data(), kNorSector));
  EXPECT_EQ(sim_.Writes("/dev/mtd1").size(), 3u);
  flash.norSectorSize = kNorSector;
  // A failing first part ends the transfer.
  sim_.ClearHistory();
  sim_.FailCall(SimCall::kOpen, 1, EIO);
  EXPECT_FALSE(flash.ReadFromNORFlashAtAddr(kNorBase + kNorSector - 16, back.data(), 32));
  EXPECT_EQ(sim_.CallCount(SimCall::kOpen), 1);
}

TEST_F(NorTest, UnknownAddressFallsBackToTheWholeChip) {
  ExtendedMemoryMapStructure::Reset();
  sim_.SetProcMtd("dev\nmtd8: 00400000 00010000 \"flash0\"\n");
  FlashInterface& flash = Flash();
  ASSERT_TRUE(LoadMap(DeviceMap()));
  LogCapture log;
  unsigned char data[4] = {0x12, 0x34, 0x56, 0x78};
  // No slot holds the address and it lies past the whole-chip row: the
  // fixed mapping is used, and mtd8 refuses a position past its end.
  EXPECT_FALSE(flash.WriteToNORFlashAtAddr(kNorBase + 0x500000, data, 4));
  EXPECT_TRUE(log.Contains("Unable to lseek64 the flash device /dev/mtd8 to 0x500000\r\n"));
  sim_.ClearHistory();
  // TINY holds this address but has no partition of its own: the table walk
  // finds it in the whole-chip row, without a warning.
  EXPECT_TRUE(flash.WriteToNORFlashAtAddr(kNorBase + 0x80000 + 0x10, data, 4));
  EXPECT_TRUE(flash.ReadFromNORFlashAtAddr(kNorBase + 0x80000 + 0x10, data, 4));
  EXPECT_FALSE(flash.ReadFromNORFlashAtAddr(kNorBase + 0x500000, data, 4));
  EXPECT_FALSE(log.Contains("0xE0080010"));
  EXPECT_EQ(sim_.Bytes("/dev/mtd8", 0x80010, 4), std::vector<uint8_t>(data, data + 4));
  EXPECT_TRUE(log.Contains(
      "WriteToNORFlashAtAddr: mtd name for address 0xE0500000 not found, using /dev/mtd0\r\n"));
  EXPECT_TRUE(log.Contains("ReadFromNORFlashAtAddr: mtd name for address 0xE0500000 not found"));
  EXPECT_EQ(log.messages()[0].level, 3u);
  EXPECT_FALSE(flash.WriteToNORFlashAtAddr(kNorBase, nullptr, 4));
  EXPECT_TRUE(log.Contains("pBuffer is NULL\r\n"));
}

TEST_F(NorTest, EraseRoundsUpAndReportsSuccessWhenTheKernelRefuses) {
  FlashInterface& flash = Flash();
  LogCapture log;
  EXPECT_FALSE(flash.NORErase(kNorBase, kNorSector - 1));
  EXPECT_TRUE(log.Contains("Can't erase less than one flash sector, numBytes = 65535\r\n"));
  sim_.ClearHistory();
  EXPECT_TRUE(flash.NORErase(kNorBase + 0x40000, kNorSector + 1));
  ASSERT_EQ(sim_.Erases("/dev/mtd1").size(), 1u);
  EXPECT_EQ(sim_.Erases("/dev/mtd1")[0], Span(0, 2 * kNorSector));
  EXPECT_FALSE(log.Contains("Flash erase error"));
  // Unaligned start: the kernel refuses, the result is still true.
  EXPECT_TRUE(flash.NORErase(kNorBase + 0x40010, kNorSector));
  EXPECT_TRUE(log.Contains("Erase: Flash erase error in /dev/mtd1 \r\n"));
  EXPECT_TRUE(flash.EraseNORSector(kNorBase + 0x40010));
  EXPECT_TRUE(log.Contains("EraseSector: Flash erase error in /dev/mtd1 \r\n"));
  EXPECT_TRUE(EraseNOR(kNorBase, kNorSector));
  // A sector size a caller set to 0 erases nothing rather than divide by it.
  flash.norSectorSize = 0;
  EXPECT_FALSE(flash.NORErase(kNorBase, kNorSector));
  EXPECT_TRUE(log.Contains("Can't erase less than one flash sector, numBytes = 65536\r\n"));
}

TEST_F(NorTest, CEntryPointsForwardToTheSingleton) {
  EXPECT_EQ(FlashInterface::m_pSelf, nullptr);
  EXPECT_EQ(GetNORSectorSize(), kNorSector);
  ASSERT_NE(FlashInterface::m_pSelf, nullptr);
  unsigned long offset = 7;
  EXPECT_STREQ(LookupMTDPartition("NOR0.BOOT.FSBL", &offset), "/dev/mtd0");
  Location spare = MakeLocation("NAND0", "SYS", "SPARE");
  EXPECT_STREQ(LookupMTDPartitionLoc(&spare, &offset), "/dev/mtd3");
  std::vector<uint8_t> data = Pattern(kNandPage, 3);
  EXPECT_TRUE(NANDWrite(data.data(), data.size(), "NAND0.SYS.DATA", 0));
  EXPECT_TRUE(NANDWriteLoc(data.data(), data.size(), &spare, kNandPage));
  std::vector<uint8_t> back(kNandPage);
  EXPECT_TRUE(NANDRead(back.data(), back.size(), "NAND0.SYS.DATA", 0));
  EXPECT_EQ(back, data);
  EXPECT_TRUE(NANDReadLoc(back.data(), back.size(), &spare, kNandPage));
  EXPECT_EQ(back, data);
  EXPECT_TRUE(WriteToNORFlashAtAddr(kNorBase + 8, data.data(), 8));
  unsigned char bytes[8];
  EXPECT_TRUE(ReadFromNORFlashAtAddr(kNorBase + 8, bytes, 8));
  EXPECT_EQ(std::memcmp(bytes, data.data(), 8), 0);
}

}  // namespace
}  // namespace test
}  // namespace stbplat
