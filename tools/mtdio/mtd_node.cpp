#include "mtdio/mtd_node.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <mtd/mtd-user.h>

#include <cerrno>
#include <cinttypes>
#include <cstdio>

#include "os/seam.h"

namespace stbplat {
namespace mtdio {
namespace {

constexpr char kProcMtd[] = "/proc/mtd";
// A /proc/mtd line: mtd number, size and erase size in hexadecimal, the name
// in double quotes (names are at most this long in the kernel's table).
constexpr int kLineLength = 256;
constexpr int kProcMtdFields = 3;
constexpr char kProcMtdFormat[] = "mtd%d: %" SCNx64 " %" SCNx64 " \"%n";
// The kernel's OOB requests carry at most this many bytes.
constexpr size_t kMaxOobRequest = 4096;

}  // namespace

const char* MtdTypeName(unsigned type) {
  switch (type) {
    case MTD_ABSENT: return "absent";
    case MTD_RAM: return "ram";
    case MTD_ROM: return "rom";
    case MTD_NORFLASH: return "nor";
    case MTD_NANDFLASH: return "nand";
    case MTD_DATAFLASH: return "dataflash";
    case MTD_UBIVOLUME: return "ubi";
    case MTD_MLCNANDFLASH: return "mlc-nand";
    default: return "unknown";
  }
}

bool ReadProcMtd(std::vector<ProcMtdRow>* rows) {
  const os::SysCalls& sys = os::Sys();
  FILE* table = sys.fopen64(kProcMtd, "r");
  if (table == nullptr) return false;
  char line[kLineLength];
  rows->clear();
  for (bool header = true; sys.fgets(line, sizeof line, table) != nullptr; header = false) {
    if (header) continue;
    ProcMtdRow row;
    int nameAt = 0;
    if (std::sscanf(line, kProcMtdFormat, &row.number, &row.size, &row.eraseSize, &nameAt) != kProcMtdFields ||
        nameAt == 0)
      continue;
    std::string name = line + nameAt;
    row.name = name.substr(0, name.rfind('"'));
    rows->push_back(row);
  }
  sys.fclose(table);
  return true;
}

MtdNode::~MtdNode() {
  if (fd_ >= 0) os::Sys().close(fd_);
}

bool MtdNode::Failed() {
  error_ = errno;
  return false;
}

bool MtdNode::Open(const std::string& path, bool forWriting) {
  if (fd_ >= 0) os::Sys().close(fd_);
  fd_ = os::Sys().open(path.c_str(), (forWriting ? O_RDWR : O_RDONLY) | O_CLOEXEC, 0);
  return fd_ >= 0 || Failed();
}

bool MtdNode::GetGeometry(MtdGeometry* geometry) {
  mtd_info_user info{};
  if (os::Sys().ioctl(fd_, MEMGETINFO, &info) != 0) return Failed();
  geometry->type = info.type;
  geometry->size = info.size;
  geometry->eraseSize = info.erasesize;
  geometry->pageSize = info.writesize;
  geometry->oobSize = info.oobsize;
  geometry->writable = (info.flags & MTD_WRITEABLE) != 0;
  return true;
}

bool MtdNode::IsBadBlock(uint64_t offset, bool* bad) {
  loff_t at = static_cast<loff_t>(offset);
  const int answer = os::Sys().ioctl(fd_, MEMGETBADBLOCK, &at);
  if (answer < 0) return Failed();
  *bad = answer > 0;
  return true;
}

bool MtdNode::GetEccCounts(EccCounts* counts) {
  mtd_ecc_stats stats{};
  if (os::Sys().ioctl(fd_, ECCGETSTATS, &stats) != 0) return Failed();
  counts->corrected = stats.corrected;
  counts->failed = stats.failed;
  counts->badBlocks = stats.badblocks;
  counts->bbtBlocks = stats.bbtblocks;
  return true;
}

bool MtdNode::Read(uint64_t offset, void* data, size_t length) {
  const os::SysCalls& sys = os::Sys();
  if (sys.lseek64(fd_, static_cast<off64_t>(offset), SEEK_SET) < 0) return Failed();
  auto* out = static_cast<unsigned char*>(data);
  for (size_t done = 0; done < length;) {
    const ssize_t got = sys.read(fd_, out + done, length - done);
    if (got < 0) return Failed();
    if (got == 0) {
      error_ = EIO;  // the node ended early
      return false;
    }
    done += static_cast<size_t>(got);
  }
  return true;
}

bool MtdNode::ReadOob(uint64_t offset, void* oob, size_t length) {
  if (length > kMaxOobRequest) {
    error_ = EINVAL;
    return false;
  }
  mtd_oob_buf64 request{};
  request.start = offset;
  request.length = static_cast<__u32>(length);
  request.usr_ptr = reinterpret_cast<uintptr_t>(oob);
  if (os::Sys().ioctl(fd_, MEMREADOOB64, &request) != 0) return Failed();
  return true;
}

bool MtdNode::Erase(uint64_t offset, uint64_t length) {
  erase_info_user64 region{};
  region.start = offset;
  region.length = length;
  return os::Sys().ioctl(fd_, MEMERASE64, &region) == 0 || Failed();
}

}  // namespace mtdio
}  // namespace stbplat
