#include "image_storage.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <set>
#include <vector>

namespace stbplat {
namespace devmodel {
namespace {

// Offset of the bad-block marker in a page's OOB bytes.
constexpr size_t kBadMarkerByte = 0;
constexpr unsigned char kBadMarker = 0x00;
// Pages read at once from an image with OOB bytes: one system call per page
// would be the bottleneck.
constexpr uint64_t kSpanPages = 64;

std::string BadListPath(const std::string& imagePath) { return imagePath + ".bad"; }

class ImageStorage : public SimStorage {
 public:
  ImageStorage(int fd, const std::string& path, const Geometry& geometry, bool hasOob, bool readOnly)
      : fd_(fd), path_(path), geometry_(geometry), hasOob_(hasOob), readOnly_(readOnly) {}
  ~ImageStorage() override { close(fd_); }
  ImageStorage(const ImageStorage&) = delete;
  ImageStorage& operator=(const ImageStorage&) = delete;

  bool LoadBadBlocks(std::string* error) {
    if (geometry_.medium != Medium::kNand || geometry_.eraseSize == 0) return true;
    if (hasOob_) {
      LoadBadMarkers();
      return true;
    }
    return LoadBadList(error);
  }

  uint64_t Size() const override { return geometry_.size; }
  int Resize(uint64_t) override { return EINVAL; }
  int Read(uint64_t offset, void* buffer, size_t length) const override;
  int Write(uint64_t offset, const void* data, size_t length) override;
  int Erase(uint64_t offset, uint64_t length) override;
  std::vector<uint64_t> BadBlocks() const override { return {bad_.begin(), bad_.end()}; }
  int SaveBadBlock(uint64_t offset) override;
  bool ReadOnly() const override { return readOnly_; }

 private:
  uint64_t FileOffset(uint64_t dataOffset) const {
    if (!hasOob_) return dataOffset;
    uint64_t page = dataOffset / geometry_.writeSize;
    return page * (geometry_.writeSize + geometry_.oobSize) + dataOffset % geometry_.writeSize;
  }
  off_t MarkerOffset(uint64_t block) const {
    return static_cast<off_t>(FileOffset(block) + geometry_.writeSize + kBadMarkerByte);
  }
  void LoadBadMarkers();
  bool LoadBadList(std::string* error);

