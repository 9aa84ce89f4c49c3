#include "memory_map_names.h"

#include <cctype>
#include <cstring>

namespace stbplat {
namespace platform {

bool ToPaddedName(const std::string& text, unsigned char* out) {
  if (text.empty() || text.size() > kMemoryMapNameWidth) return false;
  std::memset(out, kNamePad, kMemoryMapNameWidth);
  for (std::size_t i = 0; i < text.size(); ++i)
    out[i] = static_cast<unsigned char>(std::toupper(static_cast<unsigned char>(text[i])));
  return true;
}

std::string Unpadded(const unsigned char* name) {
  std::string text;
  for (unsigned int i = 0; i < kMemoryMapNameWidth && name[i] != kNamePad && name[i] != 0; ++i)
    text += static_cast<char>(name[i]);
  return text;
}

bool SameName(const unsigned char* a, const unsigned char* b) {
  return std::memcmp(a, b, kMemoryMapNameWidth) == 0;
}

namespace {
bool IsOneOf(const unsigned char* technology, const char* const* names, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i)
    if (std::memcmp(technology, names[i], kMemoryMapNameWidth) == 0) return true;
  return false;
}
}  // namespace

bool IsNandTechnology(const unsigned char* technology) {
  static const char* const kNames[] = {"NAND....", "VNAND..."};
  return IsOneOf(technology, kNames, sizeof kNames / sizeof kNames[0]);
}

bool IsEmmcTechnology(const unsigned char* technology) {
  static const char* const kNames[] = {"EMMC....", "VEMMC...", "GP1_EMMC", "GP3_EMMC"};
  return IsOneOf(technology, kNames, sizeof kNames / sizeof kNames[0]);
}

}  // namespace platform
}  // namespace stbplat
