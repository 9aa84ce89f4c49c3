// "BSCK": the executing boot-security image type and the reload errors the
// boot stage met. Payload: uint16 ExecutingType, uint16 count, then count
// 8-byte errors (uint16 flags, uint8 majorVer, uint8 minorVer, uint16 Type,
// uint16 Error).
//
// Safe edge on corrupt input: the count is trusted only as far as elements
// read; the first failing element (at the latest, the stream's end) stops
// the loop.
#ifndef STBPLAT_BSECK_RELOAD_H
#define STBPLAT_BSECK_RELOAD_H

#include <vector>

#include "stbplat/export.h"
#include "stbplat/system_descriptor.h"

class STBPLAT_EXPORT BseckReloadError {
 public:
  unsigned short flags;
  unsigned char majorVer;
  unsigned char minorVer;
  unsigned short Type;
  unsigned short Error;

  // All fields 0; Read or the caller fills them.
  BseckReloadError();
  unsigned int Read(Extruder& in);
  unsigned int Store(Intruder* out) const;
  // "Type" and "Error" lines at log level 4, indent clamped to 199.
  void Display(unsigned char indent) const;
  // Compares Type and Error only.
  bool operator==(const BseckReloadError& other) const;
};

// Default versions: major 0, minor 0.
class STBPLAT_EXPORT BseckReloadDescriptor : public SystemDescriptor {
 public:
  unsigned short ExecutingType;
  std::vector<BseckReloadError> ReloadErrors;

  BseckReloadDescriptor();
  BseckReloadDescriptor(unsigned short flags, unsigned char majorVer, unsigned char minorVer);
  ~BseckReloadDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

#endif
