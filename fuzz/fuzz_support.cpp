#include "fuzz_support.h"

#include <unistd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <string>

#include "devmodel/flash_sim.h"

extern "C" {

// Every level on: the message paths run, and their formatting is checked.
// The array interposes the platform library's; as in the unit tests, keep it
// out of AddressSanitizer's global registration and leave room behind it for
// the platform library's redzone.
constexpr int kSpareForPlatformRedzone = 64;
__attribute__((no_sanitize("address")))
unsigned int subSystemLogLevel[eLogModuleCount + kSpareForPlatformRedzone] = {
    99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99,
    99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99, 99};

namespace {
unsigned long g_streamErrors = 0;
}  // namespace

void GlobalLogUtilAdd(etLogUtilModuleId module, unsigned int level, const char*, unsigned int, const char*,
                      const char* format, ...) {
  if (module == eLogModuleByteStreams && level == eLogLevelError) ++g_streamErrors;
  char line[512];
  va_list args;
  va_start(args, format);
  std::vsnprintf(line, sizeof line, format, args);
  va_end(args);
}

}  // extern "C"

namespace stbplat {
namespace fuzz {
namespace {

constexpr const char* kRecordFile = "/data/record.bin";
constexpr int kNorMtd = 0;
// One 4 KiB sector: libFuzzer's inputs fit it, and a count that fits the slot
// walks at most a few thousand NOR reads.
constexpr uint64_t kNorSlotSize = 0x1000;
constexpr const char kMap[] =
    "[device NOR0]\n"
    "technology = SPI_NOR\n"
    "base = 0xE0000000\n"
    "size = 0x1000\n"
    "[partition NOR0.BOOT]\n"
    "offset = 0\n"
    "size = 0x1000\n"
    "[slot NOR0.BOOT.INFO]\n"
    "offset = 0\n"
    "size = 0x1000\n"
    "node = /dev/mtd0\n";

// The emulated device, bound for the whole run, and its memory map.
devmodel::FlashSim& Device() {
  static devmodel::FlashSim* sim = [] {
    auto* device = new devmodel::FlashSim;
    device->AddMtd(kNorMtd, "flash0.BOOT.INFO", devmodel::SimKind::kNor, kNorSlotSize, kNorSlotSize);
    char path[] = "/tmp/stbplat-fuzz-map-XXXXXX";
    int fd = mkstemp(path);
    std::string error;
    if (fd < 0 || write(fd, kMap, sizeof kMap - 1) != static_cast<ssize_t>(sizeof kMap - 1) ||
        !ExtendedMemoryMapStructure::Load(path, &error))
      std::abort();
    close(fd);
    unlink(path);
    return device;
  }();
  return *sim;
}

}  // namespace

const std::vector<unsigned char>* NorSlotBytes(const unsigned char* data, size_t size) {
  static std::vector<unsigned char> slot(kNorSlotSize, devmodel::kErasedByte);
  static size_t used = 0;  // the bytes the last input covered
  if (size > kNorSlotSize) return nullptr;
  if (used > size) std::fill(slot.data() + size, slot.data() + used, devmodel::kErasedByte);
  std::copy(data, data + size, slot.data());
  used = size;
  return &slot;
}

unsigned long StreamErrorCount() { return g_streamErrors; }

std::unique_ptr<Extruder> OpenSource(Source source, const unsigned char* data, size_t size) {
  if (source == Source::kMemory) {
    if (size > 0xFFFFFFFFu) return nullptr;
    return std::make_unique<Extruder>(data, static_cast<unsigned int>(size));
  }
  devmodel::FlashSim& device = Device();
  if (source == Source::kFile) {
    device.AddFile(kRecordFile, std::vector<uint8_t>(data, data + size));
    return std::make_unique<Extruder>(kRecordFile, false);
  }
  const std::vector<unsigned char>* slot = NorSlotBytes(data, size);
  if (slot == nullptr) return nullptr;
  device.Poke("/dev/mtd0", 0, *slot);
  ComponentLocation component;
  component.location = Location(reinterpret_cast<const unsigned char*>("NOR0"),
                                reinterpret_cast<const unsigned char*>("BOOT"),
                                reinterpret_cast<const unsigned char*>("INFO"));
  return std::make_unique<Extruder>(&component, false);
}

}  // namespace fuzz
}  // namespace stbplat
