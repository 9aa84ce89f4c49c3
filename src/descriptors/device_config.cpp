// "DEVC": the device settings the boot loader chose.
#include "descriptors/record_io.h"
#include "stbplat/fsbl_info.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kDevcMajorVersion = 0;
constexpr unsigned char kDevcMinorVersion = 0;
}  // namespace

DeviceConfigDescriptor::DeviceConfigDescriptor()
    : DeviceConfigDescriptor(0, kDevcMajorVersion, kDevcMinorVersion) {}

DeviceConfigDescriptor::DeviceConfigDescriptor(unsigned short flagsWord, unsigned char major,
                                               unsigned char minor)
    : SystemDescriptor(kEntryTypeDEVC, flagsWord, major, minor),
      scbClock(0),
      avsEnabled(0),
      reserved(0) {}

DeviceConfigDescriptor::~DeviceConfigDescriptor() {}

unsigned int DeviceConfigDescriptor::Read(Extruder& in, unsigned int) {
  if (!Extruded(in.extrude(&scbClock))) {
    RECORD_ERROR("Read", "Error reading scbClock\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&avsEnabled, 1))) {
    RECORD_ERROR("Read", "Error reading avsEnabled\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&reserved, 1))) {
    RECORD_ERROR("Read", "Error reading reserved\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int DeviceConfigDescriptor::Store(Intruder*) const { return kDescriptorStoreNotSupported; }
