// Reads a CodeObjectInfo from arbitrary bytes; what reads and can be stored must
// store, read back and store again to the same bytes.
#include "fuzz_support.h"

STBPLAT_FUZZ_RECORD(CodeObjectInfo, r.Read(from), r.Store(&to))
