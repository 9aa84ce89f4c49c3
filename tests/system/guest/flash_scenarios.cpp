// FlashInterface on real MTD devices: nandsim NAND (2 KiB pages, 128 KiB
// blocks), mtdram NOR (64 KiB sectors) and the virtio disk as eMMC, under
// the box's partition table (see init.sh). Data written by the library is
// checked with the kernel directly and with mtd-utils, and the other way
// round.
#if __has_include("stbplat/flash_interface.h")

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>

#include "harness.h"
#include "mtd_device.h"
#include "stbplat/component_location.h"
#include "stbplat/extruder.h"
#include "stbplat/flash_c.h"
#include "stbplat/flash_interface.h"
#include "stbplat/intruder.h"
#include "stbplat/location.h"
#include "stbplat/version_entry.h"

namespace {

constexpr unsigned long kBlock = 0x20000;
constexpr unsigned long kPage = 2048;
constexpr unsigned long kNorSector = 0x10000;
constexpr unsigned long kNorBase = 0xE0000000ul;
constexpr unsigned long kNorPart = 0x80000;
constexpr int kTableRows = 15;

const char* const kBoxNames[kTableRows] = {
    "NOR0.BOOT.A",   "NOR0.BOOT.B",    "NOR0.CFG.A",      "NOR0.CFG.B",    "NOR0.SPLASH.A",
    "NOR0.SPLASH.B", "NOR0.NVRAM.A",   "NOR0.NVRAM.B",    "NOR0....",      "NAND0.KERNEL.A",
    "NAND0.KERNEL.B", "NAND0.ROOTFS.A", "NAND0.DATA.A",   "NAND0.USER.A",  "EMMC0.APPS.A"};

FlashInterface* Flash() { return FlashInterface::Instance(); }

// Logical offset (counted over good blocks) of a physical block.
unsigned long LogicalOf(systest::MtdDevice& dev, unsigned long physicalBlock) {
  unsigned long good = 0;
  for (unsigned long b = 0; b < physicalBlock; ++b)
    if (dev.IsBad(b * kBlock) <= 0) ++good;
  return good * kBlock;
}

// Concatenated contents of the good blocks of a partition, as nanddump
// --bb=skipbad produces them.
std::vector<unsigned char> GoodBlocks(systest::MtdDevice& dev) {
  std::vector<unsigned char> all;
  for (unsigned long at = 0; at < dev.info().size; at += kBlock) {
    if (dev.IsBad(at) > 0) continue;
    auto block = dev.ReadAll(at, kBlock);
    all.insert(all.end(), block.begin(), block.end());
  }
  return all;
}

Location Loc(const char* device, const char* partition, const char* slot) {
  return Location(reinterpret_cast<const unsigned char*>(device),
                  reinterpret_cast<const unsigned char*>(partition),
                  reinterpret_cast<const unsigned char*>(slot));
}

}  // namespace

