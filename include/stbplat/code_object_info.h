// CodeObjectInfo: the package header. Where the package's own header lies and
// up to sixteen code components.
#ifndef STBPLAT_CODE_OBJECT_INFO_H
#define STBPLAT_CODE_OBJECT_INFO_H

#include "stbplat/component_location.h"
#include "stbplat/export.h"

class STBPLAT_EXPORT CodeObjectInfo {
 public:
  static constexpr unsigned int kMaxComponents = 16;

  unsigned short unused;
  ComponentLocationStorage packageHeaderLocation;
  unsigned int numComponents;
  ComponentLocationStorage componentLocations[kMaxComponents];

  CodeObjectInfo();

  // A numComponents above 16 is refused with 0xA004 before any component is
  // read (the array holds 16).
  unsigned int Read(Extruder& in);
  // A numComponents above 16 is refused with 0xA004 before anything is
  // written.
  unsigned int Store(Intruder* out) const;
  // Shows at most the 16 components the array holds.
  void Display(unsigned char indent) const;
};

#endif
