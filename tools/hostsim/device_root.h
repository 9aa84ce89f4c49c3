// The files of an emulated device (see host_mode.h for the layout), loaded
// once into the emulated device: the MTD partitions listed in proc/mtd, the
// images behind them and the eMMC devices.
#ifndef STBPLAT_HOSTSIM_DEVICE_ROOT_H
#define STBPLAT_HOSTSIM_DEVICE_ROOT_H

#include <cstdint>
#include <map>
#include <memory>
#include <string>

#include "devmodel/flash_sim.h"
#include "devmodel/image_storage.h"

namespace stbplat {
namespace hostsim {

class DeviceRoot {
 public:
  // Reads proc/mtd and the settings beside the images, and adds every
  // partition and eMMC device to sim. On failure returns false and says
  // which file is wrong, with the line where it has lines.
  static bool Load(const std::string& root, devmodel::FlashSim& sim, std::string* error);

 private:
  // A line of proc/mtd.
  struct Row {
    int number;
    uint64_t size, eraseSize;
    std::string name;
    std::string where;  // "ROOT/proc/mtd:LINE", for the messages
  };

  DeviceRoot(const std::string& root, devmodel::FlashSim& sim) : root_(root), sim_(sim) {}
  // The node of image `name` (dev/NAME), added on first use.
  devmodel::DeviceNode* Image(const std::string& name, std::string* error);
  bool LoadNode(const Row& row, std::string* error);
  bool LoadEmmcDevices(std::string* error);

  std::string root_;
  devmodel::FlashSim& sim_;
  std::map<std::string, devmodel::Geometry> images_;
  // The rows by node name ("mtd7"), for partitions used as images of others.
  std::map<std::string, Row> rows_;
};

// Where a device path lies on the host: under root for /dev, /proc and /sys,
// unchanged otherwise.
std::string HostPath(const std::string& root, const char* path);

}  // namespace hostsim
}  // namespace stbplat

#endif
