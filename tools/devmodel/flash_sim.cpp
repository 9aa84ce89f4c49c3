#include "flash_sim.h"

#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <unistd.h>
#include <sys/ioctl.h>
#include <sys/mman.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

namespace stbplat {
namespace devmodel {

namespace {

constexpr const char* kProcMtdPath = "/proc/mtd";
constexpr const char* kDevMemPath = "/dev/mem";
constexpr size_t kProcLineMax = 200;
// What nandsim reports for a 2 KiB page.
constexpr uint32_t kNandOobSize = 64;

FlashSim* g_current = nullptr;

const os::SysCalls& Libc() { return os::LibcSysCalls(); }

}  // namespace

struct FlashSim::Fault {
  SimCall call;
  int nth;
  int error;
  bool persistent;
  int seen = 0;
};

namespace {

// The seam table: every entry forwards to the bound simulator.
int SimOpen(const char* path, int flags, mode_t mode) {
  return FlashSim::Current()->Open(path, flags, mode);
}
int SimClose(int fd) { return FlashSim::Current()->Close(fd); }
off64_t SimLseek(int fd, off64_t offset, int whence) {
  return FlashSim::Current()->Seek(fd, offset, whence);
}
ssize_t SimRead(int fd, void* buffer, size_t count) {
  return FlashSim::Current()->Read(fd, buffer, count);
}
ssize_t SimWrite(int fd, const void* data, size_t count) {
  return FlashSim::Current()->Write(fd, data, count);
}
int SimIoctl(int fd, unsigned long request, void* argument) {
  return FlashSim::Current()->Ioctl(fd, request, argument);
}

// FILE streams over a node (or a snapshot of /proc/mtd).
struct Cookie {
  FlashSim* sim;
  std::string path;
  uint64_t position;
  bool isText;
  std::string text;
};

ssize_t CookieRead(void* raw, char* buffer, size_t size) {
  auto* cookie = static_cast<Cookie*>(raw);
  if (cookie->isText) {
    if (cookie->position >= cookie->text.size()) return 0;
    size_t n = std::min<size_t>(size, cookie->text.size() - cookie->position);
    std::memcpy(buffer, cookie->text.data() + cookie->position, n);
    cookie->position += n;
    return static_cast<ssize_t>(n);
  }
  FlashSim::Node* node = cookie->sim->Find(cookie->path);
  if (node == nullptr) return -1;
  size_t done = 0;
  int error = node->Read(cookie->position, buffer, size, &done);
  if (error != 0) {
    errno = error;
    return -1;
  }
  cookie->position += done;
  return static_cast<ssize_t>(done);
}

ssize_t CookieWrite(void* raw, const char* data, size_t size) {
  auto* cookie = static_cast<Cookie*>(raw);
  FlashSim::Node* node = cookie->isText ? nullptr : cookie->sim->Find(cookie->path);
  if (node == nullptr) return 0;
  size_t done = 0;
  int error = node->Write(cookie->position, data, size, &done);
  if (error != 0) {
    errno = error;
    return 0;
  }
  cookie->position += done;
  return static_cast<ssize_t>(done);
}

int CookieSeek(void* raw, off64_t* offset, int whence) {
  auto* cookie = static_cast<Cookie*>(raw);
  uint64_t end = cookie->text.size();
  if (!cookie->isText) {
    FlashSim::Node* node = cookie->sim->Find(cookie->path);
    end = node == nullptr ? 0 : node->Size();
  }
  int64_t base = whence == SEEK_SET ? 0
                 : whence == SEEK_CUR ? static_cast<int64_t>(cookie->position)
                                      : static_cast<int64_t>(end);
  int64_t target = base + *offset;
  if (target < 0) {
    errno = EINVAL;
    return -1;
  }
  cookie->position = static_cast<uint64_t>(target);
  *offset = target;
  return 0;
}

int CookieClose(void* raw) {
  auto* cookie = static_cast<Cookie*>(raw);
  cookie->sim->FileOpened(-1);
  delete cookie;
  return 0;
}

FILE* SimFopen(const char* path, const char* mode) {
  FlashSim* sim = FlashSim::Current();
  if (sim->Hit(SimCall::kFopen)) return nullptr;
  std::string name(path);
  bool create = mode[0] == 'w' || mode[0] == 'a';
  auto* cookie = new Cookie{sim, name, 0, false, {}};
  if (name == kProcMtdPath) {
    std::string text = sim->ProcMtdText();
    if (text.empty() && sim->Find(kProcMtdPath) == nullptr) {
      delete cookie;
      errno = ENOENT;
      return nullptr;
    }
    cookie->isText = true;
    cookie->text = text;
  } else {
    FlashSim::Node* node = sim->Find(name);
    if (node == nullptr && sim->PassesThrough()) {
      delete cookie;
      std::string host = sim->HostPath(path);
      if (create && host != name && access(host.c_str(), F_OK) != 0) {
        errno = ENOENT;  // nothing is created in the device's own trees
        return nullptr;
      }
      return Libc().fopen64(host.c_str(), mode);
    }
    if (node == nullptr && !create) {
      delete cookie;
      errno = ENOENT;
      return nullptr;
    }
    bool writing = create || std::strchr(mode, '+') != nullptr;
    if (node != nullptr && node->readOnly && writing) {
      delete cookie;
      errno = EACCES;
      return nullptr;
    }
    if (node == nullptr) node = sim->Create(name, SimKind::kFile, 0);
    if (mode[0] == 'w' && node->kind == SimKind::kFile) node->storage->Resize(0);
  }
  cookie_io_functions_t functions{CookieRead, CookieWrite, CookieSeek, CookieClose};
  FILE* file = fopencookie(cookie, mode, functions);
  if (file == nullptr) {
    delete cookie;
    return nullptr;
  }
  sim->FileOpened(1);
  return file;
}

int SimFclose(FILE* file) {
  FlashSim::Current()->Hit(SimCall::kFclose);
  return std::fclose(file);
}
size_t SimFread(void* buffer, size_t size, size_t count, FILE* file) {
  if (FlashSim::Current()->Hit(SimCall::kFread)) return 0;
  return std::fread(buffer, size, count, file);
}
size_t SimFwrite(const void* data, size_t size, size_t count, FILE* file) {
  if (FlashSim::Current()->Hit(SimCall::kFwrite)) return 0;
  size_t written = std::fwrite(data, size, count, file);
  std::fflush(file);  // the node sees every write at once, as O_SYNC would
  return written;
}
int SimFseek(FILE* file, long offset, int whence) {
  if (FlashSim::Current()->Hit(SimCall::kFseek)) return -1;
  return std::fseek(file, offset, whence);
}
long SimFtell(FILE* file) { return std::ftell(file); }
char* SimFgets(char* buffer, int size, FILE* file) {
  if (FlashSim::Current()->Hit(SimCall::kFgets)) return nullptr;
  return std::fgets(buffer, size, file);
}
int SimFerror(FILE* file) { return std::ferror(file); }
// The emulated device runs no shell tools.
FILE* SimPopen(const char*, const char*) {
  errno = ENOENT;
  return nullptr;
}
int SimPclose(FILE*) { return -1; }
void* SimMmap(void*, size_t length, int protection, int flags, int fd, off64_t offset) {
  return FlashSim::Current()->Map(length, protection, flags, fd, offset);
}
int SimMunmap(void* address, size_t length) {
  FlashSim* sim = FlashSim::Current();
  if (sim->PassesThrough() && !sim->IsEmulatedMemory(address)) return Libc().munmap(address, length);
  return sim->Unmap(address, length);
}
int SimPageSize();
ssize_t SimReadlink(const char* path, char* buffer, size_t size) {
  FlashSim* sim = FlashSim::Current();
  if (sim->PassesThrough()) return Libc().readlink(sim->HostPath(path).c_str(), buffer, size);
  errno = ENOENT;
  return -1;
}
int SimUnlink(const char* path) { return FlashSim::Current()->Unlink(path); }
unsigned int SimSleep(unsigned int seconds) {
  return FlashSim::Current()->PassesThrough() ? Libc().sleep(seconds) : 0;
}

}  // namespace

FlashSim* FlashSim::Current() { return g_current; }

FlashSim::FlashSim() : previous_(g_current) {
  table_ = os::SysCalls{SimOpen,  SimClose,  SimLseek, SimRead,   SimWrite,    SimIoctl,
                        SimFopen, SimFclose, SimFread, SimFwrite, SimFseek,    SimFtell,
                        SimFgets, SimFerror, SimPopen, SimPclose, SimMmap,     SimMunmap,
                        SimPageSize, SimReadlink, SimUnlink, SimSleep};
  g_current = this;
  binding_ = std::make_unique<os::ScopedSysCalls>(table_);
}

FlashSim::~FlashSim() {
  binding_.reset();
  if (PassesThrough())
    for (const auto& handle : handles_) Libc().close(handle.first);
  g_current = previous_;
}

namespace {
int SimPageSize() {
  FlashSim* sim = FlashSim::Current();
  return sim->PassesThrough() ? Libc().getpagesize() : sim->PageSize();
}
}  // namespace


bool FlashSim::Hit(SimCall call, SimCall specific) {
  ++counts_[static_cast<size_t>(call)];
  if (specific != SimCall::kAny) ++counts_[static_cast<size_t>(specific)];
  ++counts_[static_cast<size_t>(SimCall::kAny)];
  // Every matching fault counts the call, whichever of them fires.
  bool fire = false;
  int error = 0;
  for (const auto& cut : cuts_)
    if (cut->PowerGone()) {
      fire = true;
      error = EIO;
    }
  for (auto& fault : faults_) {
    if (fault->call != SimCall::kAny && fault->call != call && fault->call != specific) continue;
    ++fault->seen;
    if (!fire && (fault->seen == fault->nth || (fault->persistent && fault->seen > fault->nth))) {
      fire = true;
      error = fault->error;
    }
  }
  if (fire) {
    errno = error;
    failed_.push_back(specific != SimCall::kAny ? specific : call);
  }
  return fire;
}

FlashSim::Node* FlashSim::Find(const std::string& path) {
  auto it = nodes_.find(path);
  return it == nodes_.end() ? nullptr : it->second.get();
}

const FlashSim::Node* FlashSim::Find(const std::string& path) const {
  auto it = nodes_.find(path);
  return it == nodes_.end() ? nullptr : it->second.get();
}

FlashSim::Node* FlashSim::Create(const std::string& path, SimKind kind, uint64_t size) {
  auto node = std::make_shared<Node>();
  node->kind = kind;
  node->storage = MakeMemoryStorage(size, kind == SimKind::kFile ? 0 : kErasedByte);
  node->recordHistory = !PassesThrough();
  Node* raw = node.get();
  nodes_[path] = std::move(node);
  return raw;
}

DeviceNode* FlashSim::AddNode(const std::string& path, SimKind kind, std::unique_ptr<SimStorage> storage,
                              uint32_t eraseSize, uint32_t writeSize, uint32_t oobSize) {
  Node* node = Create(path, kind, 0);
  node->storage = std::move(storage);
  node->eraseSize = eraseSize;
  node->writeSize = writeSize;
  node->oobSize = oobSize;
  node->LoadBadBlocks();
  return node;
}

void FlashSim::ListInProcMtd(int number, const std::string& name, uint64_t size, uint32_t eraseSize) {
  char line[kProcLineMax];
  std::snprintf(line, sizeof line, "mtd%d: %08llx %08x \"%s\"\n", number, static_cast<unsigned long long>(size),
                eraseSize, name.c_str());
  procLines_[number] = line;
}

void FlashSim::PassThrough(std::function<std::string(const char*)> hostPath) {
  hostPath_ = std::move(hostPath);
}

std::string FlashSim::HostPath(const char* path) const { return hostPath_(path); }

void FlashSim::AddMtd(int number, const std::string& name, SimKind kind, uint64_t size,
                      uint32_t eraseSize, uint32_t writeSize) {
  Node* node = Create("/dev/mtd" + std::to_string(number), kind, size);
  node->eraseSize = eraseSize;
  node->writeSize = writeSize;
  node->oobSize = kind == SimKind::kNand ? kNandOobSize : 0;
  ListInProcMtd(number, name, size, eraseSize);
}

DeviceNode* FlashSim::AddPartition(int number, const std::string& name, const std::string& chipPath,
                                   uint64_t offset, uint64_t size) {
  auto it = nodes_.find(chipPath);
  if (it == nodes_.end()) return nullptr;
  std::shared_ptr<Node> chip = it->second;
  auto node = std::make_shared<Node>();
  node->kind = chip->kind;
  node->eraseSize = chip->eraseSize;
  node->writeSize = chip->writeSize;
  node->oobSize = chip->oobSize;
  node->recordHistory = chip->recordHistory;
  node->storage = MakeWindowStorage(*chip->storage, offset, size);
  node->chip = chip;
  node->badBlocks = chip->badBlocks;
  node->eccFailures = chip->eccFailures;
  node->faults = chip->faults;
  node->chipOffset = chip->chipOffset + offset;
  node->LoadBadBlocks();
  nodes_["/dev/mtd" + std::to_string(number)] = node;
  ListInProcMtd(number, name, size, chip->eraseSize);
  return node.get();
}

void FlashSim::SetReadOnly(const std::string& path) {
  Node* node = Find(path);
  if (node != nullptr) node->readOnly = true;
}

void FlashSim::SetProcMtd(const std::string& text) {
  procOverride_ = text;
  hasOverride_ = true;
  procRemoved_ = false;
}

void FlashSim::RemoveProcMtd() { procRemoved_ = true; }

std::string FlashSim::ProcMtdText() const {
  if (procRemoved_) return std::string();
  if (hasOverride_) return procOverride_;
  std::string text = "dev:    size   erasesize  name\n";
  for (const auto& line : procLines_) text += line.second;
  return text;
}

void FlashSim::AddEmmc(const std::string& path, uint64_t size) {
  Create(path, SimKind::kEmmc, size);
}

void FlashSim::AddFile(const std::string& path, const std::vector<uint8_t>& contents) {
  Node* node = Create(path, SimKind::kFile, contents.size());
  node->storage->Write(0, contents.data(), contents.size());
}

void FlashSim::Alias(const std::string& alias, const std::string& target) {
  auto it = nodes_.find(target);
  if (it != nodes_.end()) nodes_[alias] = it->second;
}

bool FlashSim::HasFile(const std::string& path) const { return Find(path) != nullptr; }

void FlashSim::AddMemory(uint64_t physBase, uint64_t size) {
  Region region{physBase, size, std::vector<uint8_t>(size + kPageSize, 0), nullptr};
  const auto at = reinterpret_cast<uintptr_t>(region.storage.data());
  region.bytes = region.storage.data() + (kPageSize - at % kPageSize) % kPageSize;
  memory_.push_back(std::move(region));
}

bool FlashSim::IsEmulatedMemory(const void* address) const {
  for (const Region& region : memory_) {
    const uint8_t* at = static_cast<const uint8_t*>(address);
    if (at >= region.bytes && at < region.bytes + region.size) return true;
  }
  return false;
}

uint8_t* FlashSim::Memory(uint64_t physAddress) {
  for (Region& region : memory_)
    if (physAddress >= region.base && physAddress - region.base < region.size)
      return region.bytes + (physAddress - region.base);
  return nullptr;
}

std::vector<uint8_t> FlashSim::Bytes(const std::string& path, uint64_t offset,
                                     size_t length) const {
  std::vector<uint8_t> bytes(length);
  const Node* node = Find(path);
  if (node != nullptr && offset + length <= node->storage->Size())
    node->storage->Read(offset, bytes.data(), length);
  return bytes;
}

void FlashSim::Poke(const std::string& path, uint64_t offset, const std::vector<uint8_t>& data) {
  Node* node = Find(path);
  if (node == nullptr) return;
  if (offset + data.size() > node->storage->Size()) node->storage->Resize(offset + data.size());
  node->storage->Write(offset, data.data(), data.size());
}

void FlashSim::MarkBad(const std::string& path, uint64_t offset) {
  Node* node = Find(path);
  if (node != nullptr) node->AddBad(offset, false);
}

bool FlashSim::IsBad(const std::string& path, uint64_t offset) const {
  const Node* node = Find(path);
  return node != nullptr && node->IsBadBlock(offset);
}

void FlashSim::AddEccFailure(const std::string& path, uint64_t offset) {
  Node* node = Find(path);
  if (node != nullptr) node->AddEccFailure(offset);
}

void FlashSim::FailWritesAt(const std::string& path, uint64_t offset) {
  Node* node = Find(path);
  if (node != nullptr) node->faults->weakPages.insert(node->chipOffset + offset);
}

void FlashSim::ClearWriteFailures() {
  for (auto& entry : nodes_) entry.second->faults->weakPages.clear();
}

void FlashSim::FullFrom(const std::string& path, uint64_t offset) {
  Node* node = Find(path);
  if (node != nullptr) node->faults->fullFrom = node->chipOffset + offset;
}

void FlashSim::CutPowerAfter(const std::string& path, uint64_t writes) {
  Node* node = Find(path);
  if (node == nullptr) return;
  node->faults->powerCut = writes;
  cuts_.push_back(node->faults);
}

void FlashSim::FailCall(SimCall call, int nth, int error, bool persistent) {
  faults_.push_back(std::make_unique<Fault>(Fault{call, nth, error, persistent, 0}));
}

void FlashSim::ClearFaults() { faults_.clear(); }

int FlashSim::CallCount(SimCall call) const {
  return counts_[static_cast<size_t>(call)];
}

const std::vector<std::pair<uint64_t, uint64_t>>& FlashSim::Writes(const std::string& path) const {
  static const std::vector<std::pair<uint64_t, uint64_t>> kNone;
  const Node* node = Find(path);
  return node == nullptr ? kNone : node->writes;
}

const std::vector<std::pair<uint64_t, uint64_t>>& FlashSim::Erases(const std::string& path) const {
  static const std::vector<std::pair<uint64_t, uint64_t>> kNone;
  const Node* node = Find(path);
  return node == nullptr ? kNone : node->erases;
}

void FlashSim::ClearHistory() {
  for (auto& entry : nodes_) {
    entry.second->writes.clear();
    entry.second->erases.clear();
  }
  counts_.fill(0);
}

int FlashSim::OpenCount() const { return static_cast<int>(handles_.size()) + openFiles_; }

int FlashSim::Open(const char* path, int flags, mode_t mode) {
  if (Hit(SimCall::kOpen)) return -1;
  // The library opens a node around every transfer: one lookup of the node,
  // and the descriptor kept in the table itself.
  std::string name(path);
  auto found = nodes_.find(name);
  bool devMem = name == kDevMemPath && !(PassesThrough() && memory_.empty());
  if (found == nodes_.end() && !devMem && PassesThrough()) {
    std::string host = HostPath(path);
    if (host != name) flags &= ~O_CREAT;  // nothing is created in the device's own trees
    return Libc().open(host.c_str(), flags, mode);
  }
  Handle handle;
  if (devMem) {
    handle.devMem = true;
  } else {
    if (found == nodes_.end() && (flags & O_CREAT) == 0) {
      errno = ENOENT;
      return -1;
    }
    // A read-only MTD partition refuses an open for writing, as the kernel's.
    if (found != nodes_.end() && found->second->readOnly && (flags & O_ACCMODE) != O_RDONLY) {
      errno = EACCES;
      return -1;
    }
    if (found == nodes_.end()) {
      Create(name, SimKind::kFile, 0);
      found = nodes_.find(name);
    }
    handle.node = found->second;
    handle.writable = (flags & O_ACCMODE) != O_RDONLY;
  }
  int fd = firstFd_;
  if (PassesThrough()) {
    fd = Libc().open("/dev/null", O_RDONLY | O_CLOEXEC, 0);
    if (fd < 0) return fd;
  }
  while (handles_.count(fd) != 0) ++fd;
  handles_.emplace(fd, std::move(handle));
  return fd;
}

int FlashSim::Close(int fd) {
  bool failed = Hit(SimCall::kClose);
  if (PassesThrough()) {
    handles_.erase(fd);
    return Libc().close(fd);
  }
  if (handles_.erase(fd) == 0) {
    errno = EBADF;
    return -1;
  }
  // A failing close still releases the descriptor, as on Linux.
  return failed ? -1 : 0;
}

off64_t FlashSim::Seek(int fd, off64_t offset, int whence) {
  if (Hit(SimCall::kLseek)) return -1;
  auto it = handles_.find(fd);
  if (it == handles_.end() && PassesThrough()) return Libc().lseek64(fd, offset, whence);
  if (it == handles_.end()) {
    errno = EBADF;
    return -1;
  }
  Node* node = it->second.node.get();
  uint64_t size = node == nullptr ? 0 : node->Size();
  int64_t base = whence == SEEK_SET ? 0
                 : whence == SEEK_CUR ? static_cast<int64_t>(it->second.position)
                                      : static_cast<int64_t>(size);
  int64_t target = base + offset;
  // The MTD character device refuses positions past its end.
  if (target < 0 || (node != nullptr && node->IsMtd() && static_cast<uint64_t>(target) > size)) {
    errno = EINVAL;
    return -1;
  }
  it->second.position = static_cast<uint64_t>(target);
  return target;
}

template <typename Transfer, typename PassThroughCall>
ssize_t FlashSim::DescriptorTransfer(SimCall call, int fd, Transfer transfer, PassThroughCall passThrough) {
  if (Hit(call)) return -1;
  auto it = handles_.find(fd);
  if (it == handles_.end() && PassesThrough()) return passThrough();
  Node* node = it == handles_.end() ? nullptr : it->second.node.get();
  if (node == nullptr) {
    errno = EBADF;
    return -1;
  }
  size_t done = 0;
  int error = transfer(*node, it->second.position, &done);
  if (error != 0) {
    errno = error;
    return -1;
  }
  it->second.position += done;
  return static_cast<ssize_t>(done);
}

ssize_t FlashSim::Read(int fd, void* buffer, size_t count) {
  return DescriptorTransfer(
      SimCall::kRead, fd,
      [&](Node& node, uint64_t position, size_t* done) { return node.Read(position, buffer, count, done); },
      [&] { return Libc().read(fd, buffer, count); });
}

ssize_t FlashSim::Write(int fd, const void* data, size_t count) {
  auto it = handles_.find(fd);
  if (it != handles_.end() && !it->second.writable) {
    errno = EBADF;
    return -1;
  }
  return DescriptorTransfer(
      SimCall::kWrite, fd,
      [&](Node& node, uint64_t position, size_t* done) { return node.Write(position, data, count, done); },
      [&] { return Libc().write(fd, data, count); });
}

int FlashSim::Ioctl(int fd, unsigned long request, void* argument) {
  SimCall specific = request == MEMGETINFO        ? SimCall::kMemGetInfo
                     : request == MEMERASE        ? SimCall::kMemErase
                     : request == MEMERASE64      ? SimCall::kMemErase
                     : request == MEMREADOOB      ? SimCall::kMemReadOob
                     : request == MEMREADOOB64    ? SimCall::kMemReadOob
                     : request == ECCGETSTATS     ? SimCall::kEccGetStats
                     : request == MEMGETBADBLOCK  ? SimCall::kMemGetBadBlock
                     : request == MEMSETBADBLOCK  ? SimCall::kMemSetBadBlock
                                                  : SimCall::kAny;
  if (Hit(SimCall::kIoctl, specific)) return -1;
  auto it = handles_.find(fd);
  if (it == handles_.end() && PassesThrough()) return Libc().ioctl(fd, request, argument);
  Node* node = it == handles_.end() ? nullptr : it->second.node.get();
  if (node == nullptr || !node->IsMtd()) {
    errno = node == nullptr ? EBADF : ENOTTY;
    return -1;
  }
  // Requests that change the device need a descriptor open for writing.
  if ((specific == SimCall::kMemErase || specific == SimCall::kMemSetBadBlock) && !it->second.writable) {
    errno = EPERM;
    return -1;
  }
  int error = 0;
  switch (specific) {
    case SimCall::kMemGetInfo:
      *static_cast<mtd_info_user*>(argument) = node->Info();
      return 0;
    case SimCall::kEccGetStats:
      *static_cast<mtd_ecc_stats*>(argument) = node->Stats();
      return 0;
    case SimCall::kMemErase: {
      if (request == MEMERASE64) {
        const auto* region = static_cast<const erase_info_user64*>(argument);
        error = node->Erase(region->start, region->length);
      } else {
        const auto* region = static_cast<const erase_info_user*>(argument);
        error = node->Erase(region->start, region->length);
      }
      break;
    }
    case SimCall::kMemReadOob:
      // The kernel answers with the count read in the request's length.
      if (request == MEMREADOOB64) {
        auto* request64 = static_cast<mtd_oob_buf64*>(argument);
        error = node->ReadOob(request64->start, reinterpret_cast<void*>(request64->usr_ptr), request64->length);
      } else {
        auto* request32 = static_cast<mtd_oob_buf*>(argument);
        error = node->ReadOob(request32->start, request32->ptr, request32->length);
      }
      break;
    case SimCall::kMemGetBadBlock: {
      bool bad = false;
      error = node->GetBadBlock(static_cast<uint64_t>(*static_cast<const loff_t*>(argument)), &bad);
      if (error == 0) return bad ? 1 : 0;
      break;
    }
    case SimCall::kMemSetBadBlock:
      error = node->SetBadBlock(static_cast<uint64_t>(*static_cast<const loff_t*>(argument)));
      break;
    default:
      error = ENOTTY;
  }
  if (error == 0) return 0;
  errno = error;
  return -1;
}

void* FlashSim::Map(size_t length, int protection, int flags, int fd, off64_t offset) {
  if (Hit(SimCall::kMmap)) return MAP_FAILED;
  auto it = handles_.find(fd);
  if (it == handles_.end() && PassesThrough())
    return Libc().mmap64(nullptr, length, protection, flags, fd, offset);
  if (it == handles_.end() || !it->second.devMem) {
    errno = EBADF;
    return MAP_FAILED;
  }
  uint64_t start = static_cast<uint64_t>(offset);
  if (start % kPageSize != 0) {  // the kernel maps whole pages only
    errno = EINVAL;
    return MAP_FAILED;
  }
  for (Region& region : memory_) {
    if (start < region.base || start - region.base + length > region.size) continue;
    uint8_t* mapped = region.bytes + (start - region.base);
    mappings_.emplace(mapped, length);
    return mapped;
  }
  errno = EINVAL;
  return MAP_FAILED;
}

// An unmap must name a mapping's start and its length in pages: anything
// else leaves part of it mapped, or unmaps what is not the stream's.
int FlashSim::Unmap(void* address, size_t length) {
  auto pages = [](size_t bytes) { return (bytes + kPageSize - 1) / kPageSize; };
  auto range = mappings_.equal_range(address);
  for (auto it = range.first; it != range.second; ++it) {
    if (pages(it->second) != pages(length)) continue;
    mappings_.erase(it);
    return 0;
  }
  errno = EINVAL;
  return -1;
}

int FlashSim::Unlink(const char* path) {
  if (Hit(SimCall::kUnlink)) return -1;
  if (Find(path) == nullptr && PassesThrough()) return Libc().unlink(HostPath(path).c_str());
  if (nodes_.erase(path) == 0) {
    errno = ENOENT;
    return -1;
  }
  return 0;
}

}  // namespace devmodel
}  // namespace stbplat
