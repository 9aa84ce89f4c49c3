// Where an emulated device keeps its bytes: in memory (unit tests), in an
// image file (host mode), or as a window of another store (a partition of
// its chip). The device rules live in DeviceNode; a store only moves bytes
// and remembers which blocks are bad.
#ifndef STBPLAT_DEVMODEL_SIM_STORAGE_H
#define STBPLAT_DEVMODEL_SIM_STORAGE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

namespace stbplat {
namespace devmodel {

// Offsets and lengths are checked by the caller. Transfers return 0 or an
// errno value.
class SimStorage {
 public:
  virtual ~SimStorage() = default;
  virtual uint64_t Size() const = 0;
  virtual int Read(uint64_t offset, void* buffer, size_t length) const = 0;
  virtual int Write(uint64_t offset, const void* data, size_t length) = 0;
  // Regular files grow; devices never call this.
  virtual int Resize(uint64_t size) = 0;
  // Sets an erase block to the erased state (a dump with OOB bytes resets
  // those too).
  virtual int Erase(uint64_t offset, uint64_t length);
  // Start offsets of the blocks the store holds as bad when it is opened,
  // and the record of a block marked bad since.
  virtual std::vector<uint64_t> BadBlocks() const { return {}; }
  virtual int SaveBadBlock(uint64_t) { return 0; }
  // True when the bytes can only be read (the node refuses every change).
  virtual bool ReadOnly() const { return false; }
  // The OOB bytes kept behind the page starting at `page`: a dump taken with
  // them keeps them; other stores keep none (EOPNOTSUPP), and the node makes
  // up what a kernel would show for them.
  virtual int ReadOob(uint64_t page, void* buffer, size_t length) const;
};

constexpr uint8_t kErasedByte = 0xFF;

std::unique_ptr<SimStorage> MakeMemoryStorage(uint64_t size, uint8_t fill);

// A window of length `size` at `offset` in `whole`, which must outlive it.
std::unique_ptr<SimStorage> MakeWindowStorage(SimStorage& whole, uint64_t offset, uint64_t size);

}  // namespace devmodel
}  // namespace stbplat

#endif
