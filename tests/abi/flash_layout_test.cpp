// Field offsets of FlashInterface as programs built against it expect
// (LP64; the class has no virtual functions, so fields start at 0).
#include <cstddef>
#include <type_traits>

#include "stbplat/flash_interface.h"

#pragma GCC diagnostic ignored "-Winvalid-offsetof"

static_assert(sizeof(void*) == 8 && sizeof(long) == 8, "LP64 layout");
static_assert(!std::is_polymorphic<FlashInterface>::value, "no vtable pointer");
static_assert(offsetof(FlashInterface, mtdNames) == 0, "");
static_assert(sizeof(FlashInterface::mtdNames) == 30 * 100, "");
static_assert(offsetof(FlashInterface, aliasNames) == 3000, "");
static_assert(sizeof(FlashInterface::aliasNames) == 30 * 100, "");
static_assert(offsetof(FlashInterface, mtdSizes) == 6000, "");
static_assert(sizeof(FlashInterface::mtdSizes) == 30 * 8, "");
static_assert(offsetof(FlashInterface, mtdCount) == 6240, "");
static_assert(offsetof(FlashInterface, aliasCount) == 6241, "");
static_assert(offsetof(FlashInterface, norSectorSize) == 6248, "");
static_assert(offsetof(FlashInterface, emmcChunkSize) == 6256, "");
static_assert(offsetof(FlashInterface, spareSectorSize) == 6264, "");
static_assert(offsetof(FlashInterface, nandSectorSize) == 6272, "");
static_assert(offsetof(FlashInterface, nandPageSize) == 6280, "");
static_assert(offsetof(FlashInterface, pendingNANDOffset) == 6288, "");
static_assert(offsetof(FlashInterface, blocksMarkedBad) == 6296, "");
static_assert(offsetof(FlashInterface, badBlocksSkipped) == 6304, "");
static_assert(offsetof(FlashInterface, nandPageBuffer) == 6312, "");
static_assert(offsetof(FlashInterface, currNANDBufferOffset) == 6320, "");
static_assert(offsetof(FlashInterface, pendingNANDDevice) == 6328, "");
static_assert(sizeof(FlashInterface) == 6336, "");
static_assert(std::is_same<decltype(FlashInterface::m_pSelf), FlashInterface*>::value, "");
static_assert(std::is_same<decltype(isRDLQUpgradeInProgress), bool>::value, "");
