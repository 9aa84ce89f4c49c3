// FlashInterface and the streams over it on real devices: nandsim NAND,
// mtdram NOR, the virtio disk as eMMC and reserved physical memory through
// /dev/mem, under the box's partition table (see init.sh). Data written by
// the library is checked with the kernel directly and with mtd-utils, and
// the other way round.
#include <sys/mman.h>

#include <cerrno>
#include <algorithm>
#include <functional>
#include <iomanip>
#include <string_view>

#include "harness.h"
#include "stbplat/component_location.h"
#include "stbplat/flash_c.h"
#include "stbplat/flash_interface.h"
#include "stbplat/intruder.h"
#include "stbplat/version_entry.h"

constexpr unsigned long kNorBase = 0xE0000000ul;
constexpr int kTableRows = 15;

static const char* const kBoxNames[kTableRows] = {
    "NOR0.BOOT.A",   "NOR0.BOOT.B",    "NOR0.CFG.A",      "NOR0.CFG.B",    "NOR0.SPLASH.A",
    "NOR0.SPLASH.B", "NOR0.NVRAM.A",   "NOR0.NVRAM.B",    "NOR0....",      "NAND0.KERNEL.A",
    "NAND0.KERNEL.B", "NAND0.ROOTFS.A", "NAND0.DATA.A",   "NAND0.USER.A",  "EMMC0.APPS.A"};

static FlashInterface* Flash() { return FlashInterface::Instance(); }

static std::string Str(const char* text) { return text ? text : "(null)"; }

static const unsigned char* U(const char* text) { return reinterpret_cast<const unsigned char*>(text); }

// "<path> <offset>" a lookup gives, from an offset, during an upgrade or not.
template <typename Key>
static std::string Lookup(Key key, unsigned long offset = 0, bool upgrade = false) {
  isRDLQUpgradeInProgress = upgrade;
  std::string path = Str(Flash()->LookupMTDPartition(key, &offset));
  isRDLQUpgradeInProgress = false;
  return path + " " + std::to_string(offset);
}

// Puts bytes on the eMMC directly, at a page-aligned offset.
static bool PutOnEmmc(unsigned long at, const Bytes& bytes) {
  return WriteFile("/tmp/emmc.in", bytes) && Shell("dd if=/tmp/emmc.in of=/dev/mmca bs=2048 seek=" +
                                                   std::to_string(at / kPage) + " conv=fsync 2>/dev/null");
}

// busybox devmem on a 32-bit word: its answer when reading, nothing when
// writing a value.
static std::string DevMem(unsigned long address, const std::string& value = "") {
  return ShellOutput("devmem " + std::to_string(address) + " 32 " + value);
}

// Whether /proc/iomem lists the physical address as System RAM.
static bool IsSystemRam(unsigned long address) {
  std::ifstream iomem("/proc/iomem");
  std::string line;
  unsigned long first = 0, last = 0;
  while (std::getline(iomem, line))
    if (line.find("System RAM") != std::string::npos &&
        std::sscanf(line.c_str(), " %lx-%lx", &first, &last) == 2 && first <= address && address <= last)
      return true;
  return false;
}

