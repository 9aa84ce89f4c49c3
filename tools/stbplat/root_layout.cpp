#include "root_layout.h"

#include <cstdio>

#include "output.h"
#include "tool.h"

namespace stbtool {
namespace {

// /dev/mtd0 to /dev/mtd29 are all the flash layer knows.
constexpr int kMaxMtdRows = 30;
constexpr unsigned char kErasedFlash = 0xFF;
// A new eMMC holds zeros, as the bundled example does.
constexpr unsigned char kFreshEmmc = 0x00;
// eMMC rows are windows of the device in its 512-byte sectors.
constexpr unsigned long kEmmcSector = 512;
// The library's eMMC writes go in whole pages of the NAND, 2048 bytes
// without one: an eMMC slot is whole pages so that a fill ends at its end.
constexpr unsigned long kDefaultEmmcWriteUnit = 2048;
constexpr int kRowSizeDigits = 8;

struct ChipKind {
  const char* device;      // in the memory map
  const char* kernelName;  // of its whole-chip row, and the prefix of its slots' rows
  const char* technology;
};
const ChipKind kNor = {"NOR0", "flash0", "SPI_NOR."};
const ChipKind kNand = {"NAND0", "flash1", "NAND...."};
const ChipKind kEmmc = {"EMMC0", "EMMC0", "EMMC...."};

std::string HexDigits(unsigned long value, int digits) {
  char text[32];
  std::snprintf(text, sizeof text, "%0*lx", digits, value);
  return text;
}

bool PowerOfTwo(unsigned long n) { return n != 0 && (n & (n - 1)) == 0; }

void Require(bool ok, const std::string& problem) {
  if (!ok) throw UsageError("root make: " + problem + "; nothing was written");
}

class RootWriter {
 public:
  explicit RootWriter(const RootGeometry& g) : g_(g) {}

  std::map<std::string, std::string> Run() {
    CheckChips();
    memoryMap_ = "; Memory map of the device: devices, partitions (offsets in the device)\n"
                 "; and slots (offsets in the partition) with the node of each.\n";
    Chip(kNor, g_.nor, "nor");
    Chip(kNand, g_.nand, "nand");
    Chip(kEmmc, g_.emmc, "emmc");
    Require(next_ + (g_.nor.given ? 1 : 0) + (g_.nand.given ? 1 : 0) <= kMaxMtdRows,
            "more than " + std::to_string(kMaxMtdRows) + " MTD partitions");
    // The whole chips follow their slots, as the kernel lists them.
    if (g_.nand.given) ChipImage(kNand, g_.nand);
    if (g_.nor.given) ChipImage(kNor, g_.nor);
    if (g_.emmc.given) {
      files_["dev/mmca"] = std::string(g_.emmc.size, static_cast<char>(kFreshEmmc));
      files_["dev/mmca.ini"] = "; The whole eMMC device.\nmedium = emmc\nsize = " + std::to_string(g_.emmc.size) + "\n";
    }
    files_["proc/mtd"] = "dev:    size   erasesize  name\n" + procMtd_;
    files_["memory-map.ini"] = memoryMap_;
    return files_;
  }

 private:
  void CheckChips() {
    if (g_.nor.given)
      Require(g_.nor.eraseSize != 0 && g_.nor.size != 0 && g_.nor.size % g_.nor.eraseSize == 0,
              "--nor: the size must be whole sectors");
    if (g_.nand.given) {
      const ChipGeometry& n = g_.nand;
      Require(PowerOfTwo(n.eraseSize) && PowerOfTwo(n.pageSize) && n.pageSize <= n.eraseSize,
              "--nand: the block and the page must be powers of two, the page no larger than the block");
      Require(n.size != 0 && n.size % n.eraseSize == 0, "--nand: the size must be whole blocks");
    }
    if (g_.emmc.given) Require(g_.emmc.size % kEmmcSector == 0 && g_.emmc.size != 0, "--emmc: the size must be whole 512-byte sectors");
    for (const SlotGeometry& s : g_.slots) {
      const ChipGeometry* chip = s.device == kNor.device ? &g_.nor : s.device == kNand.device ? &g_.nand
                                 : s.device == kEmmc.device ? &g_.emmc : nullptr;
      Require(chip != nullptr, "--slot " + Name(s) + ": the device is NOR0, NAND0 or EMMC0");
      Require(chip->given, "--slot " + Name(s) + ": give the geometry of " + s.device);
    }
  }

  static std::string Name(const SlotGeometry& s) { return s.device + "." + s.partition + "." + s.slot; }

  unsigned long EmmcWriteUnit() const { return g_.nand.given ? g_.nand.pageSize : kDefaultEmmcWriteUnit; }

