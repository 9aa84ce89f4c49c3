// Records in memory mode against memcpy of the same bytes: reading a full
// boot-loader information record, and storing and reading a package header
// with all sixteen components.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstring>
#include <vector>

#include "stbplat/code_object_info.h"
#include "stbplat/descriptor_status.h"
#include "stbplat/extruder.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/intruder.h"

namespace {

constexpr unsigned int kRecordRoom = 4096;
constexpr unsigned int kTlvHeaderSize = 8;  // type and size
constexpr unsigned int kControllers = 2;
constexpr unsigned int kSegmentsPerController = 2;
constexpr unsigned int kReloadErrors = 3;
constexpr unsigned int kFsblNestedEntries = 3;  // DEVC, MCFG, BSCK
constexpr unsigned int kDevcPayloadSize = 8;    // header 4 + scbClock, avsEnabled, reserved
constexpr char kVersionText[] = "FSBL 4.2.1 (production)";

unsigned int StoreHeader(Intruder& out, unsigned int type) {
  out.intrude(type);
  out.intrude(0u);  // size, patched by the caller
  out.intrude(static_cast<unsigned short>(0));
  out.intrude(static_cast<unsigned char>(0));
  return out.intrude(static_cast<unsigned char>(0));
}

// A boot-loader information record as a boot loader leaves it: version with
// description and sequence control, device configuration, two memory
// controllers of two segments each, three reload errors.
std::vector<unsigned char> FsblRecordBytes() {
  std::vector<unsigned char> room(kRecordRoom);
  Intruder out(room.data(), kRecordRoom);
  StoreHeader(out, kEntryTypeFSBL);

  VersionEntry version;
  version.majorVersion = 4;
  version.minorVersion = 2;
  version.description.CreateData(sizeof kVersionText,
                                 reinterpret_cast<const unsigned char*>(kVersionText));
  version.versionLetter = 'c';
  version.StoreTLVAndData(&out);
  out.intrude(kFsblNestedEntries);

  // The device configuration is read-only in the library: written by hand.
  out.intrude(static_cast<unsigned int>(kEntryTypeDEVC));
  out.intrude(kDevcPayloadSize);
  out.intrude(static_cast<unsigned short>(0));
  out.intrude(static_cast<unsigned char>(0));
  out.intrude(static_cast<unsigned char>(0));
  out.intrude(static_cast<unsigned short>(648));
  out.intrude(static_cast<unsigned char>(1));
  out.intrude(static_cast<unsigned char>(0));

  MemoryConfigDescriptor memory;
  for (unsigned int c = 0; c < kControllers; ++c) {
    MemoryControllerDescriptor controller;
    controller.ddrCfgWidth = 32;
    controller.ddrSize = 1024;
    controller.ddrSpeed = 1600;
    controller.ddrDevTech = 4;
    controller.ddrMode = 1;
    controller.ddrDevWidth = 16;
    for (unsigned int s = 0; s < kSegmentsPerController; ++s) {
      MemoryControllerSegmentDescriptor segment;
      segment.segmentPhysicalAddressStart = 0x40000000ul * (2 * c + s + 1);
      segment.segmentSize = 512;
      controller.memorySegments.push_back(segment);
    }
    memory.memoryControllers.push_back(controller);
  }
  memory.StoreTLVAndData(&out);

  BseckReloadDescriptor reload;
  reload.ExecutingType = 2;
  for (unsigned int e = 0; e < kReloadErrors; ++e) {
    BseckReloadError error;
    error.flags = 0;
    error.majorVer = 0;
    error.minorVer = 1;
    error.Type = static_cast<unsigned short>(e + 1);
    error.Error = static_cast<unsigned short>(0x100 + e);
    reload.ReloadErrors.push_back(error);
  }
  reload.StoreTLVAndData(&out);

  const unsigned int total = static_cast<unsigned int>(out.pCurrent - out.pStart);
  Intruder size(room.data() + 4, 4);
  size.intrude(total - kTlvHeaderSize);
  room.resize(total);
  return room;
}

CodeObjectInfo FullPackageHeader() {
  static const unsigned char kDevice[] = "NAND0";
  static const unsigned char kPartition[] = "KERNEL";
  static const unsigned char kSlot[] = "A";
  CodeObjectInfo info;
  info.packageHeaderLocation.location.Set(kDevice, kPartition, kSlot);
  std::memcpy(info.packageHeaderLocation.componentTag, "PHDR", 4);
  info.numComponents = CodeObjectInfo::kMaxComponents;
  for (unsigned int i = 0; i < CodeObjectInfo::kMaxComponents; ++i) {
    ComponentLocationStorage& component = info.componentLocations[i];
    component.location.Set(kDevice, kPartition, kSlot);
    std::memcpy(component.componentTag, "CMP0", 4);
    component.componentTag[3] = static_cast<unsigned char>('A' + i);
    component.slotOffset = 0x20000ul * i;
  }
  return info;
}

std::vector<unsigned char> PackageHeaderBytes(const CodeObjectInfo& info) {
  std::vector<unsigned char> room(kRecordRoom);
  Intruder out(room.data(), kRecordRoom);
  info.Store(&out);
  room.resize(static_cast<std::size_t>(out.pCurrent - out.pStart));
  return room;
}

void MemcpyBaseline(benchmark::State& state, const std::vector<unsigned char>& bytes) {
  std::vector<unsigned char> copy(bytes.size());
  for (auto _ : state) {
    std::memcpy(copy.data(), bytes.data(), bytes.size());
    benchmark::DoNotOptimize(copy.data());
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
  state.counters["record_bytes"] = static_cast<double>(bytes.size());
}

void FsblReadLibrary(benchmark::State& state) {
  const std::vector<unsigned char> bytes = FsblRecordBytes();
  FSBLInfo info;
  for (auto _ : state) {
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    const unsigned int status = info.ReadTLVAndData(in, nullptr);
    if (status != kDescriptorOk || info.memConfig.memoryControllers.size() != kControllers ||
        info.BseckInfo.ReloadErrors.size() != kReloadErrors) {
      state.SkipWithError("the boot-loader information record did not read");
      break;
    }
    benchmark::DoNotOptimize(info.memConfig.memoryControllers.data());
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
  state.counters["record_bytes"] = static_cast<double>(bytes.size());
}

void FsblReadMemcpy(benchmark::State& state) { MemcpyBaseline(state, FsblRecordBytes()); }

void PackageHeaderStoreLibrary(benchmark::State& state) {
  const CodeObjectInfo info = FullPackageHeader();
  std::vector<unsigned char> room(kRecordRoom);
  for (auto _ : state) {
    Intruder out(room.data(), kRecordRoom);
    if (info.Store(&out) != kDescriptorOk) {
      state.SkipWithError("the package header did not store");
      break;
    }
    benchmark::DoNotOptimize(room.data());
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
}

void PackageHeaderReadLibrary(benchmark::State& state) {
  const std::vector<unsigned char> bytes = PackageHeaderBytes(FullPackageHeader());
  CodeObjectInfo info;
  for (auto _ : state) {
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    if (info.Read(in) != kDescriptorOk) {
      state.SkipWithError("the package header did not read");
      break;
    }
    benchmark::DoNotOptimize(&info);
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
  state.counters["record_bytes"] = static_cast<double>(bytes.size());
}

void PackageHeaderMemcpy(benchmark::State& state) {
  MemcpyBaseline(state, PackageHeaderBytes(FullPackageHeader()));
}

BENCHMARK(FsblReadLibrary)->Name("fsbl_read/stbplat");
BENCHMARK(FsblReadMemcpy)->Name("fsbl_read/memcpy");
BENCHMARK(PackageHeaderStoreLibrary)->Name("coi16_store/stbplat");
BENCHMARK(PackageHeaderMemcpy)->Name("coi16_store/memcpy");
BENCHMARK(PackageHeaderReadLibrary)->Name("coi16_read/stbplat");
BENCHMARK(PackageHeaderMemcpy)->Name("coi16_read/memcpy");

}  // namespace
