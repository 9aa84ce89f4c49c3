// The hard disks of an emulated device, beside its flash (see host_mode.h):
//   dev/sdX.ini        a disk: link (its /sys/class/block/sdX link, as
//                      readlink prints it on the box), size (bytes), model,
//                      serial, bus (the SCSI bus number its generic node
//                      answers) and sg (that node's N of /dev/sgN; 0 for
//                      sda, 1 for sdb...)
//   dev/sdX.hdparm-i   what `hdparm -i /dev/sdX` prints on the box
//   dev/sdX.hdparm-I   what `hdparm -I /dev/sdX` prints
//   dev/sdX.smartctl-A what `smartctl -d ata -A /dev/sdX` prints
//   proc/modules       the kernel's module list, which lsmod shows
// /proc/scsi/scsi is a file under the root like any other /proc path.
#ifndef STBPLAT_HOSTSIM_DISK_ROOT_H
#define STBPLAT_HOSTSIM_DISK_ROOT_H

#include <string>

#include "devmodel/disk_sim.h"

namespace stbplat {
namespace hostsim {

// Whether dev/NAME.ini describes a disk (sda, sdb, ... sdaa): the flash
// loader leaves those to this one.
bool IsDiskName(const std::string& name);

// Adds the root's disks to sim. On failure returns false and says which
// file is wrong.
bool LoadDisks(const std::string& root, devmodel::DiskSim& sim, std::string* error);

}  // namespace hostsim
}  // namespace stbplat

#endif
