// "VERS": the version record, whose trailing fields are optional on reading.
#include "stbplat/version_entry.h"

#include "descriptors/record_io.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kVersMajorVersion = 0;
constexpr unsigned char kVersMinorVersion = 2;
// The entry size counts from the header's flags field: the flags and the
// two version bytes precede the payload.
constexpr unsigned long kHeaderBytes = 4;
}  // namespace

VersionEntry::VersionEntry()
    : SystemDescriptor(kEntryTypeVERS, 0, kVersMajorVersion, kVersMinorVersion),
      majorVersion(0),
      minorVersion(0),
      _temp(0),
      versionLetter(0),
      pad(0) {}

VersionEntry::~VersionEntry() {}

unsigned int VersionEntry::Read(Extruder& in, unsigned int entrySize) {
  const unsigned long counted = Position(in) - kHeaderBytes;
  if (!Extruded(in.extrude(&majorVersion))) {
    RECORD_ERROR("Read", "Error reading majorVersion\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&minorVersion))) {
    RECORD_ERROR("Read", "Error reading minorVersion\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&_temp))) {
    RECORD_ERROR("Read", "Error reading _temp\r\n");
    return kDescriptorFieldError;
  }
  if (description.ReadTLVAndData(in, nullptr, false) != kDescriptorOk) {
    RECORD_ERROR("Read", "Error reading description\r\n");
    return kDescriptorWrongType;
  }
  // Older producers ended the record here or behind pad.
  if (Position(in) - counted < entrySize) {
    if (!Extruded(in.extrude(&versionLetter, 1))) {
      RECORD_ERROR("Read", "Error reading versionLetter\r\n");
      return kDescriptorFieldError;
    }
    if (!Extruded(in.extrude(&pad, 1))) {
      RECORD_ERROR("Read", "Error reading pad\r\n");
      return kDescriptorFieldError;
    }
  } else {
    versionLetter = 0;
    pad = 0;
  }
  if (Position(in) - counted >= entrySize) {
    sequenceControl = SequenceControlStorage();
    return kDescriptorOk;
  }
  if (sequenceControl.Read(in) != kDescriptorOk) {
    RECORD_ERROR("Read", "Error reading sequenceControl\r\n");
    return kDescriptorWrongType;
  }
  return kDescriptorOk;
}

unsigned int VersionEntry::Store(Intruder* out) const {
  if (!Intruded(out->intrude(majorVersion))) {
    RECORD_ERROR("Store", "Error writing majorVersion\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(minorVersion))) {
    RECORD_ERROR("Store", "Error writing minorVersion\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(_temp))) {
    RECORD_ERROR("Store", "Error writing _temp\r\n");
    return kDescriptorFieldError;
  }
  if (description.StoreTLVAndData(out) != kDescriptorOk) {
    RECORD_ERROR("Store", "Error writing description\r\n");
    return kDescriptorWrongType;
  }
  if (!Intruded(out->intrude(versionLetter))) {
    RECORD_ERROR("Store", "Error writing versionLetter\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(pad))) {
    RECORD_ERROR("Store", "Error writing pad\r\n");
    return kDescriptorFieldError;
  }
  // The block's status is deliberately not looked at.
  (void)sequenceControl.Store(out);
  return kDescriptorOk;
}
