#include "flash_image.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <vector>

namespace stbplat {
namespace hostsim {
namespace {

constexpr unsigned char kErased = 0xFF;
// Offset of the bad-block marker in a page's OOB bytes.
constexpr size_t kBadMarkerByte = 0;
constexpr unsigned char kBadMarker = 0x00;
constexpr size_t kChunk = 64 * 1024;
// Pages read at once from an image with OOB bytes.
constexpr uint64_t kSpanPages = 64;

std::string BadListPath(const std::string& imagePath) { return imagePath + ".bad"; }

}  // namespace

FlashImage::FlashImage(int fd, const std::string& path, const Geometry& geometry, bool hasOob)
    : fd_(fd), path_(path), geometry_(geometry), hasOob_(hasOob) {}

FlashImage::~FlashImage() {
  if (fd_ >= 0) close(fd_);
}

std::unique_ptr<FlashImage> FlashImage::Open(const std::string& path, const Geometry& geometry,
                                             std::string* error) {
  int fd = open(path.c_str(), O_RDWR | O_CLOEXEC);
  if (fd < 0) {
    *error = path + ": " + std::strerror(errno);
    return nullptr;
  }
  struct stat info;
  if (fstat(fd, &info) != 0) {
    *error = path + ": " + std::strerror(errno);
    close(fd);
    return nullptr;
  }
  uint64_t fileSize = static_cast<uint64_t>(info.st_size);
  bool withOob = false;
  if (geometry.medium == Medium::kNand && geometry.oobSize != 0 && geometry.writeSize != 0 &&
      fileSize == geometry.size / geometry.writeSize * (geometry.writeSize + geometry.oobSize)) {
    withOob = true;
  } else if (fileSize != geometry.size) {
    std::string expected = std::to_string(geometry.size);
    bool nandWithOob = geometry.medium == Medium::kNand && geometry.oobSize != 0 &&
                       geometry.writeSize != 0 && geometry.eraseSize != 0;
    if (nandWithOob) {
      uint64_t pages = geometry.size / geometry.writeSize;
      uint64_t blockBytes = geometry.eraseSize / geometry.writeSize * (geometry.writeSize + geometry.oobSize);
      expected += " (plain) or " + std::to_string(pages * (geometry.writeSize + geometry.oobSize)) + " (with OOB)";
      // nanddump leaves bad blocks out unless told otherwise, and then their
      // places are lost.
      if (fileSize % blockBytes == 0 && fileSize < pages * (geometry.writeSize + geometry.oobSize))
        expected += "; a dump short of whole blocks lacks its bad blocks: take it with nanddump --oob --bb=dumpbad";
    }
    *error = path + ": " + std::to_string(fileSize) + " bytes, expected " + expected;
    close(fd);
    return nullptr;
  }
  std::unique_ptr<FlashImage> image(new FlashImage(fd, path, geometry, withOob));
  if (geometry.medium == Medium::kNand && geometry.eraseSize != 0)
    image->badBlocks_.assign(geometry.size / geometry.eraseSize, false);
  if (geometry.medium == Medium::kNand && !withOob && !image->LoadBadList(error)) return nullptr;
  if (withOob && geometry.eraseSize != 0) image->LoadBadMarkers();
  return image;
}

// The library asks for every block from the start of the device for each
// block it touches: the markers are read once here, not from the file on
// every question.
void FlashImage::LoadBadMarkers() {
  for (uint64_t block = 0; block < geometry_.size / geometry_.eraseSize; ++block) {
    unsigned char marker = kErased;
    off_t where = static_cast<off_t>(FileOffset(block * geometry_.eraseSize) + geometry_.writeSize + kBadMarkerByte);
    if (pread(fd_, &marker, 1, where) != 1 || marker != kErased) badBlocks_[block] = true;
  }
}

bool FlashImage::LoadBadList(std::string* error) {
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
    badBlocks_[block] = true;
  }
  return true;
}

int FlashImage::SaveBadList() const {
  std::ofstream out(BadListPath(path_), std::ios::trunc);
  if (!out) return EIO;
  out << "# bad blocks of " << path_.substr(path_.find_last_of('/') + 1) << ", one block number a line\n";
  for (uint64_t block = 0; block < badBlocks_.size(); ++block)
    if (badBlocks_[block]) out << block << "\n";
  return out ? 0 : EIO;
}

uint64_t FlashImage::FileOffset(uint64_t dataOffset) const {
  if (!hasOob_) return dataOffset;
  uint64_t page = dataOffset / geometry_.writeSize;
  return page * (geometry_.writeSize + geometry_.oobSize) + dataOffset % geometry_.writeSize;
}

int FlashImage::RawRead(uint64_t dataOffset, void* buffer, size_t length) const {
  unsigned char* out = static_cast<unsigned char*>(buffer);
  if (!hasOob_) return pread(fd_, out, length, static_cast<off_t>(dataOffset)) == static_cast<ssize_t>(length) ? 0 : EIO;
  // A span of pages is read in one system call, each page's data going
  // straight to the caller and its OOB bytes to a scratch area: one call
  // per page would be the bottleneck.
  const uint64_t page = geometry_.writeSize;
  std::vector<unsigned char> oob(geometry_.oobSize);
  struct iovec parts[2 * kSpanPages];
  while (length > 0) {
    off_t where = static_cast<off_t>(FileOffset(dataOffset));
    size_t count = 0, total = 0;
    for (uint64_t within = dataOffset % page; count < 2 * kSpanPages && length > 0; within = 0) {
      size_t n = std::min<uint64_t>(length, page - within);
      parts[count++] = {out, n};
      total += n;
      out += n;
      dataOffset += n;
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

int FlashImage::RawWrite(uint64_t dataOffset, const void* data, size_t length) {
  const unsigned char* in = static_cast<const unsigned char*>(data);
  while (length > 0) {
    size_t n = length;
    if (hasOob_) n = std::min<uint64_t>(n, geometry_.writeSize - dataOffset % geometry_.writeSize);
    ssize_t put = pwrite(fd_, in, n, static_cast<off_t>(FileOffset(dataOffset)));
    if (put != static_cast<ssize_t>(n)) return EIO;
    in += n;
    dataOffset += n;
    length -= n;
  }
  return 0;
}

int FlashImage::Read(uint64_t offset, void* buffer, size_t length) const {
  if (offset > geometry_.size || length > geometry_.size - offset) return EINVAL;
  return RawRead(offset, buffer, length);
}

int FlashImage::Write(uint64_t offset, const void* data, size_t length) {
  if (offset > geometry_.size || length > geometry_.size - offset) return ENOSPC;
  if (geometry_.medium == Medium::kEmmc) return RawWrite(offset, data, length);
  // NAND is programmed in whole pages. As in the kernel, the bad-block table
  // is not consulted: only erases refuse bad blocks.
  if (geometry_.medium == Medium::kNand &&
      (offset % geometry_.writeSize != 0 || length % geometry_.writeSize != 0))
    return EINVAL;
  // Programming clears bits only.
  const unsigned char* in = static_cast<const unsigned char*>(data);
  std::vector<unsigned char> cells(std::min(length, kChunk));
  for (size_t done = 0; done < length;) {
    size_t n = std::min(kChunk, length - done);
    if (int error = RawRead(offset + done, cells.data(), n)) return error;
    for (size_t i = 0; i < n; ++i) cells[i] &= in[done + i];
    if (int error = RawWrite(offset + done, cells.data(), n)) return error;
    done += n;
  }
  return 0;
}

int FlashImage::Erase(uint64_t offset, uint64_t length) {
  // The kernel's order: the range first, an empty one succeeds, then the
  // alignment; blocks go in order and a bad one stops the erase.
  if (offset >= geometry_.size || length > geometry_.size - offset) return EINVAL;
  if (length == 0) return 0;
  if (geometry_.eraseSize == 0 || offset % geometry_.eraseSize != 0 || length % geometry_.eraseSize != 0)
    return EINVAL;
  std::vector<unsigned char> erased(geometry_.eraseSize, kErased);
  for (uint64_t at = offset; at < offset + length; at += geometry_.eraseSize) {
    if (IsBad(at)) return EIO;
    if (int error = RawWrite(at, erased.data(), erased.size())) return error;
    if (hasOob_) {
      std::vector<unsigned char> oob(geometry_.oobSize, kErased);
      for (uint64_t page = at; page < at + geometry_.eraseSize; page += geometry_.writeSize) {
        off_t where = static_cast<off_t>(FileOffset(page) + geometry_.writeSize);
        if (pwrite(fd_, oob.data(), oob.size(), where) != static_cast<ssize_t>(oob.size())) return EIO;
      }
    }
  }
  return 0;
}

bool FlashImage::IsBad(uint64_t offset) const {
  if (geometry_.medium != Medium::kNand || geometry_.eraseSize == 0) return false;
  uint64_t block = offset / geometry_.eraseSize;
  return block < badBlocks_.size() && badBlocks_[block];
}

int FlashImage::MarkBad(uint64_t offset) {
  if (geometry_.medium != Medium::kNand) return EOPNOTSUPP;
  uint64_t block = offset / geometry_.eraseSize;
  if (block >= badBlocks_.size()) return EINVAL;
  badBlocks_[block] = true;
  if (!hasOob_) return SaveBadList();
  off_t where = static_cast<off_t>(FileOffset(block * geometry_.eraseSize) + geometry_.writeSize +
                                   kBadMarkerByte);
  return pwrite(fd_, &kBadMarker, 1, where) == 1 ? 0 : EIO;
}

unsigned FlashImage::BadBlocksIn(uint64_t offset, uint64_t length) const {
  if (geometry_.medium != Medium::kNand || geometry_.eraseSize == 0) return 0;
  uint64_t first = offset / geometry_.eraseSize, end = (offset + length) / geometry_.eraseSize;
  end = std::min<uint64_t>(end, badBlocks_.size());
  return first < end ? static_cast<unsigned>(std::count(badBlocks_.begin() + static_cast<long>(first),
                                                        badBlocks_.begin() + static_cast<long>(end), true))
                     : 0;
}

}  // namespace hostsim
}  // namespace stbplat
