#include "location_arg.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "memory_layout.h"
#include "output.h"
#include "stbplat/memory_map.h"
#include "tool.h"

namespace stbtool {
namespace {

constexpr size_t kNameWidth = 8;
constexpr size_t kTagWidth = 4;
constexpr unsigned long kKiB = 1024;

bool IsNameChar(char c) {
  return std::isalnum(static_cast<unsigned char>(c)) || c == '_' || c == '-';
}

std::string NameOf(const unsigned char* name) {
  size_t length = 0;
  while (length < kNameWidth && name[length] != '.' && name[length] != 0) ++length;
  return PrintableText(name, length);
}

}  // namespace

unsigned long ParseNumber(const std::string& text, const std::string& what) {
  const std::string bad = what + ": '" + text + "' is not a number";
  // strtoul would skip blanks and take a sign: a number starts with a digit.
  if (text.empty() || !std::isdigit(static_cast<unsigned char>(text[0]))) throw UsageError(bad);
  errno = 0;
  char* end = nullptr;
  unsigned long value = std::strtoul(text.c_str(), &end, 0);
  if (errno == ERANGE) throw UsageError(what + ": '" + text + "' is too large");
  unsigned long scale = 1;
  if (*end != '\0') {
    char suffix = static_cast<char>(std::toupper(static_cast<unsigned char>(*end)));
    if (suffix == 'K') scale = kKiB;
    else if (suffix == 'M') scale = kKiB * kKiB;
    else if (suffix == 'G') scale = kKiB * kKiB * kKiB;
    else throw UsageError(bad);
    ++end;
    if (*end == 'i' || *end == 'I') ++end;
    if (*end == 'B' || *end == 'b') ++end;
    if (*end != '\0') throw UsageError(bad);
  }
  if (value > std::numeric_limits<unsigned long>::max() / scale)
    throw UsageError(what + ": '" + text + "' is too large");
  return value * scale;
}

CLI::Option* AddNumberOption(CLI::App* app, const std::string& names, unsigned long* value,
                             const std::string& help, bool* given) {
  const std::string name = names.substr(names.rfind(',') + 1);
  return app
      ->add_option_function<std::string>(
          names,
          [=](const std::string& text) {
            try {
              *value = ParseNumber(text, name);
            } catch (const UsageError& e) {
              throw CLI::ValidationError(e.what());
            }
            if (given != nullptr) *given = true;
          },
          help + " (0x.. hex; K, M, G suffixes)")
      ->type_name("NUMBER");
}

bool ParseLocationArg(const std::string& text, const std::string& what, LocationArg* out) {
  std::string names = text;
  std::string offset;
  size_t plus = text.find('+');
  if (plus != std::string::npos) {
    names = text.substr(0, plus);
    offset = text.substr(plus + 1);
  }
  std::string parts[3];
  size_t part = 0;
  for (char c : names) {
    if (c == '.') {
      if (++part == 3) return false;
    } else if (IsNameChar(c)) {
      parts[part] += c;
    } else {
      return false;
    }
  }
  if (part != 2 || parts[0].empty() || parts[1].empty() || parts[2].empty()) return false;
  static const char* const labels[] = {"device", "partition", "slot"};
  for (size_t i = 0; i < 3; ++i)
    if (parts[i].size() > kNameWidth)
      throw UsageError(what + ": " + labels[i] + " name '" + parts[i] + "' in '" + text +
                       "' is longer than 8 characters");
  LocationArg arg;
  arg.device = parts[0];
  arg.partition = parts[1];
  arg.slot = parts[2];
  if (plus != std::string::npos) {
    arg.offset = ParseNumber(offset, what + " offset");
    arg.hasOffset = true;
  }
  *out = arg;
  return true;
}

ComponentLocation ToComponentLocation(const LocationArg& arg, const std::string& tag) {
  ComponentLocation component(reinterpret_cast<const unsigned char*>(arg.device.c_str()),
                              reinterpret_cast<const unsigned char*>(arg.partition.c_str()),
                              reinterpret_cast<const unsigned char*>(arg.slot.c_str()), 0);
  std::memset(component.componentTag, 0, sizeof component.componentTag);
  std::memcpy(component.componentTag, tag.data(), std::min(tag.size(), kTagWidth));
  component.slotOffset = arg.offset;
  return component;
}

std::string LocationText(const Location& location) {
  return NameOf(location.deviceName) + "." + NameOf(location.partitionName) + "." +
         NameOf(location.slotName);
}

void RequireKnownSlot(const LocationArg& arg, const std::string& command) {
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  if (!map->IsCreated()) return;  // no map to tell; the library says what it finds
  Location location = ToComponentLocation(arg).location;
  unsigned long size = 0, offset = 0;
  if (map->GetSlotSizeAndOffset(&location, &size, &offset)) return;
  bool fromMemoryMap = false;
  std::string known;
  for (const LayoutDevice& device : LoadLayout(LoadDeviceTable(false), &fromMemoryMap))
    for (const LayoutPartition& partition : device.partitions)
      for (const LayoutSlot& slot : partition.slots)
        known += (known.empty() ? "" : ", ") + device.name + "." + partition.name + "." + slot.name;
  throw UsageError(command + ": no slot " + LocationText(location) + " (known: " + known + ")");
}

}  // namespace stbtool
