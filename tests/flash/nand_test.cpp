// NAND reads and writes: block cutting, the partial-page buffer, bad-block
// skipping and relocation.
#include <cerrno>

#include "flash_fixture.h"

namespace stbplat {
namespace test {
namespace {

constexpr const char* kDataSlot = "NAND0.SYS.DATA";

using NandTest = FlashTest;

TEST_F(NandTest, ReadCutsAtBlocksAndSkipsBadOnes) {
  FlashInterface& flash = Flash();
  sim_.MarkBad(kNandData, kNandBlock);
  std::vector<uint8_t> first = Pattern(0x100, 1);
  std::vector<uint8_t> second = Pattern(0x100, 2);
  sim_.Poke(kNandData, kNandBlock - 0x100, first);
  sim_.Poke(kNandData, 2 * kNandBlock, second);
  std::vector<uint8_t> back(0x200);
  ASSERT_TRUE(flash.NANDRead(back.data(), back.size(), kDataSlot, kNandBlock - 0x100));
  EXPECT_EQ(std::vector<uint8_t>(back.begin(), back.begin() + 0x100), first);
  EXPECT_EQ(std::vector<uint8_t>(back.begin() + 0x100, back.end()), second);
  LogCapture log;
  EXPECT_FALSE(flash.NANDRead(back.data(), back.size(), "NAND0.SYS.NONE", 0));
  EXPECT_TRUE(log.Contains("NANDRead: LookupMTDPartition for NAND0.SYS.NONE failed\r\n"));
  sim_.AddEccFailure(kNandData, 0x10);
  EXPECT_FALSE(flash.NANDRead(back.data(), back.size(), kDataSlot, 0));
  EXPECT_TRUE(log.Contains(
      "NANDRead: LinuxFlashRead failed in /dev/mtd2 at offset 0x00000000, attempting "
      "recovery\r\n"));
}

TEST_F(NandTest, ContinuedWriteCompletesTheBufferedPage) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(3 * kNandPage + 100, 8);
  sim_.ClearHistory();
  ASSERT_TRUE(flash.NANDWrite(data.data(), 100, kDataSlot, 0));
  ASSERT_TRUE(flash.NANDWrite(data.data() + 100, 50, kDataSlot, 100));  // still inside the page
  EXPECT_TRUE(sim_.Writes(kNandData).empty());  // a short write is only buffered
  EXPECT_EQ(flash.currNANDBufferOffset, 150UL);
  EXPECT_STREQ(flash.pendingNANDDevice, kNandData);
  sim_.ClearHistory();
  ASSERT_TRUE(flash.NANDWrite(data.data() + 150, data.size() - 150, kDataSlot, 150));
  // One page from the buffer, the whole pages from the source in one
  // write, the tail buffered again.
  ASSERT_EQ(sim_.Writes(kNandData).size(), 2u);
  EXPECT_EQ(sim_.Writes(kNandData)[0], Span(0, kNandPage));
  EXPECT_EQ(sim_.Writes(kNandData)[1], Span(kNandPage, 2 * kNandPage));
  EXPECT_EQ(flash.currNANDBufferOffset, 100UL);
  EXPECT_EQ(flash.pendingNANDOffset, 3 * kNandPage);
  flash.NANDFlushWrite();
  EXPECT_EQ(sim_.Bytes(kNandData, 0, data.size()), data);
  EXPECT_EQ(sim_.Writes(kNandData).back(), Span(3 * kNandPage, kNandPage));  // the whole last page
  flash.NANDFlushWrite();  // nothing buffered: nothing happens
  EXPECT_EQ(sim_.Writes(kNandData).size(), 3u);
  // A short write that exactly fills the buffered page sends it at once.
  ASSERT_TRUE(flash.NANDWrite(data.data(), 1500, kDataSlot, 4 * kNandPage));
  ASSERT_TRUE(flash.NANDWrite(data.data() + 1500, kNandPage - 1500, kDataSlot, 4 * kNandPage + 1500));
  EXPECT_EQ(sim_.Writes(kNandData).back(), Span(4 * kNandPage, kNandPage));
  EXPECT_EQ(flash.currNANDBufferOffset, 0UL);
}

TEST_F(NandTest, MisalignedWritesAreRefused) {
  FlashInterface& flash = Flash();
  LogCapture log;
  std::vector<uint8_t> data = Pattern(100, 1);
  EXPECT_FALSE(flash.NANDWrite(data.data(), 10, kDataSlot, 5));
  ASSERT_TRUE(flash.NANDWrite(data.data(), 100, kDataSlot, 0));
  EXPECT_FALSE(flash.NANDWrite(data.data(), 10, kDataSlot, 40));
  EXPECT_TRUE(log.Contains(
      "NANDWrite: writing in the middle of a block and write start doesn't align with "
      "currNANDBufferOffset\r\n"));
  EXPECT_FALSE(flash.NANDWrite(data.data(), 10, kDataSlot, kNandPage));
  EXPECT_TRUE(log.Contains("NANDWrite: not writing a full block and currNANDBufferOffset != 0\r\n"));
  EXPECT_FALSE(flash.NANDWrite(nullptr, 10, kDataSlot, 0));
  EXPECT_FALSE(flash.NANDWrite(data.data(), 0, kDataSlot, 0));
  EXPECT_TRUE(log.Contains("FlashInterface::NANDWrite: invalid parameters\r\n"));
}

TEST_F(NandTest, FailedWriteMovesEarlierDataToTheNextGoodBlock) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(4 * kNandPage, 3);
  ASSERT_TRUE(flash.NANDWrite(data.data(), 2 * kNandPage, kDataSlot, 0));
  sim_.MarkBad(kNandData, kNandBlock);  // the next block is bad: skipped
  sim_.FailWritesAt(kNandData, 2 * kNandPage);
  LogCapture log;
  ASSERT_TRUE(flash.NANDWrite(data.data() + 2 * kNandPage, 2 * kNandPage, kDataSlot,
                              2 * kNandPage));
  EXPECT_TRUE(sim_.IsBad(kNandData, 0));
  EXPECT_EQ(flash.blocksMarkedBad, 1UL);
  // Block 0 is bad now, block 1 was bad: the data lives in block 2.
  EXPECT_EQ(sim_.Bytes(kNandData, 2 * kNandBlock, data.size()), data);
  std::vector<uint8_t> back(data.size());
  ASSERT_TRUE(flash.NANDRead(back.data(), back.size(), kDataSlot, 0));
  EXPECT_EQ(back, data);
  EXPECT_TRUE(log.Contains("HandleBadNANDBlock: moving block data (4096 bytes) to next block\r\n"));
  EXPECT_TRUE(log.Contains("HandleBadNANDBlock: Skipping a bad block at offset 0x00020000\r\n"));
}

TEST_F(NandTest, UnreadableEarlierDataEndsTheWrite) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(2 * kNandPage, 3);
  ASSERT_TRUE(flash.NANDWrite(data.data(), data.size(), kDataSlot, 0));
  sim_.FailWritesAt(kNandData, 2 * kNandPage);
  sim_.FailCall(SimCall::kRead, 1, EIO);
  LogCapture log;
  EXPECT_FALSE(flash.NANDWrite(data.data(), data.size(), kDataSlot, 2 * kNandPage));
  EXPECT_TRUE(log.Contains(
      "HandleBadNANDBlock: unable to read bad block at offset 0x00000000, size = 0x00001000\r\n"));
  EXPECT_FALSE(sim_.IsBad(kNandData, 0));
}

