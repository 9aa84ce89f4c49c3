// The streams' device modes: NOR, NAND and eMMC transfers through the flash
// layer, and construction over a component location through the memory map.
#ifndef STBPLAT_SRC_STREAMS_STREAM_DEVICE_H
#define STBPLAT_SRC_STREAMS_STREAM_DEVICE_H

#include <string>

class ComponentLocation;
class Extruder;

namespace stbplat {
namespace streams {

bool DeviceNorRead(unsigned long address, unsigned char* buffer, unsigned int count);
bool DeviceNorWrite(unsigned long address, const unsigned char* data, unsigned int count);
bool DeviceNandRead(unsigned char* buffer, unsigned int count, const std::string& partition,
                    unsigned long offset);
bool DeviceNandWrite(const unsigned char* data, unsigned int count, const std::string& partition,
                     unsigned long offset);
bool DeviceEmmcRead(unsigned char* buffer, unsigned int count, const std::string& partition,
                    unsigned long offset);
bool DeviceEmmcWrite(const unsigned char* data, unsigned int count, const std::string& partition,
                     unsigned long offset);

// Resolves `location` through the memory map and opens the stream on it;
// clears isInitedOK on failure.
void OpenComponentLocation(Extruder& stream, const ComponentLocation* location, bool writable);

}  // namespace streams
}  // namespace stbplat

#endif
