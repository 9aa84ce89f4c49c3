#include "device_node.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "image_storage.h"

namespace stbplat {
namespace devmodel {
namespace {

// The NAND driver checks ECC in steps of this many bytes; an unreadable page
// counts one failure per step.
constexpr uint32_t kEccStep = 256;
// Programming reads the cells back in pieces of this size, so a write of any
// length holds a bounded buffer.
constexpr size_t kProgramPiece = 64 * 1024;
// Scrambling of unreadable pages: a linear congruential sequence seeded per
// page and read.
constexpr uint32_t kSeedStep = 0x9E3779B9u;
constexpr uint32_t kLcgMultiplier = 1103515245u;
constexpr uint32_t kLcgIncrement = 12345u;
// The MTD character device takes OOB requests of at most this many bytes.
constexpr size_t kMaxOobRequest = 4096;
// What marking a block bad writes into its marker byte.
constexpr uint8_t kBadMarker = 0x00;

bool AllErased(const uint8_t* bytes, size_t n) {
  return std::all_of(bytes, bytes + n, [](uint8_t b) { return b == kErasedByte; });
}

}  // namespace

bool DeviceNode::IsBadBlock(uint64_t offset) const {
  return badBlocks->count(chipOffset + BlockOf(offset)) != 0;
}

void DeviceNode::AddBad(uint64_t offset, bool countAgain) {
  bool added = badBlocks->insert(chipOffset + BlockOf(offset)).second;
  if (added || countAgain) ++badBlockCount;
}

void DeviceNode::LoadBadBlocks() {
  if (!chip)
    for (uint64_t block : storage->BadBlocks()) badBlocks->insert(block);
  auto first = badBlocks->lower_bound(chipOffset);
  auto end = badBlocks->lower_bound(chipOffset + Size());
  badBlockCount = static_cast<uint32_t>(std::distance(first, end));
}

void DeviceNode::ScrambleFailedPages(uint64_t offset, size_t n, uint8_t* bytes) {
  // The driver reads whole pages: a failing page counts once per ECC step
  // however little of it was asked for, and its bytes come back scrambled.
  auto first = eccFailures->lower_bound(chipOffset + PageOf(offset));
  auto end = eccFailures->lower_bound(chipOffset + offset + n);
  for (auto it = first; it != end; ++it) {
    uint64_t page = *it - chipOffset;
    eccFailed += std::max<uint32_t>(1, writeSize / kEccStep);
    uint32_t state = static_cast<uint32_t>(page) ^ (++garbageReads * kSeedStep);
    uint64_t to = std::min<uint64_t>(page + writeSize, offset + n);
    for (uint64_t at = std::max(page, offset); at < to; ++at) {
      state = state * kLcgMultiplier + kLcgIncrement;
      // Never 0, so every byte differs from what was programmed.
      bytes[at - offset] ^= static_cast<uint8_t>(1 + (state >> 16) % 255);
    }
  }
}

int DeviceNode::Read(uint64_t offset, void* buffer, size_t count, size_t* done) {
  *done = 0;
  if (offset >= Size()) return 0;
  size_t n = static_cast<size_t>(std::min<uint64_t>(count, Size() - offset));
  if (int error = storage->Read(offset, buffer, n)) return error;
  if (!eccFailures->empty()) ScrambleFailedPages(offset, n, static_cast<uint8_t*>(buffer));
  *done = n;
  return 0;
}

void DeviceNode::CheckReprogram(uint64_t page, const uint8_t* cells, const uint8_t* data) {
  if (!AllErased(cells, writeSize) && !AllErased(data, writeSize) &&
      !std::equal(cells, cells + writeSize, data))
    AddEccFailure(page);
}

// Flash cells only go from 1 to 0. NAND is programmed in whole pages (the
// caller has checked that offset and count are).
int DeviceNode::Program(uint64_t offset, const uint8_t* data, size_t count) {
  size_t unit = kind == SimKind::kNand ? writeSize : 1;
  std::vector<uint8_t> cells(std::min(count, std::max<size_t>(kProgramPiece / unit, 1) * unit));
  for (size_t done = 0; done < count;) {
    size_t n = std::min(cells.size(), count - done);
    if (int error = storage->Read(offset + done, cells.data(), n)) return error;
    if (kind == SimKind::kNand)
      for (size_t at = 0; at < n; at += unit) CheckReprogram(offset + done + at, &cells[at], data + done + at);
    for (size_t i = 0; i < n; ++i) cells[i] &= data[done + i];
    if (int error = storage->Write(offset + done, cells.data(), n)) return error;
    done += n;
  }
  return 0;
}

int DeviceNode::Write(uint64_t offset, const void* data, size_t count, size_t* done) {
  *done = 0;
  if (storage->ReadOnly()) return EROFS;
  if (kind == SimKind::kFile) {
    if (offset + count > Size())
      if (int error = storage->Resize(offset + count)) return error;
    if (int error = storage->Write(offset, data, count)) return error;
    if (recordHistory) writes.emplace_back(offset, count);
    *done = count;
    return 0;
  }
  // A device takes what fits before its end; only a write starting there
  // fails.
  if (offset >= Size()) return ENOSPC;
  count = static_cast<size_t>(std::min<uint64_t>(count, Size() - offset));
  if (kind == SimKind::kNand && (offset % writeSize != 0 || count % writeSize != 0)) return EINVAL;
  if (int error = Reach()) return error;
  // A full chip takes what lies before the offset it is full from.
  const uint64_t at = chipOffset + offset;
  if (at >= faults->fullFrom) return ENOSPC;
  count = static_cast<size_t>(std::min<uint64_t>(count, faults->fullFrom - at));
  // A weak page fails the write after the pages before it and the page
  // itself were programmed.
  size_t programmed = count;
  bool weakPage = false;
  for (auto weak = faults->weakPages.lower_bound(at); weak != faults->weakPages.end() && *weak < at + count; ++weak) {
    weakPage = true;
    programmed = std::min<size_t>(programmed, PageOf(*weak - chipOffset) + writeSize - offset);
  }
  const auto* bytes = static_cast<const uint8_t*>(data);
  // The MTD layer does not consult the bad-block table on writes.
  bool clearsBits = kind == SimKind::kNor || kind == SimKind::kNand;
  int error = clearsBits ? Program(offset, bytes, programmed) : storage->Write(offset, bytes, programmed);
  if (error != 0) return error;
  if (recordHistory) writes.emplace_back(offset, programmed);
  if (weakPage) return EIO;
  *done = count;
  return 0;
}

int DeviceNode::Reach() {
  if (faults->PowerGone()) return EIO;
  ++faults->writes;
  return 0;
}

int DeviceNode::Erase(uint64_t start, uint64_t length) {
  if (start >= Size() || length > Size() - start) return EINVAL;
  if (storage->ReadOnly()) return EROFS;
  if (length == 0) return 0;
  if (eraseSize == 0 || start % eraseSize != 0 || length % eraseSize != 0) return EINVAL;
  if (int error = Reach()) return error;
  // Block by block: the blocks before a bad one are erased.
  for (uint64_t block = start; block < start + length; block += eraseSize) {
    if (IsBadBlock(block)) {
      if (block > start && recordHistory) erases.emplace_back(start, block - start);
      return EIO;
    }
    if (int error = EraseBlock(block)) return error;
  }
  if (recordHistory) erases.emplace_back(start, length);
  return 0;
}

int DeviceNode::EraseBlock(uint64_t block) {
  if (int error = storage->Erase(block, eraseSize)) return error;
  eccFailures->erase(eccFailures->lower_bound(chipOffset + block),
                     eccFailures->lower_bound(chipOffset + block + eraseSize));
  return 0;
}

int DeviceNode::GetBadBlock(uint64_t offset, bool* bad) const {
  if (offset >= Size()) return EINVAL;
  *bad = kind == SimKind::kNand && IsBadBlock(offset);
  return 0;
}

int DeviceNode::ReadOob(uint64_t offset, void* buffer, size_t length) {
  if (kind != SimKind::kNand || oobSize == 0) return EOPNOTSUPP;
  const uint64_t within = offset % writeSize;
  if (length > kMaxOobRequest || offset >= Size() || within >= oobSize || (within != 0 && length > oobSize - within))
    return EINVAL;
  const uint64_t first = PageOf(offset);
  const uint64_t pages = (within + length + oobSize - 1) / oobSize;
  if (pages > (Size() - first) / writeSize) return EINVAL;
  std::vector<uint8_t> oob(oobSize);
  Geometry geometry;
  geometry.writeSize = writeSize;
  auto* out = static_cast<uint8_t*>(buffer);
  for (uint64_t page = first, skip = within; length > 0; page += writeSize, skip = 0) {
    int error = storage->ReadOob(page, oob.data(), oob.size());
    if (error == EOPNOTSUPP) {
      std::fill(oob.begin(), oob.end(), kErasedByte);
      if (page == BlockOf(page) && IsBadBlock(page)) oob[BadMarkerByte(geometry)] = kBadMarker;
    } else if (error != 0) {
      return error;
    }
    const size_t n = std::min<size_t>(length, oobSize - skip);
    std::memcpy(out, oob.data() + skip, n);
    out += n;
    length -= n;
  }
  return 0;
}

int DeviceNode::SetBadBlock(uint64_t offset) {
  if (kind != SimKind::kNand) return EOPNOTSUPP;
  if (offset >= Size()) return EINVAL;
  if (storage->ReadOnly()) return EROFS;
  // The kernel erases the block before it writes the marker.
  if (int error = EraseBlock(BlockOf(offset))) return error;
  AddBad(offset, true);
  return storage->SaveBadBlock(BlockOf(offset));
}

mtd_info_user DeviceNode::Info() const {
  mtd_info_user info{};
  info.type = kind == SimKind::kNand ? MTD_NANDFLASH : kind == SimKind::kNor ? MTD_NORFLASH : MTD_RAM;
  info.flags = kind == SimKind::kNand  ? MTD_CAP_NANDFLASH
               : kind == SimKind::kNor ? MTD_CAP_NORFLASH
                                       : MTD_CAP_RAM;
  if (readOnly || storage->ReadOnly()) info.flags &= ~MTD_WRITEABLE;
  info.size = static_cast<__u32>(Size());
  info.erasesize = eraseSize;
  info.writesize = writeSize;
  info.oobsize = oobSize;
  return info;
}

mtd_ecc_stats DeviceNode::Stats() const {
  mtd_ecc_stats stats{};
  stats.failed = eccFailed;
  stats.badblocks = badBlockCount;
  return stats;
}

}  // namespace devmodel
}  // namespace stbplat
