// The example device's layout: its three chips, their partitions and slots,
// and the images being filled.
#ifndef STBPLAT_MKEXAMPLE_EXAMPLE_LAYOUT_H
#define STBPLAT_MKEXAMPLE_EXAMPLE_LAYOUT_H

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace stbplat {
namespace example {

constexpr uint64_t kKiB = 1024;
constexpr uint64_t kNorSize = 256 * kKiB;
constexpr uint64_t kNorSector = 64 * kKiB;
constexpr uint64_t kNorPhysicalBase = 0xE0000000;
constexpr uint64_t kNandSize = 1024 * kKiB;
constexpr uint64_t kNandBlock = 128 * kKiB;
constexpr uint64_t kNandPage = 2 * kKiB;
constexpr uint64_t kNandOob = 64;
constexpr uint64_t kEmmcSize = 1024 * kKiB;
// Blocks of the NAND chip that are bad from the factory.
constexpr unsigned kBadNandBlocks[] = {2, 5};

enum class Chip { kNor, kNand, kEmmc };

struct Slot {
  Chip chip;
  const char* partition;
  const char* slot;
  uint64_t offset;  // in the chip
  uint64_t size;
  int mtd;          // -1 when the kernel has no MTD partition for it
  uint64_t partitionOffset;  // of the slot in its partition
  uint64_t partitionSize;
};

const std::vector<Slot>& Slots();
const char* DeviceName(Chip chip);

struct Layout {
  Layout();
  std::vector<unsigned char> nor;   // data
  std::vector<unsigned char> nand;  // data and OOB bytes, page by page
  std::vector<unsigned char> emmc;
  const char* norImageName = "mtd8";
  const char* nandImageName = "mtd7";

  // Writes bytes into a slot at a logical offset; on NAND the offset counts
  // good blocks only, as the library reads them.
  bool Place(const char* partition, const char* slot, uint64_t offset,
             const std::vector<unsigned char>& bytes, std::string* error);

  std::string ProcMtd() const;
  std::string MemoryMap() const;
  // (file name under dev/, contents)
  std::vector<std::pair<std::string, std::string>> GeometryFiles() const;
};

}  // namespace example
}  // namespace stbplat

#endif