SCENARIO("flash.table") {
  REQUIRE(Flash() != nullptr);
  CHECK_LOG("NOR sector size = 0x00010000\r\n");
  CHECK_LOG("NAND sector size = 0x00020000\r\n");
  CHECK_EQ(Flash()->nandPageSize, kPage);
  CHECK_EQ(static_cast<int>(Flash()->mtdCount), kTableRows);
  for (int n = 0; n < kTableRows; ++n) {
    std::string node = "/dev/mtd" + std::to_string(n);
    CHECK_EQ(std::string(Flash()->mtdNames[n]), kBoxNames[n]);
    CHECK_EQ(Lookup(kBoxNames[n], 77), node + " 77");
    // The kernel's sizes, but BOOT.A's node is read-only and the eMMC's a
    // disk: neither gives one.
    CHECK_EQ(Flash()->GetDevSize(node.c_str()), n == 0 || n == 14 ? 0 : Flash()->mtdSizes[n]);
  }
  CHECK_LOG("GetDevSize: Failed to obtain file handle for /dev/mtd0\r\n");

  Location kernelA(U("nand0"), U("kernel"), U("a"));
  unsigned long offset = 0;
  CHECK_EQ(Str(LookupMTDPartitionLoc(&kernelA, &offset)) + " " + std::to_string(offset), "/dev/mtd9 0");
  // A NOR address: the fixed mapping on the whole chip (mtd8) during an
  // upgrade, else through the memory map (BOOT.B starts 512 KiB into the
  // chip); below the NOR window nothing matches.
  CHECK_EQ(Lookup(kNorBase + 0x12345, 1, true), "/dev/mtd8 " + std::to_string(0x12345));
  CHECK_EQ(Lookup(kNorBase + kNorPart + 0x10), "/dev/mtd1 16");
  CHECK_EQ(Lookup(0x10000000ul, 1).find("(null)"), 0u);
  // During an upgrade a slot name resolves to the whole-device partition,
  // offset by the slot's offset inside its partition.
  CHECK_EQ(Lookup("NOR0.CFG.B", 0, true), "/dev/mtd8 " + std::to_string(kNorPart));
  ClearLog();
  CHECK_EQ(Lookup("NAND0.KERNEL.A", 0, true), "(null) 0");
  CHECK_LOG("FlashInterface::LookupMTDPartition: did not find mtd entry\r\n");
}

SCENARIO("flash.nand_slot") {
  // KERNEL.A: 16 blocks, block 2 bad from the factory, passed over.
  MtdDevice dev("/dev/mtd9", true);
  const unsigned long length = 5 * kBlock + 7 * kPage;
  auto data = Pattern(length, 10);
  CHECK(NANDWrite(data.data(), length, "NAND0.KERNEL.A", 0));
  CHECK_EQ(Flash()->currNANDBufferOffset, 0ul);
  CHECK_EQ(Flash()->badBlocksSkipped, 1ul);
  CHECK_EQ(dev.ReadAll(2 * kBlock, kBlock), Erased(kBlock));
  CHECK_EQ(Slice(dev.GoodBlocks(), 0, length), data);
  // The Location overload reads the bytes back across the bad block.
  Bytes back(length);
  Location kernelA(U("NAND0"), U("KERNEL"), U("A"));
  CHECK(NANDReadLoc(back.data(), 3 * kPage, &kernelA, 2 * kBlock - kPage));
  CHECK_EQ(Slice(back, 0, 3 * kPage), Slice(data, 2 * kBlock - kPage, 3 * kPage));

  // Past the end of the good blocks (as the kernel reports the size).
  CHECK(!NANDRead(back.data(), kPage, "NAND0.KERNEL.A", 15 * kBlock));
  CHECK_LOG("ValidBlockOffset: final offset (0x00200000) > device size (0x00200000) for /dev/mtd9");
  CHECK_LOG("NANDRead: Error finding valid block for offset (0x001E0000) in /dev/mtd9 device.");
}

SCENARIO("flash.nand_partial_page") {
  MtdDevice dev("/dev/mtd9", true);
  auto data = Pattern(3100, 11);
  // 100 bytes: only buffered. The next 3000 complete page 0 and leave 1052
  // bytes of page 1 buffered, which the flush writes.
  CHECK(Flash()->NANDWrite(data.data(), 100, "NAND0.KERNEL.A", 0));
  CHECK_EQ(Flash()->currNANDBufferOffset, 100ul);
  CHECK_EQ(dev.ReadAll(0, kPage), Erased(kPage));
  CHECK(Flash()->NANDWrite(data.data() + 100, 3000, "NAND0.KERNEL.A", 100));
  CHECK_EQ(Flash()->currNANDBufferOffset, 1052ul);
  CHECK_EQ(dev.ReadAll(0, 2 * kPage), Slice(data, 0, kPage) + Erased(kPage));
  Flash()->NANDFlushWrite();
  CHECK_EQ(Flash()->currNANDBufferOffset, 0ul);
  CHECK_EQ(dev.ReadAll(kPage, 1052), Slice(data, kPage, 1052));
  CHECK_EQ(dev.ReadAll(2 * kPage, kPage), Erased(kPage));
}

