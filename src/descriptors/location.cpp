// Location: three 8-byte names in standard form.
#include "stbplat/location.h"

#include <cctype>
#include <cstring>

#include "descriptors/display_line.h"
#include "descriptors/record_io.h"
#include "stbplat/platform.h"

using namespace stbplat::records;

namespace {

constexpr unsigned char kNameWidth = 8;
constexpr unsigned char kPad = '.';

// Appends a name up to its first '.' or its 8 characters. Only '.' ends a
// name: NUL bytes of an empty Location are kept.
void AppendName(std::string& out, const unsigned char* name) {
  for (unsigned int i = 0; i < kNameWidth && name[i] != kPad; ++i) out += static_cast<char>(name[i]);
}

void DisplayName(unsigned char indent, const char* label, const unsigned char* name) {
  char terminated[kNameWidth + 1] = {};
  std::memcpy(terminated, name, kNameWidth);
  DisplayLabelLine("Display", indent, "%s\r\n", label, terminated);
}

}  // namespace

Location::Location() {
  std::memset(deviceName, 0, sizeof deviceName);
  std::memset(partitionName, 0, sizeof partitionName);
  std::memset(slotName, 0, sizeof slotName);
}

Location::Location(const Location& other) : Location() { *this = other; }

Location::Location(const unsigned char* device, const unsigned char* partition,
                   const unsigned char* slot) {
  Set(device, partition, slot);
}

Location& Location::operator=(const Location& other) {
  // Copies pass through the standard form again, so a NUL inside a name is
  // padded with '.' from there on.
  unsigned char device[kNameWidth], partition[kNameWidth], slot[kNameWidth];
  std::memcpy(device, other.deviceName, kNameWidth);
  std::memcpy(partition, other.partitionName, kNameWidth);
  std::memcpy(slot, other.slotName, kNameWidth);
  Set(device, partition, slot);
  return *this;
}

void Location::Set(const unsigned char* device, const unsigned char* partition,
                   const unsigned char* slot) {
  ConvertToStandardFormat(device, deviceName, kNameWidth);
  ConvertToStandardFormat(partition, partitionName, kNameWidth);
  ConvertToStandardFormat(slot, slotName, kNameWidth);
}

bool Location::operator==(const Location& other) const { return AreLocationsSame(this, &other); }

void Location::ConvertToStandardFormat(const unsigned char* src, unsigned char* dst,
                                       unsigned char width) {
  for (unsigned int i = 0; i < width; ++i) {
    if (src[i] == 0) {
      std::memset(dst + i, kPad, width - i);
      return;
    }
    dst[i] = static_cast<unsigned char>(std::toupper(src[i]));
  }
}

std::string Location::GetNameString() const {
  std::string name;
  AppendName(name, deviceName);
  name += '.';
  AppendName(name, partitionName);
  name += '.';
  AppendName(name, slotName);
  return name;
}

void Location::Display(unsigned char indent) const {
  DisplayName(indent, "deviceName", deviceName);
  DisplayName(indent, "partitionName", partitionName);
  DisplayName(indent, "slotName", slotName);
}

void Location::DisplayCompact(bool newline) const {
  if (!stbplat::LogEnabled(eLogModuleRecords, eLogLevelDisplay)) return;
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "DisplayCompact", "%s",
              GetNameString().c_str());
  if (newline)
    STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "DisplayCompact", "\r\n");
}

LocationStorage::LocationStorage(const Location& location) : Location(location) {}

unsigned int LocationStorage::Read(Extruder& in) {
  if (!Extruded(in.extrude(deviceName, kNameWidth))) {
    RECORD_ERROR("Read", "Error reading deviceName\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(partitionName, kNameWidth))) {
    RECORD_ERROR("Read", "Error reading partitionName\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(slotName, kNameWidth))) {
    RECORD_ERROR("Read", "Error reading slotName\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int LocationStorage::Store(Intruder* out) const {
  if (!Intruded(out->intrude(deviceName, kNameWidth))) {
    RECORD_ERROR("Store", "Error writing deviceName\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(partitionName, kNameWidth))) {
    RECORD_ERROR("Store", "Error writing partitionName\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(slotName, kNameWidth))) {
    RECORD_ERROR("Store", "Error writing slotName\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}
