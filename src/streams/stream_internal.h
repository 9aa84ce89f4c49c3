// Internals shared by the Extruder and Intruder sources.
#ifndef STBPLAT_SRC_STREAMS_STREAM_INTERNAL_H
#define STBPLAT_SRC_STREAMS_STREAM_INTERNAL_H

#include <cstdint>

#include "stbplat/extruder.h"

namespace stbplat {
namespace streams {

constexpr const char* kExtruderSource = "../extruder";
constexpr const char* kIntruderSource = "../intruder";
constexpr unsigned int kStdinHistorySize = sizeof(Extruder::stdinHistory);

// Mode tests, in the order the operations apply them.
inline bool IsMemoryMode(const Extruder& s) {
  return s.pFile == nullptr && !s.isNand && !s.isEMMC;
}
inline bool IsFlashOffsetMode(const Extruder& s) { return s.isNand || s.isEMMC; }

// Bytes that really lie between pCurrent and the end of the buffer (0 when
// pCurrent is outside it). bytesLeft can overstate this after the kept
// position quirks; every memory access is bounded by both.
inline unsigned int PhysicalRoom(const Extruder& s) {
  auto start = reinterpret_cast<std::uintptr_t>(s.pStart);
  auto current = reinterpret_cast<std::uintptr_t>(s.pCurrent);
  if (s.pStart == nullptr || current < start || current > start + s.length) return 0;
  return static_cast<unsigned int>(start + s.length - current);
}

// Every field zero or empty: a memory stream over nothing.
void InitEmpty(Extruder& s);
void InitMemory(Extruder& s, const unsigned char* buffer, unsigned int length);

// Standard input: the history holds the last bytes read, ending at
// stdinTotalRead. Take copies what lies between stdinPosition and the end of
// the history and advances the position; Append records bytes just read.
unsigned int TakeFromStdinHistory(Extruder& s, unsigned char* dst, unsigned int n);
void AppendToStdinHistory(Extruder& s, const unsigned char* bytes, unsigned int n);

}  // namespace streams
}  // namespace stbplat

#endif