// mtd-utils and the library agree on data, bad blocks and the erased state
// (EraseNANDSlot erases the good blocks, as flash_erase does, and no more).
SCENARIO("flash.mtd_utils") {
  MtdDevice dev("/dev/mtd10", true);  // KERNEL.B, block 4 bad
  const unsigned long length = 10 * kBlock;
  auto data = Pattern(length, 12), other = Pattern(length, 13);
  CHECK(NANDWrite(data.data(), length, "NAND0.KERNEL.B", 0));
  CHECK(Shell("nanddump -q --bb=skipbad -f /tmp/kb.dump /dev/mtd10"));
  CHECK_EQ(ReadFile("/tmp/kb.dump"), data + Erased(5 * kBlock));

  REQUIRE(WriteFile("/tmp/kb.in", other) && FlashErase("/dev/mtd10"));
  CHECK(Shell("nandwrite -q -p /dev/mtd10 /tmp/kb.in"));
  Bytes back(length);
  CHECK(NANDRead(back.data(), length, "NAND0.KERNEL.B", 0));
  CHECK_EQ(back, other);

  // EraseNANDSlot erases what NANDWrite wrote.
  CHECK(NANDWrite(data.data(), length, "NAND0.KERNEL.B", 0));
  CHECK(Flash()->EraseNANDSlot("/dev/mtd10"));
  CHECK_EQ(dev.GoodBlocks(), Erased(15 * kBlock));
  CHECK(dev.Blocks() == std::vector<unsigned long>({4}));
}

// --- Fault phase: DATA.A with a weak page (block 2 page 5), a weak block
// (6) and a grave page (block 8 page 10); block 4 bad from the factory.

SCENARIO("flash.erase_weak_block") {
  MtdDevice dev("/dev/mtd12");
  CHECK(Flash()->EraseNANDSlot("/dev/mtd12"));
  CHECK_LOG("Flash erase error @ 0x000C0000\n");
  CHECK_LOG("NANDErase: marking block at offset 0x000C0000 as bad\n");
  CHECK(dev.Blocks() == std::vector<unsigned long>({4, 6}));
  CHECK_EQ(dev.GoodBlocks(), Erased(30 * kBlock));
}

SCENARIO("flash.weak_page_relocation") {
  MtdDevice dev("/dev/mtd12");
  REQUIRE(dev.IsBad(2 * kBlock) == 0 && dev.Erase(2 * kBlock, 2 * kBlock) == 0);
  const unsigned long start = 2 * kBlock;  // blocks 0 and 1 are good
  auto data = Pattern(15 * kPage, 14);
  // Five pages land in block 2; the next write hits its weak page 5, and
  // block 3 then holds everything, from its first page.
  CHECK(Flash()->NANDWrite(data.data(), 5 * kPage, "NAND0.DATA.A", start));
  CHECK(Flash()->NANDWrite(data.data() + 5 * kPage, 10 * kPage, "NAND0.DATA.A", start + 5 * kPage));
  CHECK_LOG("NANDWrite: found a bad block in /dev/mtd12 at offset 0x00042800, attempting recovery\r\n");
  CHECK_LOG("HandleBadNANDBlock: moving block data (10240 bytes) to next block\r\n");
  CHECK_LOG("HandleBadNANDBlock: marking block at offset 0x00040000 as bad\r\n");
  CHECK_EQ(Flash()->blocksMarkedBad, 1ul);
  CHECK_EQ(dev.IsBad(2 * kBlock), 1);
  CHECK_EQ(dev.ReadAll(3 * kBlock, 15 * kPage), data);
}

