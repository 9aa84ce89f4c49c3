// Intruder: the writing stream. Integers are written most significant byte
// first into a memory buffer (borrowed, or owned and growable), a file, or a
// component location (flash slot, slot file or physical memory).
#ifndef STBPLAT_INTRUDER_H
#define STBPLAT_INTRUDER_H

#include "stbplat/export.h"
#include "stbplat/extruder.h"

// Results of the intrude family.
enum {
  kIntrudeOk = 1,          // written; room remains, or written to file/device
  kIntrudeFull = 2,        // written; memory buffer now exactly full
  kIntrudeFailed = 3,      // not written: no room, or file/device write failed
  kIntrudeGrowFailed = 6   // not written: growing the buffer failed
};

class STBPLAT_EXPORT Intruder : public Extruder {
 public:
  unsigned int growthStep;
  bool ownsBuffer;

  Intruder(unsigned char* buffer, unsigned int length);
  // Owned buffer of initialSize bytes (fallbackSize when initialSize is 0).
  // The growth step is 0: such a buffer never grows.
  Intruder(unsigned int initialSize, unsigned int fallbackSize);
  Intruder(char const* path, bool append);
  Intruder(ComponentLocation const* location);
  ~Intruder() override;

  unsigned int intrude(bool value);
  unsigned int intrude(unsigned char value);
  unsigned int intrude(unsigned short value);
  unsigned int intrude(short value);
  unsigned int intrude(unsigned int value);
  unsigned int intrude(int value);
  unsigned int intrude(unsigned long value);
  unsigned int intrude(unsigned char const* data, unsigned int n);

  unsigned int verify(unsigned int n);
  unsigned int resize(unsigned int n);
};

#endif
