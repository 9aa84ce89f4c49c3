// Extruder construction, destruction and bookkeeping.
#include <algorithm>
#include <cstdint>
#include <cstring>

#include "os/seam.h"
#include "streams/last_file_name.h"
#include "streams/stream_device.h"
#include "streams/stream_internal.h"
#include "util/log_gate.h"

const char* pLastFileName = nullptr;

namespace stbplat {
namespace streams {

namespace {
// Used when the system reports no page size.
constexpr int kFallbackPageSize = 8192;
}  // namespace

void InitEmpty(Extruder& s) {
  s.pStart = nullptr;
  s.pCurrent = nullptr;
  s.length = 0;
  s.bytesLeft = 0;
  s.is64Address = false;
  s.isInitedOK = true;
  s.pFile = nullptr;
  std::memset(s.stdinHistory, 0, sizeof s.stdinHistory);
  s.stdinHistoryCount = 0;
  s.stdinPosition = 0;
  s.stdinTotalRead = 0;
  s.memFd = 0;
  s.pMapped = nullptr;
  s.isNorFlash = false;
  s.norBaseOffset = 0;
  s.isNand = false;
  s.isEMMC = false;
  s.currNandOffset = 0;
  s.partitionName.clear();
}

void InitMemory(Extruder& s, const unsigned char* buffer, unsigned int length) {
  InitEmpty(s);
  s.pStart = buffer;
  s.pCurrent = const_cast<unsigned char*>(buffer);
  s.length = length;
  s.bytesLeft = length;
}

unsigned int TakeFromStdinHistory(Extruder& s, unsigned char* dst, unsigned int n) {
  if (s.stdinPosition >= s.stdinTotalRead) return 0;
  unsigned int behind = s.stdinTotalRead - s.stdinPosition;
  // The position never lies before the history's start; if it somehow does,
  // those bytes are gone and nothing is taken.
  if (behind > s.stdinHistoryCount) return 0;
  unsigned int take = std::min(n, behind);
  std::memcpy(dst, s.stdinHistory + (s.stdinHistoryCount - behind), take);
  s.stdinPosition += take;
  return take;
}

void AppendToStdinHistory(Extruder& s, const unsigned char* bytes, unsigned int n) {
  if (n >= kStdinHistorySize) {
    std::memcpy(s.stdinHistory, bytes + (n - kStdinHistorySize), kStdinHistorySize);
    s.stdinHistoryCount = kStdinHistorySize;
  } else {
    if (s.stdinHistoryCount + n > kStdinHistorySize) {
      unsigned int drop = s.stdinHistoryCount + n - kStdinHistorySize;
      std::memmove(s.stdinHistory, s.stdinHistory + drop, s.stdinHistoryCount - drop);
      s.stdinHistoryCount -= drop;
    }
    std::memcpy(s.stdinHistory + s.stdinHistoryCount, bytes, n);
    s.stdinHistoryCount += n;
  }
  s.stdinPosition += n;
  s.stdinTotalRead += n;
}

}  // namespace streams
}  // namespace stbplat

using stbplat::os::Sys;
using namespace stbplat::streams;

Extruder::Extruder() {}

Extruder::Extruder(unsigned char const* buffer, unsigned int bufferLength) {
  InitMemory(*this, buffer, bufferLength);
}

Extruder::Extruder(char const* path, bool logErrors) {
  InitEmpty(*this);
  pFile = Sys().fopen64(path, "rb");
  if (pFile == nullptr) {
    isInitedOK = false;
    if (logErrors)
      STBPLAT_LOG(eLogModuleByteStreams, eLogLevelError, kExtruderSource, "Extruder",
                  "Unable to open file %s\r\n", path);
  }
  pLastFileName = path;
}

Extruder::Extruder(_IO_FILE* file) {
  InitEmpty(*this);
  pFile = file;
}

Extruder::Extruder(char const* path, unsigned long startOffset, bool logErrors)
    : Extruder(path, logErrors) {
  is64Address = true;
  isEMMC = true;
  currNandOffset = startOffset;
}

Extruder::Extruder(ComponentLocation const* location, bool writable) {
  InitEmpty(*this);
  is64Address = true;
  OpenComponentLocation(*this, location, writable);
}

Extruder::~Extruder() {
  if (pFile != nullptr && pFile != stdin) Sys().fclose(pFile);
  if (pMapped != nullptr) {
    // pMapped was advanced past the page-aligned start of the mapping;
    // unmap from that start so the whole mapping goes.
    int page = Sys().getpagesize();
    if (page <= 0) page = kFallbackPageSize;
    auto mapped = reinterpret_cast<std::uintptr_t>(pMapped);
    std::uintptr_t base = mapped - mapped % static_cast<std::uintptr_t>(page);
    Sys().munmap(reinterpret_cast<void*>(base), (mapped - base) + length);
  }
  if (memFd != 0) Sys().close(memFd);
}

Extruder& Extruder::operator++() { return *this += 1; }

Extruder& Extruder::operator--() { return *this -= 1; }

unsigned int Extruder::count() {
  if (pFile == nullptr) return bytesLeft;
  long position = Sys().ftell(pFile);
  if (position < 0 || Sys().fseek(pFile, 0, SEEK_END) != 0) return 0;
  long size = Sys().ftell(pFile);
  Sys().fseek(pFile, position, SEEK_SET);
  if (size < position) return 0;
  return static_cast<unsigned int>(size - position);
}

void Extruder::SetLength(unsigned int newLength) {
  bytesLeft -= length - newLength;
  length = newLength;
}

bool Extruder::IsUsingStdin() { return pFile == stdin; }

bool Extruder::Is64Address() { return is64Address; }

void Extruder::Display() {
  constexpr auto kModule = eLogModuleByteStreams;
  constexpr auto kLevel = eLogLevelDisplay;
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "Extruder info:\r\n");
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  pStart     = %p\r\n",
              static_cast<const void*>(pStart));
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  pCurrent   = %p\r\n",
              static_cast<void*>(pCurrent));
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  length     = %u\r\n", length);
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  bytesLeft  = %u\r\n", bytesLeft);
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  isInitedOK = %d\r\n",
              isInitedOK ? 1 : 0);
  STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  pFile      = %p\r\n",
              static_cast<void*>(pFile));
  if (pLastFileName != nullptr)
    STBPLAT_LOG(kModule, kLevel, kExtruderSource, "Display", "  pLastFileName = %s\r\n",
                pLastFileName);
}
