// The example device's hard disk: its settings, what hdparm, smartctl and
// the kernel print about it, by path under the device root.
#ifndef STBPLAT_MKEXAMPLE_EXAMPLE_DISK_H
#define STBPLAT_MKEXAMPLE_EXAMPLE_DISK_H

#include <map>
#include <string>

namespace stbplat {
namespace example {

std::map<std::string, std::string> DiskFiles();

}  // namespace example
}  // namespace stbplat

#endif
