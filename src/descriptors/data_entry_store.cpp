// DataEntry: writing a DATA entry, and copying an in-place payload out of
// its source stream.
#include "descriptors/data_entry_payload.h"
#include "descriptors/record_io.h"
#include "stbplat/data_entry.h"
#include "stbplat/system_descriptor.h"

using namespace stbplat::records;

namespace {
// Copy unit of GetInPlaceData: keeps the work buffer small whatever the
// payload's size.
constexpr unsigned int kInPlaceChunk = 1024;
}  // namespace

unsigned int DataEntry::StoreTLVAndData(Intruder* out) const {
  if (!Intruded(out->intrude(static_cast<unsigned int>(kEntryTypeDATA)))) {
    RECORD_ERROR("StoreTLVAndData", "Error writing DATA_ENTRY_TYPE\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(length))) {
    RECORD_ERROR("StoreTLVAndData", "Error writing length\r\n");
    return kDescriptorFieldError;
  }
  if (pPayload == nullptr) return kDescriptorOk;
  // A payload left in a file or device holds only its offset there: it is
  // copied from its source in pieces, and the source is put back.
  bool stored = false;
  if (HoldsOffsetOnly(*this)) {
    unsigned char* const saved = source->getP();
    stored = GetInPlaceData(out);
    source->setP(saved);
  } else {
    stored = Intruded(out->intrude(pPayload, length));
  }
  if (!stored) {
    RECORD_ERROR("StoreTLVAndData", "Error writing pPayload\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

bool DataEntry::GetInPlaceData(Intruder* out) const {
  if (pPayload == nullptr || source == nullptr) return false;
  if (!source->setP(pPayload)) return false;
  unsigned char chunk[kInPlaceChunk];
  unsigned int left = length;
  while (left > 0) {
    const unsigned int n = left < kInPlaceChunk ? left : kInPlaceChunk;
    if (!Extruded(source->extrude(chunk, n))) {
      RECORD_ERROR("GetInPlaceData", "DataEntry::GetInPlaceData: unable to read data\r\n");
      return false;
    }
    if (!Intruded(out->intrude(chunk, n))) {
      RECORD_ERROR("GetInPlaceData", "DataEntry::GetInPlaceData: unable to store data\r\n");
      return false;
    }
    left -= n;
  }
  return true;
}