SCENARIO("flash.table") {
  FlashInterface* flash = Flash();
  REQUIRE(flash != nullptr);
  CHECK_LOG("NOR sector size = 0x00010000\r\n");
  CHECK_LOG("NAND sector size = 0x00020000\r\n");
  CHECK_EQ(static_cast<int>(flash->mtdCount), kTableRows);
  for (int n = 0; n < kTableRows; ++n) {
    CHECK_EQ(std::string(flash->mtdNames[n]), std::string(kBoxNames[n]));
    unsigned long offset = 77;
    const char* path = flash->LookupMTDPartition(kBoxNames[n], &offset);
    CHECK_EQ(std::string(path ? path : "(null)"), "/dev/mtd" + std::to_string(n));
    CHECK_EQ(offset, 77ul);
  }
  // Sizes as the kernel reports them.
  CHECK_EQ(flash->mtdSizes[0], kNorPart);
  CHECK_EQ(flash->mtdSizes[8], 0x400000ul);
  CHECK_EQ(flash->mtdSizes[11], 64 * kBlock);
  CHECK_EQ(flash->mtdSizes[14], 64ul << 20);
  CHECK_EQ(flash->norSectorSize, kNorSector);
  CHECK_EQ(flash->nandSectorSize, kBlock);
  CHECK_EQ(flash->nandPageSize, kPage);
  CHECK_EQ(flash->GetNORSectorSize(), kNorSector);
  CHECK_EQ(GetNORSectorSize(), kNorSector);
  CHECK_EQ(flash->GetDevSize("/dev/mtd11"), 64 * kBlock);
  CHECK_EQ(flash->GetDevSize("/dev/mtd1"), kNorPart);
  systest::ClearLog();
  CHECK_EQ(flash->GetDevSize("/dev/mtd29"), 0ul);
  CHECK_LOG("GetDevSize: Failed to obtain file handle for /dev/mtd29\r\n");

  unsigned long offset = 5;
  CHECK(flash->LookupMTDPartition("NAND0.NOSUCH.A", &offset) == nullptr);
  CHECK_EQ(offset, 5ul);
  Location kernelA = Loc("nand0", "kernel", "a");
  offset = 0;
  const char* path = flash->LookupMTDPartition(&kernelA, &offset);
  CHECK_EQ(std::string(path ? path : "(null)"), std::string("/dev/mtd9"));
  path = LookupMTDPartitionLoc(&kernelA, &offset);
  CHECK_EQ(std::string(path ? path : "(null)"), std::string("/dev/mtd9"));
  path = LookupMTDPartition(const_cast<char*>("NAND0.DATA.A"), &offset);
  CHECK_EQ(std::string(path ? path : "(null)"), std::string("/dev/mtd12"));

  // The fixed NOR mapping during an upgrade: whole chip, mtd8.
  isRDLQUpgradeInProgress = true;
  offset = 1;
  path = flash->LookupMTDPartition(kNorBase + 0x12345, &offset);
  isRDLQUpgradeInProgress = false;
  CHECK_EQ(std::string(path ? path : "(null)"), std::string("/dev/mtd8"));
  CHECK_EQ(offset, 0x12345ul);
  // Through the memory map: BOOT.B starts 512 KiB into the chip.
  offset = 0;
  path = flash->LookupMTDPartition(kNorBase + kNorPart + 0x10, &offset);
  CHECK_EQ(std::string(path ? path : "(null)"), std::string("/dev/mtd1"));
  CHECK_EQ(offset, 0x10ul);
  // During an upgrade a slot name resolves to the whole-device partition,
  // offset by the slot's offset inside its partition.
  isRDLQUpgradeInProgress = true;
  offset = 0;
  path = flash->LookupMTDPartition("NOR0.CFG.B", &offset);
  std::string upgraded = path ? path : "(null)";
  systest::ClearLog();
  const char* nandPath = flash->LookupMTDPartition("NAND0.KERNEL.A", &offset);
  isRDLQUpgradeInProgress = false;
  CHECK_EQ(upgraded, std::string("/dev/mtd8"));
  CHECK_EQ(offset, kNorPart);
  CHECK(nandPath == nullptr);
  CHECK_LOG("FlashInterface::LookupMTDPartition: did not find mtd entry\r\n");
  // Below the NOR window nothing matches.
  offset = 1;
  CHECK(flash->LookupMTDPartition(0x10000000ul, &offset) == nullptr);
}

