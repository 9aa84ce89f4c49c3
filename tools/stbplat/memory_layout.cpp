#include "memory_layout.h"

#include <cstring>

#include "stbplat/memory_map.h"

namespace stbtool {
namespace {

std::string NameOf(const unsigned char* name) {
  std::string text;
  for (unsigned i = 0; i < kMemoryMapNameWidth && name[i] != '.' && name[i] != 0; ++i)
    text += static_cast<char>(name[i]);
  return text;
}

std::string Raw(const unsigned char* name) {
  return std::string(reinterpret_cast<const char*>(name), kMemoryMapNameWidth);
}

// The stand-in keeps its device list to itself (there is no query that
// lists devices); a derived class may name the member, so the tool reads it
// through that member's pointer.
struct DeviceList : ExtendedMemoryMapStructure {
  static const std::vector<MemoryDeviceEntry>& Of(const ExtendedMemoryMapStructure* map) {
    return map->*(&DeviceList::devices);
  }
};

Medium MediumOf(const std::string& technology) {
  if (technology.find("NAND") != std::string::npos) return Medium::kNand;
  if (technology.find("NOR") != std::string::npos) return Medium::kNor;
  return Medium::kOther;
}

const Chip* ChipNamed(const DeviceTable& table, const std::string& name) {
  for (const Chip& chip : table.chips)
    if (chip.name == name) return &chip;
  return nullptr;
}

}  // namespace

std::vector<LayoutDevice> LoadLayout(const DeviceTable& table, bool* fromMemoryMap) {
  std::vector<LayoutDevice> devices;
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  *fromMemoryMap = map != nullptr && map->IsCreated();
  if (*fromMemoryMap) {
    for (const MemoryDeviceEntry& entry : DeviceList::Of(map)) {
      LayoutDevice device;
      device.name = NameOf(entry.deviceName);
      device.technology = Raw(entry.technology);
      device.medium = MediumOf(device.technology);
      device.base = entry.physBase;
      device.size = entry.size;
      for (const PartitionEntry& p : entry.partitions) {
        LayoutPartition partition{NameOf(p.partitionName), p.offset, p.size, {}};
        for (const PhysicalLocationDescriptor& s : p.slots)
          partition.slots.push_back({NameOf(s.slotName), p.offset + s.offset, s.size,
                                     !s.filePath.empty() ? s.filePath : !s.nodeName.empty() ? s.nodeName : p.nodeName});
        device.partitions.push_back(partition);
      }
      devices.push_back(device);
    }
  } else {
    for (const Chip& chip : table.chips) {
      LayoutDevice device;
      device.name = chip.name;
      device.medium = chip.medium;
      device.size = chip.size;
      for (const auto& slot : chip.slots) {
        const MtdPartition& p = table.partitions[slot.second];
        size_t dot = p.slotName.find('.');
        LayoutPartition partition{p.slotName.substr(0, dot), slot.first, p.size, {}};
        partition.slots.push_back({dot == std::string::npos ? "" : p.slotName.substr(dot + 1), slot.first, p.size, p.path});
        device.partitions.push_back(partition);
      }
      devices.push_back(device);
    }
  }
  // What the flash layer measured and found bad.
  for (LayoutDevice& device : devices) {
    const Chip* chip = ChipNamed(table, device.name);
    if (chip == nullptr) continue;
    if (device.medium == Medium::kOther) device.medium = chip->medium;
    device.eraseSize = chip->eraseSize;
    device.pageSize = chip->pageSize;
    if (chip->whole >= 0) {
      device.wholeNode = table.partitions[static_cast<size_t>(chip->whole)].path;
      device.badBlocks = chip->badBlocks;
    } else {
      // Bad blocks of the slot partitions, placed where the slots lie.
      for (const auto& slot : chip->slots) {
        const MtdPartition& p = table.partitions[slot.second];
        for (const LayoutPartition& partition : device.partitions)
          for (const LayoutSlot& s : partition.slots)
            if (s.node == p.path)
              for (unsigned long bad : p.badBlocks) device.badBlocks.push_back(s.offset + bad);
      }
    }
  }
  return devices;
}

}  // namespace stbtool
