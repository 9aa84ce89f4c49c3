// Extruder: the reading stream. Integers are read most significant byte first
// from a memory buffer, a file, standard input, an eMMC device, a flash slot or
// physical memory.
// A NOR read reports no failure (kept as it is); bytes it could not read
// arrive as erased flash (0xFF), never as whatever the caller's memory held.
#ifndef STBPLAT_EXTRUDER_H
#define STBPLAT_EXTRUDER_H

#include <cstdio>
#include <string>

#include "stbplat/export.h"

class ComponentLocation;

// Destination of a bit-field read: one byte or one 16-bit value.
union UXB {
  unsigned char byte;
  unsigned short word;
};

// Results of the extrude family.
enum {
  kExtrudeOk = 0,         // value read; bytes remain (memory mode)
  kExtrudeExhausted = 1,  // value read; memory buffer now exhausted
  kExtrudeFailed = 2,     // not enough bytes or read error
  kExtrudeShortFile = 3,  // array read with out-length: file ended early
  kExtrudeBadBitField = 4 // bit-field read: bad width or bit position
};

class STBPLAT_EXPORT Extruder {
 public:
  // Fields are public and in this order: programs built against this layout
  // read them directly.
  const unsigned char* pStart;
  unsigned char* pCurrent;
  unsigned int length;
  unsigned int bytesLeft;
  bool is64Address;
  bool isInitedOK;
  FILE* pFile;
  unsigned char stdinHistory[2000];
  unsigned int stdinHistoryCount;
  unsigned int stdinPosition;
  unsigned int stdinTotalRead;
  int memFd;
  unsigned char* pMapped;
  bool isNorFlash;
  unsigned int norBaseOffset;
  bool isNand;
  bool isEMMC;
  unsigned long currNandOffset;
  std::string partitionName;

  // Installs the class only; the fields are left for a derived class to fill.
  Extruder();
  Extruder(unsigned char const* buffer, unsigned int length);
  Extruder(char const* path, bool logErrors);
  Extruder(_IO_FILE* file);
  Extruder(char const* path, unsigned long startOffset, bool logErrors);
  Extruder(ComponentLocation const* location, bool writable);
  virtual ~Extruder();

  Extruder(const Extruder&) = delete;
  Extruder& operator=(const Extruder&) = delete;

  // Position operations (virtual, in this slot order).
  virtual Extruder& operator-=(unsigned int n);
  virtual Extruder& operator+=(unsigned int n);
  virtual unsigned char* getP();
  virtual bool setP(unsigned char* p);
  virtual unsigned long getP64();
  virtual bool setP64(unsigned long offset);

  Extruder& operator++();
  Extruder& operator--();

  unsigned int count();
  void SetLength(unsigned int newLength);
  bool IsUsingStdin();
  bool Is64Address();
  void Display();

  unsigned int extrude(bool* value);
  unsigned int extrude(unsigned short* value);
  unsigned int extrude(short* value);
  unsigned int extrude(unsigned int* value);
  unsigned int extrude(int* value);
  unsigned int extrude(unsigned long* value);
  unsigned int extrude(unsigned char* dst, unsigned int n);
  unsigned int extrude(unsigned char* dst, unsigned int n, unsigned int* got);
  unsigned int extrude(UXB* dst, unsigned int width, unsigned int highBit);
};

#endif
