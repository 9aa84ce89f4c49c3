// Binds an emulated device into the library through its OS seam: the seam's
// table is replaced by one whose calls answer /dev/mtdN from the images,
// send the other /dev, /proc and /sys paths under the device root, and pass
// everything else to the C library.
#include "hostsim/host_mode.h"

#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <map>
#include <memory>

#include "device_root.h"
#include "stbplat/memory_map.h"
#include "os/seam.h"

namespace stbplat {
namespace hostsim {
namespace {

// An open /dev/mtdN. The descriptor number is a real one (of /dev/null), so
// it never collides with the process's other descriptors.
struct OpenMtd {
  MtdNode* node;
  uint64_t position;
};

struct HostState {
  std::unique_ptr<DeviceRoot> device;
  std::map<int, OpenMtd> open;
  std::unique_ptr<os::ScopedSysCalls> binding;
};

HostState& State() {
  static HostState state;
  return state;
}

const os::SysCalls& Libc() { return os::LibcSysCalls(); }

OpenMtd* Lookup(int fd) {
  auto it = State().open.find(fd);
  return it == State().open.end() ? nullptr : &it->second;
}

int Fail(int error) {
  errno = error;
  return -1;
}

unsigned char MtdType(Medium medium) {
  switch (medium) {
    case Medium::kNand: return MTD_NANDFLASH;
    case Medium::kNor: return MTD_NORFLASH;
    case Medium::kEmmc: break;
  }
  return MTD_RAM;
}

unsigned int MtdFlags(Medium medium) {
  switch (medium) {
    case Medium::kNand: return MTD_CAP_NANDFLASH;
    case Medium::kNor: return MTD_CAP_NORFLASH;
    case Medium::kEmmc: break;
  }
  return MTD_CAP_RAM;
}

int HostOpen(const char* path, int flags, mode_t mode) {
  int number = MtdNumberOfPath(path);
  if (number < 0) return Libc().open(State().device->HostPath(path).c_str(), flags, mode);
  MtdNode* node = State().device->Node(number);
  if (node == nullptr) return Fail(ENOENT);
  int fd = Libc().open("/dev/null", O_RDONLY | O_CLOEXEC, 0);
  if (fd < 0) return fd;
  State().open[fd] = {node, 0};
  return fd;
}

int HostClose(int fd) {
  State().open.erase(fd);
  return Libc().close(fd);
}

off64_t HostLseek(int fd, off64_t offset, int whence) {
  OpenMtd* mtd = Lookup(fd);
  if (mtd == nullptr) return Libc().lseek64(fd, offset, whence);
  off64_t base = whence == SEEK_SET ? 0
                 : whence == SEEK_CUR ? static_cast<off64_t>(mtd->position)
                 : whence == SEEK_END ? static_cast<off64_t>(mtd->node->geometry.size)
                                      : -1;
  if (base < 0 || base + offset < 0) return Fail(EINVAL);
  mtd->position = static_cast<uint64_t>(base + offset);
  return static_cast<off64_t>(mtd->position);
}

ssize_t HostRead(int fd, void* buffer, size_t count) {
  OpenMtd* mtd = Lookup(fd);
  if (mtd == nullptr) return Libc().read(fd, buffer, count);
  const Geometry& g = mtd->node->geometry;
  if (mtd->position >= g.size) return 0;
  size_t n = count < g.size - mtd->position ? count : static_cast<size_t>(g.size - mtd->position);
  if (int error = mtd->node->image->Read(mtd->node->base + mtd->position, buffer, n)) return Fail(error);
  mtd->position += n;
  return static_cast<ssize_t>(n);
}

ssize_t HostWrite(int fd, const void* data, size_t count) {
  OpenMtd* mtd = Lookup(fd);
  if (mtd == nullptr) return Libc().write(fd, data, count);
  const Geometry& g = mtd->node->geometry;
  // The character device cuts a write at its end; only one starting there
  // fails.
  if (mtd->position >= g.size) return Fail(ENOSPC);
  count = std::min<uint64_t>(count, g.size - mtd->position);
  if (int error = mtd->node->image->Write(mtd->node->base + mtd->position, data, count))
    return Fail(error);
  mtd->position += count;
  return static_cast<ssize_t>(count);
}

int HostIoctl(int fd, unsigned long request, void* argument) {
  OpenMtd* mtd = Lookup(fd);
  if (mtd == nullptr) return Libc().ioctl(fd, request, argument);
  MtdNode& node = *mtd->node;
  const Geometry& g = node.geometry;
  switch (request) {
    case MEMGETINFO: {
      mtd_info_user info;
      std::memset(&info, 0, sizeof info);
      info.type = MtdType(g.medium);
      info.flags = MtdFlags(g.medium);
      info.size = static_cast<__u32>(g.size);
      info.erasesize = static_cast<__u32>(g.eraseSize);
      info.writesize = static_cast<__u32>(g.writeSize);
      info.oobsize = static_cast<__u32>(g.oobSize);
      std::memcpy(argument, &info, sizeof info);
      return 0;
    }
    case MEMERASE: {
      erase_info_user region;
      std::memcpy(&region, argument, sizeof region);
      if (region.start >= g.size || region.length > g.size - region.start) return Fail(EINVAL);
      if (int error = node.image->Erase(node.base + region.start, region.length)) return Fail(error);
      return 0;
    }
    case MEMGETBADBLOCK: {
      long long offset;
      std::memcpy(&offset, argument, sizeof offset);
      if (offset < 0 || static_cast<uint64_t>(offset) >= g.size) return Fail(EINVAL);
      return node.image->IsBad(node.base + static_cast<uint64_t>(offset)) ? 1 : 0;
    }
    case MEMSETBADBLOCK: {
      long long offset;
      std::memcpy(&offset, argument, sizeof offset);
      if (offset < 0 || static_cast<uint64_t>(offset) >= g.size) return Fail(EINVAL);
      if (int error = node.image->MarkBad(node.base + static_cast<uint64_t>(offset))) return Fail(error);
      return 0;
    }
    case ECCGETSTATS: {
      mtd_ecc_stats stats;
      std::memset(&stats, 0, sizeof stats);
      stats.badblocks = node.image->BadBlocksIn(node.base, g.size);
      std::memcpy(argument, &stats, sizeof stats);
      return 0;
    }
    default:
      return Fail(ENOTTY);
  }
}

FILE* HostFopen(const char* path, const char* mode) {
  int number = MtdNumberOfPath(path);
  if (number < 0) return Libc().fopen64(State().device->HostPath(path).c_str(), mode);
  // Streams over a partition only keep their position in the file (the
  // bytes move through the flash calls above), so the image itself serves.
  MtdNode* node = State().device->Node(number);
  if (node == nullptr) {
    errno = ENOENT;
    return nullptr;
  }
  return Libc().fopen64(node->image->path().c_str(), "rb");
}

FILE* HostPopen(const char*, const char*) {
  // The emulated device runs no shell tools.
  errno = ENOENT;
  return nullptr;
}

ssize_t HostReadlink(const char* path, char* buffer, size_t size) {
  return Libc().readlink(State().device->HostPath(path).c_str(), buffer, size);
}

int HostUnlink(const char* path) { return Libc().unlink(State().device->HostPath(path).c_str()); }

os::SysCalls HostTable() {
  os::SysCalls table = Libc();
  table.open = HostOpen;
  table.close = HostClose;
  table.lseek64 = HostLseek;
  table.read = HostRead;
  table.write = HostWrite;
  table.ioctl = HostIoctl;
  table.fopen64 = HostFopen;
  table.popen = HostPopen;
  table.readlink = HostReadlink;
  table.unlink = HostUnlink;
  return table;
}

}  // namespace

bool Attach(const std::string& root, std::string* error) {
  Detach();
  std::unique_ptr<DeviceRoot> device = DeviceRoot::Load(root, error);
  if (!device) return false;
  // The platform reads its memory map itself, from the host's file system.
  // Without one the device has only its MTD partitions.
  std::string map = root + "/memory-map.ini";
  if (access(map.c_str(), F_OK) != 0) {
    ExtendedMemoryMapStructure::Reset();
  } else if (!ExtendedMemoryMapStructure::Load(map.c_str(), error)) {
    return false;
  }
  State().device = std::move(device);
  State().binding.reset(new os::ScopedSysCalls(HostTable()));
  return true;
}

void Detach() {
  HostState& state = State();
  state.binding.reset();
  for (auto& entry : state.open) Libc().close(entry.first);
  state.open.clear();
  if (state.device) ExtendedMemoryMapStructure::Reset();
  state.device.reset();
}

bool IsAttached() { return State().device != nullptr; }

}  // namespace hostsim
}  // namespace stbplat
