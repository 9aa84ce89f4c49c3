#include "descriptors/data_entry_payload.h"

#include <cstdint>

#include "descriptors/record_io.h"

namespace stbplat {
namespace records {

bool HoldsOffsetOnly(const DataEntry& entry) {
  return !entry.ownsData && entry.source != nullptr && !IsMemoryStream(*entry.source);
}

bool PayloadBytes(const DataEntry& entry, std::vector<unsigned char>& scratch,
                  const unsigned char** bytes) {
  if (entry.pPayload == nullptr) return false;
  if (!HoldsOffsetOnly(entry)) {
    *bytes = entry.pPayload;
    return true;
  }
  Extruder& in = *entry.source;
  unsigned char* const saved = in.getP();
  bool ok = in.setP(entry.pPayload);
  if (ok && in.count() < entry.length) ok = false;
  if (ok) {
    scratch.assign(entry.length, 0);
    ok = entry.length == 0 || Extruded(in.extrude(scratch.data(), entry.length));
  }
  in.setP(saved);
  if (ok) *bytes = scratch.data();
  return ok;
}

void ReleaseOwned(DataEntry& entry) {
  if (entry.ownsData && entry.pPayload != nullptr) delete[] entry.pPayload;
  entry.pPayload = nullptr;
}

}  // namespace records
}  // namespace stbplat
