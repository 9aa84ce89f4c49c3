// Field offsets of the exported stream classes as programs built against
// them expect (LP64: 8-byte pointers, long and size_t).
#include <cstddef>
#include <string>

#include "stbplat/intruder.h"

#pragma GCC diagnostic ignored "-Winvalid-offsetof"

static_assert(sizeof(void*) == 8 && sizeof(long) == 8, "LP64 layout");
static_assert(offsetof(Extruder, pStart) == 8, "after the vtable pointer");
static_assert(offsetof(Extruder, pCurrent) == 16, "");
static_assert(offsetof(Extruder, length) == 24, "");
static_assert(offsetof(Extruder, bytesLeft) == 28, "");
static_assert(offsetof(Extruder, is64Address) == 32, "");
static_assert(offsetof(Extruder, isInitedOK) == 33, "");
static_assert(offsetof(Extruder, pFile) == 40, "");
static_assert(offsetof(Extruder, stdinHistory) == 48, "");
static_assert(offsetof(Extruder, stdinHistoryCount) == 2048, "");
static_assert(offsetof(Extruder, stdinPosition) == 2052, "");
static_assert(offsetof(Extruder, stdinTotalRead) == 2056, "");
static_assert(offsetof(Extruder, memFd) == 2060, "");
static_assert(offsetof(Extruder, pMapped) == 2064, "");
static_assert(offsetof(Extruder, isNorFlash) == 2072, "");
static_assert(offsetof(Extruder, norBaseOffset) == 2076, "");
static_assert(offsetof(Extruder, isNand) == 2080, "");
static_assert(offsetof(Extruder, isEMMC) == 2081, "");
static_assert(offsetof(Extruder, currNandOffset) == 2088, "");
static_assert(offsetof(Extruder, partitionName) == 2096, "");
static_assert(sizeof(Extruder) == 2096 + sizeof(std::string), "");
static_assert(offsetof(Intruder, growthStep) == sizeof(Extruder), "");
static_assert(offsetof(Intruder, ownsBuffer) == sizeof(Extruder) + 4, "");
static_assert(sizeof(Intruder) == sizeof(Extruder) + 8, "");
static_assert(sizeof(UXB) == 2 && offsetof(UXB, byte) == 0 && offsetof(UXB, word) == 0, "");
