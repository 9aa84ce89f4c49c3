#include <type_traits>

#include "stbplat/disk.h"

static_assert(std::is_same<decltype(GetVendorInfo), int(char*)>::value, "GetVendorInfo");
static_assert(std::is_same<decltype(GetBlkDevSize), unsigned long(const char*)>::value,
              "GetBlkDevSize");
static_assert(std::is_same<decltype(IsDevHDD), int(const char*)>::value, "IsDevHDD");
static_assert(std::is_same<decltype(GetHDDTemperature), int()>::value, "GetHDDTemperature");
static_assert(std::is_same<decltype(HardDriveGetVendorType),
                           int(const HardDriveNodeInfo*, unsigned int*)>::value,
              "HardDriveGetVendorType");
static_assert(std::is_same<decltype(HardDriveProbeScsiBusPosition),
                           int(unsigned int, unsigned int*)>::value,
              "HardDriveProbeScsiBusPosition");
static_assert(std::is_same<decltype(HardDriveGetTemperatureData),
                           int(const HardDriveNodeInfo*, unsigned char, unsigned char*)>::value,
              "HardDriveGetTemperatureData");
static_assert(std::is_same<decltype(HardDriveGetTemperature),
                           bool(const HardDriveNodeInfo*, unsigned int*)>::value,
              "HardDriveGetTemperature");
static_assert(std::is_same<decltype(GetHdTemperature), bool(int*)>::value, "GetHdTemperature");
static_assert(std::is_same<decltype(HardDriveProbeNodePosition), int(HardDriveNodeInfo*)>::value,
              "HardDriveProbeNodePosition");
static_assert(std::is_same<decltype(HardDriveProbeSataPosition), int(HardDriveNodeInfo*)>::value,
              "HardDriveProbeSataPosition");
static_assert(std::is_same<decltype(HardDriveScanDeviceNode), int(HardDriveNodeInfo*)>::value,
              "HardDriveScanDeviceNode");
