// "SEQC": a sequence-control block framed as a record of its own.
#include "stbplat/version_entry.h"

namespace {
constexpr unsigned char kSeqcMajorVersion = 0;
constexpr unsigned char kSeqcMinorVersion = 0;
}  // namespace

SequenceControlDescriptor::SequenceControlDescriptor()
    : SequenceControlDescriptor(0, kSeqcMajorVersion, kSeqcMinorVersion) {}

SequenceControlDescriptor::SequenceControlDescriptor(unsigned short flagsWord, unsigned char major,
                                                     unsigned char minor)
    : SystemDescriptor(kEntryTypeSEQC, flagsWord, major, minor) {}

SequenceControlDescriptor::~SequenceControlDescriptor() {}

unsigned int SequenceControlDescriptor::Read(Extruder& in, unsigned int) {
  return sequenceControl.Read(in);
}

unsigned int SequenceControlDescriptor::Store(Intruder* out) const {
  return sequenceControl.Store(out);
}