SCENARIO("flash.nand_slot") {
  // KERNEL.A: 16 blocks, block 2 bad from the factory.
  systest::MtdDevice dev("/dev/mtd9");
  REQUIRE(dev.ok());
  REQUIRE(dev.EraseAllGood());
  FlashInterface* flash = Flash();
  const unsigned long length = 5 * kBlock + 7 * kPage;
  auto data = systest::Pattern(length, 10);
  CHECK(NANDWrite(data.data(), length, "NAND0.KERNEL.A", 0));
  CHECK_EQ(flash->currNANDBufferOffset, 0ul);
  std::vector<unsigned char> back(length);
  CHECK(NANDRead(back.data(), length, "NAND0.KERNEL.A", 0));
  CHECK_BYTES(back, data);
  // The bad block was passed over on the device.
  CHECK_BYTES(dev.ReadAll(2 * kBlock, kPage), systest::Erased(kPage));
  auto third = dev.ReadAll(3 * kBlock, kBlock);
  CHECK(std::equal(third.begin(), third.end(), data.begin() + 2 * kBlock));
  CHECK_EQ(flash->badBlocksSkipped, 1ul);

  // The Location overloads reach the same bytes, at an offset.
  Location kernelA = Loc("NAND0", "KERNEL", "A");
  std::vector<unsigned char> part(3 * kPage);
  CHECK(NANDReadLoc(part.data(), part.size(), &kernelA, 2 * kBlock - kPage));
  CHECK(std::equal(part.begin(), part.end(), data.begin() + 2 * kBlock - kPage));

  // Past the end of the good blocks.
  systest::ClearLog();
  std::vector<unsigned char> tail(kPage);
  CHECK(!NANDRead(tail.data(), kPage, "NAND0.KERNEL.A", 15 * kBlock));
  CHECK_LOG("ValidBlockOffset: final offset (0x00200000) > device size (0x00200000) for /dev/mtd9");
  CHECK_LOG("NANDRead: Error finding valid block for offset (0x001E0000) in /dev/mtd9 device.");
  systest::ClearLog();
  CHECK(!NANDRead(tail.data(), kPage, "NAND0.NOSUCH.A", 0));
  CHECK_LOG("NANDRead: LookupMTDPartition for NAND0.NOSUCH.A failed\r\n");
}

SCENARIO("flash.nand_partial_page") {
  systest::MtdDevice dev("/dev/mtd9");
  REQUIRE(dev.ok());
  REQUIRE(dev.EraseAllGood());
  FlashInterface* flash = Flash();
  auto data = systest::Pattern(3100, 11);
  // 100 bytes: only buffered.
  CHECK(flash->NANDWrite(data.data(), 100, "NAND0.KERNEL.A", 0));
  CHECK_EQ(flash->currNANDBufferOffset, 100ul);
  CHECK_BYTES(dev.ReadAll(0, kPage), systest::Erased(kPage));
  // The next 3000 bytes complete page 0 and leave 1052 bytes of page 1.
  CHECK(flash->NANDWrite(data.data() + 100, 3000, "NAND0.KERNEL.A", 100));
  auto page0 = dev.ReadAll(0, kPage);
  CHECK(std::equal(page0.begin(), page0.end(), data.begin()));
  CHECK_EQ(flash->currNANDBufferOffset, 1052ul);
  CHECK_BYTES(dev.ReadAll(kPage, kPage), systest::Erased(kPage));
  flash->NANDFlushWrite();
  CHECK_EQ(flash->currNANDBufferOffset, 0ul);
  auto page1 = dev.ReadAll(kPage, kPage);
  CHECK(std::equal(page1.begin(), page1.begin() + 1052, data.begin() + 2048));
  std::vector<unsigned char> back(3100);
  CHECK(flash->NANDRead(back.data(), back.size(), "NAND0.KERNEL.A", 0));
  CHECK_BYTES(back, data);
  // Flushing an empty buffer writes nothing.
  flash->NANDFlushWrite();
  CHECK_BYTES(dev.ReadAll(2 * kPage, kPage), systest::Erased(kPage));

  // A write that starts inside a page with nothing buffered is refused.
  systest::ClearLog();
  CHECK(!flash->NANDWrite(data.data(), 10, "NAND0.KERNEL.A", 2 * kPage + 10));
  CHECK_LOG("NANDWrite: writing in the middle of a block and currNANDBufferOffset == 0\r\n");
}

