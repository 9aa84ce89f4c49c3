#include "disk/disk_common.h"

namespace stbplat {
namespace disk {

const char* const kDeviceNodes[HARD_DRIVE_NODE_COUNT] = {"/dev/sda", "/dev/sdb", "/dev/sdc",
                                                         "/dev/sdd", "/dev/sde"};

void DevicePath(char (&out)[kPathSize], const char* prefix, const char* name) {
  std::snprintf(out, sizeof out, "%s%s", prefix, name != nullptr ? name : "");
}

bool ReadBlockDeviceLink(const char* name, char (&link)[kLinkSize]) {
  char path[kPathSize];
  DevicePath(path, "/sys/class/block/", name);
  const ssize_t length = os::Sys().readlink(path, link, sizeof link - 1);
  if (length < 0) return false;
  link[length] = '\0';
  return true;
}

}  // namespace disk
}  // namespace stbplat
