// Interfaces imported from the device's platform library (libstbplat-platform
// off the device). Logging is in stbplat/log.h, the memory map in
// stbplat/memory_map.h.
#ifndef STBPLAT_PLATFORM_H
#define STBPLAT_PLATFORM_H

#include "stbplat/export.h"

class Location;

// The platform's rule for two locations naming the same place. The stand-in
// compares the 24 name bytes.
STBPLAT_EXPORT bool AreLocationsSame(const Location* a, const Location* b);

extern "C" {
// Starts the platform's token-ageing thread. The stand-in starts nothing and
// returns 0.
STBPLAT_EXPORT int StartTokenAgingThread(void);
}

#endif