SCENARIO("flash.grave_page") {
  MtdDevice dev("/dev/mtd12");
  // nandsim only fails reads of pages that hold data. Blocks 8 and 9 are
  // good; how many before them are bad depends on the scenarios before.
  REQUIRE(dev.IsBad(8 * kBlock) == 0 && dev.IsBad(9 * kBlock) == 0 && dev.Erase(8 * kBlock, kBlock) == 0);
  REQUIRE(dev.Write(8 * kBlock + 10 * kPage, Pattern(kPage, 20)) == static_cast<long>(kPage));
  unsigned long block8 = 8 * kBlock;
  for (auto bad : dev.Blocks()) block8 -= bad < 8 ? kBlock : 0;
  Bytes buffer(kBlock);
  CHECK(!NANDRead(buffer.data(), kBlock, "NAND0.DATA.A", block8));
  CHECK_LOG("ECC error reading the flash device /dev/mtd12, failed = 0x");
  CHECK_LOG("NANDRead: LinuxFlashRead failed in /dev/mtd12 at offset 0x00100000, attempting recovery\r\n");
  // The next block reads fine.
  CHECK(NANDRead(buffer.data(), kBlock, "NAND0.DATA.A", block8 + kBlock));
}

SCENARIO("flash.nor") {
  MtdDevice chip("/dev/mtd8");
  REQUIRE(chip.Erase(0, kNorChip) == 0);
  // CFG.A (mtd2) starts 1 MiB into the chip. 16 bytes before a sector
  // boundary, three sectors long: a 16-byte write and one write of the
  // rest, both on the partition.
  const unsigned long cfgA = kNorBase + 2 * kNorPart;
  auto data = Pattern(3 * kNorSector, 15);
  CHECK(Flash()->WriteToNORFlashAtAddr(cfgA + kNorSector - 16, data.data(), data.size()));
  // Erase rounding: a sector and a byte erases two; the data is where it was
  // written around them.
  CHECK(EraseNOR(cfgA + kNorSector, kNorSector + 1));
  Bytes expect = Erased(kNorSector - 16) + data + Erased(16);
  std::fill(expect.begin() + kNorSector, expect.begin() + 3 * kNorSector, 0xFF);
  CHECK_EQ(chip.ReadAll(2 * kNorPart, 4 * kNorSector), expect);
  // An unaligned erase is refused by the kernel but reported as done.
  CHECK(Flash()->NORErase(cfgA + 16, kNorSector));
  CHECK_LOG("Erase: Flash erase error in /dev/mtd2 \r\n");

  // The fixed mapping during an upgrade reaches the whole chip.
  isRDLQUpgradeInProgress = true;
  CHECK(WriteToNORFlashAtAddr(kNorBase + 0x3F0000, data.data(), 64));
  isRDLQUpgradeInProgress = false;
  CHECK_EQ(chip.ReadAll(0x3F0000, 64), Slice(data, 0, 64));
}

SCENARIO("flash.nor_read_only") {
  // BOOT.A (mtd0) is read-only, as the boot loader's partition is on the
  // box: records and bytes read there; every write is refused by the kernel.
  MtdDevice chip("/dev/mtd8");
  CHECK_EQ(::open("/dev/mtd0", O_RDWR) < 0 ? errno : 0, EACCES);
  REQUIRE(chip.Erase(0, kNorPart) == 0);
  VersionEntry version, back;
  version.majorVersion = 3;
  Intruder record(256u, 0u);
  REQUIRE(version.StoreTLVAndData(&record) == 0);
  Bytes bytes(record.pStart, const_cast<const unsigned char*>(record.pCurrent)), raw(bytes.size());
  REQUIRE(chip.Write(0x100, bytes) == static_cast<long>(bytes.size()));
  ComponentLocation component(U("NOR0"), U("BOOT"), U("A"), 0);
  component.slotOffset = 0x100;
  Extruder in(&component, false);
  CHECK_EQ(back.ReadTLVAndData(in, nullptr), 0u);
  CHECK_EQ(back.majorVersion, 3);
  CHECK(ReadFromNORFlashAtAddr(kNorBase + 0x100, raw.data(), raw.size()));
  CHECK_EQ(raw, bytes);
  CHECK(!WriteToNORFlashAtAddr(kNorBase, raw.data(), raw.size()));
  Intruder out(&component);
  CHECK(!out.isInitedOK);
  CHECK_EQ(chip.ReadAll(0x100, bytes.size()), bytes);
}

