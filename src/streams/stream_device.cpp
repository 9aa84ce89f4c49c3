// Device modes of the streams: transfers through the flash singleton, and
// construction over a component location resolved through the memory map.
#include "streams/stream_device.h"

#include <fcntl.h>
#include <sys/mman.h>

#include <cerrno>
#include <cstring>

#include "os/seam.h"
#include "stbplat/component_location.h"
#include "stbplat/extruder.h"
#include "stbplat/flash_interface.h"
#include "stbplat/memory_map.h"
#include "streams/last_file_name.h"
#include "streams/stream_internal.h"
#include "util/log_gate.h"

using stbplat::os::Sys;

namespace stbplat {
namespace streams {

namespace {

constexpr int kFallbackMapPageSize = 8192;
constexpr unsigned int kTypeNameWidth = 8;
constexpr const char* kSdramType = "SDRAM...";
constexpr const char* kSpiNorType = "SPI_NOR.";

#define STREAM_ERROR(...) \
  STBPLAT_LOG(eLogModuleByteStreams, eLogLevelError, kExtruderSource, "Extruder", __VA_ARGS__)

bool TypeIs(const MemoryDeviceEntry& device, const char* type) {
  return std::memcmp(device.technology, type, kTypeNameWidth) == 0;
}

// Maps the component's physical memory; the stream becomes a memory stream
// over it.
bool MapPhysicalMemory(Extruder& stream, const ComponentLocation& component,
                       ExtendedMemoryMapStructure& map, const std::string& name) {
  unsigned long physAddress = 0;
  unsigned long size = 0;
  if (!map.GetPhysAddressFromLocation(&component.location, component.slotOffset, &physAddress,
                                      &size)) {
    STREAM_ERROR("Package location %s not found\r\n", name.c_str());
    return false;
  }
  stream.memFd = Sys().open("/dev/mem", O_RDWR | O_SYNC, 0);
  if (stream.memFd < 0) {
    STREAM_ERROR("Open /dev/mem failed: errno = %d.\nYou probably need to have root access.\r\n",
                 errno);
    stream.memFd = 0;
    return false;
  }
  int page = Sys().getpagesize();
  if (page <= 0) page = kFallbackMapPageSize;
  unsigned long base = physAddress - physAddress % static_cast<unsigned long>(page);
  unsigned long delta = physAddress - base;
  void* mapped = Sys().mmap64(nullptr, delta + size, PROT_READ | PROT_WRITE, MAP_SHARED,
                              stream.memFd, static_cast<off64_t>(base));
  if (mapped == MAP_FAILED) {
    STREAM_ERROR("mmap failed: errno = %d\r\n", errno);
    Sys().close(stream.memFd);
    stream.memFd = 0;
    stream.pMapped = nullptr;
    return false;
  }
  stream.pMapped = static_cast<unsigned char*>(mapped) + delta;
  stream.length = stream.bytesLeft = static_cast<unsigned int>(size);
  stream.pStart = stream.pCurrent = stream.pMapped;
  return true;
}

bool OpenFlashOrFile(Extruder& stream, const ComponentLocation& component,
                     ExtendedMemoryMapStructure& map, const MemoryDeviceEntry& device,
                     const std::string& name, bool writable) {
  const Location* location = &component.location;
  if (TypeIs(device, kSpiNorType)) {
    stream.isNorFlash = true;
    unsigned long flashAddress = 0;
    unsigned long size = 0;
    if (!map.GetPhysAddressFromLocation(location, component.slotOffset, &flashAddress, &size)) {
      STREAM_ERROR("Package location %s not found\r\n", name.c_str());
      return false;
    }
    stream.norBaseOffset = static_cast<unsigned int>(flashAddress - component.slotOffset);
  }
  if (stream.isEMMC) {
    unsigned long slotSize = 0;
    unsigned long slotOffset = 0;
    if (!map.GetSlotSizeAndOffset(location, &slotSize, &slotOffset)) return false;
    stream.currNandOffset = slotOffset;
  }
  unsigned long extraOffset = 0;
  const char* file = map.GetMTDorFileName(location, &extraOffset);
  if (file == nullptr) {
    STREAM_ERROR("Can't find mtd partition or file name for %s\r\n", name.c_str());
    return false;
  }
  stream.pFile = Sys().fopen64(file, writable ? "r+b" : "rb");
  if (stream.pFile == nullptr && writable) stream.pFile = Sys().fopen64(file, "w+b");
  if (stream.pFile == nullptr) {
    STREAM_ERROR("Unable to open file %s\r\n", file);
    return false;
  }
  stream += static_cast<unsigned int>(component.slotOffset + extraOffset);
  pLastFileName = file;
  return true;
}

}  // namespace

bool DeviceNorRead(unsigned long address, unsigned char* buffer, unsigned int count) {
  FlashInterface* flash = FlashInterface::Instance();
  return flash != nullptr && flash->ReadFromNORFlashAtAddr(address, buffer, count);
}

bool DeviceNorWrite(unsigned long address, const unsigned char* data, unsigned int count) {
  FlashInterface* flash = FlashInterface::Instance();
  return flash != nullptr && flash->WriteToNORFlashAtAddr(address, data, count);
}

bool DeviceNandRead(unsigned char* buffer, unsigned int count, const std::string& partition,
                    unsigned long offset) {
  FlashInterface* flash = FlashInterface::Instance();
  return flash != nullptr && flash->NANDRead(buffer, count, partition.c_str(), offset);
}

bool DeviceNandWrite(const unsigned char* data, unsigned int count, const std::string& partition,
                     unsigned long offset) {
  FlashInterface* flash = FlashInterface::Instance();
  return flash != nullptr && flash->NANDWrite(data, count, partition.c_str(), offset);
}

bool DeviceEmmcRead(unsigned char* buffer, unsigned int count, const std::string& partition,
                    unsigned long offset) {
  FlashInterface* flash = FlashInterface::Instance();
  return flash != nullptr && flash->EMMCRead(buffer, count, partition.c_str(), offset);
}

bool DeviceEmmcWrite(const unsigned char* data, unsigned int count, const std::string& partition,
                     unsigned long offset) {
  FlashInterface* flash = FlashInterface::Instance();
  return flash != nullptr && flash->EMMCWrite(data, count, partition.c_str(), offset);
}

void OpenComponentLocation(Extruder& stream, const ComponentLocation* location, bool writable) {
  stream.isInitedOK = true;
  if (location == nullptr) {
    stream.isInitedOK = false;
    return;
  }
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  std::string name = location->location.GetNameString();
  stream.isNand = map->IsNandDevice(&location->location);
  if (stream.isNand) stream.partitionName = name;
  stream.isEMMC = map->IsEMMCDevice(&location->location);
  if (stream.isEMMC) stream.partitionName = name;
  const MemoryDeviceEntry* device = map->GetDevice(&location->location);
  bool opened = false;
  if (device == nullptr) {
    char deviceName[kTypeNameWidth + 1] = {};
    std::memcpy(deviceName, location->location.deviceName, kTypeNameWidth);
    STREAM_ERROR("Device %s not found\r\n", deviceName);
  } else if (TypeIs(*device, kSdramType)) {
    opened = MapPhysicalMemory(stream, *location, *map, name);
  } else {
    opened = OpenFlashOrFile(stream, *location, *map, *device, name, writable);
  }
  if (!opened) stream.isInitedOK = false;
}

}  // namespace streams
}  // namespace stbplat
