#include "record_kinds.h"

#include "stbplat/system_descriptor.h"

namespace stbtool {

const std::vector<RecordKindInfo>& RecordKinds() {
  static const std::vector<RecordKindInfo> kinds = {
      {RecordKind::kBootLoaderInfo, kEntryTypeFSBL, "fsbl", "FSBLInfo", "boot-loader information"},
      {RecordKind::kBuildConfig, kEntryTypeBLDC, "bldc", "BuildConfig", "build configuration"},
      {RecordKind::kVersion, kEntryTypeVERS, "vers", "VersionEntry", "version record"},
      {RecordKind::kMemoryConfig, kEntryTypeMCFG, "mcfg", "MemoryConfigDescriptor", "memory configuration"},
      {RecordKind::kController, kEntryTypeMCET, "mcet", "MemoryControllerDescriptor", "memory controller"},
      {RecordKind::kSegment, kEntryTypeMCSD, "mcsd", "MemoryControllerSegmentDescriptor", "memory segment"},
      {RecordKind::kDeviceConfig, kEntryTypeDEVC, "devc", "DeviceConfigDescriptor", "device configuration"},
      {RecordKind::kBootSecurity, kEntryTypeBSCK, "bsck", "BseckReloadDescriptor", "boot security reload state"},
      {RecordKind::kSequenceControl, kEntryTypeSEQC, "seqc", "SequenceControlDescriptor", "sequence control"},
      {RecordKind::kBuildEnvironment, kEntryTypeBCFG, "bcfg", "BuildEnvironmentDescriptor", "build environment"},
      {RecordKind::kFrontPanel, kEntryTypeAFPD, "afpd", "AnimatedFrontPanelDisplayEntry", "front-panel text"},
      {RecordKind::kData, kEntryTypeDATA, "data", "DataEntry", "data entry"},
      {RecordKind::kPackageHeader, 0, "package", "CodeObjectInfo", "package header"},
  };
  return kinds;
}

const RecordKindInfo* KindByCode(unsigned int code) {
  if (code == 0) return nullptr;
  for (const RecordKindInfo& info : RecordKinds())
    if (info.code == code) return &info;
  return nullptr;
}

const RecordKindInfo* KindByName(const std::string& name) {
  for (const RecordKindInfo& info : RecordKinds())
    if (name == info.name) return &info;
  return nullptr;
}

const RecordKindInfo& KindInfo(RecordKind kind) {
  for (const RecordKindInfo& info : RecordKinds())
    if (info.kind == kind) return info;
  static const RecordKindInfo unknown = {RecordKind::kUnknown, 0, "unknown", "", "unknown record"};
  return unknown;
}

std::string KindNames() {
  std::string names;
  for (const RecordKindInfo& info : RecordKinds()) {
    if (!names.empty()) names += ", ";
    names += info.name;
  }
  return names;
}

}  // namespace stbtool
