#include "image_storage.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <map>
#include <set>
#include <vector>

namespace stbplat {
namespace devmodel {
namespace {

constexpr unsigned char kBadMarker = 0x00;
constexpr uint64_t kSmallPage = 512;
constexpr uint64_t kSmallPageMarkerByte = 5;
// Pages read at once from an image with OOB bytes: one system call per page
// would be the bottleneck.
constexpr uint64_t kSpanPages = 64;

std::string BadListPath(const std::string& imagePath) { return imagePath + ".bad"; }

class ImageStorage : public SimStorage {
 public:
  ImageStorage(int fd, const std::string& path, const Geometry& geometry, bool readOnly)
      : fd_(fd), path_(path), geometry_(geometry), hasOob_(geometry.oobInImage), readOnly_(readOnly) {}
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
  int ReadOob(uint64_t page, void* buffer, size_t length) const override {
    if (!hasOob_) return SimStorage::ReadOob(page, buffer, length);
    const off_t where = static_cast<off_t>(FileOffset(page) + geometry_.writeSize);
    return pread(fd_, buffer, length, where) == static_cast<ssize_t>(length) ? 0 : EIO;
  }

 private:
  uint64_t FileOffset(uint64_t dataOffset) const {
    if (!hasOob_) return dataOffset;
    uint64_t page = dataOffset / geometry_.writeSize;
    return page * (geometry_.writeSize + geometry_.oobSize) + dataOffset % geometry_.writeSize;
  }
  off_t MarkerOffset(uint64_t block) const {
    return static_cast<off_t>(FileOffset(block) + geometry_.writeSize + BadMarkerByte(geometry_));
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
  const uint64_t blocks = geometry_.size / geometry_.eraseSize;
  std::map<uint64_t, unsigned> lineOf;
  std::string line;
  for (unsigned lineNumber = 1; std::getline(in, line); ++lineNumber) {
    line.erase(std::min(line.find('#'), line.size()));
    size_t first = line.find_first_not_of(" \t\r");
    if (first == std::string::npos) continue;
    std::string text = line.substr(first, line.find_last_not_of(" \t\r") + 1 - first);
    uint64_t block = 0;
    std::string where = BadListPath(path_) + ":" + std::to_string(lineNumber) + ": ";
    if (!ParseNumber(text, &block) || block >= blocks) {
      *error = where + "'" + text + "' is not a block number of this image (0 to " + std::to_string(blocks - 1) + ")";
      return false;
    }
    if (lineOf.count(block) != 0) {
      *error = where + "block " + text + " listed again (first at line " + std::to_string(lineOf[block]) + ")";
      return false;
    }
    lineOf[block] = lineNumber;
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

// Why a NAND file may have the wrong size, as far as its size tells.
std::string SizeHint(const Geometry& g, uint64_t fileSize) {
  if (g.medium != Medium::kNand || g.oobSize == 0) return "";
  uint64_t pages = g.size / g.writeSize;
  uint64_t blockBytes = g.eraseSize / g.writeSize * (g.writeSize + g.oobSize);
  if (!g.oobInImage)
    return fileSize == pages * (g.writeSize + g.oobSize) ? " (the size with OOB bytes: drop layout = plain)" : "";
  if (fileSize == g.size) return " with the OOB bytes of each page (a dump without them needs layout = plain)";
  // nanddump leaves bad blocks out unless told otherwise, and then their
  // places are lost.
  if (fileSize % blockBytes == 0 && fileSize < pages * (g.writeSize + g.oobSize))
    return "; a dump short of whole blocks lacks its bad blocks: take it with nanddump --oob --bb=dumpbad";
  return "";
}

}  // namespace

uint64_t BadMarkerByte(const Geometry& geometry) {
  return geometry.writeSize <= kSmallPage ? kSmallPageMarkerByte : 0;
}

bool ParseNumber(const std::string& text, uint64_t* value) {
  bool hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
  const uint64_t base = hex ? 16 : 10;
  if (text.empty()) return false;
  uint64_t result = 0;
  for (size_t i = hex ? 2 : 0; i < text.size(); ++i) {
    const int c = static_cast<unsigned char>(text[i]);
    const int digit = std::isdigit(c) ? c - '0' : hex && std::isxdigit(c) ? std::tolower(c) - 'a' + 10 : -1;
    if (digit < 0 || result > (UINT64_MAX - static_cast<uint64_t>(digit)) / base) return false;
    result = result * base + static_cast<uint64_t>(digit);
  }
  *value = result;
  return true;
}

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
  uint64_t expected = geometry.size;
  if (geometry.oobInImage) expected = geometry.size / geometry.writeSize * (geometry.writeSize + geometry.oobSize);
  if (fileSize != expected) {
    *error = path + ": " + std::to_string(fileSize) + " bytes, expected " + std::to_string(expected) +
             SizeHint(geometry, fileSize);
    close(fd);
    return nullptr;
  }
  auto image = std::make_unique<ImageStorage>(fd, path, geometry, readOnly);
  if (!image->LoadBadBlocks(error)) return nullptr;
  return image;
}

}  // namespace devmodel
}  // namespace stbplat
