// Name helpers of the memory-map stand-in: 8-byte names padded with '.'.
#ifndef STBPLAT_PLATFORM_MEMORY_MAP_NAMES_H
#define STBPLAT_PLATFORM_MEMORY_MAP_NAMES_H

#include <string>

#include "stbplat/memory_map.h"

namespace stbplat {
namespace platform {

constexpr unsigned char kNamePad = '.';

// Upper-cased and padded to 8 bytes; false when text is empty or longer.
bool ToPaddedName(const std::string& text, unsigned char* out);
// The name without its padding.
std::string Unpadded(const unsigned char* name);
bool SameName(const unsigned char* a, const unsigned char* b);
bool IsNandTechnology(const unsigned char* technology);
bool IsEmmcTechnology(const unsigned char* technology);

}  // namespace platform
}  // namespace stbplat

#endif
