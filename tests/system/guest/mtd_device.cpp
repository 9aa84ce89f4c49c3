#include "mtd_device.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdio>

namespace systest {

constexpr unsigned char kErasedByte = 0xFF;

MtdDevice::MtdDevice(const std::string& path) : fd_(::open(path.c_str(), O_RDWR | O_SYNC)) {
  if (fd_ >= 0 && ::ioctl(fd_, MEMGETINFO, &info_) != 0) {
    std::perror(path.c_str());
  }
}

MtdDevice::~MtdDevice() {
  if (fd_ >= 0) ::close(fd_);
}

long MtdDevice::Write(std::uint64_t offset, const std::vector<unsigned char>& data) {
  return ::pwrite(fd_, data.data(), data.size(), static_cast<off_t>(offset));
}

long MtdDevice::Read(std::uint64_t offset, std::vector<unsigned char>& data) {
  return ::pread(fd_, data.data(), data.size(), static_cast<off_t>(offset));
}

int MtdDevice::Erase(std::uint64_t offset, std::uint64_t length) {
  erase_info_user region{static_cast<__u32>(offset), static_cast<__u32>(length)};
  return ::ioctl(fd_, MEMERASE, &region);
}

int MtdDevice::IsBad(std::uint64_t offset) {
  loff_t at = static_cast<loff_t>(offset);
  return ::ioctl(fd_, MEMGETBADBLOCK, &at);
}

int MtdDevice::MarkBad(std::uint64_t offset) {
  loff_t at = static_cast<loff_t>(offset);
  return ::ioctl(fd_, MEMSETBADBLOCK, &at);
}

bool MtdDevice::EccStats(mtd_ecc_stats& stats) { return ::ioctl(fd_, ECCGETSTATS, &stats) == 0; }

long MtdDevice::Seek(std::uint64_t offset) {
  return static_cast<long>(::lseek64(fd_, static_cast<off64_t>(offset), SEEK_SET));
}

bool MtdDevice::EraseAllGood() {
  bool all = true;
  for (std::uint64_t at = 0; at < info_.size; at += info_.erasesize) {
    if (IsBad(at) > 0) continue;
    if (Erase(at, info_.erasesize) != 0) all = false;
  }
  return all;
}

std::vector<unsigned char> MtdDevice::ReadAll(std::uint64_t offset, std::size_t length) {
  std::vector<unsigned char> data(length);
  if (Read(offset, data) != static_cast<long>(length)) data.clear();
  return data;
}

std::vector<std::uint64_t> MtdDevice::BadBlocks() {
  std::vector<std::uint64_t> bad;
  for (std::uint64_t at = 0; at < info_.size; at += info_.erasesize)
    if (IsBad(at) > 0) bad.push_back(at / info_.erasesize);
  return bad;
}

std::vector<unsigned char> Erased(std::size_t size) {
  return std::vector<unsigned char>(size, kErasedByte);
}

}  // namespace systest