  // The memory-map sections of one chip and the rows and windows of its
  // slots, laid out one behind the other.
  void Chip(const ChipKind& kind, const ChipGeometry& chip, const char* option) {
    if (!chip.given) return;
    memoryMap_ += std::string("\n[device ") + kind.device + "]\ntechnology = " + kind.technology +
                  "\nbase = " + Hex(chip.base) + "\nsize = " + Hex(chip.size) + "\n";
    const bool emmc = &kind == &kEmmc;
    const unsigned long unit = emmc ? EmmcWriteUnit() : chip.eraseSize;
    unsigned long at = 0, partitionStart = 0;
    std::string partition, seen;
    for (size_t i = 0; i < g_.slots.size(); ++i) {
      const SlotGeometry& s = g_.slots[i];
      if (s.device != kind.device) continue;
      Require(s.size != 0 && s.size % unit == 0,
              "--slot " + Name(s) + ": the size must be whole " + Hex(unit) + "-byte " +
                  (emmc ? "eMMC write units (pages)" : "erase blocks") + " of --" + option);
      Require(s.size <= chip.size - at, "--slot " + Name(s) + ": the slots do not fit in " + kind.device);
      if (s.partition != partition) {
        Require(seen.find("|" + s.partition + "|") == std::string::npos,
                "--slot " + Name(s) + ": give the slots of a partition one after the other");
        Require(!emmc || partition.empty(),
                "--slot " + Name(s) + ": eMMC slots go in one partition (a slot's offset in it is read as its "
                "offset on the device)");
        partition = s.partition;
        seen += "|" + partition + "|";
        partitionStart = at;
        memoryMap_ += std::string("\n[partition ") + kind.device + "." + partition + "]\noffset = " + Hex(at) +
                      "\nsize = " + Hex(PartitionSize(kind, i)) + "\n";
      }
      const int mtd = next_++;
      const std::string node = "mtd" + std::to_string(mtd);
      memoryMap_ += "\n[slot " + Name(s) + "]\noffset = " + Hex(at - partitionStart) + "\nsize = " + Hex(s.size) +
                    "\nnode = /dev/" + (emmc ? std::string("mmca") : node) + "\n";
      const std::string rowName = std::string(kind.kernelName) + "." + s.partition + "." + s.slot;
      procMtd_ += node + ": " + HexDigits(s.size, kRowSizeDigits) + " " +
                  HexDigits(emmc ? kEmmcSector : chip.eraseSize, kRowSizeDigits) + " \"" + rowName + "\"\n";
      const std::string image = emmc ? "mmca" : "mtd" + std::to_string(ChipMtd(kind));
      files_["dev/" + node + ".ini"] = "; " + rowName + ": a window of " + image + "\nimage = " + image +
                                       "\noffset = " + Hex(at) + "\n";
      at += s.size;
    }
  }

  unsigned long PartitionSize(const ChipKind& kind, size_t first) const {
    unsigned long size = 0;
    for (size_t i = first; i < g_.slots.size() && g_.slots[i].device == kind.device; ++i) {
      if (g_.slots[i].partition != g_.slots[first].partition) break;
      size += g_.slots[i].size;
    }
    return size;
  }

  // The whole chips come after every slot row: NAND, then NOR.
  int ChipMtd(const ChipKind& kind) const {
    const int slots = static_cast<int>(g_.slots.size());
    if (&kind == &kNand) return slots;
    return slots + (g_.nand.given ? 1 : 0);
  }

  void ChipImage(const ChipKind& kind, const ChipGeometry& chip) {
    const int mtd = ChipMtd(kind);
    procMtd_ += "mtd" + std::to_string(mtd) + ": " + HexDigits(chip.size, kRowSizeDigits) + " " +
                HexDigits(chip.eraseSize, kRowSizeDigits) + " \"" + kind.kernelName + "\"\n";
    const std::string image = "dev/mtd" + std::to_string(mtd);
    if (&kind == &kNor) {
      files_[image] = std::string(chip.size, static_cast<char>(kErasedFlash));
      files_[image + ".ini"] = "; The whole NOR chip, and the image of its slot partitions.\nmedium = nor\n";
      return;
    }
    files_[image] = std::string(chip.size / chip.pageSize * (chip.pageSize + chip.oobSize),
                                static_cast<char>(kErasedFlash));
    files_[image + ".ini"] = "; The whole NAND chip, and the image of its slot partitions" +
                             std::string(chip.oobSize != 0 ? ", each page's OOB bytes behind it" : "") +
                             ".\nmedium = nand\nwritesize = " + std::to_string(chip.pageSize) +
                             "\noobsize = " + std::to_string(chip.oobSize) + "\n";
  }

  const RootGeometry& g_;
  std::map<std::string, std::string> files_;
  std::string procMtd_, memoryMap_;
  int next_ = 0;
};

}  // namespace

std::map<std::string, std::string> LayOutRoot(const RootGeometry& geometry) { return RootWriter(geometry).Run(); }

}  // namespace stbtool
