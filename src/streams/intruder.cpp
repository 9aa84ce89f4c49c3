// Intruder construction, destruction and buffer growth.
#include <algorithm>
#include <cstring>
#include <new>

#include "os/seam.h"
#include "streams/stream_internal.h"
#include "stbplat/intruder.h"
#include "util/log_gate.h"

using stbplat::os::Sys;
using namespace stbplat::streams;

namespace {
constexpr auto kModule = eLogModuleByteStreams;
}  // namespace

Intruder::Intruder(unsigned char* buffer, unsigned int bufferLength) : Extruder() {
  InitMemory(*this, buffer, bufferLength);
  growthStep = 0;
  ownsBuffer = false;
}

Intruder::Intruder(unsigned int initialSize, unsigned int fallbackSize) : Extruder() {
  unsigned int size = initialSize != 0 ? initialSize : fallbackSize;
  unsigned char* buffer = new (std::nothrow) unsigned char[size];
  if (buffer == nullptr) {
    STBPLAT_LOG(kModule, eLogLevelAllocation, kIntruderSource, "Intruder",
                "Memory allocation failure\r\n");
    size = 0;  // no buffer, so no room either
  }
  InitMemory(*this, buffer, size);
  growthStep = 0;
  ownsBuffer = true;
}

Intruder::Intruder(char const* path, bool append) : Extruder() {
  InitEmpty(*this);
  growthStep = 0;
  ownsBuffer = false;
  if (append) {
    pFile = Sys().fopen64(path, "r+b");
    if (pFile == nullptr) pFile = Sys().fopen64(path, "w+b");
    if (pFile != nullptr) Sys().fseek(pFile, 0, SEEK_END);
  } else {
    pFile = Sys().fopen64(path, "w+b");
  }
  if (pFile == nullptr) {
    STBPLAT_LOG(kModule, eLogLevelError, kIntruderSource, "Intruder", "Unable to open file %s\r\n",
                path);
    isInitedOK = false;
  }
}

Intruder::Intruder(ComponentLocation const* location) : Extruder(location, true) {
  growthStep = 0;
  ownsBuffer = false;
}

Intruder::~Intruder() {
  if (ownsBuffer && pStart != nullptr) delete[] pStart;
}

unsigned int Intruder::verify(unsigned int n) {
  if (bytesLeft >= n && PhysicalRoom(*this) >= n) return 0;
  if (growthStep == 0) {
    STBPLAT_LOG(kModule, eLogLevelError, kIntruderSource, "verify",
                "Can't intrude %d bytes, bytesLeft = %d\r\n", static_cast<int>(n),
                static_cast<int>(bytesLeft));
    return kIntrudeFailed;
  }
  return resize(n);
}

unsigned int Intruder::resize(unsigned int n) {
  unsigned int step = std::max(growthStep, n);
  if (static_cast<unsigned long>(length) + step > 0xFFFFFFFFul) return kIntrudeGrowFailed;
  unsigned char* grown = new (std::nothrow) unsigned char[length + step];
  if (grown == nullptr) return kIntrudeGrowFailed;
  if (length != 0 && pStart != nullptr) std::memcpy(grown, pStart, length);
  // A borrowed buffer stays with its owner; the new one is ours either way.
  if (ownsBuffer) delete[] pStart;
  ownsBuffer = true;
  pStart = grown;
  // Writing resumes at the old end of the buffer, not at the old write
  // position: a resize is exact only when the old buffer was full.
  pCurrent = grown + length;
  length += step;
  bytesLeft += step;
  return 0;
}