SCENARIO("flash.emmc") {
  // 100 bytes 16 bytes before a chunk boundary: one page-sized write, whose
  // bytes past the caller's 100 keep what the device held.
  auto data = Pattern(0x180000 + kPage, 17);
  Bytes back(0x180000 + 300);
  REQUIRE(PutOnEmmc(0x7F800, Bytes(2 * kPage, 0x11)));
  CHECK(Flash()->EMMCWrite(data.data(), 100, "EMMC0.APPS.A", 0x7FFF0));
  CHECK(Flash()->EMMCRead(back.data(), kPage, "ANY.NAME.X", 0x7FFF0));
  CHECK_EQ(Slice(back, 0, kPage), Slice(data, 0, 100) + Bytes(kPage - 100, 0x11));
  // A long write spans several chunks (the source is readable up to the
  // next page multiple).
  CHECK(Flash()->EMMCWrite(data.data(), back.size(), "EMMC0.APPS.A", 0xFF000));
  CHECK(Flash()->EMMCRead(back.data(), back.size(), "EMMC0.APPS.A", 0xFF000));
  CHECK_EQ(back, Slice(data, 0, back.size()));

  // Fill a range of the slot (1 MiB into the device): split at the next
  // 512 KiB boundary, nothing outside the range touched.
  constexpr unsigned long kFrom = 0x101000, kLength = 0x90000;
  REQUIRE(PutOnEmmc(kFrom - kPage, Bytes(kLength + 2 * kPage, 0)));
  Location apps(U("EMMC0"), U("APPS"), U("A"));
  CHECK(Flash()->EMMCErase(&apps, kFrom - 0x100000, kLength, 0xA5));
  CHECK_LOG("EMMCErase: [/dev/mtd14] StartAddress=0x101000 len=0x90000\r\n");
  Bytes filled(kLength + 2 * kPage);
  CHECK(Flash()->EMMCRead(filled.data(), filled.size(), "EMMC0.APPS.A", kFrom - kPage));
  CHECK_EQ(filled, Bytes(kPage, 0) + Bytes(kLength, 0xA5) + Bytes(kPage, 0));

}

// Whole-partition transfers, the library beside mtd-utils: one NANDWrite and
// one NANDRead of the slot, then nandwrite and nanddump of the same bytes.
// The bytes live once, in a file in the guest's tmpfs mapped as the
// library's buffer (read back into the same pages, checked by a hash), since
// the guest's memory also holds nandsim's copy of the chip; nanddump writes
// to /dev/null. Reports times, rates and time ratios (library / tool) only;
// timings are never asserted. Leaves the partition erased.
static void TimeSlot(const char* slot, const std::string& node, unsigned long length) {
  const char* path = "/tmp/timing.in";
  struct Remove { const char* path; ~Remove() { ::unlink(path); } } remove{path};  // whatever check stops it
  int fd = ::open(path, O_RDWR | O_CREAT | O_TRUNC, 0600);
  REQUIRE(fd >= 0 && ::ftruncate(fd, length) == 0);
  void* map = ::mmap(nullptr, length, PROT_READ | PROT_WRITE, MAP_SHARED, fd, 0);
  ::close(fd);
  REQUIRE(map != MAP_FAILED);
  auto* bytes = static_cast<unsigned char*>(map);
  std::generate(bytes, bytes + length, std::minstd_rand(length));
  auto hash = [&] { return std::hash<std::string_view>()(std::string_view(static_cast<char*>(map), length)); };
  const size_t written = hash();
  REQUIRE(FlashErase(node));
  double libWrite = Seconds([&] { CHECK(NANDWrite(bytes, length, slot, 0)); });
  std::fill(bytes, bytes + length, 0);
  double libRead = Seconds([&] { CHECK(NANDRead(bytes, length, slot, 0)); });
  CHECK_EQ(hash(), written);
  ::munmap(map, length);
  REQUIRE(FlashErase(node));
  double toolWrite = Seconds([&] { CHECK(Shell("nandwrite -q -p " + node + " " + path)); });
  std::string dump = "nanddump -q --bb=skipbad -f /dev/null -l " + std::to_string(length) + " " + node;
  double toolRead = Seconds([&] { CHECK(Shell(dump)); });
  CHECK(FlashErase(node));
  auto rate = [&](double seconds) { return length / 1048576.0 / seconds; };
  std::ostringstream line;
  line << std::setprecision(3) << std::fixed << "timing " << slot << " " << length << " bytes: NANDWrite " << libWrite
       << " s " << rate(libWrite) << " MiB/s, nandwrite " << toolWrite << " s " << rate(toolWrite)
       << " MiB/s, time ratio " << libWrite / toolWrite << "; NANDRead " << libRead << " s " << rate(libRead)
       << " MiB/s, nanddump " << toolRead << " s " << rate(toolRead) << " MiB/s, time ratio " << libRead / toolRead;
  Info(line.str());
}

