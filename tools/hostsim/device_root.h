// The files of an emulated device (see host_mode.h for the layout), loaded
// once: the MTD partitions listed in proc/mtd and the images behind them.
#ifndef STBPLAT_HOSTSIM_DEVICE_ROOT_H
#define STBPLAT_HOSTSIM_DEVICE_ROOT_H

#include <cstdint>
#include <map>
#include <memory>
#include <string>

#include "flash_image.h"

namespace stbplat {
namespace hostsim {

// /dev/mtdN: a window of an image. Several partitions may share one image
// (a whole-chip partition and the slots inside it).
struct MtdNode {
  FlashImage* image = nullptr;
  uint64_t base = 0;  // where the partition starts in the image
  Geometry geometry;  // the partition's own size, the image's block sizes
};

class DeviceRoot {
 public:
  // Reads proc/mtd and opens every partition's image. On failure returns
  // null and says which file is wrong.
  static std::unique_ptr<DeviceRoot> Load(const std::string& root, std::string* error);

  const std::string& root() const { return root_; }
  // Null when the partition does not exist.
  MtdNode* Node(int number);
  // Where a device path lies on the host: under the root for /dev, /proc and
  // /sys, unchanged otherwise.
  std::string HostPath(const char* path) const;

 private:
  explicit DeviceRoot(const std::string& root) : root_(root) {}
  FlashImage* Image(const std::string& name, std::string* error);
  bool LoadNode(int number, uint64_t size, uint64_t eraseSize, const std::string& name,
                std::string* error);

  std::string root_;
  std::map<int, MtdNode> nodes_;
  std::map<std::string, std::unique_ptr<FlashImage>> images_;
  // proc/mtd sizes, for partitions used as images of others.
  std::map<std::string, std::pair<uint64_t, uint64_t>> mtdSizes_;
  std::map<std::string, std::string> mtdNames_;
};

// "/dev/mtd7" gives 7; anything else (including "/dev/mtd7ro") gives -1.
int MtdNumberOfPath(const char* path);

}  // namespace hostsim
}  // namespace stbplat

#endif
