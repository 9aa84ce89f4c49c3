// Streams and records over component locations on real devices: a DATA
// record in a NAND slot that runs across a factory-bad block, and words in
// reserved physical memory through /dev/mem.
#if __has_include("stbplat/flash_interface.h")

#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <string>
#include <vector>

#include "harness.h"
#include "mtd_device.h"
#include "stbplat/component_location.h"
#include "stbplat/data_entry.h"
#include "stbplat/extruder.h"
#include "stbplat/flash_interface.h"
#include "stbplat/intruder.h"

namespace {

constexpr unsigned long kBlock = 0x20000;
constexpr unsigned long kPage = 2048;
constexpr unsigned int kRecordHeader = 8;  // type and length
constexpr unsigned char kDataType[4] = {'D', 'A', 'T', 'A'};

const unsigned char* U(const char* text) { return reinterpret_cast<const unsigned char*>(text); }

std::string DevMem(unsigned long address) {
  char hex[32];
  std::snprintf(hex, sizeof hex, "0x%lX", address);
  std::string out = systest::ShellOutput(std::string("devmem ") + hex + " 32");
  while (!out.empty() && (out.back() == '\n' || out.back() == '\r')) out.pop_back();
  return out;
}

}  // namespace

SCENARIO("streams.nand_record") {
  // KERNEL.A: block 2 is bad. The record starts one page into block 1 and
  // its payload runs on through block 3.
  systest::MtdDevice dev("/dev/mtd9");
  REQUIRE(dev.ok());
  REQUIRE(dev.EraseAllGood());
  const unsigned int start = static_cast<unsigned int>(kBlock + kPage);
  const unsigned int payloadSize = static_cast<unsigned int>(kBlock + 3000);
  auto payload = systest::Pattern(payloadSize, 30);
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
  FlashInterface::Instance()->NANDFlushWrite();

  // On the device: header and first bytes in block 1, nothing in block 2,
  // the rest from block 3 on.
  auto head = dev.ReadAll(start, kRecordHeader);
  REQUIRE(head.size() == kRecordHeader);
  CHECK(std::equal(kDataType, kDataType + 4, head.begin()));
  CHECK_EQ((unsigned(head[4]) << 24) | (unsigned(head[5]) << 16) | (unsigned(head[6]) << 8) | head[7],
           payloadSize);
  CHECK_BYTES(dev.ReadAll(2 * kBlock, kBlock), systest::Erased(kBlock));
  const unsigned long inBlock1 = kBlock - kPage - kRecordHeader;
  auto block3 = dev.ReadAll(3 * kBlock, payloadSize - inBlock1);
  CHECK(std::equal(block3.begin(), block3.end(), payload.begin() + inBlock1));

  Extruder in(&slot, false);
  REQUIRE(in.isInitedOK);
  DataEntry back;
  unsigned int length = 0;
  CHECK_EQ(back.ReadTLVAndData(in, &length, false), 0u);
  CHECK_EQ(back.length, payloadSize);
  REQUIRE(back.GetData() != nullptr);
  CHECK(std::equal(payload.begin(), payload.end(), back.GetData()));
}

// Whether /proc/iomem lists the physical address as System RAM.
bool IsSystemRam(unsigned long address) {
  std::vector<unsigned char> bytes = systest::ReadFile("/proc/iomem");
  std::istringstream lines(std::string(bytes.begin(), bytes.end()));
  std::string line;
  while (std::getline(lines, line)) {
    unsigned long first = 0, last = 0;
    if (line.find("System RAM") != std::string::npos &&
        std::sscanf(line.c_str(), " %lx-%lx", &first, &last) == 2 && first <= address &&
        address <= last)
      return true;
  }
  return false;
}

SCENARIO("streams.sdram") {
  // SDRAM0.SCRATCH.A: a range of physical memory the kernel leaves alone
  // (its address depends on the machine; init.sh passes it on).
  const char* base = std::getenv("STBPLAT_SYSTEST_SDRAM");
  const unsigned long kBase = base != nullptr ? std::strtoul(base, nullptr, 0) : 0x30000000UL;
  constexpr unsigned int kOffset = 0x100;
  constexpr unsigned long kReservedSize = 0x100000;
  ComponentLocation scratch(U("SDRAM0"), U("SCRATCH"), U("A"), 0);
  scratch.slotOffset = kOffset;
  {
    Intruder out(&scratch);
    REQUIRE(out.isInitedOK);
    CHECK_EQ(out.intrude(0x11223344u), 1u);
    CHECK_EQ(out.intrude(static_cast<unsigned short>(0xA5C3)), 1u);
  }
  // Big-endian in memory, as the kernel's /dev/mem shows it (devmem reads a
  // native little-endian word).
  CHECK_EQ(DevMem(kBase + kOffset), std::string("0x44332211"));
  std::string second = DevMem(kBase + kOffset + 4);
  CHECK(second.size() == 10 && second.substr(6) == "C3A5");

  char poke[64];
  std::snprintf(poke, sizeof poke, "devmem 0x%lX 32 0x78563412", kBase + kOffset + 8);
  REQUIRE(systest::Shell(poke) == 0);
  Extruder in(&scratch, false);
  REQUIRE(in.isInitedOK);
  unsigned int first = 0, third = 0;
  unsigned short half = 0;
  CHECK_EQ(in.extrude(&first), 0u);
  CHECK_EQ(first, 0x11223344u);
  CHECK_EQ(in.extrude(&half), 0u);
  CHECK_EQ(half, 0xA5C3);
  in += 2;
  CHECK_EQ(in.extrude(&third), 0u);
  CHECK_EQ(third, 0x12345678u);

  // The stream maps the whole slot size from the component's address, so a
  // component not at the slot's start maps past the slot's end. Where the
  // slot ends with the reserved range, the kernel refuses the mapping.
  // Only System RAM is refused: where the range is followed by something
  // else (the top of the virt machine's RAM left out with mem=), the kernel
  // maps it and there is nothing to see.
  ComponentLocation last(U("SDRAM0"), U("SCRATCH"), U("B"), 0);
  last.slotOffset = kOffset;
  systest::ClearLog();
  Extruder refused(&last, false);
  bool ramFollows = IsSystemRam(kBase + kReservedSize);
  if (ramFollows) {
    CHECK(!refused.isInitedOK);
    CHECK_LOG("mmap failed: errno = 1\r\n");
  } else {
    systest::Info("streams.sdram: no System RAM after the range here; the refused mapping is not shown");
  }
  last.slotOffset = 0;
  Extruder whole(&last, false);
  CHECK(whole.isInitedOK);
}

#endif