// ROOTFS.A: 64 blocks, block 8 bad.
SCENARIO("flash.timing") { TimeSlot("NAND0.ROOTFS.A", "/dev/mtd11", 63 * kBlock); }

// The whole of USER.A, 1920 blocks (240 MiB), none bad: every block's lookup
// walks the bad-block table from block 0, so the lookups grow with the
// square of the partition's size.
SCENARIO("flash.timing_whole_user") { TimeSlot("NAND0.USER.A", "/dev/mtd13", 1920 * kBlock); }

SCENARIO("flash.erase_slots") {
  // NOR: SPLASH.A, 2 MiB into the chip, and SPLASH.B after it; EraseSector
  // clears the first sector of its slot only.
  MtdDevice chip("/dev/mtd8"), kernelB("/dev/mtd10");
  REQUIRE(chip.Erase(0x200000, 2 * kNorPart) == 0);
  auto data = Pattern(2 * kNorPart, 21);
  REQUIRE(chip.Write(0x200000, data) == static_cast<long>(data.size()));
  Location splashA(U("NOR0"), U("SPLASH"), U("A")), splashB(U("NOR0"), U("SPLASH"), U("B"));
  CHECK(Flash()->EraseSlot(&splashA));
  CHECK_EQ(chip.ReadAll(0x200000, 2 * kNorPart), Erased(kNorPart) + Slice(data, kNorPart, kNorPart));
  CHECK(Flash()->EraseSector(&splashB));
  CHECK_EQ(chip.ReadAll(0x280000, kNorPart),
           Erased(kNorSector) + Slice(data, kNorPart + kNorSector, kNorPart - kNorSector));

  // NAND: EraseSlot clears every good block of KERNEL.B, EraseSector block
  // 0 only.
  Location nandB(U("NAND0"), U("KERNEL"), U("B"));
  CHECK(NANDWrite(data.data(), 2 * kBlock, "NAND0.KERNEL.B", 0));
  CHECK(Flash()->EraseSlot(&nandB));
  CHECK_EQ(kernelB.GoodBlocks(), Erased(15 * kBlock));
  CHECK(NANDWriteLoc(data.data(), 2 * kBlock, &nandB, 0));
  CHECK(Flash()->EraseSector(&nandB));
  CHECK_EQ(kernelB.ReadAll(0, 2 * kBlock), Erased(kBlock) + Slice(data, kBlock, kBlock));

  // eMMC: EraseSlot refuses, EraseSector leaves it alone and succeeds.
  Location apps(U("EMMC0"), U("APPS"), U("A"));
  CHECK(!Flash()->EraseSlot(&apps));
  CHECK_LOG("FlashInterface::EraseSlot: memory technology for EMMC0.APPS.A is not NOR or NAND, "
            "unable to erase\n");
  CHECK(Flash()->EraseSector(&apps));
  CHECK_LOG("FlashInterface::EraseSlot: memory technology for EMMC0.APPS.A is EMMC did not erase\r\n");
}

