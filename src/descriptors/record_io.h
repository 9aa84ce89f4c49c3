// Helpers shared by the record readers and writers: result tests, logging,
// and stream positions as plain integers.
#ifndef STBPLAT_SRC_DESCRIPTORS_RECORD_IO_H
#define STBPLAT_SRC_DESCRIPTORS_RECORD_IO_H

#include "stbplat/descriptor_status.h"
#include "stbplat/extruder.h"
#include "stbplat/intruder.h"
#include "util/log_gate.h"

namespace stbplat {
namespace records {

constexpr const char* kLogSource = "SystemDescriptor";

inline bool Extruded(unsigned int result) {
  return result == kExtrudeOk || result == kExtrudeExhausted;
}

inline bool Intruded(unsigned int result) {
  return result == kIntrudeOk || result == kIntrudeFull;
}

// Stream positions as integers, through the operations that really move
// the stream in its mode: getP64/setP64 on NAND and eMMC (their running
// device offset), getP/setP everywhere else, including the other 64-bit
// streams (a NOR component or slot file moves its file position, physical
// memory its pointer), where getP64/setP64 would not move. A memory
// stream's position is its offset from pStart, so that positions noted
// before a growable buffer moves stay valid.
unsigned long Position(Extruder& in);
bool SetPosition(Extruder& in, unsigned long position);

// True for the modes positioned by getP64/setP64 (NAND, eMMC).
bool MovesBy64(const Extruder& in);

// Only a memory stream knows for certain how many bytes are left.
bool IsMemoryStream(const Extruder& in);

// Moves forward n bytes. Refuses (without moving) when a memory stream or a
// file holds fewer than n bytes, so that a size read from flash never makes
// a skip allocate or write, and callers looping over a corrupt count stop at
// the stream's end.
bool Skip(Extruder& in, unsigned long n);

}  // namespace records
}  // namespace stbplat

// Record diagnostics: module 3, level 2.
#define RECORD_ERROR(function, ...) \
  STBPLAT_LOG(eLogModuleRecords, eLogLevelError, ::stbplat::records::kLogSource, function, \
              __VA_ARGS__)

// The four characters of a type code, most significant byte first, as
// arguments for "%c%c%c%c".
#define RECORD_TYPE_CHARS(type)                                           \
  static_cast<int>(((type) >> 24) & 0xFFu), static_cast<int>(((type) >> 16) & 0xFFu), \
      static_cast<int>(((type) >> 8) & 0xFFu), static_cast<int>((type) & 0xFFu)

#endif
