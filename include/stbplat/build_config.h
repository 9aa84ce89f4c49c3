// What a build image says about itself: BuildConfig, a container holding the
// component's tag and version, a sequence-control block ("SEQC") and the
// build-environment text (BuildEnvironmentDescriptor, "BCFG"). Read-only
// here: Store returns 0xA00A.
//
// BuildConfig payload: 4-byte tag, 2-byte major, 2-byte minor (both as
// stored), 1-byte letter, 3 reserved bytes, uint32 unused1, uint32 count,
// then count entries in any order: "SEQC" and "BCFG" fill the members, other
// types are skipped silently.
//
// Versions (callers may pass their own): BuildConfig type "BLDC"
// (0x424C4443), major 0, minor 0; BuildEnvironmentDescriptor major 0,
// minor 0. Major 0 takes every record whose major version is 0.
// The text member of BuildEnvironmentDescriptor is named text.
// Safe edges on corrupt input: the count is trusted only while entry headers
// can be read and skipped; a header that cannot be read, or a skip past the
// end of a memory stream, stops the loop with 0xA012.
#ifndef STBPLAT_BUILD_CONFIG_H
#define STBPLAT_BUILD_CONFIG_H

#include "stbplat/data_entry.h"
#include "stbplat/export.h"
#include "stbplat/system_descriptor.h"
#include "stbplat/version_entry.h"

// Payload: one DATA entry holding the build-environment text.
class STBPLAT_EXPORT BuildEnvironmentDescriptor : public SystemDescriptor {
 public:
  DataEntry text;

  BuildEnvironmentDescriptor();
  BuildEnvironmentDescriptor(unsigned short flags, unsigned char majorVer, unsigned char minorVer);
  ~BuildEnvironmentDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

class STBPLAT_EXPORT BuildConfig : public SystemDescriptor {
 public:
  unsigned char componentTag[4];
  unsigned char componentMajorVer[2];
  unsigned char componentMinorVer[2];
  unsigned char componentVerLetter;
  unsigned char reserved[3];
  unsigned int unused1;
  unsigned int numDescriptors;
  SequenceControlDescriptor sequenceControl;
  BuildEnvironmentDescriptor buildEnvironment;

  BuildConfig();
  BuildConfig(unsigned int entryType, unsigned short flags, unsigned char majorVer,
              unsigned char minorVer);
  ~BuildConfig() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

#endif
