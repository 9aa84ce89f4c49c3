// Flash in the in-process simulator: the system calls that reading a whole
// NAND slot makes, counted through the OS seam, against the number the read
// algorithm calls for. Per erase block k of the partition (counted from its
// start) the read does:
//   finding the good block: the device size (open, MEMGETINFO, close), then
//     open, one MEMGETBADBLOCK for each block 0..k, close      -> 6 + k
//   the transfer: open, seek, ECCGETSTATS, read, ECCGETSTATS, close -> 6
// so a slot of B blocks from the partition's start needs the sum over
// k < B of (12 + k) = 12 B + B (B - 1) / 2: quadratic in the slot size,
// because every block's lookup walks the bad-block table from block 0.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <unistd.h>
#include <vector>

#include "flash/flash_test_hook.h"
#include "seam_counter.h"
#include "stbplat/flash_interface.h"
#include "stbplat/memory_map.h"
#include "support/flash_sim.h"

namespace {

constexpr unsigned long kNandBlock = 0x20000;
constexpr unsigned long kNandPage = 2048;
constexpr int kDataMtd = 2;
constexpr const char* kSlotName = "NAND0.SYS.DATA";
constexpr unsigned long kCallsPerBlock = 12;

std::string DeviceMap(unsigned long slotSize) {
  char text[512];
  std::snprintf(text, sizeof text,
                "[device NAND0]\n"
                "technology = NAND\n"
                "base = 0x0\n"
                "size = 0x%lx\n"
                "[partition NAND0.SYS]\n"
                "offset = 0\n"
                "size = 0x%lx\n"
                "[slot NAND0.SYS.DATA]\n"
                "offset = 0\n"
                "size = 0x%lx\n"
                "node = /dev/mtd%d\n",
                slotSize, slotSize, slotSize, kDataMtd);
  return text;
}

bool LoadDeviceMap(const std::string& text) {
  char path[] = "/tmp/stbplat-bench-map-XXXXXX";
  const int fd = mkstemp(path);
  if (fd < 0) return false;
  const bool written =
      ::write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
  ::close(fd);
  std::string error;
  const bool loaded = written && ExtendedMemoryMapStructure::Load(path, &error);
  std::remove(path);
  return loaded;
}

void NandReadSlot(benchmark::State& state, unsigned long blocks) {
  const unsigned long slotSize = blocks * kNandBlock;
  stbplat::test::FlashSim sim;
  sim.AddMtd(kDataMtd, kSlotName, stbplat::test::SimKind::kNand, slotSize, kNandBlock,
             kNandPage);
  stbplat::flash::ResetFlashInterfaceForTest();
  if (!LoadDeviceMap(DeviceMap(slotSize))) {
    state.SkipWithError("the device map did not load");
    return;
  }
  // Created outside the count: reading the partition table is once a process.
  FlashInterface* flash = FlashInterface::Instance();
  std::vector<unsigned char> buffer(slotSize);

  stbplat::bench::SeamCallCounter counter;
  for (auto _ : state) {
    if (!flash->NANDRead(buffer.data(), slotSize, kSlotName, 0)) {
      state.SkipWithError("the slot did not read");
      break;
    }
    benchmark::DoNotOptimize(buffer.data());
  }
  const double reads = static_cast<double>(state.iterations());
  const stbplat::bench::SeamCallCounts& counts = counter.counts();
  state.counters["calls"] = static_cast<double>(counts.Total()) / reads;
  state.counters["calls_needed"] =
      static_cast<double>(kCallsPerBlock * blocks + blocks * (blocks - 1) / 2);
  state.counters["ioctl"] = static_cast<double>(counts.ioctl) / reads;
  state.counters["open"] = static_cast<double>(counts.open) / reads;

  stbplat::flash::ResetFlashInterfaceForTest();
  ExtendedMemoryMapStructure::Reset();
}

BENCHMARK_CAPTURE(NandReadSlot, 1MiB, 8)->Name("nand_read_slot_1MiB/stbplat");
BENCHMARK_CAPTURE(NandReadSlot, 8MiB, 64)->Name("nand_read_slot_8MiB/stbplat");

}  // namespace
