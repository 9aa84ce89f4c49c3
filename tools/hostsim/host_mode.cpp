// Binds an emulated device into the library through its OS seam: the
// device's nodes answer from the images under the root, the other /dev,
// /proc and /sys paths go to the files under the root, and everything else
// to the C library.
#include "hostsim/host_mode.h"

#include <unistd.h>

#include <memory>

#include "device_root.h"
#include "disk_root.h"
#include "devmodel/flash_sim.h"
#include "stbplat/memory_map.h"

namespace stbplat {
namespace hostsim {
namespace {

// The emulation of the attached device, if any: its flash, and its disks
// bound over the flash.
struct Emulation {
  std::unique_ptr<devmodel::FlashSim> flash;
  std::unique_ptr<devmodel::DiskSim> disks;
};

Emulation& Attached() {
  static Emulation emulation;
  return emulation;
}

}  // namespace

bool Attach(const std::string& root, std::string* error) {
  Detach();
  auto sim = std::make_unique<devmodel::FlashSim>();
  sim->PassThrough([root](const char* path) { return HostPath(root, path); });
  if (!DeviceRoot::Load(root, *sim, error)) return false;
  // The platform reads its memory map itself, from the host's file system.
  // Without one the device has only its MTD partitions.
  std::string map = root + "/memory-map.ini";
  if (access(map.c_str(), F_OK) != 0) {
    ExtendedMemoryMapStructure::Reset();
  } else if (!ExtendedMemoryMapStructure::Load(map.c_str(), error)) {
    return false;
  }
  auto disks = std::make_unique<devmodel::DiskSim>();
  if (!LoadDisks(root, *disks, error)) return false;
  Attached().flash = std::move(sim);
  Attached().disks = std::move(disks);
  return true;
}

void Detach() {
  if (IsAttached()) ExtendedMemoryMapStructure::Reset();
  Attached().disks.reset();
  Attached().flash.reset();
}

bool IsAttached() { return Attached().flash != nullptr; }

}  // namespace hostsim
}  // namespace stbplat
