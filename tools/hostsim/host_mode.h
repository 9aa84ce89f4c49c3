// Host mode: runs the library against a device emulated from files.
//
// A device root holds
//   memory-map.ini          the platform memory map (devices, partitions, slots);
//                           without it the device has only its MTD partitions
//   proc/mtd                the kernel's partition table, as on the device
//   dev/mtdN                one image per MTD partition
//   dev/mtdN.ini            its geometry: medium (nor, nand, emmc), size,
//                           erase and page size, OOB size and whether the
//                           image holds the OOB bytes (layout = oob, plain);
//                           or the image it is a window of, and where
//   dev/mtdN.bad            the bad blocks of a NAND image without OOB bytes
//   dev/mmca                the whole eMMC device
//   dev/sdX.ini ...         hard disks and their tools' output (disk_root.h)
// README.md tells the keys and the checks made on them.
// While attached, the library's device and file calls for /proc/mtd and
// /dev/... are answered from these files, every other path is passed on, and
// the platform's memory map is the one in the root.
#ifndef STBPLAT_HOSTSIM_HOST_MODE_H
#define STBPLAT_HOSTSIM_HOST_MODE_H

#include <string>

namespace stbplat {
namespace hostsim {

// Binds the device under root. On failure returns false and says why.
bool Attach(const std::string& root, std::string* error);
// Unbinds it (flushing what the images need); harmless when not attached.
void Detach();
bool IsAttached();

}  // namespace hostsim
}  // namespace stbplat

#endif