TEST_F(NandTest, NoBlockAfterTheLastToMoveTo) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(2 * kNandPage, 5);
  const unsigned long last = kNandSize - kNandBlock;
  ASSERT_TRUE(flash.NANDWrite(data.data(), kNandPage, kDataSlot, last));
  sim_.FailWritesAt(kNandData, last + kNandPage);
  LogCapture log;
  EXPECT_FALSE(flash.NANDWrite(data.data() + kNandPage, kNandPage, kDataSlot, last + kNandPage));
  EXPECT_TRUE(log.Contains("FlashInterface::NANDWrite: unable to find a good block\r\n"));
}

TEST_F(NandTest, SixthConsecutiveFailureAborts) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(kNandPage, 4);
  for (unsigned long block = 0; block < 6; ++block)
    sim_.FailWritesAt(kNandData, block * kNandBlock);
  LogCapture log;
  EXPECT_FALSE(flash.NANDWrite(data.data(), data.size(), kDataSlot, 0));
  EXPECT_TRUE(log.Contains("NANDWrite: too many bad blocks, aborting\r\n"));
  EXPECT_EQ(flash.blocksMarkedBad, 5UL);
  EXPECT_FALSE(sim_.IsBad(kNandData, 5 * kNandBlock));
}

TEST_F(NandTest, FlushRecoversFromABadBlock) {
  FlashInterface& flash = Flash();
  std::vector<uint8_t> data = Pattern(10, 4);
  ASSERT_TRUE(flash.NANDWrite(data.data(), data.size(), kDataSlot, kNandBlock));
  sim_.FailWritesAt(kNandData, kNandBlock);
  LogCapture log;
  flash.NANDFlushWrite();
  EXPECT_TRUE(log.Contains(
      "NANDFlushWrite: found a bad block in /dev/mtd2 at offset 0x00020000, attempting "
      "recovery\r\n"));
  EXPECT_EQ(sim_.Bytes(kNandData, 2 * kNandBlock, 10), data);
  EXPECT_EQ(flash.currNANDBufferOffset, 0UL);
}

