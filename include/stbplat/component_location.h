// ComponentLocation: where a code component lies (tag, slot, offset in slot).
#ifndef STBPLAT_COMPONENT_LOCATION_H
#define STBPLAT_COMPONENT_LOCATION_H

#include "stbplat/export.h"
#include "stbplat/location.h"

class STBPLAT_EXPORT ComponentLocation {
 public:
  unsigned char componentTag[4];
  Location location;
  unsigned long slotOffset;

  ComponentLocation();
  ComponentLocation(const ComponentLocation& other);
  // The offset argument is discarded: the object starts with an empty tag at
  // offset 0, and callers set both afterwards.
  ComponentLocation(const unsigned char* device, const unsigned char* partition,
                    const unsigned char* slot, unsigned int slotOffset);
  ComponentLocation& operator=(const ComponentLocation& other);
  bool operator==(const ComponentLocation& other) const;
  void Display(unsigned char indent) const;
};

// The serialisable form: 36 bytes (tag, location, 64-bit offset).
class STBPLAT_EXPORT ComponentLocationStorage : public ComponentLocation {
 public:
  ComponentLocationStorage();
  // The names are read raw, as stored; a failed read leaves what it reached.
  unsigned int Read(Extruder& in);
  // The names go out through a LocationStorage copy, so in standard form: an
  // empty (all-zero) location is written as 24 '.'.
  unsigned int Store(Intruder* out) const;
};

#endif
