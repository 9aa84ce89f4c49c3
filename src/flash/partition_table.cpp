// The singleton, the MTD partition table read from /proc/mtd, the measured
// sector sizes, and the three partition lookups.
#include <fcntl.h>
#include <mtd/mtd-user.h>
#include <sys/ioctl.h>

#include <cstdio>
#include <cstring>
#include <new>

#include "flash/flash_internal.h"
#include "os/scoped_file.h"
#include "os/seam.h"
#include "stbplat/location.h"
#include "stbplat/memory_map.h"

using stbplat::os::ScopedFd;
using stbplat::os::ScopedFile;
using stbplat::os::Sys;

bool isRDLQUpgradeInProgress = false;
FlashInterface* FlashInterface::m_pSelf = nullptr;

namespace stbplat {
namespace flash {

const char* const mtdDeviceNames[FlashInterface::kMaxMtdDevices] = {
    "/dev/mtd0",  "/dev/mtd1",  "/dev/mtd2",  "/dev/mtd3",  "/dev/mtd4",  "/dev/mtd5",
    "/dev/mtd6",  "/dev/mtd7",  "/dev/mtd8",  "/dev/mtd9",  "/dev/mtd10", "/dev/mtd11",
    "/dev/mtd12", "/dev/mtd13", "/dev/mtd14", "/dev/mtd15", "/dev/mtd16", "/dev/mtd17",
    "/dev/mtd18", "/dev/mtd19", "/dev/mtd20", "/dev/mtd21", "/dev/mtd22", "/dev/mtd23",
    "/dev/mtd24", "/dev/mtd25", "/dev/mtd26", "/dev/mtd27", "/dev/mtd28", "/dev/mtd29",
};

std::string NameOf(const Location* location) {
  return location == nullptr ? std::string() : location->GetNameString();
}

namespace {

// Device paths matching aliasNames row by row; never filled, like the names.
const char kAliasDevicePaths[FlashInterface::kMaxAliases][FlashInterface::kMtdNameLength] = {};

constexpr int kMtdLineLength = 100;

// Kernel partition names spelled the way the memory map names devices. A
// name that is the bare prefix (or the prefix followed by anything but '.')
// becomes the whole device; prefix + '.' + rest becomes renamed + '.' + rest.
struct NameRule {
  const char* prefix;
  const char* renamed;  // null: such names are kept as they are
  const char* whole;
};
constexpr NameRule kNameRules[] = {
    {"NOR0", nullptr, kNorDevice},
    {"NAND0", nullptr, kNandDevice},
    {"flash0", "NOR0", kNorDevice},
    {"flash1", "NAND0", kNandDevice},
};

// name still carries its closing quote, which the caller trims afterwards;
// every replacement keeps a trailing character for that.
void NormaliseName(std::string& name) {
  for (const NameRule& rule : kNameRules) {
    std::size_t length = std::strlen(rule.prefix);
    if (name.compare(0, length, rule.prefix) != 0) continue;
    bool dotted = name.size() > length && name[length] == '.';
    if (!dotted)
      name = std::string(rule.whole) + "\"";
    else if (rule.renamed != nullptr)
      name = std::string(rule.renamed) + name.substr(length);
    return;
  }
}

void ReadPartitionTable(FlashInterface& self) {
  ScopedFile table(Sys().fopen64(kProcMtd, "r"));
  if (table.get() == nullptr) return;
  char line[kMtdLineLength];
  if (Sys().fgets(line, sizeof line, table.get()) == nullptr) return;  // column header
  while (Sys().fgets(line, sizeof line, table.get()) != nullptr) {
    int number = -1;
    unsigned long long size = 0;
    char parsed[kMtdLineLength] = {};
    if (std::sscanf(line, "mtd%d: %llX %*X \"%99s", &number, &size, parsed) != 3) continue;
    FLASH_LOG(eLogLevelTrace, "FlashInterface", "mtd = [%s]\r\n", parsed);
    if (number < 0 || number >= FlashInterface::kMaxMtdDevices) continue;
    std::string name(parsed);
    NormaliseName(name);
    if (!name.empty()) name.pop_back();
    std::size_t kept = name.copy(self.mtdNames[number], FlashInterface::kMtdNameLength - 1);
    self.mtdNames[number][kept] = 0;
    FLASH_LOG(eLogLevelTrace, "FlashInterface", "mtdNames[%d] = [%s]\r\n", number,
              self.mtdNames[number]);
    self.mtdSizes[number] = size;
    self.mtdCount = static_cast<unsigned char>(number + 1);
  }
}

bool GetInfo(int fd, mtd_info_user* info) {
  return Sys().ioctl(fd, MEMGETINFO, info) == 0;
}

void MeasureNorSectorSize(FlashInterface& self) {
  if (!ExtendedMemoryMapStructure::Instance()->DoesDeviceExist(kNorDevice)) return;
  unsigned long offset = 0;
  const char* path = self.LookupMTDPartition(kNorDevice, &offset);
  if (path == nullptr) return;
  ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
  if (!fd.valid()) {
    FLASH_LOG(eLogLevelError, "FlashInterface",
              "FlashInterface::FlashInterface: can't open %s, unable to get NOR sector size\r\n",
              path);
    return;
  }
  mtd_info_user info{};
  if (GetInfo(fd.get(), &info) && info.erasesize != 0) self.norSectorSize = info.erasesize;
}

// A flush writes the whole page, the unused tail of the buffer included: the
// first one sends erased bytes there, not whatever the heap held.
void AllocatePageBuffer(FlashInterface& self) {
  self.nandPageBuffer = new (std::nothrow) unsigned char[self.nandPageSize];
  if (self.nandPageBuffer != nullptr) std::memset(self.nandPageBuffer, kErasedFlashByte, self.nandPageSize);
}

// The first NAND slot whose partition opens decides the NAND geometry.
bool MeasureNandFromSlots(FlashInterface& self, const MemoryDeviceEntry& device) {
  for (const PartitionEntry& partition : device.partitions) {
    for (const PhysicalLocationDescriptor& slot : partition.slots) {
      Location location;
      std::memcpy(location.deviceName, kNandDevice, kNameWidth);
      std::memcpy(location.partitionName, partition.partitionName, kNameWidth);
      std::memcpy(location.slotName, slot.slotName, kNameWidth);
      unsigned long offset = 0;
      const char* path = self.LookupMTDPartition(&location, &offset);
      if (path == nullptr) continue;
      ScopedFd fd(Sys().open(path, O_RDWR | O_SYNC, kCreateMode));
      // Descriptor 0 counts as a failure here, unlike for the NOR device.
      if (fd.get() <= 0) continue;
      mtd_info_user info{};
      if (GetInfo(fd.get(), &info) && info.erasesize != 0 && info.writesize != 0) {
        self.nandSectorSize = info.erasesize;
        self.nandPageSize = info.writesize;
      }
      return true;
    }
  }
  return false;
}

void MeasureNandSizes(FlashInterface& self) {
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  if (!map->DoesDeviceExist(kNandDevice)) {
    self.nandSectorSize = 0;
    return;
  }
  const MemoryDeviceEntry* device = map->GetDevice(kNandDevice);
  if (device == nullptr) {
    FLASH_LOG(eLogLevelError, "FlashInterface",
              "FlashInterface::FlashInterface: Can't get NAND partition, unable to get NAND "
              "sector size\r\n");
  } else if (!MeasureNandFromSlots(self, *device)) {
    FLASH_LOG(eLogLevelError, "FlashInterface",
              "FlashInterface::FlashInterface: Can't open any partition in NAND0, unable to get "
              "sector size\r\n");
  }
  AllocatePageBuffer(self);
}

}  // namespace
}  // namespace flash
}  // namespace stbplat