// mtd-utils and the library agree on data, bad blocks and the erased state.
SCENARIO("flash.mtd_utils") {
  systest::MtdDevice dev("/dev/mtd10");  // KERNEL.B, block 4 bad
  REQUIRE(dev.ok());
  const unsigned long length = 10 * kBlock;
  auto data = systest::Pattern(length, 12);

  REQUIRE(systest::Shell("flash_erase -q /dev/mtd10 0 0") == 0);
  CHECK(NANDWrite(data.data(), length, "NAND0.KERNEL.B", 0));
  CHECK_EQ(systest::Shell("nanddump -q --bb=skipbad -f /tmp/kb.dump /dev/mtd10"), 0);
  auto dumped = systest::ReadFile("/tmp/kb.dump");
  CHECK_EQ(dumped.size(), 15 * kBlock);
  dumped.resize(length);
  CHECK_BYTES(dumped, data);

  auto other = systest::Pattern(length, 13);
  REQUIRE(systest::WriteFile("/tmp/kb.in", other));
  REQUIRE(systest::Shell("flash_erase -q /dev/mtd10 0 0") == 0);
  CHECK_EQ(systest::Shell("nandwrite -q -p /dev/mtd10 /tmp/kb.in"), 0);
  std::vector<unsigned char> back(length);
  CHECK(NANDRead(back.data(), length, "NAND0.KERNEL.B", 0));
  CHECK_BYTES(back, other);

  // Erased state: flash_erase versus EraseNANDSlot.
  REQUIRE(systest::Shell("flash_erase -q /dev/mtd10 0 0") == 0);
  auto byTool = GoodBlocks(dev);
  auto badByTool = dev.BadBlocks();
  CHECK(NANDWrite(data.data(), length, "NAND0.KERNEL.B", 0));
  CHECK(Flash()->EraseNANDSlot("/dev/mtd10"));
  auto byLibrary = GoodBlocks(dev);
  CHECK_BYTES(byLibrary, byTool);
  CHECK_BYTES(byLibrary, systest::Erased(15 * kBlock));
  CHECK(dev.BadBlocks() == badByTool);
}

// --- Fault phase: DATA.A with a weak page (block 2 page 5), a weak block
// (6) and a grave page (block 8 page 10); block 4 bad from the factory.

SCENARIO("flash.erase_weak_block") {
  systest::MtdDevice dev("/dev/mtd12");
  REQUIRE(dev.ok());
  CHECK_EQ(dev.IsBad(6 * kBlock), 0);
  CHECK(Flash()->EraseNANDSlot("/dev/mtd12"));
  CHECK_LOG("Flash erase error @ 0x000C0000\n");
  CHECK_LOG("NANDErase: marking block at offset 0x000C0000 as bad\n");
  CHECK_EQ(dev.IsBad(6 * kBlock), 1);
  CHECK_EQ(dev.IsBad(4 * kBlock), 1);
  CHECK_BYTES(GoodBlocks(dev), systest::Erased(30 * kBlock));
}

