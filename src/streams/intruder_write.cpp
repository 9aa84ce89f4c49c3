// The intrude family: big-endian values and byte arrays into every mode.
#include <cerrno>
#include <cstring>

#include "os/seam.h"
#include "streams/stream_device.h"
#include "streams/stream_internal.h"
#include "stbplat/intruder.h"
#include "util/log_gate.h"

using stbplat::os::Sys;
using namespace stbplat::streams;

namespace {

constexpr auto kModule = eLogModuleByteStreams;
constexpr unsigned int kBitsPerByte = 8;

template <typename T>
void EncodeBigEndian(T value, unsigned char* bytes) {
  for (unsigned int i = sizeof(T); i > 0; --i) {
    bytes[i - 1] = static_cast<unsigned char>(value & 0xFFu);
    value = static_cast<T>(value >> kBitsPerByte);
  }
}

// File and device modes: NAND, eMMC, NOR, then a plain file.
unsigned int WriteTarget(Intruder& s, const unsigned char* bytes, unsigned int k) {
  if (s.isNand) {
    if (!DeviceNandWrite(bytes, k, s.partitionName, s.currNandOffset)) return kIntrudeFailed;
  } else if (s.isEMMC) {
    if (!DeviceEmmcWrite(bytes, k, s.partitionName, s.currNandOffset)) return kIntrudeFailed;
  } else if (s.isNorFlash) {
    unsigned long address = s.norBaseOffset + reinterpret_cast<std::uintptr_t>(s.getP());
    DeviceNorWrite(address, bytes, k);  // the NOR write reports nothing back
    // The position is an offset held in the pointer, from null: it moves as
    // an integer.
    s.setP(reinterpret_cast<unsigned char*>(reinterpret_cast<std::uintptr_t>(s.getP()) + k));
    return kIntrudeOk;  // the device offset does not move in this mode
  } else {
    long position = Sys().ftell(s.pFile);
    size_t written = Sys().fwrite(bytes, 1, k, s.pFile);
    if (written < k) {
      int error = errno;
      STBPLAT_LOG(kModule, eLogLevelError, kIntruderSource, "intrude",
                  "fwrite of %lu bytes failed, wrote %lu bytes, file location = %d, errno = %d, "
                  "ferror = %d\r\n",
                  static_cast<unsigned long>(k), static_cast<unsigned long>(written),
                  static_cast<int>(position), error, Sys().ferror(s.pFile));
      return kIntrudeFailed;
    }
  }
  s.currNandOffset += k;
  return kIntrudeOk;
}

unsigned int WriteBytes(Intruder& s, const unsigned char* bytes, unsigned int k) {
  if (s.pFile != nullptr) return WriteTarget(s, bytes, k);
  unsigned int rc = s.verify(k);
  if (rc != 0) return rc;
  if (k == 1)
    *s.pCurrent = *bytes;
  else if (k != 0)
    std::memcpy(s.pCurrent, bytes, k);
  s.pCurrent += k;
  s.bytesLeft -= k;
  return s.bytesLeft == 0 ? kIntrudeFull : kIntrudeOk;
}

template <typename T>
unsigned int IntrudeValue(Intruder& s, T value) {
  unsigned char bytes[sizeof(T)];
  EncodeBigEndian(value, bytes);
  return WriteBytes(s, bytes, sizeof(T));
}

}  // namespace

unsigned int Intruder::intrude(bool value) {
  unsigned char byte;
  std::memcpy(&byte, &value, 1);
  if (pFile != nullptr) return WriteTarget(*this, &byte, 1);
  // Kept as it always was: the verdict of verify is not looked at, and the
  // result comes from bytesLeft alone, even when nothing could be written.
  if (verify(1) == 0) {
    *pCurrent = byte;
    ++pCurrent;
    --bytesLeft;
  }
  return bytesLeft == 0 ? kIntrudeFull : kIntrudeOk;
}

unsigned int Intruder::intrude(unsigned char value) { return WriteBytes(*this, &value, 1); }

unsigned int Intruder::intrude(unsigned short value) { return IntrudeValue(*this, value); }

unsigned int Intruder::intrude(short value) {
  return IntrudeValue(*this, static_cast<unsigned short>(value));
}

unsigned int Intruder::intrude(unsigned int value) { return IntrudeValue(*this, value); }

unsigned int Intruder::intrude(int value) { return IntrudeValue(*this, static_cast<unsigned int>(value)); }

unsigned int Intruder::intrude(unsigned long value) { return IntrudeValue(*this, value); }

unsigned int Intruder::intrude(unsigned char const* data, unsigned int n) { return WriteBytes(*this, data, n); }
