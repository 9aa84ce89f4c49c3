// Raw access to one MTD character node for the tool: geometry, bad blocks,
// ECC counters, page data and OOB bytes, block erases. Every call goes
// through the library's OS seam, so the kernel answers on the box and the
// emulated device in host mode. Descriptors are closed when the node object
// goes. Calls return false on failure, with the C library's error number in
// Error().
#ifndef STBPLAT_TOOLS_MTDIO_MTD_NODE_H
#define STBPLAT_TOOLS_MTDIO_MTD_NODE_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace stbplat {
namespace mtdio {

// What MEMGETINFO reports.
struct MtdGeometry {
  unsigned type = 0;  // MTD_NANDFLASH, MTD_NORFLASH, ...
  uint64_t size = 0;
  uint32_t eraseSize = 0;
  uint32_t pageSize = 0;  // the smallest write
  uint32_t oobSize = 0;
  bool writable = false;
};

// What ECCGETSTATS reports.
struct EccCounts {
  uint32_t corrected = 0;
  uint32_t failed = 0;
  uint32_t badBlocks = 0;
  uint32_t bbtBlocks = 0;
};

// A line of /proc/mtd: the kernel's own name of a partition.
struct ProcMtdRow {
  int number = 0;
  uint64_t size = 0;
  uint64_t eraseSize = 0;
  std::string name;
};

// The type's name as mtdinfo prints it ("nand", "nor", "ram", ...).
const char* MtdTypeName(unsigned type);

// The kernel's partition table; false when /proc/mtd cannot be read.
bool ReadProcMtd(std::vector<ProcMtdRow>* rows);

class MtdNode {
 public:
  MtdNode() = default;
  ~MtdNode();
  MtdNode(const MtdNode&) = delete;
  MtdNode& operator=(const MtdNode&) = delete;

  bool Open(const std::string& path, bool forWriting);
  bool GetGeometry(MtdGeometry* geometry);
  bool IsBadBlock(uint64_t offset, bool* bad);
  bool GetEccCounts(EccCounts* counts);
  // Exactly length bytes of data from offset.
  bool Read(uint64_t offset, void* data, size_t length);
  // OOB bytes of consecutive pages from the page at offset, as the kernel
  // places them (the whole area of each page, ECC bytes included).
  bool ReadOob(uint64_t offset, void* oob, size_t length);
  bool Erase(uint64_t offset, uint64_t length);
  int Error() const { return error_; }

 private:
  bool Failed();
  int fd_ = -1;
  int error_ = 0;
};

}  // namespace mtdio
}  // namespace stbplat

#endif
