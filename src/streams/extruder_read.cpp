// The extrude family: big-endian values and byte arrays from every mode.
#include <cstring>

#include "os/seam.h"
#include "streams/stream_device.h"
#include "streams/stream_internal.h"
#include "util/log_gate.h"

using stbplat::os::Sys;
using namespace stbplat::streams;

namespace {

constexpr auto kModule = eLogModuleByteStreams;
constexpr unsigned int kBitsPerByte = 8;
constexpr unsigned int kMaxBitFieldWidth = 16;
constexpr unsigned int kTopBitOfUnit = 0xFFFFFFFFu;
constexpr unsigned int kWidestShift = 31;
// What flash that was never written, or could not be read, holds.
constexpr unsigned char kErasedFlashByte = 0xFF;

template <typename T>
T DecodeBigEndian(const unsigned char* bytes) {
  T value = 0;
  for (unsigned int i = 0; i < sizeof(T); ++i) value = static_cast<T>((value << kBitsPerByte) | bytes[i]);
  return value;
}

// Reads n bytes from a standard-input stream: history first, then the pipe.
// Returns how many arrived.
unsigned int ReadStdin(Extruder& s, unsigned char* dst, unsigned int n) {
  unsigned int taken = TakeFromStdinHistory(s, dst, n);
  unsigned int fresh = static_cast<unsigned int>(Sys().fread(dst + taken, 1, n - taken, s.pFile));
  if (taken + fresh == n && fresh > 0) AppendToStdinHistory(s, dst + taken, fresh);
  return taken + fresh;
}

// Memory mode: k bytes at pCurrent, or code 2 with `logTooFew` called.
template <typename LogFn>
unsigned int ReadMemory(Extruder& s, unsigned char* dst, unsigned int k, LogFn logTooFew) {
  if (s.bytesLeft < k || PhysicalRoom(s) < k) {
    logTooFew();
    return kExtrudeFailed;
  }
  if (k == 1)
    *dst = *s.pCurrent;
  else
    std::memcpy(dst, s.pCurrent, k);
  s.pCurrent += k;
  s.bytesLeft -= k;
  return s.bytesLeft == 0 ? kExtrudeExhausted : kExtrudeOk;
}

// Every other mode: NOR, NAND, eMMC, then file or standard input.
unsigned int ReadSource(Extruder& s, unsigned char* dst, unsigned int k) {
  if (s.isNorFlash) {
    unsigned long address = s.norBaseOffset + reinterpret_cast<std::uintptr_t>(s.getP());
    // The NOR read reports nothing back: what it cannot read stays erased.
    std::memset(dst, kErasedFlashByte, k);
    DeviceNorRead(address, dst, k);
    // The position is an offset held in the pointer, from null: it moves as
    // an integer.
    s.setP(reinterpret_cast<unsigned char*>(reinterpret_cast<std::uintptr_t>(s.getP()) + k));
  } else if (s.isNand) {
    if (!DeviceNandRead(dst, k, s.partitionName, s.currNandOffset)) return kExtrudeFailed;
  } else if (s.isEMMC) {
    if (!DeviceEmmcRead(dst, k, s.partitionName, s.currNandOffset)) return kExtrudeFailed;
  } else {
    unsigned int got = s.IsUsingStdin()
                           ? ReadStdin(s, dst, k)
                           : static_cast<unsigned int>(Sys().fread(dst, 1, k, s.pFile));
    if (got < k) {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "extrude",
                  "Can't extrude from a file\r\n");
      return kExtrudeFailed;
    }
  }
  s.currNandOffset += k;
  return kExtrudeOk;
}

// The too-few message differs by width only in its text; it is one of the
// constant formats below.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
template <typename T>
unsigned int ExtrudeValue(Extruder& s, T* value, const char* tooFewFormat) {
  unsigned char bytes[sizeof(T)];
  unsigned int rc;
  if (IsMemoryMode(s)) {
    rc = ReadMemory(s, bytes, sizeof(T), [&] {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "extrude", tooFewFormat, s.bytesLeft);
    });
  } else {
    rc = ReadSource(s, bytes, sizeof(T));
  }
  if (rc == kExtrudeOk || rc == kExtrudeExhausted) *value = DecodeBigEndian<T>(bytes);
  return rc;
}
#pragma GCC diagnostic pop

