#include "descriptors/record_io.h"

#include <climits>
#include <cstdint>

namespace stbplat {
namespace records {

unsigned long Position(Extruder& in) {
  if (MovesBy64(in)) return in.getP64();
  std::uintptr_t p = reinterpret_cast<std::uintptr_t>(in.getP());
  if (IsMemoryStream(in)) p -= reinterpret_cast<std::uintptr_t>(in.pStart);
  return static_cast<unsigned long>(p);
}

bool SetPosition(Extruder& in, unsigned long position) {
  if (MovesBy64(in)) return in.setP64(position);
  std::uintptr_t p = static_cast<std::uintptr_t>(position);
  if (IsMemoryStream(in)) p += reinterpret_cast<std::uintptr_t>(in.pStart);
  return in.setP(reinterpret_cast<unsigned char*>(p));
}

bool MovesBy64(const Extruder& in) { return in.isNand || in.isEMMC; }

bool IsMemoryStream(const Extruder& in) {
  return in.pFile == nullptr && !in.isNand && !in.isEMMC;
}

bool Skip(Extruder& in, unsigned long n) {
  if (n > UINT_MAX) return false;
  if (IsMemoryStream(in) && in.bytesLeft < n) return false;
  // A file (a NOR partition, a slot file) tells what it holds; a skip past
  // its end would fall into the stream's write-to-extend path.
  if (in.pFile != nullptr && !MovesBy64(in) && !in.IsUsingStdin() && in.count() < n) return false;
  in += static_cast<unsigned int>(n);
  return true;
}

}  // namespace records
}  // namespace stbplat