SCENARIO("streams.nand_record") {
  // KERNEL.A: block 2 is bad. The record starts one page into block 1 and
  // its payload runs on through block 3.
  MtdDevice dev("/dev/mtd9", true);
  const unsigned int start = kBlock + kPage, payloadSize = kBlock + 3000;
  auto payload = Pattern(payloadSize, 30);
  // The constructor drops its offset argument by design; set it after.
  ComponentLocation slot(U("NAND0"), U("KERNEL"), U("A"), 0);
  slot.slotOffset = start;
  {
    Intruder out(&slot);
    REQUIRE(out.isInitedOK);
    DataEntry entry;
    entry.CreateData(payloadSize, payload.data());
    CHECK_EQ(entry.StoreTLVAndData(&out), 0u);
  }
  // The stream writes through the page buffer; the last page is pending.
  Flash()->NANDFlushWrite();
  // On the good blocks: the type and big-endian length (0x20BB8), then the
  // payload; nothing in the bad block.
  Bytes record = Bytes{'D', 'A', 'T', 'A', 0x00, 0x02, 0x0B, 0xB8} + payload;
  CHECK_EQ(Slice(dev.GoodBlocks(), start, record.size()), record);
  CHECK_EQ(dev.ReadAll(2 * kBlock, kBlock), Erased(kBlock));

  Extruder in(&slot, false);
  DataEntry back;
  unsigned int length = 0;
  REQUIRE(in.isInitedOK);
  CHECK_EQ(back.ReadTLVAndData(in, &length, false), 0u);
  REQUIRE(back.length == payloadSize && back.GetData() != nullptr);
  CHECK_EQ(Bytes(back.GetData(), back.GetData() + payloadSize), payload);
}

SCENARIO("streams.sdram") {
  // SDRAM0.SCRATCH.A: a range of physical memory the kernel leaves alone
  // (its address depends on the machine; init.sh passes it on).
  const char* base = std::getenv("STBPLAT_SYSTEST_SDRAM");
  const unsigned long kBase = base != nullptr ? std::strtoul(base, nullptr, 0) : 0x30000000UL;
  constexpr unsigned long kOffset = 0x100, kReservedSize = 0x100000;
  ComponentLocation scratch(U("SDRAM0"), U("SCRATCH"), U("A"), 0);
  ComponentLocation last(U("SDRAM0"), U("SCRATCH"), U("B"), 0);
  scratch.slotOffset = kOffset;
  {
    Intruder out(&scratch);
    REQUIRE(out.isInitedOK);
    CHECK_EQ(out.intrude(0x11223344u), 1u);
    CHECK_EQ(out.intrude(static_cast<unsigned short>(0xA5C3)), 1u);
  }
  // Big-endian in memory, as the kernel's /dev/mem shows it (devmem reads a
  // native little-endian word).
  CHECK_EQ(DevMem(kBase + kOffset), "0x44332211");
  std::string second = DevMem(kBase + kOffset + 4);
  CHECK(second.size() == 10 && second.substr(6) == "C3A5");
  DevMem(kBase + kOffset + 8, "0x78563412");
  Extruder in(&scratch, false);
  unsigned int first = 0, third = 0;
  unsigned short half = 0;
  REQUIRE(in.isInitedOK);
  CHECK_EQ(in.extrude(&first), 0u);
  CHECK_EQ(in.extrude(&half), 0u);
  in += 2;
  CHECK_EQ(in.extrude(&third), 0u);
  CHECK_EQ(first, 0x11223344u);
  CHECK_EQ(half, 0xA5C3);
  CHECK_EQ(third, 0x12345678u);

  // The stream maps the whole slot size from the component's address, so a
  // component not at the slot's start maps past the slot's end. Where the
  // slot ends with the reserved range, the kernel refuses the mapping.
  // Only System RAM is refused: where the range is followed by something
  // else (the top of the virt machine's RAM left out with mem=), the kernel
  // maps it and there is nothing to see.
  last.slotOffset = kOffset;
  ClearLog();
  Extruder refused(&last, false);
  if (IsSystemRam(kBase + kReservedSize)) {
    CHECK(!refused.isInitedOK);
    CHECK_LOG("mmap failed: errno = 1\r\n");
  } else {
    Info("streams.sdram: no System RAM after the range here; the refused mapping is not shown");
  }
  last.slotOffset = 0;
  Extruder whole(&last, false);
  CHECK(whole.isInitedOK);
}
