// The device's memory map, as the platform library supplies it: which memory
// devices exist (technology, physical base, size), their partitions, the
// slots inside each partition, and the device node or file that holds each.
//
// The stand-in loads the map from an ini file (docs/memory-map.md): named by
// the environment variable STBPLAT_MEMORY_MAP on the first Instance(), or
// given to Load(). Every query answers false or null for what the map does
// not hold. A loaded map has been checked: partitions lie inside their
// device, slots inside their partition, and neither overlap, so addresses
// computed from it never leave the declared ranges.
#ifndef STBPLAT_MEMORY_MAP_H
#define STBPLAT_MEMORY_MAP_H

#include <string>
#include <vector>

#include "stbplat/export.h"

class Location;

// Names are 8 bytes, upper case, padded with '.', not terminated.
constexpr unsigned int kMemoryMapNameWidth = 8;

struct STBPLAT_EXPORT PhysicalLocationDescriptor {
  unsigned char slotName[kMemoryMapNameWidth];
  unsigned long offset;  // inside the partition
  unsigned long size;
  std::string filePath;  // non-empty: the slot is stored as this file
  std::string nodeName;  // non-empty: the slot has a device node of its own
};

struct STBPLAT_EXPORT PartitionEntry {
  unsigned char partitionName[kMemoryMapNameWidth];
  unsigned long offset;  // inside the device
  unsigned long size;
  std::string nodeName;  // MTD or eMMC node that holds the partition
  std::vector<PhysicalLocationDescriptor> slots;
};

struct STBPLAT_EXPORT MemoryDeviceEntry {
  unsigned char deviceName[kMemoryMapNameWidth];
  unsigned char technology[kMemoryMapNameWidth];  // "SPI_NOR.", "NAND....", "EMMC....", ...
  unsigned long physBase;
  unsigned long size;
  std::vector<PartitionEntry> partitions;
};

class STBPLAT_EXPORT PlatformMemoryMapStructure {
 public:
  PlatformMemoryMapStructure();
  virtual ~PlatformMemoryMapStructure();

  // Size of the slot and its offset inside its partition.
  bool GetSlotSizeAndOffset(const Location* location, unsigned long* size, unsigned long* offset);

 protected:
  const MemoryDeviceEntry* FindDevice(const unsigned char* deviceName) const;
  // Null when the map has no such slot; device and partition may be null.
  const PhysicalLocationDescriptor* FindSlot(const unsigned char* deviceName,
                                             const unsigned char* partitionName,
                                             const unsigned char* slotName,
                                             const MemoryDeviceEntry** device,
                                             const PartitionEntry** partition) const;
  const PhysicalLocationDescriptor* FindSlot(const Location* location,
                                             const MemoryDeviceEntry** device,
                                             const PartitionEntry** partition) const;

  std::vector<MemoryDeviceEntry> devices;
  bool created;
};

class STBPLAT_EXPORT ExtendedMemoryMapStructure : public PlatformMemoryMapStructure {
 public:
  // The singleton; on its creation it loads the file named by
  // STBPLAT_MEMORY_MAP, when that is set.
  static ExtendedMemoryMapStructure* Instance();
  // Defined in the platform library, so that its type information lives
  // there and nowhere else.
  ~ExtendedMemoryMapStructure() override;

  // Replaces the map with the file at path. On failure the map is left empty
  // (not created) and *error names the line at fault.
  static bool Load(const char* path, std::string* error);
  // Forgets the map (not created).
  static void Reset();

  bool IsCreated() const;

  // Location from its name string "DEVICE.PARTITION.SLOT"; false when the
  // map has no such slot.
  bool GetLocation(const char* name, Location* location) const;
  const MemoryDeviceEntry* GetDevice(const Location* location) const;
  const MemoryDeviceEntry* GetDevice(const char* deviceName) const;
  // Only index 0 exists: one chip per device name.
  bool GetDeviceSize(const char* deviceName, int index, unsigned long* size) const;
  bool GetDeviceBaseAddress(const Location* location, int index, unsigned long* address) const;
  bool DoesDeviceExist(const char* deviceName) const;

  bool IsNandDevice(const Location* location) const;
  bool IsEMMCDevice(const Location* location) const;
  bool IsSlotAFile(const Location* location) const;
  // Path of a file slot; null for a slot in flash or an unknown one.
  const char* GetSlotFileName(const Location* location) const;
  // The file or device node to open for the slot. *extraOffset grows by the
  // slot's offset inside the node (0 for files and slots with a node of
  // their own).
  const char* GetMTDorFileName(const Location* location, unsigned long* extraOffset) const;

  // Physical address of byte `offset` of the slot, and the slot's size
  // (size may be null). False when offset lies beyond the slot.
  bool GetPhysAddressFromLocation(const Location* location, unsigned long offset,
                                  unsigned long* address, unsigned long* size) const;
  // The slot holding a physical address and the offset inside it.
  bool GetLocationInfoFromPhysAddr(unsigned long address, Location* location,
                                   unsigned long* offset) const;

 private:
  ExtendedMemoryMapStructure();
};

#endif
