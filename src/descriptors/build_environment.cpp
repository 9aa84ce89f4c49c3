// "BCFG": the build-environment text of a build image.
#include "descriptors/record_io.h"
#include "stbplat/build_config.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kBcfgMajorVersion = 0;
constexpr unsigned char kBcfgMinorVersion = 0;
}  // namespace

BuildEnvironmentDescriptor::BuildEnvironmentDescriptor()
    : BuildEnvironmentDescriptor(0, kBcfgMajorVersion, kBcfgMinorVersion) {}

BuildEnvironmentDescriptor::BuildEnvironmentDescriptor(unsigned short flagsWord,
                                                       unsigned char major, unsigned char minor)
    : SystemDescriptor(kEntryTypeBCFG, flagsWord, major, minor) {}

BuildEnvironmentDescriptor::~BuildEnvironmentDescriptor() {}

unsigned int BuildEnvironmentDescriptor::Read(Extruder& in, unsigned int) {
  return text.ReadTLVAndData(in, nullptr, false);
}

unsigned int BuildEnvironmentDescriptor::Store(Intruder*) const {
  return kDescriptorStoreNotSupported;
}
