#include "support/flash_sim.h"

#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>
#include <sys/mman.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

namespace stbplat {
namespace test {

namespace {

constexpr uint8_t kErased = 0xFF;
// The NAND driver checks ECC in steps of this many bytes; an unreadable
// page counts one failure per step.
constexpr uint32_t kEccStep = 256;
constexpr const char* kProcMtdPath = "/proc/mtd";
constexpr const char* kDevMemPath = "/dev/mem";

class MemoryStorage : public SimStorage {
 public:
  MemoryStorage(uint64_t size, uint8_t fill) : bytes_(size, fill) {}
  uint64_t Size() const override { return bytes_.size(); }
  void Read(uint64_t offset, void* buffer, size_t length) const override {
    if (length != 0) std::memcpy(buffer, bytes_.data() + offset, length);
  }
  void Write(uint64_t offset, const void* data, size_t length) override {
    if (length != 0) std::memcpy(bytes_.data() + offset, data, length);
  }
  void Resize(uint64_t size) override { bytes_.resize(size, 0); }

 private:
  std::vector<uint8_t> bytes_;
};

// A partition: a window of its chip's bytes.
class WindowStorage : public SimStorage {
 public:
  WindowStorage(std::shared_ptr<FlashSim::Node> chip, SimStorage& bytes, uint64_t offset, uint64_t size)
      : chip_(std::move(chip)), bytes_(bytes), offset_(offset), size_(size) {}
  uint64_t Size() const override { return size_; }
  void Read(uint64_t offset, void* buffer, size_t length) const override {
    bytes_.Read(offset_ + offset, buffer, length);
  }
  void Write(uint64_t offset, const void* data, size_t length) override {
    bytes_.Write(offset_ + offset, data, length);
  }
  void Resize(uint64_t) override {}

