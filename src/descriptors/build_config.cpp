// Build configuration: the component's identity, then a counted list of
// nested records dispatched on their type; unknown ones are skipped.
#include "stbplat/build_config.h"

#include <cstring>

#include "descriptors/record_io.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kBldcMajorVersion = 0;
constexpr unsigned char kBldcMinorVersion = 0;
constexpr unsigned int kTypeBytes = 4;
}  // namespace

BuildConfig::BuildConfig() : BuildConfig(kEntryTypeBLDC, 0, kBldcMajorVersion, kBldcMinorVersion) {}

BuildConfig::BuildConfig(unsigned int type, unsigned short flagsWord, unsigned char major,
                         unsigned char minor)
    : SystemDescriptor(type, flagsWord, major, minor),
      componentVerLetter(0),
      unused1(0),
      numDescriptors(0) {
  std::memset(componentTag, 0, sizeof componentTag);
  std::memset(componentMajorVer, 0, sizeof componentMajorVer);
  std::memset(componentMinorVer, 0, sizeof componentMinorVer);
  std::memset(reserved, 0, sizeof reserved);
}

BuildConfig::~BuildConfig() {}

unsigned int BuildConfig::Read(Extruder& in, unsigned int) {
  if (!Extruded(in.extrude(componentTag, sizeof componentTag))) {
    RECORD_ERROR("Read", "Error reading componentTag\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(componentMajorVer, sizeof componentMajorVer))) {
    RECORD_ERROR("Read", "Error reading (uint8_t *)componentMajorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(componentMinorVer, sizeof componentMinorVer))) {
    RECORD_ERROR("Read", "Error reading (uint8_t *)componentMinorVer\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&componentVerLetter, 1))) {
    RECORD_ERROR("Read", "Error reading componentVerLetter\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(reserved, sizeof reserved))) {
    RECORD_ERROR("Read", "Error reading reserved\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&unused1))) {
    RECORD_ERROR("Read", "Error reading unused1\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&numDescriptors))) {
    RECORD_ERROR("Read", "Error reading numDescriptors\r\n");
    return kDescriptorFieldError;
  }
  for (unsigned int i = 0; i < numDescriptors; ++i) {
    unsigned int type = 0;
    // A count larger than the entries present ends here, at the stream's end.
    if (!Extruded(in.extrude(&type))) return kDescriptorFieldError;
    in -= kTypeBytes;
    if (type == kEntryTypeBCFG) {
      if (buildEnvironment.ReadTLVAndData(in, nullptr) != kDescriptorOk) {
        RECORD_ERROR("Read", "Error reading buildEnvironment\r\n");
        return kDescriptorWrongType;
      }
    } else if (type == kEntryTypeSEQC) {
      if (sequenceControl.ReadTLVAndData(in, nullptr) != kDescriptorOk) {
        RECORD_ERROR("Read", "Error reading sequenceControl\r\n");
        return kDescriptorWrongType;
      }
    } else {
      unsigned int size = 0;
      if (!Extruded(in.extrude(&type)) || !Extruded(in.extrude(&size)) || !Skip(in, size))
        return kDescriptorFieldError;
    }
  }
  return kDescriptorOk;
}

unsigned int BuildConfig::Store(Intruder*) const { return kDescriptorStoreNotSupported; }
