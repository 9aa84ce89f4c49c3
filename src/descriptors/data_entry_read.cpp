// DataEntry: reading a DATA entry as an owned, borrowed or in-place payload.
#include <cstdint>
#include <new>

#include "descriptors/data_entry_payload.h"
#include "descriptors/record_io.h"
#include "stbplat/data_entry.h"
#include "stbplat/system_descriptor.h"

using namespace stbplat::records;

namespace {
constexpr unsigned int kTypeAndLengthBytes = 8;
}  // namespace

unsigned int DataEntry::ReadTLVAndData(Extruder& in, unsigned int* pLength, bool inPlace) {
  unsigned int entryType = 0;
  if (!Extruded(in.extrude(&entryType))) {
    RECORD_ERROR("ReadTLVAndData", "Error reading entryType\r\n");
    return kDescriptorFieldError;
  }
  unsigned int storedLength = 0;
  if (!Extruded(in.extrude(&storedLength))) {
    RECORD_ERROR("ReadTLVAndData", "Error reading entrySize\r\n");
    return kDescriptorFieldError;
  }
  if (entryType != kEntryTypeDATA) {
    RECORD_ERROR("ReadTLVAndData", "DataEntry::ReadTLVAndData: Invalid entry type %c%c%c%c\r\n",
                 RECORD_TYPE_CHARS(entryType));
    in -= kTypeAndLengthBytes;
    return kDescriptorWrongType;
  }
  if (pLength != nullptr) *pLength = storedLength;
  const unsigned long payloadStart = Position(in);
  // An in-place payload is remembered by its pointer-sized position, which
  // cannot carry a 64-bit device offset.
  if (in.Is64Address() && inPlace) return kDescriptorInPlaceOn64Bit;
  const unsigned int result = inPlace ? ReadInPlace(in, storedLength) : Read(in, storedLength, 0);
  if (!SetPosition(in, payloadStart + storedLength)) return kDescriptorFieldError;
  return result;
}

unsigned int DataEntry::Read(Extruder& in, unsigned int newLength, unsigned long externalBuffer) {
  if (newLength == 0) return kDescriptorOk;
  if (externalBuffer != 0) {
    ReleaseOwned(*this);
    ownsData = false;
    pPayload = reinterpret_cast<unsigned char*>(static_cast<std::uintptr_t>(externalBuffer));
  } else {
    // Never allocate more than the stream can deliver (standard input cannot
    // tell how much is left).
    if (!in.IsUsingStdin() && in.count() < newLength) return kDescriptorWrongType;
    ReleaseOwned(*this);
    ownsData = true;
    pPayload = new (std::nothrow) unsigned char[newLength];
    if (pPayload == nullptr) {
      STBPLAT_LOG(eLogModuleRecords, eLogLevelAllocation, kLogSource, "Read",
                  "Memory allocation failure\r\n");
    }
  }
  source = nullptr;
  if (pPayload == nullptr) return kDescriptorNoBuffer;
  length = newLength;
  if (!Extruded(in.extrude(pPayload, newLength))) {
    RECORD_ERROR("Read", "Error reading pPayload\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int DataEntry::ReadInPlace(Extruder& in, unsigned int newLength) {
  ReleaseOwned(*this);
  ownsData = false;
  source = &in;
  pPayload = in.getP();
  const std::uintptr_t end = reinterpret_cast<std::uintptr_t>(pPayload) + newLength;
  if (!in.setP(reinterpret_cast<unsigned char*>(end))) {
    // No payload rather than the old length over the new source.
    pPayload = nullptr;
    source = nullptr;
    length = 0;
    return kDescriptorWrongType;
  }
  length = newLength;
  return kDescriptorOk;
}
