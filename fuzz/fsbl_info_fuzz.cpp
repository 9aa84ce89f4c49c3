// Reads a FSBLInfo from arbitrary bytes; what reads and can be stored must
// store, read back and store again to the same bytes.
#include "fuzz_support.h"

STBPLAT_FUZZ_RECORD(FSBLInfo, r.ReadTLVAndData(from, nullptr), r.StoreTLVAndData(&to))
