// Reads a AnimatedFrontPanelDisplayEntry from arbitrary bytes; what reads and can be stored must
// store, read back and store again to the same bytes.
#include "fuzz_support.h"

STBPLAT_FUZZ_RECORD(AnimatedFrontPanelDisplayEntry, r.ReadTLVAndData(from, nullptr), r.StoreTLVAndData(&to))
