// Location: one place in the device's flash, named by device, partition and
// slot. Each name is 8 bytes, upper case, padded with '.', not terminated.
// A default-constructed Location is all zero bytes (empty), not '.'-padded.
#ifndef STBPLAT_LOCATION_H
#define STBPLAT_LOCATION_H

#include <string>

#include "stbplat/export.h"

class Extruder;
class Intruder;

class STBPLAT_EXPORT Location {
 public:
  unsigned char deviceName[8];
  unsigned char partitionName[8];
  unsigned char slotName[8];

  Location();
  Location(const Location& other);
  Location(const unsigned char* device, const unsigned char* partition, const unsigned char* slot);
  Location& operator=(const Location& other);

  void Set(const unsigned char* device, const unsigned char* partition, const unsigned char* slot);
  // Decided by the platform library's AreLocationsSame.
  bool operator==(const Location& other) const;

  static void ConvertToStandardFormat(const unsigned char* src, unsigned char* dst,
                                      unsigned char width);
  // "DEVICE.PARTITION.SLOT"; only '.' ends a name, so NUL bytes of an empty
  // Location are kept in the string.
  std::string GetNameString() const;
  void Display(unsigned char indent) const;
  void DisplayCompact(bool newline) const;
};

// The serialisable form: the same 24 bytes, read and written raw.
class STBPLAT_EXPORT LocationStorage : public Location {
 public:
  LocationStorage(const Location& location);
  unsigned int Read(Extruder& in);
  unsigned int Store(Intruder* out) const;
};

#endif
