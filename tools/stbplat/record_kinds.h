// The records the tool knows, by the type code at their start. A package
// header has no type code of its own; it is named by --type or recognised
// when nothing else matches.
#ifndef STBPLAT_TOOL_RECORD_KINDS_H
#define STBPLAT_TOOL_RECORD_KINDS_H

#include <string>
#include <vector>

namespace stbtool {

enum class RecordKind {
  kUnknown,
  kVersion,            // VERS  VersionEntry
  kSegment,            // MCSD  MemoryControllerSegmentDescriptor
  kController,         // MCET  MemoryControllerDescriptor
  kMemoryConfig,       // MCFG  MemoryConfigDescriptor
  kFrontPanel,         // AFPD  AnimatedFrontPanelDisplayEntry
  kDeviceConfig,       // DEVC  DeviceConfigDescriptor
  kBootSecurity,       // BSCK  BseckReloadDescriptor
  kSequenceControl,    // SEQC  SequenceControlDescriptor
  kBuildEnvironment,   // BCFG  BuildEnvironmentDescriptor
  kBootLoaderInfo,     // FSBL  FSBLInfo
  kBuildConfig,        // BLDC  BuildConfig
  kData,               // DATA  DataEntry
  kPackageHeader       // (no code) CodeObjectInfo
};

struct RecordKindInfo {
  RecordKind kind;
  unsigned int code;       // 0 for the package header
  const char* name;        // --type name
  const char* className;
  const char* description;
};

const std::vector<RecordKindInfo>& RecordKinds();
const RecordKindInfo* KindByCode(unsigned int code);
const RecordKindInfo* KindByName(const std::string& name);
const RecordKindInfo& KindInfo(RecordKind kind);
// "vers, mcsd, ..." for help texts.
std::string KindNames();

}  // namespace stbtool

#endif
