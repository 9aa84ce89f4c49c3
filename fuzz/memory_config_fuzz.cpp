// Reads a MemoryConfigDescriptor from arbitrary bytes; what reads must
// store, read back and store again to the same bytes. Records in the old
// (minor 5 and below) layouts convert as they are read, so they take part.
#include "fuzz_support.h"

STBPLAT_FUZZ_RECORD(MemoryConfigDescriptor, r.ReadTLVAndData(from, nullptr), r.StoreTLVAndData(&to))