using namespace stbplat::flash;

FlashInterface::FlashInterface()
    : mtdNames(),
      aliasNames(),
      mtdSizes(),
      mtdCount(0),
      aliasCount(0),
      norSectorSize(kDefaultNorSectorSize),
      emmcChunkSize(kDefaultEmmcChunkSize),
      spareSectorSize(kDefaultSpareSectorSize),
      nandSectorSize(kDefaultNandSectorSize),
      nandPageSize(kDefaultNandPageSize),
      pendingNANDOffset(0),
      blocksMarkedBad(0),
      badBlocksSkipped(0),
      nandPageBuffer(nullptr),
      currNANDBufferOffset(0),
      pendingNANDDevice(nullptr) {
  ReadPartitionTable(*this);
  MeasureNorSectorSize(*this);
  MeasureNandSizes(*this);
  FLASH_LOG(eLogLevelSizes, "FlashInterface", "NOR sector size = 0x%08llX\r\n",
            static_cast<unsigned long long>(norSectorSize));
  FLASH_LOG(eLogLevelSizes, "FlashInterface", "NAND sector size = 0x%08llX\r\n",
            static_cast<unsigned long long>(nandSectorSize));
}

FlashInterface* FlashInterface::Instance() {
  if (m_pSelf == nullptr) {
    m_pSelf = new (std::nothrow) FlashInterface();
    if (m_pSelf == nullptr)
      FLASH_LOG(eLogLevelAllocation, "Instance", "Memory allocation failure\r\n");
  }
  return m_pSelf;
}

