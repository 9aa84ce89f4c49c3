// Field offsets of the location classes and the package header (LP64).
#include <cstddef>

#include "stbplat/code_object_info.h"

static_assert(sizeof(Location) == 24, "three 8-byte names, nothing else");
static_assert(offsetof(Location, partitionName) == 8 && offsetof(Location, slotName) == 16, "");
static_assert(sizeof(LocationStorage) == sizeof(Location), "no added fields");
static_assert(offsetof(ComponentLocation, componentTag) == 0, "");
static_assert(offsetof(ComponentLocation, location) == 4, "");
static_assert(offsetof(ComponentLocation, slotOffset) == 32, "");
static_assert(sizeof(ComponentLocation) == 40, "");
static_assert(sizeof(ComponentLocationStorage) == sizeof(ComponentLocation), "no added fields");
static_assert(offsetof(CodeObjectInfo, unused) == 0, "");
static_assert(offsetof(CodeObjectInfo, packageHeaderLocation) == 8, "");
static_assert(offsetof(CodeObjectInfo, numComponents) == 48, "");
static_assert(offsetof(CodeObjectInfo, componentLocations) == 56, "");
static_assert(sizeof(CodeObjectInfo) == 56 + 16 * 40, "");