SCENARIO("flash.weak_page_relocation") {
  systest::MtdDevice dev("/dev/mtd12");
  REQUIRE(dev.ok());
  REQUIRE(dev.IsBad(2 * kBlock) == 0);
  REQUIRE(dev.Erase(2 * kBlock, kBlock) == 0 && dev.Erase(3 * kBlock, kBlock) == 0);
  FlashInterface* flash = Flash();
  const unsigned long start = LogicalOf(dev, 2);
  auto data = systest::Pattern(15 * kPage, 14);
  // Five pages land in block 2; the next write hits its weak page 5.
  CHECK(flash->NANDWrite(data.data(), 5 * kPage, "NAND0.DATA.A", start));
  systest::ClearLog();
  CHECK(flash->NANDWrite(data.data() + 5 * kPage, 10 * kPage, "NAND0.DATA.A", start + 5 * kPage));
  CHECK_LOG("NANDWrite: found a bad block in /dev/mtd12 at offset 0x00042800, attempting recovery\r\n");
  CHECK_LOG("HandleBadNANDBlock: moving block data (10240 bytes) to next block\r\n");
  CHECK_LOG("HandleBadNANDBlock: marking block at offset 0x00040000 as bad\r\n");
  CHECK_EQ(flash->blocksMarkedBad, 1ul);
  CHECK_EQ(dev.IsBad(2 * kBlock), 1);
  // Block 3 now holds everything, from its first page.
  CHECK_BYTES(dev.ReadAll(3 * kBlock, 15 * kPage), data);
  std::vector<unsigned char> back(15 * kPage);
  CHECK(flash->NANDRead(back.data(), back.size(), "NAND0.DATA.A", start));
  CHECK_BYTES(back, data);
}

SCENARIO("flash.grave_page") {
  systest::MtdDevice dev("/dev/mtd12");
  REQUIRE(dev.ok());
  REQUIRE(dev.IsBad(8 * kBlock) == 0 && dev.IsBad(9 * kBlock) == 0);
  // nandsim only fails reads of pages that hold data.
  REQUIRE(dev.Erase(8 * kBlock, kBlock) == 0);
  REQUIRE(dev.Write(8 * kBlock + 10 * kPage, systest::Pattern(kPage, 20)) == static_cast<long>(kPage));
  const unsigned long block8 = LogicalOf(dev, 8);
  std::vector<unsigned char> buffer(kBlock);
  systest::ClearLog();
  CHECK(!NANDRead(buffer.data(), kBlock, "NAND0.DATA.A", block8));
  CHECK_LOG("ECC error reading the flash device /dev/mtd12, failed = 0x");
  CHECK_LOG("NANDRead: LinuxFlashRead failed in /dev/mtd12 at offset 0x00100000, attempting recovery\r\n");
  // The next block reads fine.
  CHECK(NANDRead(buffer.data(), kBlock, "NAND0.DATA.A", block8 + kBlock));
}

SCENARIO("flash.nor") {
  systest::MtdDevice chip("/dev/mtd8");
  REQUIRE(chip.ok());
  REQUIRE(chip.Erase(0, 0x400000) == 0);
  FlashInterface* flash = Flash();
  // CFG.A (mtd2) starts 1 MiB into the chip.
  const unsigned long cfgA = kNorBase + 2 * kNorPart;
  auto data = systest::Pattern(3 * kNorSector, 15);
  // 16 bytes before a sector boundary, three sectors long: a 16-byte write
  // and one write of the rest, both on the partition.
  CHECK(flash->WriteToNORFlashAtAddr(cfgA + kNorSector - 16, data.data(), data.size()));
  CHECK_BYTES(chip.ReadAll(2 * kNorPart + kNorSector - 16, data.size()), data);
  std::vector<unsigned char> back(data.size());
  CHECK(ReadFromNORFlashAtAddr(cfgA + kNorSector - 16, back.data(), back.size()));
  CHECK_BYTES(back, data);

  // Erase rounding: less than a sector is refused, a sector and a byte
  // erases two.
  systest::ClearLog();
  CHECK(!flash->NORErase(cfgA, kNorSector - 1));
  CHECK_LOG("Can't erase less than one flash sector, numBytes = 65535\r\n");
  CHECK(EraseNOR(cfgA + kNorSector, kNorSector + 1));
  auto after = chip.ReadAll(2 * kNorPart, 4 * kNorSector);
  CHECK(std::equal(after.begin() + kNorSector - 16, after.begin() + kNorSector,
                   data.begin()));
  CHECK_BYTES(std::vector<unsigned char>(after.begin() + kNorSector, after.begin() + 3 * kNorSector),
              systest::Erased(2 * kNorSector));
  // Chip byte p of CFG.A holds data[p - (sector - 16)].
  CHECK(std::equal(after.begin() + 3 * kNorSector, after.begin() + 4 * kNorSector - 16,
                   data.begin() + 2 * kNorSector + 16));
  // An unaligned erase is refused by the kernel but reported as done.
  systest::ClearLog();
  CHECK(flash->NORErase(cfgA + 16, kNorSector));
  CHECK_LOG("Erase: Flash erase error in /dev/mtd2 \r\n");

  // The fixed mapping during an upgrade reaches the whole chip.
  auto word = systest::Pattern(64, 16);
  isRDLQUpgradeInProgress = true;
  CHECK(WriteToNORFlashAtAddr(kNorBase + 0x3F0000, word.data(), word.size()));
  isRDLQUpgradeInProgress = false;
  CHECK_BYTES(chip.ReadAll(0x3F0000, 64), word);
}

