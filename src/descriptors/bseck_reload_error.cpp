// One boot-security reload error: its own small header, type and code.
#include <algorithm>
#include <cstdio>

#include "descriptors/record_io.h"
#include "stbplat/bseck_reload.h"

using namespace stbplat::records;

namespace {
constexpr unsigned int kDisplayLineSize = 200;
constexpr unsigned int kDisplayMaxIndent = kDisplayLineSize - 1;

void DisplayLine(unsigned char indent, const char* label, unsigned short value) {
  char line[kDisplayLineSize] = {};
  const unsigned int spaces = std::min<unsigned int>(indent, kDisplayMaxIndent);
  std::fill(line, line + spaces, ' ');
  std::snprintf(line + spaces, kDisplayMaxIndent - spaces, "%-20s = 0x%04X\r\n", label, value);
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "Display", "%s", line);
}

}  // namespace

BseckReloadError::BseckReloadError() : flags(0), majorVer(0), minorVer(0), Type(0), Error(0) {}

unsigned int BseckReloadError::Read(Extruder& in) {
  if (!Extruded(in.extrude(&flags))) {
    RECORD_ERROR("Read", "Error reading flags\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&majorVer, 1))) {
    RECORD_ERROR("Read", "Error reading majorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&minorVer, 1))) {
    RECORD_ERROR("Read", "Error reading minorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&Type))) {
    RECORD_ERROR("Read", "Error reading Type\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&Error))) {
    RECORD_ERROR("Read", "Error reading Error\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int BseckReloadError::Store(Intruder* out) const {
  if (!Intruded(out->intrude(flags))) {
    RECORD_ERROR("Store", "Error writing flags\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(majorVer))) {
    RECORD_ERROR("Store", "Error writing majorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(minorVer))) {
    RECORD_ERROR("Store", "Error writing minorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(Type))) {
    RECORD_ERROR("Store", "Error writing Type\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(Error))) {
    RECORD_ERROR("Store", "Error writing Error\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

void BseckReloadError::Display(unsigned char indent) const {
  DisplayLine(indent, "Type", Type);
  DisplayLine(indent, "Error", Error);
}

bool BseckReloadError::operator==(const BseckReloadError& other) const {
  return Type == other.Type && Error == other.Error;
}
