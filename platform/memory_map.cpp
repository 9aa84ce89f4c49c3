// Queries of the memory-map stand-in.
#include "stbplat/memory_map.h"

#include <cstdlib>
#include <cstring>
#include <string>

#include "memory_map_names.h"
#include "stbplat/location.h"

using stbplat::platform::IsEmmcTechnology;
using stbplat::platform::IsNandTechnology;
using stbplat::platform::SameName;
using stbplat::platform::ToPaddedName;

namespace {

constexpr const char* kMapVariable = "STBPLAT_MEMORY_MAP";

ExtendedMemoryMapStructure*& InstancePointer() {
  static ExtendedMemoryMapStructure* instance = nullptr;
  return instance;
}

// A device name as callers pass it: already padded ("NAND0...") or bare.
bool DeviceNameFromText(const char* text, unsigned char* out) {
  if (text == nullptr) return false;
  return ToPaddedName(std::string(text, strnlen(text, kMemoryMapNameWidth + 1)), out);
}

}  // namespace

PlatformMemoryMapStructure::PlatformMemoryMapStructure() : created(false) {}
PlatformMemoryMapStructure::~PlatformMemoryMapStructure() = default;

const MemoryDeviceEntry* PlatformMemoryMapStructure::FindDevice(
    const unsigned char* deviceName) const {
  for (const MemoryDeviceEntry& device : devices)
    if (SameName(device.deviceName, deviceName)) return &device;
  return nullptr;
}

const PhysicalLocationDescriptor* PlatformMemoryMapStructure::FindSlot(
    const unsigned char* deviceName, const unsigned char* partitionName,
    const unsigned char* slotName, const MemoryDeviceEntry** device,
    const PartitionEntry** partition) const {
  const MemoryDeviceEntry* foundDevice = FindDevice(deviceName);
  if (foundDevice == nullptr) return nullptr;
  for (const PartitionEntry& candidate : foundDevice->partitions) {
    if (!SameName(candidate.partitionName, partitionName)) continue;
    for (const PhysicalLocationDescriptor& slot : candidate.slots) {
      if (!SameName(slot.slotName, slotName)) continue;
      if (device != nullptr) *device = foundDevice;
      if (partition != nullptr) *partition = &candidate;
      return &slot;
    }
  }
  return nullptr;
}

const PhysicalLocationDescriptor* PlatformMemoryMapStructure::FindSlot(
    const Location* location, const MemoryDeviceEntry** device,
    const PartitionEntry** partition) const {
  if (location == nullptr) return nullptr;
  return FindSlot(location->deviceName, location->partitionName, location->slotName, device,
                  partition);
}

bool PlatformMemoryMapStructure::GetSlotSizeAndOffset(const Location* location,
                                                      unsigned long* size,
                                                      unsigned long* offset) {
  const PhysicalLocationDescriptor* slot = FindSlot(location, nullptr, nullptr);
  if (slot == nullptr) return false;
  if (size != nullptr) *size = slot->size;
  if (offset != nullptr) *offset = slot->offset;
  return true;
}

ExtendedMemoryMapStructure::ExtendedMemoryMapStructure() = default;
ExtendedMemoryMapStructure::~ExtendedMemoryMapStructure() = default;

ExtendedMemoryMapStructure* ExtendedMemoryMapStructure::Instance() {
  ExtendedMemoryMapStructure*& instance = InstancePointer();
  if (instance == nullptr) {
    instance = new ExtendedMemoryMapStructure();
    const char* path = std::getenv(kMapVariable);
    std::string error;
    // A bad file leaves the map empty; Load has said why on standard error.
    if (path != nullptr && *path != 0) static_cast<void>(Load(path, &error));
  }
  return instance;
}

void ExtendedMemoryMapStructure::Reset() {
  ExtendedMemoryMapStructure* map = Instance();
  map->devices.clear();
  map->created = false;
}

bool ExtendedMemoryMapStructure::IsCreated() const { return created; }

bool ExtendedMemoryMapStructure::GetLocation(const char* name, Location* location) const {
  if (name == nullptr || location == nullptr) return false;
  std::string text(name);
  std::size_t first = text.find('.');
  std::size_t second = first == std::string::npos ? first : text.find('.', first + 1);
  if (second == std::string::npos || text.find('.', second + 1) != std::string::npos)
    return false;
  unsigned char device[kMemoryMapNameWidth];
  unsigned char partition[kMemoryMapNameWidth];
  unsigned char slot[kMemoryMapNameWidth];
  if (!ToPaddedName(text.substr(0, first), device) ||
      !ToPaddedName(text.substr(first + 1, second - first - 1), partition) ||
      !ToPaddedName(text.substr(second + 1), slot))
    return false;
  if (FindSlot(device, partition, slot, nullptr, nullptr) == nullptr) return false;
  std::memcpy(location->deviceName, device, kMemoryMapNameWidth);
  std::memcpy(location->partitionName, partition, kMemoryMapNameWidth);
  std::memcpy(location->slotName, slot, kMemoryMapNameWidth);
  return true;
}

