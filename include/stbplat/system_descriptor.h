// SystemDescriptor: the type-length-value framing shared by every system
// record. An entry on the wire is
//   uint32 type | uint32 size (4 + payload length) | uint16 flags |
//   uint8 major version | uint8 minor version | payload
// with multi-byte fields most significant byte first. The base writes and
// checks the type, back-patches the size, handles the common header and the
// version rule, and always leaves a reading stream exactly behind the entry;
// subclasses supply the payload through Read and Store.
//
// Safe edges on corrupt input:
// - Positions are computed as integers, so an entry size that points past a
//   memory stream makes the final repositioning fail (0xA012) instead of
//   forming an out-of-range pointer.
// - Positions of a memory stream are kept as offsets from its start, so an
//   output buffer that grows (moves) while an entry is written still gets
//   its size field patched in the right place.
// - A failed payload read clears valid even when the repositioning behind
//   the entry fails as well.
#ifndef STBPLAT_SYSTEM_DESCRIPTOR_H
#define STBPLAT_SYSTEM_DESCRIPTOR_H

#include "stbplat/descriptor_status.h"
#include "stbplat/export.h"

class Extruder;
class Intruder;

// Entry type codes: four ASCII characters, the first in the most
// significant byte.
enum : unsigned int {
  kEntryTypeVERS = 0x56455253,  // VersionEntry
  kEntryTypeMCSD = 0x4D435344,  // MemoryControllerSegmentDescriptor
  kEntryTypeMCET = 0x4D434554,  // MemoryControllerDescriptor
  kEntryTypeMCFG = 0x4D434647,  // MemoryConfigDescriptor
  kEntryTypeAFPD = 0x41465044,  // AnimatedFrontPanelDisplayEntry
  kEntryTypeDEVC = 0x44455643,  // DeviceConfigDescriptor
  kEntryTypeBSCK = 0x4253434B,  // BseckReloadDescriptor
  kEntryTypeSEQC = 0x53455143,  // SequenceControlDescriptor
  kEntryTypeBCFG = 0x42434647,  // BuildEnvironmentDescriptor
  kEntryTypePADD = 0x50414444,  // padding inside FSBL information
  kEntryTypeDATA = 0x44415441,  // DataEntry
  // The containers' own codes are not fixed by their readers (users pass
  // them); these are the defaults the default constructors use.
  kEntryTypeFSBL = 0x4653424C,  // FSBLInfo
  kEntryTypeBLDC = 0x424C4443   // BuildConfig
};

class STBPLAT_EXPORT SystemDescriptor {
 public:
  unsigned short flags;
  // Before a read: the newest major version accepted; after: the stored one.
  unsigned char majorVer;
  unsigned char minorVer;
  bool valid;
  unsigned int entryType;

  // Type 0, flags 0, version 0.0.
  SystemDescriptor();
  SystemDescriptor(unsigned int entryType, unsigned short flags, unsigned char majorVer,
                   unsigned char minorVer);
  SystemDescriptor(const SystemDescriptor& other);
  SystemDescriptor& operator=(const SystemDescriptor& other) = default;
  virtual ~SystemDescriptor();

  // Virtual slots, in this order: the common header, then the payload.
  virtual unsigned int ReadBase(Extruder& in);
  // entrySize counts from the header's flags field.
  virtual unsigned int Read(Extruder& in, unsigned int entrySize) = 0;
  virtual unsigned int Store(Intruder* out) const = 0;

  // Type, size, header and payload at the stream's position. On a foreign
  // type the stream is moved back to where the entry began.
  unsigned int ReadTLVAndData(Extruder& in, unsigned int* pEntrySize);
  // Header and payload of an entry whose type and size are already read;
  // leaves the stream entrySize bytes behind where it started.
  unsigned int ReadDescriptor(Extruder& in, unsigned int entrySize);
  // The whole entry; on a payload failure the stream is put back at the
  // entry's start, so the next write overwrites the partial entry.
  unsigned int StoreTLVAndData(Intruder* out) const;
  unsigned int StoreDescriptor(Intruder* out) const;
  unsigned int StoreBase(Intruder* out) const;
};

#endif