SCENARIO("flash.nor_read_only") {
  // BOOT.A (mtd0) is read-only, as the boot loader's partition is on the
  // box: records and bytes read there; every write is refused by the kernel.
  systest::MtdDevice chip("/dev/mtd8");
  REQUIRE(chip.ok());
  REQUIRE(chip.Erase(0, kNorPart) == 0);
  VersionEntry version;
  version.majorVersion = 3;
  version.description.CreateData(6, reinterpret_cast<const unsigned char*>("boot.1"));
  Intruder record(256u, 0u);
  REQUIRE(version.StoreTLVAndData(&record) == 0);
  std::vector<unsigned char> bytes(record.pStart, record.pStart + (record.pCurrent - record.pStart));
  REQUIRE(chip.Write(0x100, bytes) == static_cast<long>(bytes.size()));
  ComponentLocation component;
  component.location = Loc("NOR0", "BOOT", "A");
  component.slotOffset = 0x100;
  Extruder in(&component, false);
  CHECK(in.isInitedOK);
  VersionEntry back;
  CHECK_EQ(back.ReadTLVAndData(in, nullptr), 0u);
  CHECK_EQ(back.majorVersion, 3);
  CHECK(back.description == version.description);
  std::vector<unsigned char> raw(bytes.size());
  CHECK(ReadFromNORFlashAtAddr(kNorBase + 0x100, raw.data(), raw.size()));
  CHECK_BYTES(raw, bytes);
  int fd = open("/dev/mtd0", O_RDWR);
  CHECK_EQ(fd < 0 ? errno : 0, EACCES);
  if (fd >= 0) close(fd);
  CHECK(!WriteToNORFlashAtAddr(kNorBase, raw.data(), raw.size()));
  Intruder out(&component);
  CHECK(!out.isInitedOK);
  CHECK_BYTES(chip.ReadAll(0x100, bytes.size()), bytes);
}

