// An emulated device bound into the library through its OS seam: /proc/mtd,
// MTD character nodes with the kernel's rules (device_node.h), eMMC block
// nodes, plain files (slot files), and /dev/mem over emulated physical
// regions. FILE* streams (fopen64) are real FILE objects made with
// fopencookie. The unit tests run it over memory with fault injection on any
// call; host mode runs it over a device's image files and passes every other
// path to the C library.
#ifndef STBPLAT_DEVMODEL_FLASH_SIM_H
#define STBPLAT_DEVMODEL_FLASH_SIM_H

#include <array>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "device_node.h"
#include "os/seam.h"
#include "sim_storage.h"

namespace stbplat {
namespace devmodel {

// Seam calls that faults can be attached to. kIoctl matches every request;
// the MTD requests can also be chosen one by one. kAny matches every call.
enum class SimCall {
  kAny, kOpen, kClose, kLseek, kRead, kWrite, kIoctl, kMemGetInfo, kMemErase, kEccGetStats,
  kMemGetBadBlock, kMemSetBadBlock, kMemReadOob, kFopen, kFclose, kFread, kFwrite, kFseek, kFgets, kMmap,
  kUnlink,
  kCount,  // the number of kinds
};

class FlashSim {
 public:
  // Binds itself through the seam for its lifetime.
  FlashSim();
  ~FlashSim();
  FlashSim(const FlashSim&) = delete;
  FlashSim& operator=(const FlashSim&) = delete;

  // /dev/mtdN and its /proc/mtd line ("mtdN: size erasesize \"name\"").
  void AddMtd(int number, const std::string& name, SimKind kind, uint64_t size,
              uint32_t eraseSize, uint32_t writeSize = 1);
  // A node at path over a store of its own (an image file), its bad blocks
  // taken from the store. Not listed in /proc/mtd until ListInProcMtd.
  DeviceNode* AddNode(const std::string& path, SimKind kind, std::unique_ptr<SimStorage> storage,
                      uint32_t eraseSize, uint32_t writeSize, uint32_t oobSize);
  void ListInProcMtd(int number, const std::string& name, uint64_t size, uint32_t eraseSize);
  // /dev/mtdN as a partition of the chip at chipPath: a window of its bytes
  // at offset, sharing its bad-block table, as the kernel's partitions do.
  // Null when there is no chip at chipPath.
  DeviceNode* AddPartition(int number, const std::string& name, const std::string& chipPath, uint64_t offset,
                           uint64_t size);
  // A read-only partition: an open for writing fails with EACCES. Every
  // descriptor keeps its access mode: a write through one opened read-only
  // fails with EBADF, MEMERASE and MEMSETBADBLOCK with EPERM.
  void SetReadOnly(const std::string& path);
  // Replaces the generated /proc/mtd text; "" with remove=true drops it.
  void SetProcMtd(const std::string& text);
  void RemoveProcMtd();
  void AddEmmc(const std::string& path, uint64_t size);
  // Makes alias reach the node at target (an MTD node over the eMMC device).
  void Alias(const std::string& alias, const std::string& target);
  void AddFile(const std::string& path, const std::vector<uint8_t>& contents);
  bool HasFile(const std::string& path) const;
  // Physical memory seen through /dev/mem.
  void AddMemory(uint64_t physBase, uint64_t size);
  uint8_t* Memory(uint64_t physAddress);

  // Direct access to a node's bytes (no rules applied).
  std::vector<uint8_t> Bytes(const std::string& path, uint64_t offset, size_t length) const;
  void Poke(const std::string& path, uint64_t offset, const std::vector<uint8_t>& data);
  void MarkBad(const std::string& path, uint64_t offset);
  bool IsBad(const std::string& path, uint64_t offset) const;
  // Every read touching the page that holds offset fails its ECC checks
  // until the page's block is erased.
  void AddEccFailure(const std::string& path, uint64_t offset);
  // Writes covering offset program up to the end of its page, then fail
  // with EIO (a weak page), until cleared.
  void FailWritesAt(const std::string& path, uint64_t offset);
  void ClearWriteFailures();
  // The chip holding path takes no write at or past offset (in path): a
  // write starting there fails with ENOSPC, one running into it is cut short.
  void FullFrom(const std::string& path, uint64_t offset);
  // The power goes after `writes` writes and erases reached the chip holding
  // path: every later one fails with EIO and changes nothing, and so does
  // every later call through the seam, whatever it is.
  void CutPowerAfter(const std::string& path, uint64_t writes);

