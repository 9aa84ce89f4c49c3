// FSBL information: the version record, then a counted list of nested
// records dispatched on their type, so that newer boot loaders can add
// records older readers skip.
#include "stbplat/fsbl_info.h"

#include "descriptors/record_io.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kFsblMajorVersion = 0;
constexpr unsigned char kFsblMinorVersion = 0;
constexpr unsigned int kTypeAndSizeBytes = 8;
}  // namespace

FSBLInfo::FSBLInfo() : FSBLInfo(kEntryTypeFSBL, 0, kFsblMajorVersion, kFsblMinorVersion) {}

FSBLInfo::FSBLInfo(unsigned int type, unsigned short flagsWord, unsigned char major,
                   unsigned char minor)
    : SystemDescriptor(type, flagsWord, major, minor) {}

FSBLInfo::~FSBLInfo() {}

unsigned int FSBLInfo::Read(Extruder& in, unsigned int) {
  if (versionEntry.ReadTLVAndData(in, nullptr) != kDescriptorOk) {
    RECORD_ERROR("Read", "Error reading versionEntry\r\n");
    return kDescriptorWrongType;
  }
  unsigned int numDescriptors = 0;
  if (!Extruded(in.extrude(&numDescriptors))) {
    RECORD_ERROR("Read", "Error reading numDescriptors\r\n");
    return kDescriptorFieldError;
  }
  for (unsigned int i = 0; i < numDescriptors; ++i) {
    unsigned int type = 0;
    unsigned int size = 0;
    // A count larger than the entries present ends here, at the stream's end.
    if (!Extruded(in.extrude(&type)) || !Extruded(in.extrude(&size))) return kDescriptorFieldError;
    if (type == kEntryTypePADD) {
      if (!Skip(in, size)) return kDescriptorFieldError;
      continue;
    }
    in -= kTypeAndSizeBytes;
    switch (type) {
      case kEntryTypeDEVC:
        if (deviceConfig.ReadTLVAndData(in, nullptr) != kDescriptorOk) {
          RECORD_ERROR("Read", "Error reading deviceConfig\r\n");
          return kDescriptorWrongType;
        }
        break;
      case kEntryTypeMCFG:
        if (memConfig.ReadTLVAndData(in, nullptr) != kDescriptorOk) {
          RECORD_ERROR("Read", "Error reading memConfig\r\n");
          return kDescriptorWrongType;
        }
        break;
      case kEntryTypeBSCK:
        if (BseckInfo.ReadTLVAndData(in, nullptr) != kDescriptorOk) {
          RECORD_ERROR("Read", "Error reading BseckInfo\r\n");
          return kDescriptorWrongType;
        }
        break;
      default: {
        const bool skipped = Skip(in, static_cast<unsigned long>(size) + kTypeAndSizeBytes);
        RECORD_ERROR("Read", "Unknown entry type 0x%08X in FSBL info\r\n", type);
        if (!skipped) return kDescriptorFieldError;
        break;
      }
    }
  }
  return kDescriptorOk;
}

unsigned int FSBLInfo::Store(Intruder*) const { return kDescriptorStoreNotSupported; }
