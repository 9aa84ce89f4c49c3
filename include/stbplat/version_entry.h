// VersionEntry ("VERS") and the sequence-control block.
//
// VERS payload: uint16 majorVersion, uint16 minorVersion, uint16 _temp, the
// description as a DATA entry, then, only while the entry size leaves room,
// uint8 versionLetter, uint8 pad and the 28-byte sequence-control block
// (20-byte name, uint32 otpEpoch, uint32 nvSequence). Older, shorter records
// read with defaults for what they lack; a stored record always has it all.
#ifndef STBPLAT_VERSION_ENTRY_H
#define STBPLAT_VERSION_ENTRY_H

#include "stbplat/data_entry.h"
#include "stbplat/export.h"
#include "stbplat/system_descriptor.h"

enum : unsigned int {
  kSequenceNameLength = 20,
  kDefaultOtpEpoch = 0x40000000
};

class STBPLAT_EXPORT SequenceControl {
 public:
  unsigned char controlledSequenceName[kSequenceNameLength];  // not necessarily terminated
  unsigned int otpEpoch;
  unsigned int nvSequence;

  // Name all zero, otpEpoch 0x40000000, nvSequence 0.
  SequenceControl();
  SequenceControl(const SequenceControl& other);
  SequenceControl& operator=(const SequenceControl& other);
};

class STBPLAT_EXPORT SequenceControlStorage : public SequenceControl {
 public:
  SequenceControlStorage();
  unsigned int Read(Extruder& in);
  unsigned int Store(Intruder* out) const;
};

// "SEQC": a sequence-control block standing alone (a member of BuildConfig).
// Default versions: major 0, minor 0 (the payload has a single layout).
// The payload member is named sequenceControl.
class STBPLAT_EXPORT SequenceControlDescriptor : public SystemDescriptor {
 public:
  SequenceControlStorage sequenceControl;

  SequenceControlDescriptor();
  SequenceControlDescriptor(unsigned short flags, unsigned char majorVer, unsigned char minorVer);
  ~SequenceControlDescriptor() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
};

// Constructed as type "VERS", flags 0, major 0, minor 2.
class STBPLAT_EXPORT VersionEntry : public SystemDescriptor {
 public:
  unsigned short majorVersion;
  unsigned short minorVersion;
  unsigned short _temp;
  DataEntry description;
  unsigned char versionLetter;
  unsigned char pad;
  SequenceControlStorage sequenceControl;

  VersionEntry();
  ~VersionEntry() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  // Returns 0 once pad is written: the sequence-control block's own status
  // is not looked at.
  unsigned int Store(Intruder* out) const override;
};

#endif
