// Internals shared by the FlashInterface sources.
#ifndef STBPLAT_SRC_FLASH_FLASH_INTERNAL_H
#define STBPLAT_SRC_FLASH_FLASH_INTERNAL_H

#include <string>

#include "stbplat/flash_interface.h"
#include "util/log_gate.h"

namespace stbplat {
namespace flash {

constexpr const char* kFlashSource = "../FlashInterface";

// The NOR chip is mapped at this physical address and its whole-chip
// partition is MTD 8; used when the memory map cannot say more.
constexpr unsigned long kFixedNorBase = 0xE0000000UL;
constexpr const char* kFixedNorDevice = "/dev/mtd8";
constexpr const char* kWholeEmmcDevice = "/dev/mmca";
constexpr const char* kProcMtd = "/proc/mtd";

constexpr unsigned long kDefaultNorSectorSize = 0x20000;
constexpr unsigned long kDefaultEmmcChunkSize = 0x80000;
constexpr unsigned long kDefaultSpareSectorSize = 0x20000;
constexpr unsigned long kDefaultNandSectorSize = 0x80000;
constexpr unsigned long kDefaultNandPageSize = 2048;
constexpr unsigned char kErasedFlashByte = 0xFF;
// A chunk that keeps failing to write is retried this many times in a row
// before the block is given up as unusable.
constexpr int kMaxNandWriteFailures = 5;

constexpr const char* kNorDevice = "NOR0....";
constexpr const char* kNandDevice = "NAND0...";
constexpr unsigned int kNameWidth = 8;
constexpr mode_t kCreateMode = 0644;

// "/dev/mtd0" to "/dev/mtd29", by MTD number.
extern const char* const mtdDeviceNames[FlashInterface::kMaxMtdDevices];

// The location's name string ("DEVICE.PARTITION.SLOT").
std::string NameOf(const Location* location);

// Erase-block arithmetic; the block size is never 0 where these are used.
inline unsigned long BlockStart(unsigned long offset, unsigned long block) {
  return offset - offset % block;
}

}  // namespace flash
}  // namespace stbplat

#define FLASH_LOG(level, function, ...) \
  STBPLAT_LOG(eLogModuleFlashAccess, (level), ::stbplat::flash::kFlashSource, (function), __VA_ARGS__)

#endif
