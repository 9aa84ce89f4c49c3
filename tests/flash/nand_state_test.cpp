// The NAND write state and the ways a NAND name resolves: the partial-page
// buffer stays with its device and page, a flush always leaves it empty,
// the failure count starts again after every good chunk, and the old-kernel
// and upgrade lookups move the offset by the slot's place in the device.
#include <cerrno>
#include <string>

#include "flash_fixture.h"

namespace stbplat {
namespace test {
namespace {

constexpr const char* kDataSlot = "NAND0.SYS.DATA";
constexpr const char* kSpareSlot = "NAND0.SYS.SPARE";
constexpr const char* kSpareNode = "/dev/mtd3";
constexpr const char* kChipNode = "/dev/mtd9";
constexpr unsigned long kSpareInChip = 0x100000;  // SPARE's offset in NAND0

using NandState = FlashTest;

TEST_F(NandState, PendingPageStaysWithItsDeviceAndPage) {
  FlashInterface& flash = Flash();
  const std::vector<uint8_t> pending = Pattern(100, 1), pages = Pattern(2 * kNandPage, 2);
  ASSERT_TRUE(flash.NANDWrite(pending.data(), 1, kDataSlot, 0));
  // Whole pages elsewhere on the device come from the caller, not from the
  // one-page buffer, which is written out at its own place first.
  ASSERT_TRUE(flash.NANDWrite(pages.data(), pages.size(), kDataSlot, 4 * kNandPage));
  EXPECT_EQ(sim_.Bytes(kNandData, 4 * kNandPage, pages.size()), pages);
  EXPECT_EQ(sim_.Bytes(kNandData, 0, 2), (std::vector<uint8_t>{pending[0], 0xFF}));
  EXPECT_EQ(flash.currNANDBufferOffset, 0UL);
  // Another device never receives the buffered bytes: they go to their own.
  ASSERT_TRUE(flash.NANDWrite(pending.data(), pending.size(), kDataSlot, 8 * kNandPage));
  LogCapture log;
  EXPECT_FALSE(flash.NANDWrite(pending.data(), 10, kSpareSlot, 100));
  EXPECT_TRUE(log.Contains("NANDWrite: writing in the middle of a block and currNANDBufferOffset == 0\r\n"));
  EXPECT_EQ(sim_.Bytes(kNandData, 8 * kNandPage, pending.size()), pending);
  EXPECT_EQ(sim_.Bytes(kSpareNode, 0, 110), std::vector<uint8_t>(110, 0xFF));
  // Nor does another page of the same device continue it.
  ASSERT_TRUE(flash.NANDWrite(pending.data(), pending.size(), kDataSlot, 12 * kNandPage));
  EXPECT_FALSE(flash.NANDWrite(pending.data(), 10, kDataSlot, 13 * kNandPage + 100));
  EXPECT_EQ(flash.currNANDBufferOffset, 100UL);
}

TEST_F(NandState, FlushLeavesTheBufferEmptyWhateverHappens) {
  FlashInterface& flash = Flash();
  const std::vector<uint8_t> data = Pattern(10, 3);
  ASSERT_TRUE(flash.NANDWrite(data.data(), data.size(), kDataSlot, 3 * kNandPage));
  EXPECT_EQ(flash.pendingNANDOffset, 3 * kNandPage);
  sim_.FailCall(SimCall::kOpen, 1, EIO, true);
  flash.NANDFlushWrite();
  EXPECT_EQ(flash.currNANDBufferOffset, 0UL);
  EXPECT_EQ(flash.pendingNANDDevice, nullptr);
  EXPECT_EQ(flash.pendingNANDOffset, 0UL);
}

TEST_F(NandState, FailureCountStartsAgainAfterEveryGoodChunk) {
  // Six chunks, each failing once on its first block: never six in a row.
  FlashInterface& flash = Flash();
  for (unsigned long block = 0; block < 12; block += 2) sim_.FailWritesAt(kChipNode, block * kNandBlock);
  const std::vector<uint8_t> data = Pattern(6 * kNandBlock, 4);
  EXPECT_TRUE(flash.NANDWrite(data.data(), data.size(), "NAND0...", 0));
  EXPECT_EQ(sim_.Bytes(kChipNode, 11 * kNandBlock, kNandBlock),
            std::vector<uint8_t>(data.end() - static_cast<long>(kNandBlock), data.end()));
}

TEST_F(NandState, UpgradeTransfersUseTheSlotOffsetTheLookupAdds) {
  FlashInterface& flash = Flash();
  isRDLQUpgradeInProgress = true;
  const std::vector<uint8_t> data = Pattern(kNandPage, 5);
  ASSERT_TRUE(flash.NANDWrite(data.data(), data.size(), kSpareSlot, kNandBlock));
  EXPECT_EQ(sim_.Bytes(kChipNode, kSpareInChip + kNandBlock, data.size()), data);
  std::vector<uint8_t> back(data.size());
  ASSERT_TRUE(flash.NANDRead(back.data(), back.size(), kSpareSlot, kNandBlock));
  EXPECT_EQ(back, data);
}

// A kernel whose table has one partition for the whole NAND: a slot's name
// resolves to it, at the slot's address less the device's base address.
class OldKernel : public ::testing::Test {
 protected:
  void SetUp() override { flash::ResetFlashInterfaceForTest(); }
  void TearDown() override {
    flash::ResetFlashInterfaceForTest();
    ExtendedMemoryMapStructure::Reset();
  }
  FlashSim sim_;
};

TEST_F(OldKernel, SlotNamesResolveToTheWholeChipAtTheSlotsPlace) {
  std::string map = DeviceMap();
  map.replace(map.find("technology = NAND\nbase = 0x0"), 28, "technology = NAND\nbase = 0x8000000");
  ASSERT_TRUE(LoadMap(map));
  sim_.AddMtd(0, "flash1", SimKind::kNand, 0x200000, kNandBlock, kNandPage);
  const std::vector<uint8_t> data = Pattern(0x40, 6);
  sim_.Poke("/dev/mtd0", kSpareInChip + 0x800, data);
  FlashInterface& flash = *FlashInterface::Instance();
  std::vector<uint8_t> back(data.size());
  ASSERT_TRUE(flash.NANDRead(back.data(), back.size(), kSpareSlot, 0x800));
  EXPECT_EQ(back, data);
  unsigned long offset = 0x10;
  EXPECT_EQ(flash.FindOldKernelNANDmtdNameAndAdjustOffset("NAND0.SYS.NONE", offset), nullptr);
  EXPECT_EQ(flash.FindOldKernelNANDmtdNameAndAdjustOffset(nullptr, offset), nullptr);
  EXPECT_EQ(offset, 0x10UL);
}

TEST_F(OldKernel, NoNandPartitionMeansNoFallback) {
  ASSERT_TRUE(LoadMap(DeviceMap()));
  sim_.AddMtd(0, "flash0", SimKind::kNor, 0x400000, kNorSector);
  unsigned long offset = 0;
  EXPECT_EQ(FlashInterface::Instance()->FindOldKernelNANDmtdNameAndAdjustOffset(kSpareSlot, offset), nullptr);
  EXPECT_EQ(offset, 0UL);
}

}  // namespace
}  // namespace test
}  // namespace stbplat
