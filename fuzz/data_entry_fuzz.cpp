// Reads a DataEntry from arbitrary bytes; what reads and can be stored must
// store, read back and store again to the same bytes.
#include "fuzz_support.h"

STBPLAT_FUZZ_RECORD(DataEntry, r.ReadTLVAndData(from, nullptr, false), r.StoreTLVAndData(&to))
