// The TLV framing common to every system record.
#include "stbplat/system_descriptor.h"

#include "descriptors/record_io.h"
#include "stbplat/memory_config.h"

using namespace stbplat::records;

namespace {
constexpr unsigned int kTypeAndSizeBytes = 8;
constexpr unsigned int kSizeFieldBytes = 4;
}  // namespace

SystemDescriptor::SystemDescriptor() : SystemDescriptor(0, 0, 0, 0) {}

SystemDescriptor::SystemDescriptor(unsigned int type, unsigned short flagsWord,
                                   unsigned char major, unsigned char minor)
    : flags(flagsWord), majorVer(major), minorVer(minor), valid(false), entryType(type) {}

SystemDescriptor::SystemDescriptor(const SystemDescriptor& other)
    : flags(other.flags),
      majorVer(other.majorVer),
      minorVer(other.minorVer),
      valid(other.valid),
      entryType(other.entryType) {}

SystemDescriptor::~SystemDescriptor() {}

unsigned int SystemDescriptor::ReadTLVAndData(Extruder& in, unsigned int* pEntrySize) {
  unsigned int storedEntryType = 0;
  if (!Extruded(in.extrude(&storedEntryType))) {
    RECORD_ERROR("ReadTLVAndData", "Error reading storedEntryType\r\n");
    return kDescriptorFieldError;
  }
  unsigned int entrySize = 0;
  if (!Extruded(in.extrude(&entrySize))) {
    RECORD_ERROR("ReadTLVAndData", "Error reading entrySize\r\n");
    return kDescriptorFieldError;
  }
  if (storedEntryType != entryType) {
    RECORD_ERROR("ReadTLVAndData",
                 "SystemDescriptor::ReadTLVAndData: entry must be of type %c%c%c%c, found "
                 "%c%c%c%c instead\r\n",
                 RECORD_TYPE_CHARS(entryType), RECORD_TYPE_CHARS(storedEntryType));
    // Lets the caller try another record type at the same place.
    in -= kTypeAndSizeBytes;
    return kDescriptorWrongType;
  }
  if (pEntrySize != nullptr) *pEntrySize = entrySize;
  return ReadDescriptor(in, entrySize);
}

unsigned int SystemDescriptor::ReadDescriptor(Extruder& in, unsigned int entrySize) {
  const unsigned long start = Position(in);
  unsigned int result = ReadBase(in);
  if (result == kDescriptorOk) result = Read(in, entrySize);
  // The entry size, not what the payload reader consumed, decides where the
  // next entry begins.
  const bool positioned = SetPosition(in, start + entrySize);
  if (result != kDescriptorOk) valid = false;
  return positioned ? result : kDescriptorFieldError;
}

unsigned int SystemDescriptor::ReadBase(Extruder& in) {
  unsigned short localFlags = 0;
  if (!Extruded(in.extrude(&localFlags))) {
    RECORD_ERROR("ReadBase", "Error reading localFlags\r\n");
    return kDescriptorFieldError;
  }
  unsigned char localMajorVer = 0;
  if (!Extruded(in.extrude(&localMajorVer, 1))) {
    RECORD_ERROR("ReadBase", "Error reading localMajorVer\r\n");
    return kDescriptorFieldError;
  }
  // Older layouts stay readable; only a newer major version is refused.
  if (localMajorVer > majorVer) {
    RECORD_ERROR("ReadBase", "Invalid major version (%d), should be %d for entry type %c%c%c%c\r\n",
                 localMajorVer, majorVer, RECORD_TYPE_CHARS(entryType));
    return kDescriptorNewerMajorVersion;
  }
  flags = localFlags;
  majorVer = localMajorVer;
  if (!Extruded(in.extrude(&minorVer, 1))) {
    RECORD_ERROR("ReadBase", "Error reading minorVer\r\n");
    return kDescriptorFieldError;
  }
  valid = true;
  return kDescriptorOk;
}

namespace {

// Controllers and segments are held, and always written, in the layout of
// minor version 6, whatever minor version they were read with: their header
// says so, while minorVer keeps telling what was read.
unsigned char StoredMinorVersion(unsigned int entryType, unsigned char minorVer) {
  const bool memoryLayout = entryType == kEntryTypeMCSD || entryType == kEntryTypeMCET;
  const unsigned char layout = kMemoryLayoutMinorVersion;
  return memoryLayout && minorVer < layout ? layout : minorVer;
}

}  // namespace

unsigned int SystemDescriptor::StoreBase(Intruder* out) const {
  if (!Intruded(out->intrude(flags))) {
    RECORD_ERROR("StoreBase", "Error writing flags\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(majorVer))) {
    RECORD_ERROR("StoreBase", "Error writing majorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(StoredMinorVersion(entryType, minorVer)))) {
    RECORD_ERROR("StoreBase", "Error writing minorVer\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int SystemDescriptor::StoreDescriptor(Intruder* out) const {
  const unsigned int result = StoreBase(out);
  if (result != kDescriptorOk) return result;
  return Store(out);
}

unsigned int SystemDescriptor::StoreTLVAndData(Intruder* out) const {
  const unsigned long entryStart = Position(*out);
  if (!Intruded(out->intrude(entryType))) {
    RECORD_ERROR("StoreTLVAndData", "Error writing entryType\r\n");
    return kDescriptorFieldError;
  }
  // The size is known only once the payload is written: leave room for it.
  // A growable buffer grows first (the skip itself never grows it); growth
  // moves the write position to the buffer's old end, so it is put back.
  const unsigned long sizeField = Position(*out);
  const bool room = !IsMemoryStream(*out) || out->bytesLeft >= kSizeFieldBytes ||
                    (out->verify(kSizeFieldBytes) == 0 && SetPosition(*out, sizeField));
  if (room) *out += kSizeFieldBytes;
  const unsigned long dataStart = Position(*out);
  if (!room || StoreDescriptor(out) != kDescriptorOk) {
    RECORD_ERROR("StoreTLVAndData", "Insufficient memory to add entry of type %c%c%c%c\r\n",
                 RECORD_TYPE_CHARS(entryType));
    SetPosition(*out, entryStart);
    return kDescriptorFieldError;
  }
  const unsigned long entryEnd = Position(*out);
  const unsigned int entrySize = static_cast<unsigned int>(entryEnd - dataStart);
  const bool toSize = SetPosition(*out, sizeField);
  if (!Intruded(out->intrude(entrySize))) {
    RECORD_ERROR("StoreTLVAndData", "Error writing entrySize\r\n");
    return kDescriptorFieldError;
  }
  const bool toEnd = SetPosition(*out, entryEnd);
  return (toSize && toEnd) ? kDescriptorOk : kDescriptorFieldError;
}
