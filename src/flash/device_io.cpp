// The only places that open a flash node and move bytes: one transfer per
// call, the node opened and closed around it.
#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <cerrno>

#include "flash/flash_internal.h"
#include "os/seam.h"

using stbplat::os::ScopedFd;
using stbplat::os::Sys;
using namespace stbplat::flash;

namespace {

// Checks the read-only open and positions the node; logs what failed.
// Shared by the MTD and eMMC reads.
bool PositionForRead(const ScopedFd& fd, const char* path, unsigned long offset,
                     const char* function) {
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, function, "Unable to open the flash device: %s", path);
    return false;
  }
  if (Sys().lseek64(fd.get(), static_cast<off64_t>(offset), SEEK_SET) < 0) {
    FLASH_LOG(eLogLevelError, function, "Unable to seek the flash to 0x%llX",
              static_cast<unsigned long long>(offset));
    return false;
  }
  return true;
}

// One read of the whole length; logs a short or failed read.
bool ReadAll(ScopedFd& fd, const char* path, unsigned char* buffer, unsigned long length,
             const char* function) {
  ssize_t got = Sys().read(fd.get(), buffer, length);
  if (got == static_cast<ssize_t>(length)) return true;
  int error = errno;
  int descriptor = fd.get();
  fd.Reset();
  FLASH_LOG(eLogLevelError, function,
            "Unable to read the flash device: %s, %d, asked: %llu, got: %d, errno = %d\r\n", path,
            descriptor, static_cast<unsigned long long>(length), static_cast<int>(got), error);
  return false;
}

unsigned int FailedEccCount(int fd, bool* known) {
  mtd_ecc_stats stats{};
  *known = Sys().ioctl(fd, ECCGETSTATS, &stats) == 0;
  return *known ? stats.failed : 0;
}

}  // namespace

bool FlashInterface::LinuxFlashRead(const char* path, unsigned long offset, unsigned char* buffer,
                                    unsigned long length) {
  if (buffer == nullptr) {
    FLASH_LOG(eLogLevelError, "LinuxFlashRead", "pBuffer is NULL\r\n");
    return false;
  }
  ScopedFd fd(Sys().open(path, O_RDONLY, 0));
  if (!PositionForRead(fd, path, offset, "LinuxFlashRead")) return false;
  bool known = false;
  unsigned int baseline = FailedEccCount(fd.get(), &known);
  if (!ReadAll(fd, path, buffer, length, "LinuxFlashRead")) return false;
  unsigned int failed = FailedEccCount(fd.get(), &known);
  fd.Reset();
  if (!known || failed == baseline) return true;
  FLASH_LOG(eLogLevelError, "LinuxFlashRead",
            "ECC error reading the flash device %s, failed = 0x%llx, stats.failed = %d\r\n", path,
            static_cast<unsigned long long>(baseline), static_cast<int>(failed));
  return false;
}

bool FlashInterface::LinuxEMMCRead(const char* path, unsigned long offset, unsigned char* buffer,
                                   unsigned long length) {
  if (buffer == nullptr) {
    FLASH_LOG(eLogLevelError, "LinuxEMMCRead", "pBuffer is NULL\r\n");
    return false;
  }
  ScopedFd fd(Sys().open(path, O_RDONLY, 0));
  if (!PositionForRead(fd, path, offset, "LinuxEMMCRead")) return false;
  return ReadAll(fd, path, buffer, length, "LinuxEMMCRead");
}

bool FlashInterface::LinuxFlashWrite(const char* path, unsigned long offset,
                                     const unsigned char* buffer, unsigned long length) {
  ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC | O_CREAT, kCreateMode));
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, "LinuxFlashWrite", "Unable to open the flash device: %s\r\n", path);
    return false;
  }
  if (Sys().lseek64(fd.get(), static_cast<off64_t>(offset), SEEK_SET) < 0) {
    FLASH_LOG(eLogLevelError, "LinuxFlashWrite", "Unable to lseek64 the flash device %s to 0x%llX\r\n",
              path, static_cast<unsigned long long>(offset));
    return false;
  }
  ssize_t written = Sys().write(fd.get(), buffer, length);
  fd.Reset();
  if (written == static_cast<ssize_t>(length)) return true;
  FLASH_LOG(eLogLevelError, "LinuxFlashWrite",
            "Unable to write the flash device %s at offset 0x%08llX, asked: %llu, got: %llu\r\n",
            path, static_cast<unsigned long long>(offset), static_cast<unsigned long long>(length),
            static_cast<unsigned long long>(written));
  return false;
}

bool FlashInterface::LinuxEMMCWrite(const char* path, unsigned long offset,
                                    const unsigned char* buffer, unsigned long length) {
  return LinuxFlashWrite(path, offset, buffer, length);
}

unsigned long FlashInterface::GetDevSize(const char* path) {
  ScopedFd fd(Sys().open(path, O_RDWR, 0));
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, "GetDevSize", "GetDevSize: Failed to obtain file handle for %s\r\n",
              path);
    return 0;
  }
  mtd_info_user info{};
  if (Sys().ioctl(fd.get(), MEMGETINFO, &info) != 0) {
    FLASH_LOG(eLogLevelError, "GetDevSize", "GetDevSize: MEMGETINFO of mtd partition %s failed\r\n",
              path);
    return 0;
  }
  return info.size;
}

bool FlashInterface::ValidBlockOffset(const char* path, unsigned long offset,
                                      unsigned long& physical) {
  unsigned long size = GetDevSize(path);
  if (size == 0) return false;
  if (offset >= size) {
    FLASH_LOG(eLogLevelError, "ValidBlockOffset",
              "ValidBlockOffset: offset (0x%08llX) > device size (0x%08llX) for %s\r\n",
              static_cast<unsigned long long>(offset), static_cast<unsigned long long>(size), path);
    return false;
  }
  // Without a NAND block size the walk below would never advance.
  if (nandSectorSize == 0) return false;
  ScopedFd fd(Sys().open(path, O_RDWR, 0));
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, "ValidBlockOffset",
              "ValidBlockOffset: Failed to obtain file handle for %s\r\n", path);
    return false;
  }
  badBlocksSkipped = 0;
  for (unsigned long position = 0; position <= offset && position < size;
       position += nandSectorSize) {
    loff_t query = static_cast<loff_t>(position);
    if (Sys().ioctl(fd.get(), MEMGETBADBLOCK, &query) > 0) {
      offset += nandSectorSize;
      ++badBlocksSkipped;
    }
  }
  fd.Reset();
  if (offset < size) {
    physical = offset;
    return true;
  }
  FLASH_LOG(eLogLevelError, "ValidBlockOffset",
            "ValidBlockOffset: final offset (0x%08llX) > device size (0x%08llX) for %s\r\n",
            static_cast<unsigned long long>(offset), static_cast<unsigned long long>(size), path);
  return false;
}