constexpr const char* kTooFewBool = "Can't extrude bool, bytesLeft = %u\r\n";
constexpr const char* kTooFew16 = "Can't extrude uint16_t, bytesLeft = %u\r\n";
constexpr const char* kTooFew32 = "Can't extrude uint32_t, bytesLeft = %u\r\n";
constexpr const char* kTooFew64 = "Can't extrude uint64_t, bytesLeft = %u\r\n";

}  // namespace

unsigned int Extruder::extrude(bool* value) {
  unsigned char byte = 0;
  unsigned int rc = ExtrudeValue(*this, &byte, kTooFewBool);
  // The raw byte goes into the bool as it is, not normalised to 0 or 1.
  if (rc == kExtrudeOk || rc == kExtrudeExhausted) std::memcpy(value, &byte, 1);
  return rc;
}

unsigned int Extruder::extrude(unsigned short* value) { return ExtrudeValue(*this, value, kTooFew16); }

unsigned int Extruder::extrude(short* value) {
  unsigned short raw = 0;
  unsigned int rc = ExtrudeValue(*this, &raw, kTooFew16);
  if (rc == kExtrudeOk || rc == kExtrudeExhausted) *value = static_cast<short>(raw);
  return rc;
}

unsigned int Extruder::extrude(unsigned int* value) { return ExtrudeValue(*this, value, kTooFew32); }

unsigned int Extruder::extrude(int* value) {
  unsigned int raw = 0;
  unsigned int rc = ExtrudeValue(*this, &raw, kTooFew32);
  if (rc == kExtrudeOk || rc == kExtrudeExhausted) *value = static_cast<int>(raw);
  return rc;
}

unsigned int Extruder::extrude(unsigned long* value) { return ExtrudeValue(*this, value, kTooFew64); }

unsigned int Extruder::extrude(unsigned char* dst, unsigned int n) {
  if (IsMemoryMode(*this)) {
    return ReadMemory(*this, dst, n, [&] {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "extrude",
                  "Can't extrude array of %u bytes, bytesLeft = %u\r\n", n, bytesLeft);
    });
  }
  return ReadSource(*this, dst, n);
}

unsigned int Extruder::extrude(unsigned char* dst, unsigned int n, unsigned int* got) {
  if (pFile == nullptr) {
    return ReadMemory(*this, dst, n, [&] {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "extrude",
                  "Can't extrude array of %u bytes, bytesLeft = %u\r\n", n, bytesLeft);
    });
  }
  *got = 0;
  unsigned int taken = IsUsingStdin() ? TakeFromStdinHistory(*this, dst, n) : 0;
  unsigned int fresh = static_cast<unsigned int>(Sys().fread(dst + taken, 1, n - taken, pFile));
  *got = taken + fresh;
  if (*got < n) {
    if (Sys().ferror(pFile) == 0) {
      STBPLAT_LOG(kModule, eLogLevelTrace, kExtruderSource, "extrude",
                  "Extruded less than length specified\r\n");
      return kExtrudeShortFile;
    }
    STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "extrude", "Can't extrude from a file\r\n");
    return kExtrudeFailed;
  }
  if (IsUsingStdin() && fresh > 0) AppendToStdinHistory(*this, dst + taken, fresh);
  return kExtrudeOk;
}

unsigned int Extruder::extrude(UXB* dst, unsigned int width, unsigned int highBit) {
  if (width == 0 || width > kMaxBitFieldWidth) return kExtrudeBadBitField;
  const unsigned int unitBytes = width > kBitsPerByte ? 2 : 1;
  if (bytesLeft < unitBytes || PhysicalRoom(*this) < unitBytes) return kExtrudeFailed;
  const unsigned int topBit = unitBytes * kBitsPerByte - 1;
  if (highBit == kTopBitOfUnit) highBit = topBit;
  const int shift = static_cast<int>(highBit) - static_cast<int>(width) + 1;
  if (shift < 0 || static_cast<unsigned int>(shift) > kWidestShift) return kExtrudeBadBitField;
  unsigned int unit = unitBytes == 2 ? DecodeBigEndian<unsigned short>(pCurrent) : *pCurrent;
  unsigned int value = unit >> shift;
  if (highBit != topBit) value &= (1u << width) - 1u;
  if (unitBytes == 2)
    dst->word = static_cast<unsigned short>(value);
  else
    dst->byte = static_cast<unsigned char>(value);
  pCurrent += unitBytes;
  bytesLeft -= unitBytes;
  return bytesLeft == 0 ? kExtrudeExhausted : kExtrudeOk;
}
