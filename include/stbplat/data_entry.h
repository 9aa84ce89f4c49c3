// DataEntry: an opaque byte string framed as a "DATA" entry
//   uint32 0x44415441 | uint32 length | length bytes
// (no flags or version header). The payload is owned, borrowed from the
// caller (Read with an external buffer), or left in place in the source
// stream (ReadInPlace) and copied out later with GetInPlaceData.
//
// Kept on purpose: CreateData and operator= do not release a buffer held
// before (a caller may still hold it through GetData()).
// Safe edges on corrupt input:
// - Reading an owned payload first releases one this entry already owns, so
//   reading the same record again does not leak.
// - Assigning from an in-place entry whose source is not a memory stream
//   copies the bytes through the source stream (its position is restored),
//   since the payload pointer is then only an offset.
// - DisplayAsText never reads past length bytes (nor before the payload
//   when it starts with a zero) and leaves the payload unchanged.
// - operator== and DisplayAsText reach an offset-only payload through its
//   source stream, never through the offset as an address.
// - A failed ReadInPlace leaves no payload (null, length 0), never the old
//   length over the new source.
// - StoreTLVAndData copies an offset-only payload through its source stream
//   in pieces (and puts the source back), never through the offset.
// - GetInPlaceData without a source stream, or whose source cannot be
//   positioned at the payload, returns false.
// - Allocation failures are reported ("Memory allocation failure"), never
//   thrown.
#ifndef STBPLAT_DATA_ENTRY_H
#define STBPLAT_DATA_ENTRY_H

#include "stbplat/descriptor_status.h"
#include "stbplat/export.h"

class Extruder;
class Intruder;

class STBPLAT_EXPORT DataEntry {
 public:
  unsigned int length;
  // For an in-place entry: the source stream's position of the payload.
  unsigned char* pPayload;
  bool ownsData;
  Extruder* source;

  DataEntry();
  DataEntry(const DataEntry& other);
  ~DataEntry();
  DataEntry& operator=(const DataEntry& other);

  // inPlace is refused (0xA006) on streams with 64-bit positions.
  unsigned int ReadTLVAndData(Extruder& in, unsigned int* pLength, bool inPlace);
  // With a non-zero externalBuffer the bytes go into that caller-owned buffer.
  unsigned int Read(Extruder& in, unsigned int length, unsigned long externalBuffer);
  unsigned int ReadInPlace(Extruder& in, unsigned int length);
  unsigned int StoreTLVAndData(Intruder* out) const;

  void CreateData(unsigned int length);
  void CreateData(unsigned int length, const unsigned char* src);
  unsigned char* GetData() const;
  // Copies an in-place payload from its source to out, 1 KiB at a time.
  bool GetInPlaceData(Intruder* out) const;
  void DisplayAsText() const;
  bool operator==(const DataEntry& other) const;
};

#endif