const MemoryDeviceEntry* ExtendedMemoryMapStructure::GetDevice(const Location* location) const {
  return location == nullptr ? nullptr : FindDevice(location->deviceName);
}

const MemoryDeviceEntry* ExtendedMemoryMapStructure::GetDevice(const char* deviceName) const {
  unsigned char name[kMemoryMapNameWidth];
  return DeviceNameFromText(deviceName, name) ? FindDevice(name) : nullptr;
}

bool ExtendedMemoryMapStructure::GetDeviceSize(const char* deviceName, int index,
                                               unsigned long* size) const {
  const MemoryDeviceEntry* device = GetDevice(deviceName);
  if (device == nullptr || index != 0 || size == nullptr) return false;
  *size = device->size;
  return true;
}

bool ExtendedMemoryMapStructure::GetDeviceBaseAddress(const Location* location, int index,
                                                      unsigned long* address) const {
  const MemoryDeviceEntry* device = GetDevice(location);
  if (device == nullptr || index != 0 || address == nullptr) return false;
  *address = device->physBase;
  return true;
}

bool ExtendedMemoryMapStructure::DoesDeviceExist(const char* deviceName) const {
  return GetDevice(deviceName) != nullptr;
}

bool ExtendedMemoryMapStructure::IsNandDevice(const Location* location) const {
  const MemoryDeviceEntry* device = GetDevice(location);
  return device != nullptr && IsNandTechnology(device->technology);
}

bool ExtendedMemoryMapStructure::IsEMMCDevice(const Location* location) const {
  const MemoryDeviceEntry* device = GetDevice(location);
  return device != nullptr && IsEmmcTechnology(device->technology);
}

bool ExtendedMemoryMapStructure::IsSlotAFile(const Location* location) const {
  return GetSlotFileName(location) != nullptr;
}

const char* ExtendedMemoryMapStructure::GetSlotFileName(const Location* location) const {
  const PhysicalLocationDescriptor* slot = FindSlot(location, nullptr, nullptr);
  if (slot == nullptr || slot->filePath.empty()) return nullptr;
  return slot->filePath.c_str();
}

const char* ExtendedMemoryMapStructure::GetMTDorFileName(const Location* location,
                                                         unsigned long* extraOffset) const {
  const PartitionEntry* partition = nullptr;
  const PhysicalLocationDescriptor* slot = FindSlot(location, nullptr, &partition);
  if (slot == nullptr) return nullptr;
  if (!slot->filePath.empty()) return slot->filePath.c_str();
  if (!slot->nodeName.empty()) return slot->nodeName.c_str();
  if (partition->nodeName.empty()) return nullptr;
  if (extraOffset != nullptr) *extraOffset += slot->offset;
  return partition->nodeName.c_str();
}

bool ExtendedMemoryMapStructure::GetPhysAddressFromLocation(const Location* location,
                                                            unsigned long offset,
                                                            unsigned long* address,
                                                            unsigned long* size) const {
  const MemoryDeviceEntry* device = nullptr;
  const PartitionEntry* partition = nullptr;
  const PhysicalLocationDescriptor* slot = FindSlot(location, &device, &partition);
  if (slot == nullptr || offset > slot->size || address == nullptr) return false;
  // The loader checked that slot and partition lie inside the device, so
  // this sum cannot wrap.
  *address = device->physBase + partition->offset + slot->offset + offset;
  if (size != nullptr) *size = slot->size;
  return true;
}

bool ExtendedMemoryMapStructure::GetLocationInfoFromPhysAddr(unsigned long address,
                                                             Location* location,
                                                             unsigned long* offset) const {
  if (location == nullptr) return false;
  for (const MemoryDeviceEntry& device : devices) {
    for (const PartitionEntry& partition : device.partitions) {
      for (const PhysicalLocationDescriptor& slot : partition.slots) {
        unsigned long start = device.physBase + partition.offset + slot.offset;
        if (address < start || address - start >= slot.size) continue;
        std::memcpy(location->deviceName, device.deviceName, kMemoryMapNameWidth);
        std::memcpy(location->partitionName, partition.partitionName, kMemoryMapNameWidth);
        std::memcpy(location->slotName, slot.slotName, kMemoryMapNameWidth);
        if (offset != nullptr) *offset = address - start;
        return true;
      }
    }
  }
  return false;
}