SCENARIO("flash.emmc") {
  FlashInterface* flash = Flash();
  // 100 bytes 16 bytes before a chunk boundary: one page-sized write, whose
  // bytes past the caller's 100 keep what the device held.
  auto data = systest::Pattern(kPage, 17);
  std::vector<unsigned char> before(2 * kPage, 0x11);
  REQUIRE(systest::WriteFile("/tmp/emmc.fill", before));
  REQUIRE(systest::Shell("dd if=/tmp/emmc.fill of=/dev/mmca bs=2048 seek=255 count=2 conv=fsync 2>/dev/null") == 0);
  CHECK(flash->EMMCWrite(data.data(), 100, "EMMC0.APPS.A", 0x7FFF0));
  std::vector<unsigned char> back(kPage);
  CHECK(flash->EMMCRead(back.data(), kPage, "ANY.NAME.X", 0x7FFF0));
  auto expected = before;
  expected.resize(kPage);
  std::copy(data.begin(), data.begin() + 100, expected.begin());
  CHECK_BYTES(back, expected);

  // A long write spans several chunks.
  auto big = systest::Pattern(0x180000 + 300, 18);
  big.resize(0x180000 + kPage);  // readable up to the next page multiple
  CHECK(flash->EMMCWrite(big.data(), 0x180000 + 300, "EMMC0.APPS.A", 0x100000 - 0x1000));
  std::vector<unsigned char> bigBack(0x180000 + 300);
  CHECK(flash->EMMCRead(bigBack.data(), bigBack.size(), "EMMC0.APPS.A", 0x100000 - 0x1000));
  CHECK(std::equal(bigBack.begin(), bigBack.end(), big.begin()));

  // Fill a range of the slot (1 MiB into the device): split at the next
  // 512 KiB boundary, nothing outside the range touched.
  constexpr unsigned long kSlotStart = 0x100000;
  constexpr unsigned long kFrom = 0x1000;
  constexpr unsigned long kLength = 0x90000;
  std::vector<unsigned char> zeros(kLength + 2 * kPage, 0);
  REQUIRE(systest::WriteFile("/tmp/emmc.zero", zeros));
  REQUIRE(systest::Shell("dd if=/tmp/emmc.zero of=/dev/mmca bs=2048 seek=" +
                         std::to_string((kSlotStart + kFrom) / kPage - 1) +
                         " conv=fsync 2>/dev/null") == 0);
  Location apps = Loc("EMMC0", "APPS", "A");
  systest::ClearLog();
  CHECK(flash->EMMCErase(&apps, kFrom, kLength, 0xA5));
  CHECK_LOG("EMMCErase: [/dev/mtd14] StartAddress=0x101000 len=0x90000\r\n");
  std::vector<unsigned char> filled(kLength + 2 * kPage);
  CHECK(flash->EMMCRead(filled.data(), filled.size(), "EMMC0.APPS.A", kSlotStart + kFrom - kPage));
  std::vector<unsigned char> expectFill(filled.size(), 0xA5);
  std::fill(expectFill.begin(), expectFill.begin() + kPage, 0);
  std::fill(expectFill.end() - kPage, expectFill.end(), 0);
  CHECK_BYTES(filled, expectFill);

  systest::ClearLog();
  CHECK(!flash->EMMCWrite(data.data(), 0, "EMMC0.APPS.A", 0));
  CHECK_LOG("FlashInterface::EMMCWrite: invalid parameters\r\n");
  CHECK(!flash->EMMCWrite(data.data(), 10, "EMMC0.NOSUCH.A", 0));
  CHECK_LOG("EMMCWrite: LookupMTDPartition for EMMC0.NOSUCH.A failed\r\n");
}

// Whole-partition transfers, the library beside mtd-utils. Reports figures
// only; timings are never asserted.
SCENARIO("flash.timing") {
  systest::MtdDevice dev("/dev/mtd11");  // ROOTFS.A, 64 blocks, block 8 bad
  REQUIRE(dev.ok());
  const unsigned long length = (64 - dev.BadBlocks().size()) * kBlock;
  auto data = systest::Pattern(length, 19);
  REQUIRE(systest::WriteFile("/tmp/rootfs.in", data));
  std::vector<unsigned char> back(length);

  REQUIRE(systest::Shell("flash_erase -q /dev/mtd11 0 0") == 0);
  double t0 = systest::NowSeconds();
  CHECK(NANDWrite(data.data(), length, "NAND0.ROOTFS.A", 0));
  double libWrite = systest::NowSeconds() - t0;
  t0 = systest::NowSeconds();
  CHECK(NANDRead(back.data(), length, "NAND0.ROOTFS.A", 0));
  double libRead = systest::NowSeconds() - t0;
  CHECK_BYTES(back, data);

  REQUIRE(systest::Shell("flash_erase -q /dev/mtd11 0 0") == 0);
  t0 = systest::NowSeconds();
  CHECK_EQ(systest::Shell("nandwrite -q -p /dev/mtd11 /tmp/rootfs.in"), 0);
  double toolWrite = systest::NowSeconds() - t0;
  t0 = systest::NowSeconds();
  CHECK_EQ(systest::Shell("nanddump -q --bb=skipbad -l " + std::to_string(length) +
                          " -f /tmp/rootfs.out /dev/mtd11"), 0);
  double toolRead = systest::NowSeconds() - t0;
  auto dumped = systest::ReadFile("/tmp/rootfs.out");
  dumped.resize(length);
  CHECK_BYTES(dumped, data);

  char line[256];
  std::snprintf(line, sizeof line,
                "timing %lu bytes: NANDWrite %.3fs / nandwrite %.3fs = %.2f; "
                "NANDRead %.3fs / nanddump %.3fs = %.2f",
                length, libWrite, toolWrite, libWrite / toolWrite, libRead, toolRead,
                libRead / toolRead);
  systest::Info(line);
}

