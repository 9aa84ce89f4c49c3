// What the first-stage boot loader leaves about itself and the board:
// FSBLInfo, a container of nested records, and its member DeviceConfig-
// Descriptor ("DEVC"). Read-only here: Store returns 0xA00A.
//
// FSBLInfo payload: the "VERS" entry, uint32 count, then count entries in any
// order: "DEVC", "MCFG" and "BSCK" fill the members, "PADD" is skipped, other
// types are skipped with a message. Padding and unknown entries count.
//
// Versions (callers may pass their own): FSBLInfo type "FSBL" (0x4653424C),
// major 0, minor 0; DeviceConfigDescriptor major 0, minor 0. Major 0 takes
// every record whose major version is 0, as all known producers write.
// Safe edges on corrupt input: the count is trusted only while entry headers
// can be read and skipped; a header that cannot be read, or a skip past the
// end of a memory stream or a file (a NOR partition, a slot file), stops the
// loop with 0xA012 without moving, allocating or writing anything.
#ifndef STBPLAT_FSBL_INFO_H
#define STBPLAT_FSBL_INFO_H

#include "stbplat/bseck_reload.h"
#include "stbplat/export.h"
#include "stbplat/memory_config.h"
#include "stbplat/system_descriptor.h"
#include "stbplat/version_entry.h"

// Payload: uint16 scbClock, uint8 avsEnabled, uint8 reserved.
class STBPLAT_EXPORT DeviceConfigDescriptor : public SystemDescriptor {
 public:
  unsigned short scbClock;
  unsigned char avsEnabled;
  unsigned char reserved;

  DeviceConfigDescriptor();
  DeviceConfigDescriptor(unsigned short flags, unsigned char majorVer, unsigned char minorVer);
  ~DeviceConfigDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

class STBPLAT_EXPORT FSBLInfo : public SystemDescriptor {
 public:
  VersionEntry versionEntry;
  MemoryConfigDescriptor memConfig;
  DeviceConfigDescriptor deviceConfig;
  BseckReloadDescriptor BseckInfo;

  FSBLInfo();
  FSBLInfo(unsigned int entryType, unsigned short flags, unsigned char majorVer,
           unsigned char minorVer);
  ~FSBLInfo() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

#endif
