// Binds an emulated device into the library through its OS seam: the
// device's nodes answer from the images under the root, the other /dev,
// /proc and /sys paths go to the files under the root, and everything else
// to the C library.
#include "hostsim/host_mode.h"

#include <unistd.h>

#include <memory>

#include "device_root.h"
#include "devmodel/flash_sim.h"
#include "stbplat/memory_map.h"

namespace stbplat {
namespace hostsim {
namespace {

// The emulation of the attached device, if any.
std::unique_ptr<devmodel::FlashSim>& Attached() {
  static std::unique_ptr<devmodel::FlashSim> sim;
  return sim;
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
  Attached() = std::move(sim);
  return true;
}

void Detach() {
  if (Attached()) ExtendedMemoryMapStructure::Reset();
  Attached().reset();
}

bool IsAttached() { return Attached() != nullptr; }

}  // namespace hostsim
}  // namespace stbplat