 private:
  std::shared_ptr<FlashSim::Node> chip_;  // keeps the bytes alive
  SimStorage& bytes_;
  uint64_t offset_, size_;
};

FlashSim* g_current = nullptr;

}  // namespace

std::unique_ptr<SimStorage> MakeMemoryStorage(uint64_t size, uint8_t fill) {
  return std::make_unique<MemoryStorage>(size, fill);
}

struct FlashSim::Node {
  SimKind kind;
  uint32_t eraseSize = 0;
  uint32_t writeSize = 1;
  std::unique_ptr<SimStorage> storage;
  // Block start offsets in the chip; the partitions of a chip share it.
  std::shared_ptr<std::set<uint64_t>> badBlocks = std::make_shared<std::set<uint64_t>>();
  uint64_t chipOffset = 0;
  bool readOnly = false;
  std::set<uint64_t> eccFailures;
  std::set<uint64_t> weakOffsets;
  uint32_t eccFailed = 0;
  // What ECCGETSTATS reports: the partition counts every successful
  // MEMSETBADBLOCK, a block marked twice included.
  uint32_t badBlockCount = 0;
  uint32_t garbageReads = 0;
  std::vector<std::pair<uint64_t, uint64_t>> writes;
  std::vector<std::pair<uint64_t, uint64_t>> erases;
  bool isMtd() const { return kind == SimKind::kNor || kind == SimKind::kNand; }
  uint64_t BlockOf(uint64_t offset) const {
    return eraseSize == 0 ? offset : offset - offset % eraseSize;
  }
  uint64_t PageOf(uint64_t offset) const { return offset - offset % writeSize; }
  uint32_t EccSteps() const { return std::max<uint32_t>(1, writeSize / kEccStep); }
  bool IsBadBlock(uint64_t offset) const { return badBlocks->count(chipOffset + BlockOf(offset)) != 0; }
  void AddBad(uint64_t offset, bool countAgain) {
    bool added = badBlocks->insert(chipOffset + BlockOf(offset)).second;
    if (added || countAgain) ++badBlockCount;
  }
};

struct FlashSim::Handle {
  std::string path;  // empty for /dev/mem
  uint64_t position = 0;
  bool devMem = false;
  bool writable = true;
};

struct FlashSim::Fault {
  SimCall call;
  int nth;
  int error;
  bool persistent;
  int seen = 0;
};

namespace {

// The seam table: every entry forwards to the bound simulator.
int SimOpen(const char* path, int flags, mode_t) { return FlashSim::Current()->Open(path, flags); }
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
  int error = cookie->sim->NodeRead(*node, cookie->position, buffer, size, &done);
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
  int error = cookie->sim->NodeWrite(*node, cookie->position, data, size, &done);
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
    end = node == nullptr ? 0 : node->storage->Size();
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
FILE* SimPopen(const char*, const char*) {
  errno = ENOENT;
  return nullptr;
}
int SimPclose(FILE*) { return -1; }
void* SimMmap(void*, size_t length, int, int, int fd, off64_t offset) {
  return FlashSim::Current()->Map(length, fd, offset);
}
int SimMunmap(void*, size_t) { return 0; }
int SimPageSize();
ssize_t SimReadlink(const char*, char*, size_t) {
  errno = ENOENT;
  return -1;
}
int SimUnlink(const char* path) { return FlashSim::Current()->Unlink(path); }
unsigned int SimSleep(unsigned int) { return 0; }

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
  g_current = previous_;
}

namespace {
int SimPageSize() { return FlashSim::Current()->PageSize(); }
}  // namespace


bool FlashSim::Hit(SimCall call, SimCall specific) {
  ++counts_[call];
  if (specific != SimCall::kAny) ++counts_[specific];
  ++counts_[SimCall::kAny];
  // Every matching fault counts the call, whichever of them fires.
  bool fire = false;
  int error = 0;
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
  node->storage = MakeMemoryStorage(size, kind == SimKind::kFile ? 0 : kErased);
  Node* raw = node.get();
  nodes_[path] = std::move(node);
  return raw;
}

void FlashSim::AddMtd(int number, const std::string& name, SimKind kind, uint64_t size,
                      uint32_t eraseSize, uint32_t writeSize) {
  Node* node = Create("/dev/mtd" + std::to_string(number), kind, size);
  node->eraseSize = eraseSize;
  node->writeSize = writeSize;
  char line[200];
  std::snprintf(line, sizeof line, "mtd%d: %08llx %08x \"%s\"\n", number,
                static_cast<unsigned long long>(size), eraseSize, name.c_str());
  procLines_[number] = line;
}

void FlashSim::AddPartition(int number, const std::string& name, const std::string& chipPath,
                            uint64_t offset, uint64_t size) {
  auto it = nodes_.find(chipPath);
  if (it == nodes_.end()) return;
  std::shared_ptr<Node> chip = it->second;
  auto node = std::make_shared<Node>();
  node->kind = chip->kind;
  node->eraseSize = chip->eraseSize;
  node->writeSize = chip->writeSize;
  node->storage = std::make_unique<WindowStorage>(chip, *chip->storage, offset, size);
  node->badBlocks = chip->badBlocks;
  node->chipOffset = chip->chipOffset + offset;
  nodes_["/dev/mtd" + std::to_string(number)] = node;
  char line[200];
  std::snprintf(line, sizeof line, "mtd%d: %08llx %08x \"%s\"\n", number, static_cast<unsigned long long>(size),
                chip->eraseSize, name.c_str());
  procLines_[number] = line;
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
  memory_.push_back(Region{physBase, std::vector<uint8_t>(size, 0)});
}

uint8_t* FlashSim::Memory(uint64_t physAddress) {
  for (Region& region : memory_)
    if (physAddress >= region.base && physAddress - region.base < region.bytes.size())
      return region.bytes.data() + (physAddress - region.base);
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
  if (node != nullptr) node->eccFailures.insert(offset);
}

void FlashSim::FailWritesAt(const std::string& path, uint64_t offset) {
  Node* node = Find(path);
  if (node != nullptr) node->weakOffsets.insert(offset);
}

void FlashSim::ClearWriteFailures() {
  for (auto& entry : nodes_) entry.second->weakOffsets.clear();
}

void FlashSim::FailCall(SimCall call, int nth, int error, bool persistent) {
  faults_.push_back(std::make_unique<Fault>(Fault{call, nth, error, persistent, 0}));
}

void FlashSim::ClearFaults() { faults_.clear(); }

int FlashSim::CallCount(SimCall call) const {
  auto it = counts_.find(call);
  return it == counts_.end() ? 0 : it->second;
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
  counts_.clear();
}

int FlashSim::OpenCount() const { return static_cast<int>(handles_.size()) + openFiles_; }

int FlashSim::Open(const char* path, int flags) {
  if (Hit(SimCall::kOpen)) return -1;
  std::string name(path);
  auto handle = std::make_unique<Handle>();
  if (name == kDevMemPath) {
    handle->devMem = true;
  } else {
    Node* node = Find(name);
    if (node == nullptr && (flags & O_CREAT) == 0) {
      errno = ENOENT;
      return -1;
    }
    // A read-only MTD partition refuses an open for writing, as the kernel's.
    if (node != nullptr && node->readOnly && (flags & O_ACCMODE) != O_RDONLY) {
      errno = EACCES;
      return -1;
    }
    if (node == nullptr) Create(name, SimKind::kFile, 0);
    handle->path = name;
    handle->writable = (flags & O_ACCMODE) != O_RDONLY;
  }
  int fd = firstFd_;
  while (handles_.count(fd) != 0) ++fd;
  handles_[fd] = std::move(handle);
  return fd;
}

int FlashSim::Close(int fd) {
  bool failed = Hit(SimCall::kClose);
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
  if (it == handles_.end()) {
    errno = EBADF;
    return -1;
  }
  Node* node = Find(it->second->path);
  uint64_t size = node == nullptr ? 0 : node->storage->Size();
  int64_t base = whence == SEEK_SET ? 0
                 : whence == SEEK_CUR ? static_cast<int64_t>(it->second->position)
                                      : static_cast<int64_t>(size);
  int64_t target = base + offset;
  // The MTD character device refuses positions past its end.
  if (target < 0 || (node != nullptr && node->isMtd() && static_cast<uint64_t>(target) > size)) {
    errno = EINVAL;
    return -1;
  }
  it->second->position = static_cast<uint64_t>(target);
  return target;
}

int FlashSim::NodeRead(Node& node, uint64_t offset, void* buffer, size_t count, size_t* done) {
  uint64_t size = node.storage->Size();
  *done = 0;
  if (offset >= size) return 0;
  size_t n = static_cast<size_t>(std::min<uint64_t>(count, size - offset));
  node.storage->Read(offset, buffer, n);
  // The driver reads whole pages: a failing page counts once per ECC step
  // however little of it was asked for, and its bytes come back scrambled.
  std::set<uint64_t> failedPages;
  for (uint64_t failure : node.eccFailures)
    if (node.PageOf(failure) < offset + n && node.PageOf(failure) + node.writeSize > offset)
      failedPages.insert(node.PageOf(failure));
  auto* bytes = static_cast<uint8_t*>(buffer);
  for (uint64_t page : failedPages) {
    node.eccFailed += node.EccSteps();
    uint32_t state = static_cast<uint32_t>(page) ^ (++node.garbageReads * 0x9E3779B9u);
    uint64_t from = std::max(page, offset);
    uint64_t to = std::min<uint64_t>(page + node.writeSize, offset + n);
    for (uint64_t at = from; at < to; ++at) {
      state = state * 1103515245u + 12345u;
      // Never 0, so every byte differs from what was programmed.
      bytes[at - offset] ^= static_cast<uint8_t>(1 + (state >> 16) % 255);
    }
  }
  *done = n;
  return 0;
}

int FlashSim::NodeWrite(Node& node, uint64_t offset, const void* data, size_t count,
                        size_t* done) {
  *done = 0;
  uint64_t size = node.storage->Size();
  if (node.kind == SimKind::kFile) {
    if (offset + count > size) node.storage->Resize(offset + count);
    node.storage->Write(offset, data, count);
    node.writes.emplace_back(offset, count);
    *done = count;
    return 0;
  }
  // A device takes what fits before its end; only a write starting there
  // fails.
  if (offset >= size) return ENOSPC;
  count = static_cast<size_t>(std::min<uint64_t>(count, size - offset));
  if (node.kind == SimKind::kNand &&
      (offset % node.writeSize != 0 || count % node.writeSize != 0))
    return EINVAL;
  // A weak page fails the write after the pages before it and the page
  // itself were programmed.
  size_t programmed = count;
  bool weakPage = false;
  for (uint64_t weak : node.weakOffsets) {
    if (weak < offset || weak >= offset + count) continue;
    weakPage = true;
    programmed = std::min<size_t>(programmed, node.PageOf(weak) + node.writeSize - offset);
  }
  const auto* bytes = static_cast<const uint8_t*>(data);
  if (node.isMtd()) {
    // Flash cells only go from 1 to 0; the MTD layer does not consult the
    // bad-block table on writes.
    std::vector<uint8_t> cells(programmed);
    node.storage->Read(offset, cells.data(), programmed);
    for (size_t i = 0; i < programmed; ++i) cells[i] &= bytes[i];
    node.storage->Write(offset, cells.data(), programmed);
  } else {
    node.storage->Write(offset, data, programmed);
  }
  node.writes.emplace_back(offset, programmed);
  if (weakPage) return EIO;
  *done = count;
  return 0;
}

template <typename Transfer>
ssize_t FlashSim::DescriptorTransfer(SimCall call, int fd, Transfer transfer) {
  if (Hit(call)) return -1;
  auto it = handles_.find(fd);
  Node* node = it == handles_.end() ? nullptr : Find(it->second->path);
  if (node == nullptr) {
    errno = EBADF;
    return -1;
  }
  size_t done = 0;
  int error = transfer(*node, it->second->position, &done);
  if (error != 0) {
    errno = error;
    return -1;
  }
  it->second->position += done;
  return static_cast<ssize_t>(done);
}

ssize_t FlashSim::Read(int fd, void* buffer, size_t count) {
  return DescriptorTransfer(SimCall::kRead, fd, [&](Node& node, uint64_t position, size_t* done) {
    return NodeRead(node, position, buffer, count, done);
  });
}

ssize_t FlashSim::Write(int fd, const void* data, size_t count) {
  auto it = handles_.find(fd);
  if (it != handles_.end() && !it->second->writable) {
    errno = EBADF;
    return -1;
  }
  return DescriptorTransfer(SimCall::kWrite, fd, [&](Node& node, uint64_t position, size_t* done) {
    return NodeWrite(node, position, data, count, done);
  });
}

int FlashSim::Ioctl(int fd, unsigned long request, void* argument) {
  SimCall specific = request == MEMGETINFO        ? SimCall::kMemGetInfo
                     : request == MEMERASE        ? SimCall::kMemErase
                     : request == ECCGETSTATS     ? SimCall::kEccGetStats
                     : request == MEMGETBADBLOCK  ? SimCall::kMemGetBadBlock
                     : request == MEMSETBADBLOCK  ? SimCall::kMemSetBadBlock
                                                  : SimCall::kAny;
  if (Hit(SimCall::kIoctl, specific)) return -1;
  auto it = handles_.find(fd);
  Node* node = it == handles_.end() ? nullptr : Find(it->second->path);
  if (node == nullptr || !node->isMtd()) {
    errno = node == nullptr ? EBADF : ENOTTY;
    return -1;
  }
  uint64_t size = node->storage->Size();
  // Requests that change the device need a descriptor open for writing.
  if ((specific == SimCall::kMemErase || specific == SimCall::kMemSetBadBlock) && !it->second->writable) {
    errno = EPERM;
    return -1;
  }
  switch (specific) {
    case SimCall::kMemGetInfo: {
      auto* info = static_cast<mtd_info_user*>(argument);
      *info = mtd_info_user{};
      info->type = node->kind == SimKind::kNand ? MTD_NANDFLASH : MTD_NORFLASH;
      info->flags = node->kind == SimKind::kNand ? MTD_CAP_NANDFLASH : MTD_CAP_NORFLASH;
      info->size = static_cast<__u32>(size);
      info->erasesize = node->eraseSize;
      info->writesize = node->writeSize;
      info->oobsize = node->kind == SimKind::kNand ? 64 : 0;
      return 0;
    }
    case SimCall::kEccGetStats: {
      auto* stats = static_cast<mtd_ecc_stats*>(argument);
      *stats = mtd_ecc_stats{};
      stats->failed = node->eccFailed;
      stats->badblocks = node->badBlockCount;
      return 0;
    }
    case SimCall::kMemErase: {
      auto* region = static_cast<erase_info_user*>(argument);
      uint64_t start = region->start;
      uint64_t length = region->length;
      if (start >= size || length > size - start) {
        errno = EINVAL;
        return -1;
      }
      if (length == 0) return 0;
      if (start % node->eraseSize != 0 || length % node->eraseSize != 0) {
        errno = EINVAL;
        return -1;
      }
      // Block by block: the blocks before a bad one are erased.
      std::vector<uint8_t> erased(node->eraseSize, kErased);
      for (uint64_t block = start; block < start + length; block += node->eraseSize) {
        if (node->IsBadBlock(block)) {
          if (block > start) node->erases.emplace_back(start, block - start);
          errno = EIO;
          return -1;
        }
        node->storage->Write(block, erased.data(), erased.size());
      }
      node->erases.emplace_back(start, length);
      return 0;
    }
    case SimCall::kMemGetBadBlock: {
      uint64_t offset = static_cast<uint64_t>(*static_cast<loff_t*>(argument));
      if (offset >= size) {
        errno = EINVAL;
        return -1;
      }
      if (node->kind != SimKind::kNand) return 0;
      return node->IsBadBlock(offset) ? 1 : 0;
    }
    case SimCall::kMemSetBadBlock: {
      uint64_t offset = static_cast<uint64_t>(*static_cast<loff_t*>(argument));
      if (node->kind != SimKind::kNand) {
        errno = EOPNOTSUPP;
        return -1;
      }
      if (offset >= size) {
        errno = EINVAL;
        return -1;
      }
      // The kernel erases the block before it writes the marker.
      std::vector<uint8_t> erased(node->eraseSize, kErased);
      node->storage->Write(node->BlockOf(offset), erased.data(), erased.size());
      node->AddBad(offset, true);
      return 0;
    }
    default:
      errno = ENOTTY;
      return -1;
  }
}

void* FlashSim::Map(size_t length, int fd, off64_t offset) {
  if (Hit(SimCall::kMmap)) return MAP_FAILED;
  auto it = handles_.find(fd);
  if (it == handles_.end() || !it->second->devMem) {
    errno = EBADF;
    return MAP_FAILED;
  }
  uint64_t start = static_cast<uint64_t>(offset);
  for (Region& region : memory_) {
    if (start >= region.base && start - region.base + length <= region.bytes.size())
      return region.bytes.data() + (start - region.base);
  }
  errno = EINVAL;
  return MAP_FAILED;
}

int FlashSim::Unlink(const char* path) {
  if (Hit(SimCall::kUnlink)) return -1;
  if (nodes_.erase(path) == 0) {
    errno = ENOENT;
    return -1;
  }
  return 0;
}

}  // namespace test
}  // namespace stbplat
