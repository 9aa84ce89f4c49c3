// The types of the C-linkage exports and of the exported data, which the
// export check cannot see: a C symbol carries no parameter types.
#include <type_traits>

#include "stbplat/stbplat.h"

#define EXPORTED(name, ...) static_assert(std::is_same<decltype(name), __VA_ARGS__>::value, #name)

EXPORTED(CalcCRC16, unsigned short(const unsigned char*, unsigned short, unsigned short, bool,
                                   const unsigned char*, const unsigned char*));
EXPORTED(ComputeCRC16, unsigned short(const unsigned char*, unsigned short));
EXPORTED(CRC32Enet, unsigned int(unsigned int, const unsigned char*, unsigned int));
EXPORTED(CRC32EnetFinal, unsigned int(unsigned int));
EXPORTED(ComputeCRC32, unsigned int(const unsigned char*, unsigned int));

EXPORTED(GetVendorInfo, int(char*));
EXPORTED(GetBlkDevSize, unsigned long(const char*));
EXPORTED(IsDevHDD, int(const char*));
EXPORTED(GetHDDTemperature, int());
EXPORTED(HardDriveGetVendorType, int(const HardDriveNodeInfo*, unsigned int*));
EXPORTED(HardDriveProbeScsiBusPosition, int(unsigned int, unsigned int*));
EXPORTED(HardDriveGetTemperatureData, int(const HardDriveNodeInfo*, unsigned char, unsigned char*));
EXPORTED(HardDriveGetTemperature, bool(const HardDriveNodeInfo*, unsigned int*));
EXPORTED(GetHdTemperature, bool(int*));
EXPORTED(HardDriveProbeNodePosition, int(HardDriveNodeInfo*));
EXPORTED(HardDriveProbeSataPosition, int(HardDriveNodeInfo*));
EXPORTED(HardDriveScanDeviceNode, int(HardDriveNodeInfo*));

EXPORTED(strnchr, char*(const char*, unsigned long, char));
EXPORTED(StrSecurityCheck, bool(const char*, unsigned int));
EXPORTED(IsValidIpAddress, bool(const char*));
EXPORTED(IsValidSubNet, bool(const char*));
EXPORTED(DumpBuffer, void(etLogUtilModuleId, unsigned char, const unsigned char*, unsigned int));
EXPORTED(ZanSubSystemInit, int());
EXPORTED(HWSpecificInit, int());

EXPORTED(WriteToNORFlashAtAddr, bool(unsigned long, const unsigned char*, unsigned long));
EXPORTED(ReadFromNORFlashAtAddr, bool(unsigned long, unsigned char*, unsigned long));
EXPORTED(EraseNOR, bool(unsigned long, unsigned long));
EXPORTED(LookupMTDPartition, const char*(const char*, unsigned long*));
EXPORTED(LookupMTDPartitionLoc, const char*(const Location*, unsigned long*));
EXPORTED(NANDRead, bool(unsigned char*, unsigned long, const char*, unsigned long));
EXPORTED(NANDReadLoc, bool(unsigned char*, unsigned long, const Location*, unsigned long));
EXPORTED(NANDWrite, bool(const unsigned char*, unsigned long, const char*, unsigned long));
EXPORTED(NANDWriteLoc, bool(const unsigned char*, unsigned long, const Location*, unsigned long));
EXPORTED(GetNORSectorSize, unsigned long());
EXPORTED(isRDLQUpgradeInProgress, bool);
EXPORTED(FlashInterface::m_pSelf, FlashInterface*);
