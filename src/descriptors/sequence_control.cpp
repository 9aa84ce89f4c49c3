// The sequence-control block: a named update sequence, its epoch and counter.
#include <cstring>

#include "descriptors/record_io.h"
#include "stbplat/version_entry.h"

using namespace stbplat::records;

SequenceControl::SequenceControl() : otpEpoch(kDefaultOtpEpoch), nvSequence(0) {
  std::memset(controlledSequenceName, 0, sizeof controlledSequenceName);
}

SequenceControl::SequenceControl(const SequenceControl& other)
    : otpEpoch(other.otpEpoch), nvSequence(other.nvSequence) {
  std::memcpy(controlledSequenceName, other.controlledSequenceName, sizeof controlledSequenceName);
}

SequenceControl& SequenceControl::operator=(const SequenceControl& other) {
  std::memmove(controlledSequenceName, other.controlledSequenceName,
               sizeof controlledSequenceName);
  otpEpoch = other.otpEpoch;
  nvSequence = other.nvSequence;
  return *this;
}

SequenceControlStorage::SequenceControlStorage() {}

unsigned int SequenceControlStorage::Read(Extruder& in) {
  if (!Extruded(in.extrude(controlledSequenceName, kSequenceNameLength))) {
    RECORD_ERROR("Read", "Error reading (uint8_t *)controlledSequenceName\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&otpEpoch))) {
    RECORD_ERROR("Read", "Error reading otpEpoch\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&nvSequence))) {
    RECORD_ERROR("Read", "Error reading nvSequence\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int SequenceControlStorage::Store(Intruder* out) const {
  if (!Intruded(out->intrude(controlledSequenceName, kSequenceNameLength))) {
    RECORD_ERROR("Store", "Error writing (uint8_t *)controlledSequenceName\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(otpEpoch))) {
    RECORD_ERROR("Store", "Error writing otpEpoch\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(nvSequence))) {
    RECORD_ERROR("Store", "Error writing nvSequence\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}
