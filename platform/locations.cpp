// The stand-in's rule for two locations naming the same place: the same 24
// name bytes.
#include <cstring>

#include "stbplat/location.h"
#include "stbplat/platform.h"

STBPLAT_EXPORT bool AreLocationsSame(const Location* a, const Location* b) {
  if (a == nullptr || b == nullptr) return a == b;
  return std::memcmp(a->deviceName, b->deviceName, sizeof a->deviceName) == 0 &&
         std::memcmp(a->partitionName, b->partitionName, sizeof a->partitionName) == 0 &&
         std::memcmp(a->slotName, b->slotName, sizeof a->slotName) == 0;
}
