// Reaching a DataEntry's bytes whatever kind of payload it holds.
#ifndef STBPLAT_SRC_DESCRIPTORS_DATA_ENTRY_PAYLOAD_H
#define STBPLAT_SRC_DESCRIPTORS_DATA_ENTRY_PAYLOAD_H

#include <vector>

#include "stbplat/data_entry.h"

namespace stbplat {
namespace records {

// An in-place payload whose source is a file or device holds an offset, not
// an address, in pPayload.
bool HoldsOffsetOnly(const DataEntry& entry);

// Points *bytes at the entry's length payload bytes: the payload itself, or,
// for an offset-only entry, a copy read through the source stream into
// scratch (the source's position is restored). False when the bytes cannot
// be reached.
bool PayloadBytes(const DataEntry& entry, std::vector<unsigned char>& scratch,
                  const unsigned char** bytes);

// Frees a payload this entry allocated itself.
void ReleaseOwned(DataEntry& entry);

}  // namespace records
}  // namespace stbplat

#endif
