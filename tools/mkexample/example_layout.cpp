#include "example_layout.h"

#include <cstdio>
#include <cstring>

namespace stbplat {
namespace example {
namespace {

constexpr unsigned char kErased = 0xFF;
constexpr unsigned char kBadBlockMarker = 0x00;
constexpr int kNorChipMtd = 8;   // the whole NOR chip: MTD 8, as the fixed NOR mapping expects
constexpr int kNandChipMtd = 7;
// eMMC slot rows are windows of the device in its 512-byte sectors.
constexpr uint64_t kEmmcSector = 512;
constexpr int kLastMtd = 10;

std::string HexText(uint64_t value, int digits) {
  char text[32];
  std::snprintf(text, sizeof text, "%0*llX", digits, static_cast<unsigned long long>(value));
  return text;
}

uint64_t NandFileOffset(uint64_t dataOffset) {
  return dataOffset / kNandPage * (kNandPage + kNandOob) + dataOffset % kNandPage;
}

bool IsBadNandBlock(uint64_t block) {
  for (unsigned bad : kBadNandBlocks)
    if (bad == block) return true;
  return false;
}

// The kernel's name of a partition: flash0 is the NOR chip, flash1 the NAND;
// eMMC slots are named as the memory map names them.
std::string KernelName(const Slot& s) {
  const char* chip = s.chip == Chip::kNor ? "flash0" : s.chip == Chip::kNand ? "flash1" : "EMMC0";
  return std::string(chip) + "." + s.partition + "." + s.slot;
}

}  // namespace

const std::vector<Slot>& Slots() {
  static const std::vector<Slot> slots = {
      {Chip::kNor, "BOOT", "A", 0x00000, 64 * kKiB, 0, 0, 64 * kKiB},
      {Chip::kNor, "FSBLINFO", "A", 0x10000, 64 * kKiB, 1, 0, 64 * kKiB},
      {Chip::kNor, "BLDCFG", "A", 0x20000, 64 * kKiB, 2, 0, 64 * kKiB},
      {Chip::kNor, "PANEL", "A", 0x30000, 64 * kKiB, 3, 0, 64 * kKiB},
      {Chip::kNand, "PKGHDR", "A", 0x00000, 128 * kKiB, 4, 0, 128 * kKiB},
      {Chip::kNand, "KERNEL", "A", 0x20000, 512 * kKiB, 5, 0, 512 * kKiB},
      {Chip::kNand, "ROOTFS", "A", 0xA0000, 384 * kKiB, 6, 0, 384 * kKiB},
      // The eMMC's slots are read at their offset in the partition as an
      // offset in the whole device, so its one partition starts at 0. Each
      // has a row of its own, through which the flash layer writes it.
      {Chip::kEmmc, "APPS", "A", 0x00000, 512 * kKiB, 9, 0x00000, 1024 * kKiB},
      {Chip::kEmmc, "APPS", "B", 0x80000, 512 * kKiB, 10, 0x80000, 1024 * kKiB},
  };
  return slots;
}

const char* DeviceName(Chip chip) {
  switch (chip) {
    case Chip::kNor: return "NOR0";
    case Chip::kNand: return "NAND0";
    case Chip::kEmmc: break;
  }
  return "EMMC0";
}

Layout::Layout()
    : nor(kNorSize, kErased),
      nand(kNandSize / kNandPage * (kNandPage + kNandOob), kErased),
      emmc(kEmmcSize, 0) {
  for (unsigned block : kBadNandBlocks)
    nand[NandFileOffset(block * kNandBlock) + kNandPage] = kBadBlockMarker;
}

bool Layout::Place(const char* partition, const char* slotName, uint64_t offset,
                   const std::vector<unsigned char>& bytes, std::string* error) {
  const Slot* slot = nullptr;
  for (const Slot& s : Slots())
    if (std::strcmp(s.partition, partition) == 0 && std::strcmp(s.slot, slotName) == 0) slot = &s;
  if (slot == nullptr || offset + bytes.size() > slot->size) {
    *error = std::string("no room for ") + std::to_string(bytes.size()) + " bytes in " + partition;
    return false;
  }
  if (slot->chip == Chip::kNor) {
    std::memcpy(&nor[slot->offset + offset], bytes.data(), bytes.size());
    return true;
  }
  if (slot->chip == Chip::kEmmc) {
    std::memcpy(&emmc[slot->offset + offset], bytes.data(), bytes.size());
    return true;
  }
  // NAND: logical offsets pass over bad blocks.
  uint64_t firstBlock = slot->offset / kNandBlock;
  uint64_t lastBlock = (slot->offset + slot->size) / kNandBlock;
  for (size_t i = 0; i < bytes.size(); ++i) {
    uint64_t logical = offset + i;
    uint64_t goodBlocksToSkip = logical / kNandBlock;
    uint64_t block = firstBlock;
    for (;; ++block) {
      if (block >= lastBlock) {
        *error = std::string("slot ") + partition + " has too few good blocks";
        return false;
      }
      if (IsBadNandBlock(block)) continue;
      if (goodBlocksToSkip == 0) break;
      --goodBlocksToSkip;
    }
    nand[NandFileOffset(block * kNandBlock + logical % kNandBlock)] = bytes[i];
  }
  return true;
}

std::string Layout::ProcMtd() const {
  std::string text = "dev:    size   erasesize  name\n";
  std::vector<std::string> lines(kLastMtd + 1);
  for (const Slot& s : Slots()) {
    if (s.mtd < 0) continue;
    uint64_t erase = s.chip == Chip::kNor ? kNorSector : s.chip == Chip::kNand ? kNandBlock : kEmmcSector;
    lines[static_cast<size_t>(s.mtd)] = "mtd" + std::to_string(s.mtd) + ": " + HexText(s.size, 8) + " " +
                                        HexText(erase, 8) + " \"" + KernelName(s) + "\"\n";
  }
  lines[kNandChipMtd] = "mtd" + std::to_string(kNandChipMtd) + ": " + HexText(kNandSize, 8) + " " +
                        HexText(kNandBlock, 8) + " \"flash1\"\n";
  lines[kNorChipMtd] = "mtd" + std::to_string(kNorChipMtd) + ": " + HexText(kNorSize, 8) + " " +
                       HexText(kNorSector, 8) + " \"flash0\"\n";
  for (const std::string& line : lines) text += line;
  return text;
}

std::vector<std::pair<std::string, std::string>> Layout::GeometryFiles() const {
  std::vector<std::pair<std::string, std::string>> files;
  files.push_back({std::string(norImageName) + ".ini",
                   "; The whole NOR chip, and the image of its slot partitions.\n"
                   "medium = nor\n"});
  files.push_back({std::string(nandImageName) + ".ini",
                   "; The whole NAND chip, and the image of its slot partitions: a dump with\n"
                   "; the OOB bytes of each page behind it (nanddump --oob). Blocks 2 and 5\n"
                   "; are marked bad in the first OOB byte of their first page.\n"
                   "medium = nand\n"
                   "writesize = " + std::to_string(kNandPage) + "\n"
                   "oobsize = " + std::to_string(kNandOob) + "\n"});
  files.push_back({"mmca.ini",
                   "; The whole eMMC device.\n"
                   "medium = emmc\n"
                   "size = " + std::to_string(kEmmcSize) + "\n"});
  for (const Slot& s : Slots()) {
    if (s.mtd < 0) continue;
    const char* image = s.chip == Chip::kNor ? norImageName : s.chip == Chip::kNand ? nandImageName : "mmca";
    files.push_back({"mtd" + std::to_string(s.mtd) + ".ini",
                     "; " + KernelName(s) + ": a window of " + image + "\n"
                     "image = " + image + "\n"
                     "offset = 0x" + HexText(s.offset, 5) + "\n"});
  }
  return files;
}

std::string Layout::MemoryMap() const {
  std::string text =
      "; Memory map of the example device: its storage devices, the partitions in\n"
      "; each (offsets in the device) and the slots in each partition (offsets in\n"
      "; the partition), with the device node that holds each slot.\n";
  const Chip chips[] = {Chip::kNor, Chip::kNand, Chip::kEmmc};
  for (Chip chip : chips) {
    const char* technology = chip == Chip::kNor ? "SPI_NOR." : chip == Chip::kNand ? "NAND...." : "EMMC....";
    uint64_t base = chip == Chip::kNor ? kNorPhysicalBase : 0;
    uint64_t size = chip == Chip::kNor ? kNorSize : chip == Chip::kNand ? kNandSize : kEmmcSize;
    text += std::string("\n[device ") + DeviceName(chip) + "]\ntechnology = " + technology + "\nbase = 0x" +
            HexText(base, 8) + "\nsize = 0x" + HexText(size, 6) + "\n";
    std::string partition;
    for (const Slot& s : Slots()) {
      if (s.chip != chip) continue;
      if (partition != s.partition) {
        partition = s.partition;
        uint64_t start = s.offset - s.partitionOffset;
        text += std::string("\n[partition ") + DeviceName(chip) + "." + s.partition + "]\noffset = 0x" +
                HexText(start, 6) + "\nsize = 0x" + HexText(s.partitionSize, 6) + "\n";
      }
      std::string node = s.chip != Chip::kEmmc ? "/dev/mtd" + std::to_string(s.mtd) : "/dev/mmca";
      text += std::string("\n[slot ") + DeviceName(chip) + "." + s.partition + "." + s.slot + "]\noffset = 0x" +
              HexText(s.partitionOffset, 6) + "\nsize = 0x" + HexText(s.size, 6) + "\nnode = " + node + "\n";
    }
  }
  return text;
}

}  // namespace example
}  // namespace stbplat
