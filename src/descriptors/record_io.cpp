#include "descriptors/record_io.h"

#include <climits>
#include <cstdint>

namespace stbplat {
namespace records {

unsigned long Position(Extruder& in) {
  if (in.Is64Address()) return in.getP64();
  std::uintptr_t p = reinterpret_cast<std::uintptr_t>(in.getP());
  if (IsMemoryStream(in)) p -= reinterpret_cast<std::uintptr_t>(in.pStart);
  return static_cast<unsigned long>(p);
}

bool SetPosition(Extruder& in, unsigned long position) {
  if (in.Is64Address()) return in.setP64(position);
  std::uintptr_t p = static_cast<std::uintptr_t>(position);
  if (IsMemoryStream(in)) p += reinterpret_cast<std::uintptr_t>(in.pStart);
  return in.setP(reinterpret_cast<unsigned char*>(p));
}

bool IsMemoryStream(const Extruder& in) {
  return in.pFile == nullptr && !in.isNand && !in.isEMMC;
}

bool Skip(Extruder& in, unsigned long n) {
  if (n > UINT_MAX) return false;
  if (IsMemoryStream(in) && in.bytesLeft < n) return false;
  in += static_cast<unsigned int>(n);
  return true;
}

}  // namespace records
}  // namespace stbplat