const char* FlashInterface::LookupMTDPartition(const char* name, unsigned long* offset) {
  if (name == nullptr) return nullptr;
  if (!isRDLQUpgradeInProgress) {
    for (int n = 0; n < kMaxMtdDevices; ++n)
      if (std::strncmp(mtdNames[n], name, kMtdNameLength) == 0) return mtdDeviceNames[n];
    for (int n = 0; n < aliasCount && n < kMaxAliases; ++n) {
      std::size_t length = strnlen(aliasNames[n], kMtdNameLength);
      if (std::strncmp(name, aliasNames[n], length) == 0) return kAliasDevicePaths[n];
    }
    return nullptr;
  }
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  Location location;
  if (!map->GetLocation(name, &location)) {
    FLASH_LOG(eLogLevelError, "LookupMTDPartition",
              "FlashInterface::LookupMTDPartition: GetLocation failed for %s\r\n", name);
    return nullptr;
  }
  unsigned long slotSize = 0;
  unsigned long slotOffset = 0;
  if (!map->GetSlotSizeAndOffset(&location, &slotSize, &slotOffset)) {
    FLASH_LOG(eLogLevelError, "LookupMTDPartition",
              "FlashInterface::LookupMTDPartition: GetSlotSizeAndOffset returned false\r\n");
    return nullptr;
  }
  if (std::memcmp(location.deviceName, kNandDevice, kNameWidth) != 0 &&
      std::memcmp(location.deviceName, kNorDevice, kNameWidth) != 0) {
    FLASH_LOG(eLogLevelError, "LookupMTDPartition",
              "FlashInterface::LookupMTDPartition: unknown device type\r\n");
    return nullptr;
  }
  for (int n = 0; n < kMaxMtdDevices; ++n) {
    if (std::memcmp(mtdNames[n], location.deviceName, kNameWidth) == 0) {
      if (offset != nullptr) *offset += slotOffset;
      return mtdDeviceNames[n];
    }
  }
  FLASH_LOG(eLogLevelError, "LookupMTDPartition",
            "FlashInterface::LookupMTDPartition: did not find mtd entry\r\n");
  return nullptr;
}

const char* FlashInterface::LookupMTDPartition(const Location* location, unsigned long* offset) {
  if (location == nullptr) return nullptr;
  std::string name = NameOf(location);
  return LookupMTDPartition(name.c_str(), offset);
}

const char* FlashInterface::LookupMTDPartition(unsigned long physAddress, unsigned long* offset) {
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  if (isRDLQUpgradeInProgress || !map->IsCreated()) {
    if (offset != nullptr) *offset = physAddress - kFixedNorBase;
    return kFixedNorDevice;
  }
  Location location;
  unsigned long slotOffset = 0;
  if (map->GetLocationInfoFromPhysAddr(physAddress, &location, &slotOffset)) {
    if (offset != nullptr) *offset = slotOffset;
    const char* path = LookupMTDPartition(NameOf(&location).c_str(), offset);
    if (path != nullptr) return path;
  }
  unsigned long base = kFixedNorBase;
  for (int n = 0; n < mtdCount && n < kMaxMtdDevices; ++n) {
    // NOR partitions come first; the walk ends at the first NAND one.
    if (std::strncmp(mtdNames[n], "NAND", 4) == 0) return nullptr;
    if (physAddress >= base && physAddress - base < mtdSizes[n]) {
      if (offset != nullptr) *offset = physAddress - base;
      return mtdDeviceNames[n];
    }
    base += mtdSizes[n];
  }
  return nullptr;
}

unsigned long FlashInterface::GetNORChipSize() {
  unsigned long size = 0;
  if (!ExtendedMemoryMapStructure::Instance()->GetDeviceSize(kNorDevice, 0, &size)) return 0;
  return size;
}

unsigned long FlashInterface::GetNORSectorSize() { return norSectorSize; }
