// Status codes returned by the record classes (0 is success).
#ifndef STBPLAT_DESCRIPTOR_STATUS_H
#define STBPLAT_DESCRIPTOR_STATUS_H

enum : unsigned int {
  kDescriptorOk = 0,
  // Another entry type at this place (stream rewound to the entry's start),
  // too few bytes left, or a nested record failed.
  kDescriptorWrongType = 0xA004,
  // In-place payload requested on a stream with 64-bit positions.
  kDescriptorInPlaceOn64Bit = 0xA006,
  kDescriptorStoreNotSupported = 0xA00A,
  kDescriptorNoBuffer = 0xA00B,
  // The stored major version is newer than the class understands.
  kDescriptorNewerMajorVersion = 0xA011,
  // A field could not be read, written or positioned.
  kDescriptorFieldError = 0xA012
};

#endif