  int fd_;
  std::string path_;
  Geometry geometry_;
  bool hasOob_;
  bool readOnly_;
  std::set<uint64_t> bad_;  // block start offsets
};

void ImageStorage::LoadBadMarkers() {
  for (uint64_t block = 0; block < geometry_.size; block += geometry_.eraseSize) {
    unsigned char marker = kErasedByte;
    if (pread(fd_, &marker, 1, MarkerOffset(block)) != 1 || marker != kErasedByte) bad_.insert(block);
  }
}

bool ImageStorage::LoadBadList(std::string* error) {
  std::ifstream in(BadListPath(path_));
  if (!in) return true;  // no list: every block is good
  std::string line;
  unsigned lineNumber = 0;
  while (std::getline(in, line)) {
    ++lineNumber;
    size_t hash = line.find('#');
    if (hash != std::string::npos) line.erase(hash);
    size_t first = line.find_first_not_of(" \t\r");
    if (first == std::string::npos) continue;
    char* end = nullptr;
    unsigned long long block = std::strtoull(line.c_str() + first, &end, 0);
    if (end == line.c_str() + first || block >= geometry_.size / geometry_.eraseSize) {
      *error = BadListPath(path_) + ":" + std::to_string(lineNumber) + ": not a block number of this image";
      return false;
    }
    bad_.insert(block * geometry_.eraseSize);
  }
  return true;
}

int ImageStorage::Read(uint64_t offset, void* buffer, size_t length) const {
  auto* out = static_cast<unsigned char*>(buffer);
  if (!hasOob_)
    return pread(fd_, out, length, static_cast<off_t>(offset)) == static_cast<ssize_t>(length) ? 0 : EIO;
  // A span of pages in one call: each page's data goes to the caller, its
  // OOB bytes to a scratch area.
  const uint64_t page = geometry_.writeSize;
  std::vector<unsigned char> oob(geometry_.oobSize);
  struct iovec parts[2 * kSpanPages];
  while (length > 0) {
    off_t where = static_cast<off_t>(FileOffset(offset));
    size_t count = 0, total = 0;
    for (uint64_t within = offset % page; count < 2 * kSpanPages && length > 0; within = 0) {
      size_t n = std::min<uint64_t>(length, page - within);
      parts[count++] = {out, n};
      total += n;
      out += n;
      offset += n;
      length -= n;
      if (length > 0) {
        parts[count++] = {oob.data(), oob.size()};
        total += oob.size();
      }
    }
    if (preadv(fd_, parts, static_cast<int>(count), where) != static_cast<ssize_t>(total)) return EIO;
  }
  return 0;
}

int ImageStorage::Write(uint64_t offset, const void* data, size_t length) {
  const auto* in = static_cast<const unsigned char*>(data);
  while (length > 0) {
    size_t n = length;
    if (hasOob_) n = std::min<uint64_t>(n, geometry_.writeSize - offset % geometry_.writeSize);
    if (pwrite(fd_, in, n, static_cast<off_t>(FileOffset(offset))) != static_cast<ssize_t>(n)) return EIO;
    in += n;
    offset += n;
    length -= n;
  }
  return 0;
}

int ImageStorage::Erase(uint64_t offset, uint64_t length) {
  if (int error = SimStorage::Erase(offset, length)) return error;
  if (!hasOob_) return 0;
  std::vector<unsigned char> oob(geometry_.oobSize, kErasedByte);
  for (uint64_t page = offset; page < offset + length; page += geometry_.writeSize) {
    off_t where = static_cast<off_t>(FileOffset(page) + geometry_.writeSize);
    if (pwrite(fd_, oob.data(), oob.size(), where) != static_cast<ssize_t>(oob.size())) return EIO;
  }
  return 0;
}

int ImageStorage::SaveBadBlock(uint64_t offset) {
  bad_.insert(offset);
  if (hasOob_) return pwrite(fd_, &kBadMarker, 1, MarkerOffset(offset)) == 1 ? 0 : EIO;
  std::ofstream out(BadListPath(path_), std::ios::trunc);
  if (!out) return EIO;
  out << "# bad blocks of " << path_.substr(path_.find_last_of('/') + 1) << ", one block number a line\n";
  for (uint64_t block : bad_) out << block / geometry_.eraseSize << "\n";
  return out ? 0 : EIO;
}

// What the size of a NAND file should have been, with the likely cause.
std::string ExpectedSizes(const Geometry& g, uint64_t fileSize) {
  std::string expected = std::to_string(g.size);
  if (g.medium != Medium::kNand || g.oobSize == 0 || g.writeSize == 0 || g.eraseSize == 0) return expected;
  uint64_t withOob = g.size / g.writeSize * (g.writeSize + g.oobSize);
  uint64_t blockBytes = g.eraseSize / g.writeSize * (g.writeSize + g.oobSize);
  expected += " (plain) or " + std::to_string(withOob) + " (with OOB)";
  // nanddump leaves bad blocks out unless told otherwise, and then their
  // places are lost.
  if (fileSize % blockBytes == 0 && fileSize < withOob)
    expected += "; a dump short of whole blocks lacks its bad blocks: take it with nanddump --oob --bb=dumpbad";
  return expected;
}

}  // namespace

std::unique_ptr<SimStorage> OpenImageStorage(const std::string& path, const Geometry& geometry,
                                             std::string* error) {
  // An image the user may not write (or on a read-only mount) is still read.
  int fd = open(path.c_str(), O_RDWR | O_CLOEXEC);
  bool readOnly = fd < 0 && (errno == EACCES || errno == EPERM || errno == EROFS);
  if (readOnly) fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  struct stat info;
  if (fd < 0 || fstat(fd, &info) != 0) {
    *error = path + ": " + std::strerror(errno);
    if (fd >= 0) close(fd);
    return nullptr;
  }
  uint64_t fileSize = static_cast<uint64_t>(info.st_size);
  bool withOob = geometry.medium == Medium::kNand && geometry.oobSize != 0 && geometry.writeSize != 0 &&
                 fileSize == geometry.size / geometry.writeSize * (geometry.writeSize + geometry.oobSize);
  if (!withOob && fileSize != geometry.size) {
    *error = path + ": " + std::to_string(fileSize) + " bytes, expected " + ExpectedSizes(geometry, fileSize);
    close(fd);
    return nullptr;
  }
  auto image = std::make_unique<ImageStorage>(fd, path, geometry, withOob, readOnly);
  if (!image->LoadBadBlocks(error)) return nullptr;
  return image;
}

}  // namespace devmodel
}  // namespace stbplat