  // Fails the nth matching call (1 = the next one), with errno = error;
  // persistent: that one and every later one.
  void FailCall(SimCall call, int nth, int error, bool persistent = false);
  void ClearFaults();
  // The calls a fault made fail, most specific kind first-come.
  const std::vector<SimCall>& FailedCalls() const { return failed_; }
  int CallCount(SimCall call) const;
  // Writes (write and MEMERASE) reaching a node, as (offset, length) pairs.
  const std::vector<std::pair<uint64_t, uint64_t>>& Writes(const std::string& path) const;
  const std::vector<std::pair<uint64_t, uint64_t>>& Erases(const std::string& path) const;
  void ClearHistory();

  // Descriptors and FILE streams currently open.
  int OpenCount() const;
  // Mappings of physical memory not yet unmapped.
  int MappingCount() const { return static_cast<int>(mappings_.size()); }
  int PageSize() const { return kPageSize; }
  // Descriptors are the lowest free number from this one on, as the kernel
  // hands them out (0 lets a test see a descriptor 0).
  void SetFirstDescriptor(int fd) { firstFd_ = fd; }
  // Host mode: a path that is no node goes to the C library, rewritten by
  // hostPath; a node's descriptor is a real one (of /dev/null), so it never
  // collides with the process's own; no write history is kept. A path that
  // hostPath moves lies in the device's own trees (its /dev, /proc, /sys),
  // which hold what was put there: an open or fopen never creates a file in
  // them (ENOENT), so a write to a node the device lacks fails.
  void PassThrough(std::function<std::string(const char*)> hostPath);

  using Node = DeviceNode;
  // An open descriptor.
  struct Handle {
    // Null for /dev/mem. An open node outlives its unlinking, as a file does.
    std::shared_ptr<Node> node;
    uint64_t position = 0;
    bool devMem = false;
    bool writable = true;
  };
  struct Fault;

  // Entry points of the bound seam table (public for the table only).
  static FlashSim* Current();
  bool Hit(SimCall call, SimCall specific = SimCall::kAny);
  Node* Find(const std::string& path);
  const Node* Find(const std::string& path) const;
  Node* Create(const std::string& path, SimKind kind, uint64_t size);
  int Open(const char* path, int flags, mode_t mode);
  int Close(int fd);
  off64_t Seek(int fd, off64_t offset, int whence);
  ssize_t Read(int fd, void* buffer, size_t count);
  ssize_t Write(int fd, const void* data, size_t count);
  int Ioctl(int fd, unsigned long request, void* argument);
  void* Map(size_t length, int protection, int flags, int fd, off64_t offset);
  bool IsEmulatedMemory(const void* address) const;
  int Unmap(void* address, size_t length);
  bool PassesThrough() const { return static_cast<bool>(hostPath_); }
  std::string HostPath(const char* path) const;
  int Unlink(const char* path);
  void FileOpened(int delta) { openFiles_ += delta; }
  std::string ProcMtdText() const;

 private:
  // A read or write through a descriptor: the fault check, the node lookup,
  // the node-level transfer and the position update they share.
  template <typename Transfer, typename PassThroughCall>
  ssize_t DescriptorTransfer(SimCall call, int fd, Transfer transfer, PassThroughCall passThrough);

  os::SysCalls table_;
  std::unique_ptr<os::ScopedSysCalls> binding_;
  std::map<std::string, std::shared_ptr<Node>> nodes_;
  std::map<int, Handle> handles_;
  std::vector<std::unique_ptr<Fault>> faults_;
  std::vector<SimCall> failed_;
  std::vector<std::shared_ptr<DeviceNode::ChipFaults>> cuts_;
  std::array<int, static_cast<size_t>(SimCall::kCount)> counts_{};
  std::map<int, std::string> procLines_;
  std::string procOverride_;
  bool hasOverride_ = false;
  bool procRemoved_ = false;
  // Physical memory, page-aligned in this process as a kernel mapping is,
  // so that a stream's page arithmetic is checked.
  struct Region {
    uint64_t base;
    uint64_t size;
    std::vector<uint8_t> storage;  // a page more than size
    uint8_t* bytes;                // the first page boundary in storage
  };
  static constexpr int kPageSize = 4096;
  std::vector<Region> memory_;
  std::multimap<const void*, size_t> mappings_;  // start, length
  int firstFd_ = 3;
  int openFiles_ = 0;
  std::function<std::string(const char*)> hostPath_;
  FlashSim* previous_;
};

}  // namespace devmodel
}  // namespace stbplat

#endif