// Every seam call of a NAND write that crosses a bad block fails in turn;
// the write reports a result, the state is consistent, no descriptor leaks.
TEST_F(NandTest, EachFailingCallLeavesNoDescriptorOpen) {
  std::vector<uint8_t> data = Pattern(kNandBlock + 3 * kNandPage, 6);
  int calls = 0;
  {
    FlashInterface& flash = Flash();
    sim_.MarkBad(kNandData, kNandBlock);
    sim_.ClearHistory();
    ASSERT_TRUE(flash.NANDWrite(data.data(), data.size(), kDataSlot, 0));
    calls = sim_.CallCount(SimCall::kAny);
  }
  ASSERT_GT(calls, 10);
  for (int nth = 1; nth <= calls; ++nth) {
    SCOPED_TRACE(nth);
    flash::ResetFlashInterfaceForTest();
    FlashSim sim;
    sim.AddMtd(2, "NAND0.SYS.DATA", SimKind::kNand, kNandSize, kNandBlock, kNandPage);
    sim.MarkBad(kNandData, kNandBlock);
    FlashInterface& flash = *FlashInterface::Instance();
    sim.FailCall(SimCall::kAny, nth, EIO);
    bool written = flash.NANDWrite(data.data(), data.size(), kDataSlot, 0);
    EXPECT_EQ(sim.OpenCount(), 0);
    if (!written) continue;
    std::vector<uint8_t> back(data.size());
    sim.ClearFaults();
    ASSERT_TRUE(flash.NANDRead(back.data(), back.size(), kDataSlot, 0));
    // A failing query of the bad block counts it as good: the tail goes into
    // that block (the kernel takes writes there), and the read skips it.
    bool queryFailed = sim.FailedCalls() == std::vector<SimCall>{SimCall::kMemGetBadBlock};
    std::vector<uint8_t> tail(data.begin() + kNandBlock, data.end());
    if (queryFailed && back != data)
      EXPECT_EQ(sim.Bytes(kNandData, kNandBlock, tail.size()), tail);
    else
      EXPECT_EQ(back, data);
  }
}

}  // namespace
}  // namespace test
}  // namespace stbplat