SCENARIO("flash.erase_slots") {
  FlashInterface* flash = Flash();
  systest::MtdDevice chip("/dev/mtd8");
  REQUIRE(chip.ok());
  // SPLASH.A: 512 KiB at 2 MiB into the chip, eight sectors.
  REQUIRE(chip.Erase(0x200000, 0x100000) == 0);
  auto data = systest::Pattern(0x100000, 21);
  REQUIRE(chip.Write(0x200000, data) == 0x100000);
  Location splashA = Loc("NOR0", "SPLASH", "A");
  CHECK(flash->EraseSlot(&splashA));
  CHECK_BYTES(chip.ReadAll(0x200000, kNorPart), systest::Erased(kNorPart));
  auto slotB = chip.ReadAll(0x280000, kNorPart);
  CHECK(std::equal(slotB.begin(), slotB.end(), data.begin() + kNorPart));
  // EraseSector clears the first sector of SPLASH.B only.
  Location splashB = Loc("NOR0", "SPLASH", "B");
  CHECK(flash->EraseSector(&splashB));
  CHECK_BYTES(chip.ReadAll(0x280000, kNorSector), systest::Erased(kNorSector));
  auto rest = chip.ReadAll(0x280000 + kNorSector, kNorSector);
  CHECK(std::equal(rest.begin(), rest.end(), data.begin() + kNorPart + kNorSector));

  // NAND slot: every good block of KERNEL.B.
  systest::MtdDevice kernelB("/dev/mtd10");
  REQUIRE(kernelB.ok());
  CHECK(NANDWrite(data.data(), 2 * kBlock, "NAND0.KERNEL.B", 0));
  Location nandB = Loc("NAND0", "KERNEL", "B");
  CHECK(flash->EraseSlot(&nandB));
  CHECK_BYTES(GoodBlocks(kernelB), systest::Erased(15 * kBlock));
  // EraseSector on NAND: block 0 only.
  CHECK(NANDWriteLoc(data.data(), 2 * kBlock, &nandB, 0));
  CHECK(flash->EraseSector(&nandB));
  CHECK_BYTES(kernelB.ReadAll(0, kBlock), systest::Erased(kBlock));
  auto second = kernelB.ReadAll(kBlock, kBlock);
  CHECK(std::equal(second.begin(), second.end(), data.begin() + kBlock));

  // eMMC: EraseSlot refuses, EraseSector leaves it alone and succeeds.
  Location apps = Loc("EMMC0", "APPS", "A");
  systest::ClearLog();
  CHECK(!flash->EraseSlot(&apps));
  CHECK_LOG("FlashInterface::EraseSlot: memory technology for EMMC0.APPS.A is not NOR or NAND, unable to erase\n");
  CHECK(flash->EraseSector(&apps));
  CHECK_LOG("FlashInterface::EraseSlot: memory technology for EMMC0.APPS.A is EMMC did not erase\r\n");
}

#endif
