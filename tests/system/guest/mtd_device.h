// Direct access to an MTD character device for the guest scenarios: the
// kernel's own behaviour, without the library in between, so scenarios can
// prepare and inspect flash independently of the code under test.
#ifndef STBPLAT_SYSTEST_MTD_DEVICE_H
#define STBPLAT_SYSTEST_MTD_DEVICE_H

#include <mtd/mtd-abi.h>

#include <cstdint>
#include <string>
#include <vector>

namespace systest {

class MtdDevice {
 public:
  explicit MtdDevice(const std::string& path);
  ~MtdDevice();
  MtdDevice(const MtdDevice&) = delete;
  MtdDevice& operator=(const MtdDevice&) = delete;

  bool ok() const { return fd_ >= 0; }
  const mtd_info_user& info() const { return info_; }
  // Each returns the system call's result; errno tells why it failed.
  long Write(std::uint64_t offset, const std::vector<unsigned char>& data);
  long Read(std::uint64_t offset, std::vector<unsigned char>& data);
  int Erase(std::uint64_t offset, std::uint64_t length);
  int IsBad(std::uint64_t offset);
  int MarkBad(std::uint64_t offset);
  bool EccStats(mtd_ecc_stats& stats);
  long Seek(std::uint64_t offset);
  // Erases every good block; false when an erase failed.
  bool EraseAllGood();
  std::vector<unsigned char> ReadAll(std::uint64_t offset, std::size_t length);
  std::vector<std::uint64_t> BadBlocks();

 private:
  int fd_;
  mtd_info_user info_{};
};

std::vector<unsigned char> Erased(std::size_t size);

}  // namespace systest

#endif
