// The DRAM the boot loader configured: "MCFG" holds controllers ("MCET"),
// each holding segments ("MCSD"). Controller and segment changed layout at
// minor version 6; both layouts are read, decided by the minor version in
// the record's own header, and the new one is always written.
//
// A minor-5 controller or segment is converted as it is read (sizes to MiB)
// and keeps minorVer 5, so a program can tell an old record from a new one.
// A store writes the minor-6 layout under a minor-6 header (the common
// header's writer raises the minor version of these two types to 6), so
// what a store writes reads back to the same controller and segments.
// A failing segment is removed from its controller's list again; a failing
// controller stays in the configuration's list as its read left it.
// Safe edges on corrupt input: element counts are trusted only as far as
// elements read; the first element that fails (at the latest, the stream's
// end) stops the loop, and lists grow per element read, never by the count.
#ifndef STBPLAT_MEMORY_CONFIG_H
#define STBPLAT_MEMORY_CONFIG_H

#include <vector>

#include "stbplat/export.h"
#include "stbplat/system_descriptor.h"

enum : unsigned char {
  // The first minor version of the current controller and segment layouts.
  kMemoryLayoutMinorVersion = 6
};

// Payload: uint64 segmentPhysicalAddressStart, uint32 segmentSize (MiB; in
// bytes up to minor 5). Constructed with major 0, minor 6.
class STBPLAT_EXPORT MemoryControllerSegmentDescriptor : public SystemDescriptor {
 public:
  unsigned long segmentPhysicalAddressStart;
  unsigned int segmentSize;  // MiB

  MemoryControllerSegmentDescriptor();
  ~MemoryControllerSegmentDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

// Payload from minor 6: six uint16 DDR fields, uint16 count, the segments.
// Up to minor 5: uint32 controller number (discarded), uint32 count, the
// segments; such a record reads with zero DDR fields and valid false.
// Constructed with major 0, minor 6.
class STBPLAT_EXPORT MemoryControllerDescriptor : public SystemDescriptor {
 public:
  unsigned short ddrCfgWidth;
  unsigned short ddrSize;
  unsigned short ddrSpeed;
  unsigned short ddrDevTech;
  unsigned short ddrMode;
  unsigned short ddrDevWidth;
  std::vector<MemoryControllerSegmentDescriptor> memorySegments;

  MemoryControllerDescriptor();
  ~MemoryControllerDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

// Payload: uint8 count, uint8 reserved (0), the controllers. The count is
// one byte: more than 255 controllers cannot be stored faithfully.
// Default versions: major 0, minor 6 (versioned with its members).
class STBPLAT_EXPORT MemoryConfigDescriptor : public SystemDescriptor {
 public:
  std::vector<MemoryControllerDescriptor> memoryControllers;

  MemoryConfigDescriptor();
  MemoryConfigDescriptor(unsigned short flags, unsigned char majorVer, unsigned char minorVer);
  ~MemoryConfigDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

#endif
