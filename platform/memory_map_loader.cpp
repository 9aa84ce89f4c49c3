// Loads the memory-map stand-in from its ini file (docs/memory-map.md).
#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "memory_map_names.h"
#include "stbplat/memory_map.h"
#include "util/ini_core.h"

using stbplat::platform::ToPaddedName;

namespace {

constexpr const char* kDeviceSection = "device ";
constexpr const char* kPartitionSection = "partition ";
constexpr const char* kSlotSection = "slot ";

// Where each entry was declared, for messages about it.
struct Declared {
  int line;
  bool hasSize;
  bool hasBase;
  bool hasTechnology;
};

struct LoadState {
  FILE* file;
  int line;         // number of the line being parsed
  int sectionLine;  // number of the last section header read
  std::vector<MemoryDeviceEntry> devices;
  std::vector<Declared> deviceLines;
  std::vector<std::vector<Declared>> partitionLines;           // per device
  std::vector<std::vector<std::vector<int>>> slotLines;         // per device, partition
  std::string currentSection;
  MemoryDeviceEntry* device;
  PartitionEntry* partition;
  PhysicalLocationDescriptor* slot;
  Declared* declared;  // of the current section's entry
  std::string error;
};

char* CountingFgets(char* buffer, int size, void* context) {
  auto* state = static_cast<LoadState*>(context);
  char* got = std::fgets(buffer, size, state->file);
  if (got == nullptr) return got;
  ++state->line;
  const char* text = got;
  while (*text == ' ' || *text == '\t') ++text;
  if (*text == '[') state->sectionLine = state->line;
  return got;
}

bool Fail(LoadState& state, int line, const std::string& message) {
  if (state.error.empty()) state.error = "line " + std::to_string(line) + ": " + message;
  return false;
}

bool ParseNumber(const char* text, unsigned long* value) {
  if (text == nullptr || *text == 0 || *text == '-') return false;
  char* end = nullptr;
  errno = 0;
  unsigned long long parsed = std::strtoull(text, &end, 0);
  if (errno != 0 || end == text || *end != 0) return false;
  *value = parsed;
  return true;
}

// "A.B.C" into its dot-separated names, each 1 to 8 characters.
bool SplitNames(const std::string& text, std::size_t count, std::vector<std::string>* names) {
  names->clear();
  std::size_t start = 0;
  for (;;) {
    std::size_t dot = text.find('.', start);
    names->push_back(text.substr(start, dot == std::string::npos ? dot : dot - start));
    if (dot == std::string::npos) break;
    start = dot + 1;
  }
  if (names->size() != count) return false;
  for (const std::string& name : *names)
    if (name.empty() || name.size() > kMemoryMapNameWidth) return false;
  return true;
}

bool StartsWith(const std::string& text, const char* prefix) {
  return text.compare(0, std::strlen(prefix), prefix) == 0;
}

MemoryDeviceEntry* FindDevice(LoadState& state, const std::string& name, std::size_t* index) {
  unsigned char padded[kMemoryMapNameWidth];
  if (!ToPaddedName(name, padded)) return nullptr;
  for (std::size_t i = 0; i < state.devices.size(); ++i) {
    if (std::memcmp(state.devices[i].deviceName, padded, kMemoryMapNameWidth) == 0) {
      *index = i;
      return &state.devices[i];
    }
  }
  return nullptr;
}

bool OpenSection(LoadState& state, const std::string& section) {
  state.currentSection = section;
  state.device = nullptr;
  state.partition = nullptr;
  state.slot = nullptr;
  state.declared = nullptr;
  std::vector<std::string> names;
  if (StartsWith(section, kDeviceSection)) {
    std::string name = section.substr(std::strlen(kDeviceSection));
    std::size_t index = 0;
    if (!SplitNames(name, 1, &names)) return Fail(state, state.sectionLine, "bad device name");
    if (FindDevice(state, name, &index) != nullptr)
      return Fail(state, state.sectionLine, "device " + name + " declared twice");
    MemoryDeviceEntry entry{};
    ToPaddedName(name, entry.deviceName);
    state.devices.push_back(entry);
    state.deviceLines.push_back(Declared{state.sectionLine, false, false, false});
    state.partitionLines.emplace_back();
    state.slotLines.emplace_back();
    state.device = &state.devices.back();
    state.declared = &state.deviceLines.back();
    return true;
  }
  if (StartsWith(section, kPartitionSection)) {
    std::string name = section.substr(std::strlen(kPartitionSection));
    if (!SplitNames(name, 2, &names)) return Fail(state, state.sectionLine, "bad partition name");
    std::size_t index = 0;
    MemoryDeviceEntry* device = FindDevice(state, names[0], &index);
    if (device == nullptr)
      return Fail(state, state.sectionLine, "partition of undeclared device " + names[0]);
    PartitionEntry entry{};
    ToPaddedName(names[1], entry.partitionName);
    for (const PartitionEntry& existing : device->partitions)
      if (std::memcmp(existing.partitionName, entry.partitionName, kMemoryMapNameWidth) == 0)
        return Fail(state, state.sectionLine, "partition " + name + " declared twice");
    device->partitions.push_back(entry);
    state.partitionLines[index].push_back(Declared{state.sectionLine, false, true, true});
    state.slotLines[index].emplace_back();
    state.device = device;
    state.partition = &device->partitions.back();
    state.declared = &state.partitionLines[index].back();
    return true;
  }
  if (StartsWith(section, kSlotSection)) {
    std::string name = section.substr(std::strlen(kSlotSection));
    if (!SplitNames(name, 3, &names)) return Fail(state, state.sectionLine, "bad slot name");
    std::size_t index = 0;
    MemoryDeviceEntry* device = FindDevice(state, names[0], &index);
    unsigned char padded[kMemoryMapNameWidth];
    ToPaddedName(names[1], padded);
    std::size_t partitionIndex = 0;
    PartitionEntry* partition = nullptr;
    for (std::size_t i = 0; device != nullptr && i < device->partitions.size(); ++i) {
      if (std::memcmp(device->partitions[i].partitionName, padded, kMemoryMapNameWidth) == 0) {
        partition = &device->partitions[i];
        partitionIndex = i;
      }
    }
    if (partition == nullptr)
      return Fail(state, state.sectionLine, "slot of undeclared partition " + names[0] + "." + names[1]);
    PhysicalLocationDescriptor entry{};
    ToPaddedName(names[2], entry.slotName);
    for (const PhysicalLocationDescriptor& existing : partition->slots)
      if (std::memcmp(existing.slotName, entry.slotName, kMemoryMapNameWidth) == 0)
        return Fail(state, state.sectionLine, "slot " + name + " declared twice");
    partition->slots.push_back(entry);
    state.slotLines[index][partitionIndex].push_back(state.sectionLine);
    state.slot = &partition->slots.back();
    return true;
  }
  return Fail(state, state.sectionLine, "unknown section [" + section + "]");
}

bool OnValue(void* user, const char* section, const char* name, const char* value) {
  auto& state = *static_cast<LoadState*>(user);
  if (section != state.currentSection && !OpenSection(state, section)) return false;
  std::string key(name);
  unsigned long number = 0;
  bool numeric = ParseNumber(value, &number);
  if (state.slot != nullptr) {
    if (key == "offset" && numeric) state.slot->offset = number;
    else if (key == "size" && numeric) state.slot->size = number;
    else if (key == "file" && *value != 0) state.slot->filePath = value;
    else if (key == "node" && *value != 0) state.slot->nodeName = value;
    else return Fail(state, state.line, "bad slot entry " + key);
    return true;
  }
  if (state.partition != nullptr) {
    if (key == "offset" && numeric) state.partition->offset = number;
    else if (key == "size" && numeric) {
      state.partition->size = number;
      state.declared->hasSize = true;
    } else if (key == "node" && *value != 0) state.partition->nodeName = value;
    else return Fail(state, state.line, "bad partition entry " + key);
    return true;
  }
  if (state.device != nullptr) {
    if (key == "technology" && *value != 0 && std::strlen(value) <= kMemoryMapNameWidth) {
      ToPaddedName(value, state.device->technology);
      state.declared->hasTechnology = true;
    } else if (key == "base" && numeric) {
      state.device->physBase = number;
      state.declared->hasBase = true;
    } else if (key == "size" && numeric) {
      state.device->size = number;
      state.declared->hasSize = true;
    } else {
      return Fail(state, state.line, "bad device entry " + key);
    }
    return true;
  }
  return Fail(state, state.line, "entry outside a section");
}

struct Range {
  unsigned long start;
  unsigned long size;
  int line;
};

// Ranges must lie inside [0, limit) and not overlap; the sums are checked
// for wrapping so that addresses computed from the map stay inside it.
bool CheckRanges(LoadState& state, std::vector<Range> ranges, unsigned long limit,
                 const char* what) {
  for (const Range& range : ranges) {
    if (range.size == 0) return Fail(state, range.line, std::string(what) + " of size 0");
    if (range.start > limit || range.size > limit - range.start)
      return Fail(state, range.line, std::string(what) + " beyond its container");
  }
  std::sort(ranges.begin(), ranges.end(),
            [](const Range& a, const Range& b) { return a.start < b.start; });
  for (std::size_t i = 1; i < ranges.size(); ++i)
    if (ranges[i].start < ranges[i - 1].start + ranges[i - 1].size)
      return Fail(state, ranges[i].line, std::string(what) + " overlaps another");
  return true;
}

bool CheckMap(LoadState& state) {
  for (std::size_t d = 0; d < state.devices.size(); ++d) {
    const MemoryDeviceEntry& device = state.devices[d];
    const Declared& declared = state.deviceLines[d];
    if (!declared.hasTechnology || !declared.hasBase || !declared.hasSize)
      return Fail(state, declared.line, "device needs technology, base and size");
    if (device.size == 0 || device.physBase > ~0UL - (device.size - 1))
      return Fail(state, declared.line, "device range wraps or is empty");
    std::vector<Range> partitions;
    for (std::size_t p = 0; p < device.partitions.size(); ++p) {
      const PartitionEntry& partition = device.partitions[p];
      const Declared& partitionDeclared = state.partitionLines[d][p];
      if (!partitionDeclared.hasSize)
        return Fail(state, partitionDeclared.line, "partition needs a size");
      partitions.push_back(Range{partition.offset, partition.size, partitionDeclared.line});
      std::vector<Range> slots;
      for (std::size_t s = 0; s < partition.slots.size(); ++s)
        slots.push_back(Range{partition.slots[s].offset, partition.slots[s].size,
                              state.slotLines[d][p][s]});
      if (!CheckRanges(state, slots, partition.size, "slot")) return false;
    }
    if (!CheckRanges(state, partitions, device.size, "partition")) return false;
  }
  return true;
}

}  // namespace

bool ExtendedMemoryMapStructure::Load(const char* path, std::string* error) {
  ExtendedMemoryMapStructure* map = Instance();
  map->devices.clear();
  map->created = false;
  LoadState state{};
  std::string message;
  state.file = path == nullptr ? nullptr : std::fopen(path, "r");
  if (state.file == nullptr) {
    message = std::string("memory map ") + (path == nullptr ? "(null)" : path) +
              ": cannot open: " + std::strerror(errno);
  } else {
    // Entries live in vectors that grow while parsing; the section pointers
    // are taken again whenever a new section starts, so they never dangle
    // within one section.
    int bad = stbplat::ini::IniParse(CountingFgets, &state, OnValue, nullptr, &state, path);
    std::fclose(state.file);
    if (state.error.empty() && bad != 0) Fail(state, bad, "malformed line");
    if (state.error.empty()) CheckMap(state);
    if (!state.error.empty()) message = std::string("memory map ") + path + ": " + state.error;
  }
  if (!message.empty()) {
    std::fprintf(stderr, "%s\n", message.c_str());
    if (error != nullptr) *error = message;
    return false;
  }
  map->devices = std::move(state.devices);
  map->created = true;
  return true;
}
