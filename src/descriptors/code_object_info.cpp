// CodeObjectInfo: the package header record.
#include "stbplat/code_object_info.h"

#include <algorithm>

#include "descriptors/display_line.h"
#include "descriptors/record_io.h"

using namespace stbplat::records;

CodeObjectInfo::CodeObjectInfo() : unused(0), numComponents(0) {}

unsigned int CodeObjectInfo::Read(Extruder& in) {
  if (!Extruded(in.extrude(&unused))) {
    RECORD_ERROR("Read", "Error reading unused\r\n");
    return kDescriptorFieldError;
  }
  if (packageHeaderLocation.Read(in) != kDescriptorOk) {
    RECORD_ERROR("Read", "Error reading packageHeaderLocation\r\n");
    return kDescriptorWrongType;
  }
  if (!Extruded(in.extrude(&numComponents))) {
    RECORD_ERROR("Read", "Error reading numComponents\r\n");
    return kDescriptorFieldError;
  }
  if (numComponents > kMaxComponents) {
    RECORD_ERROR("Read", "Error reading componentLocations[i]\r\n");
    return kDescriptorWrongType;
  }
  for (unsigned int i = 0; i < numComponents; ++i) {
    if (componentLocations[i].Read(in) != kDescriptorOk) {
      RECORD_ERROR("Read", "Error reading componentLocations[i]\r\n");
      return kDescriptorWrongType;
    }
  }
  return kDescriptorOk;
}

unsigned int CodeObjectInfo::Store(Intruder* out) const {
  if (numComponents > kMaxComponents) {
    RECORD_ERROR("Store", "Error writing componentLocations[i]\r\n");
    return kDescriptorWrongType;
  }
  if (!Intruded(out->intrude(unused))) {
    RECORD_ERROR("Store", "Error writing unused\r\n");
    return kDescriptorFieldError;
  }
  if (packageHeaderLocation.Store(out) != kDescriptorOk) {
    RECORD_ERROR("Store", "Error writing packageHeaderLocation\r\n");
    return kDescriptorWrongType;
  }
  if (!Intruded(out->intrude(numComponents))) {
    RECORD_ERROR("Store", "Error writing numComponents\r\n");
    return kDescriptorFieldError;
  }
  for (unsigned int i = 0; i < numComponents; ++i) {
    if (componentLocations[i].Store(out) != kDescriptorOk) {
      RECORD_ERROR("Store", "Error writing componentLocations[i]\r\n");
      return kDescriptorWrongType;
    }
  }
  return kDescriptorOk;
}

void CodeObjectInfo::Display(unsigned char indent) const {
  // The nested indent is an 8-bit sum: it wraps above 255.
  const auto nested = static_cast<unsigned char>(indent + 2);
  DisplayIndentLine("Display", indent);
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "Display", "Header:\r\n");
  packageHeaderLocation.Display(nested);
  // A copy of the bound: binding the member itself to std::min's reference
  // would make unoptimised builds define and export it.
  const unsigned int shown = std::min(numComponents, unsigned{kMaxComponents});
  for (unsigned int i = 0; i < shown; ++i) {
    DisplayIndentLine("Display", indent);
    STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "Display", "Component %d:\r\n",
                static_cast<int>(i));
    componentLocations[i].Display(nested);
  }
}
