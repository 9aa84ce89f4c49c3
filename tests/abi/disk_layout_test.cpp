#include <cstddef>

#include "stbplat/disk.h"

// The temperature probes read the node number at byte 8 of the record.
static_assert(offsetof(HardDriveNodeInfo, scsiDeviceCount) == 0, "scsiDeviceCount");
static_assert(offsetof(HardDriveNodeInfo, scsiBus) == 4, "scsiBus");
static_assert(offsetof(HardDriveNodeInfo, deviceNode) == 8, "deviceNode");
static_assert(sizeof(HardDriveNodeInfo) == 12, "HardDriveNodeInfo size");
