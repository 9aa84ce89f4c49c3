// Position operations. NAND and eMMC streams carry a 64-bit device offset;
// memory streams a pointer; files their own position; standard input a count
// of bytes taken, with a short history to go back into.
#include <cstdint>
#include <memory>
#include <new>

#include "os/seam.h"
#include "streams/stream_internal.h"
#include "util/log_gate.h"

using stbplat::os::Sys;
using namespace stbplat::streams;

namespace {

constexpr auto kModule = eLogModuleByteStreams;

unsigned int Low32(const unsigned char* p) {
  return static_cast<unsigned int>(reinterpret_cast<std::uintptr_t>(p));
}

// Filler bytes go out in pieces of this size: memory stays bounded however
// far the stream is moved.
constexpr unsigned int kFillerPiece = 64 * 1024;

// Moving forward in a file that cannot seek (or past what it allows) writes
// filler bytes instead: streams opened for writing extend their file so. It
// stops at the first piece the file does not take.
void ExtendByWriting(FILE* file, unsigned int n) {
  std::unique_ptr<unsigned char[]> filler(new (std::nothrow) unsigned char[kFillerPiece]());
  if (!filler) {
    STBPLAT_LOG(kModule, eLogLevelAllocation, kExtruderSource, "operator+=",
                "Memory allocation failure\r\n");
    return;
  }
  while (n > 0) {
    const unsigned int piece = n < kFillerPiece ? n : kFillerPiece;
    if (Sys().fwrite(filler.get(), 1, piece, file) != piece) return;
    n -= piece;
  }
}

}  // namespace

Extruder& Extruder::operator+=(unsigned int n) {
  if (IsFlashOffsetMode(*this)) {
    currNandOffset += n;
  } else if (pFile == nullptr) {
    if (bytesLeft < n) {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "operator+=",
                  "Unable to advance %u bytes, bytesLeft = %u\r\n", n, bytesLeft);
      pCurrent += bytesLeft;
      bytesLeft = 0;
    } else {
      pCurrent += n;
      bytesLeft -= n;
    }
  } else if (pFile == stdin) {
    if (static_cast<unsigned long>(stdinPosition) + n <= stdinTotalRead) {
      stdinPosition += n;
    } else {
      for (unsigned int i = 0; i < n; ++i) {
        unsigned char discard;
        if (extrude(&discard, 1) == kExtrudeFailed) {
          STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "operator+=",
                      "Extruder::operator +=: failed\r\n");
          break;
        }
      }
    }
  } else if (Sys().fseek(pFile, static_cast<long>(n), SEEK_CUR) != 0) {
    ExtendByWriting(pFile, n);
  }
  return *this;
}

Extruder& Extruder::operator-=(unsigned int n) {
  if (IsFlashOffsetMode(*this)) {
    if (currNandOffset >= n) {
      currNandOffset -= n;
    } else {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "operator-=",
                  "Unable to go back %d bytes, currNandOffset = %ld\r\n", static_cast<int>(n),
                  static_cast<long>(currNandOffset));
    }
  } else if (pFile == nullptr) {
    // Summed in 64 bits: a huge n must not wrap into an allowed move.
    if (static_cast<unsigned long>(bytesLeft) + n <= length) {
      pCurrent -= n;
      bytesLeft += n;
    } else {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "operator-=",
                  "Unable to go back %u bytes, length-count = %u\r\n", n, length - n);
      pCurrent = const_cast<unsigned char*>(pStart);
      bytesLeft = n;
    }
  } else if (pFile == stdin) {
    if (stdinPosition + stdinHistoryCount >= stdinTotalRead + n) {
      stdinPosition -= n;
    } else {
      STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "operator-=",
                  "Extruder::operator -=: unable to decrease pointer");
    }
  } else {
    Sys().fseek(pFile, -static_cast<long>(n), SEEK_CUR);
  }
  return *this;
}

unsigned char* Extruder::getP() {
  if (IsFlashOffsetMode(*this)) return reinterpret_cast<unsigned char*>(currNandOffset);
  if (pFile == nullptr) return pCurrent;
  if (pFile == stdin) return reinterpret_cast<unsigned char*>(static_cast<std::uintptr_t>(stdinPosition));
  return reinterpret_cast<unsigned char*>(Sys().ftell(pFile));
}

bool Extruder::setP(unsigned char* p) {
  if (IsFlashOffsetMode(*this)) {
    currNandOffset = reinterpret_cast<std::uintptr_t>(p);
    return true;
  }
  if (pFile == nullptr) {
    auto start = reinterpret_cast<std::uintptr_t>(pStart);
    auto target = reinterpret_cast<std::uintptr_t>(p);
    if (start + length >= target) {
      pCurrent = p;
      bytesLeft = length - static_cast<unsigned int>(target - start);
      return true;
    }
    STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "setP",
                "Unable to setP, pNewCurr = 0x%8p, pStart = 0x%8p, length = 0x%08X\r\n",
                static_cast<void*>(p), static_cast<const void*>(pStart), length);
    return false;
  }
  if (pFile == stdin) {
    unsigned int target = Low32(p);
    if (stdinPosition <= target)
      *this += target - stdinPosition;
    else
      *this -= stdinPosition - target;
    return true;
  }
  if (Sys().fseek(pFile, static_cast<long>(Low32(p)), SEEK_SET) != 0) {
    STBPLAT_LOG(kModule, eLogLevelError, kExtruderSource, "setP",
                "Extruder::setP: fseek 0x%x failed\r\n", Low32(p));
    return false;
  }
  return true;
}

unsigned long Extruder::getP64() {
  if (IsFlashOffsetMode(*this))
    STBPLAT_LOG(kModule, eLogLevelTrace, kExtruderSource, "getP64", "getP64 0x%llx \r\n",
                static_cast<unsigned long long>(currNandOffset));
  return currNandOffset;
}

bool Extruder::setP64(unsigned long offset) {
  if (IsFlashOffsetMode(*this)) {
    STBPLAT_LOG(kModule, eLogLevelTrace, kExtruderSource, "setP64", "setP64 0x%llx \r\n",
                static_cast<unsigned long long>(offset));
    currNandOffset = offset;
  }
  return true;
}
