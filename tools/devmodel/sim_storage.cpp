#include "sim_storage.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace stbplat {
namespace devmodel {
namespace {

// Erased bytes are written in pieces of this size, so an erase of any
// length holds a bounded buffer.
constexpr uint64_t kErasePiece = 64 * 1024;

class MemoryStorage : public SimStorage {
 public:
  MemoryStorage(uint64_t size, uint8_t fill) : bytes_(size, fill) {}
  uint64_t Size() const override { return bytes_.size(); }
  int Read(uint64_t offset, void* buffer, size_t length) const override {
    if (length != 0) std::memcpy(buffer, bytes_.data() + offset, length);
    return 0;
  }
  int Write(uint64_t offset, const void* data, size_t length) override {
    if (length != 0) std::memcpy(bytes_.data() + offset, data, length);
    return 0;
  }
  int Resize(uint64_t size) override {
    bytes_.resize(size, 0);
    return 0;
  }

 private:
  std::vector<uint8_t> bytes_;
};

class WindowStorage : public SimStorage {
 public:
  WindowStorage(SimStorage& whole, uint64_t offset, uint64_t size)
      : whole_(whole), offset_(offset), size_(size) {}
  uint64_t Size() const override { return size_; }
  int Read(uint64_t offset, void* buffer, size_t length) const override {
    return whole_.Read(offset_ + offset, buffer, length);
  }
  int Write(uint64_t offset, const void* data, size_t length) override {
    return whole_.Write(offset_ + offset, data, length);
  }
  int Resize(uint64_t) override { return EINVAL; }
  int Erase(uint64_t offset, uint64_t length) override { return whole_.Erase(offset_ + offset, length); }
  int SaveBadBlock(uint64_t offset) override { return whole_.SaveBadBlock(offset_ + offset); }
  bool ReadOnly() const override { return whole_.ReadOnly(); }
  int ReadOob(uint64_t page, void* buffer, size_t length) const override {
    return whole_.ReadOob(offset_ + page, buffer, length);
  }

 private:
  SimStorage& whole_;
  uint64_t offset_, size_;
};

}  // namespace

int SimStorage::Erase(uint64_t offset, uint64_t length) {
  std::vector<uint8_t> erased(std::min(length, kErasePiece), kErasedByte);
  for (uint64_t done = 0; done < length;) {
    size_t n = static_cast<size_t>(std::min<uint64_t>(erased.size(), length - done));
    if (int error = Write(offset + done, erased.data(), n)) return error;
    done += n;
  }
  return 0;
}

int SimStorage::ReadOob(uint64_t, void*, size_t) const { return EOPNOTSUPP; }

std::unique_ptr<SimStorage> MakeMemoryStorage(uint64_t size, uint8_t fill) {
  return std::make_unique<MemoryStorage>(size, fill);
}

std::unique_ptr<SimStorage> MakeWindowStorage(SimStorage& whole, uint64_t offset, uint64_t size) {
  return std::make_unique<WindowStorage>(whole, offset, size);
}

}  // namespace devmodel
}  // namespace stbplat
