// One flash or eMMC image file of an emulated device, and the MTD nodes that
// look into it.
//
// NOR and NAND images behave like the chips: programming only clears bits
// (the caller erases first), an erase sets a whole erase block to 0xFF, and a
// NAND block can be bad. A NAND image is either plain data with a list of bad
// blocks beside it (IMAGE.bad: block numbers, one a line), or a dump with the
// out-of-band bytes of every page behind it, as nanddump --oob writes it; a
// block of such a dump is bad when the first OOB byte of its first page is
// not 0xFF, so a real device's dump reads as it is. eMMC images are plain
// files: writes replace bytes.
#ifndef STBPLAT_HOSTSIM_FLASH_IMAGE_H
#define STBPLAT_HOSTSIM_FLASH_IMAGE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>
#include <string>

namespace stbplat {
namespace hostsim {

enum class Medium { kNor, kNand, kEmmc };

struct Geometry {
  Medium medium = Medium::kNor;
  uint64_t size = 0;        // data bytes
  uint64_t eraseSize = 0;   // erase block (NOR sector)
  uint64_t writeSize = 1;   // page (NAND), 1 otherwise
  uint64_t oobSize = 0;     // OOB bytes per page when the image holds them
};

class FlashImage {
 public:
  // Opens path read-write. The file's size decides whether a NAND image
  // holds OOB bytes. On failure returns null and says why.
  static std::unique_ptr<FlashImage> Open(const std::string& path, const Geometry& geometry,
                                          std::string* error);
  ~FlashImage();
  FlashImage(const FlashImage&) = delete;
  FlashImage& operator=(const FlashImage&) = delete;

  const Geometry& geometry() const { return geometry_; }
  bool hasOob() const { return hasOob_; }
  const std::string& path() const { return path_; }

  // Byte ranges of the data (OOB bytes are never part of them). Return 0 or
  // an errno value.
  int Read(uint64_t offset, void* buffer, size_t length) const;
  int Write(uint64_t offset, const void* data, size_t length);
  int Erase(uint64_t offset, uint64_t length);
  bool IsBad(uint64_t offset) const;
  int MarkBad(uint64_t offset);
  unsigned BadBlocksIn(uint64_t offset, uint64_t length) const;

 private:
  FlashImage(int fd, const std::string& path, const Geometry& geometry, bool hasOob);
  uint64_t FileOffset(uint64_t dataOffset) const;
  int RawRead(uint64_t dataOffset, void* buffer, size_t length) const;
  int RawWrite(uint64_t dataOffset, const void* data, size_t length);
  bool LoadBadList(std::string* error);
  void LoadBadMarkers();
  int SaveBadList() const;

  int fd_;
  std::string path_;
  Geometry geometry_;
  bool hasOob_;
  // Block numbers: a plain image's list, or the markers of a dump with OOB
  // bytes as they stood at the open, kept up to date by MarkBad.
  std::vector<bool> badBlocks_;
};

}  // namespace hostsim
}  // namespace stbplat

#endif
