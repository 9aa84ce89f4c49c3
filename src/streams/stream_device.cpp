// Device modes of the streams. Until the flash layer is bound here, device
// transfers fail and a component location cannot be opened.
#include "streams/stream_device.h"

#include "stbplat/extruder.h"

namespace stbplat {
namespace streams {

bool DeviceNorRead(unsigned long, unsigned char*, unsigned int) { return false; }
bool DeviceNorWrite(unsigned long, const unsigned char*, unsigned int) { return false; }
bool DeviceNandRead(unsigned char*, unsigned int, const std::string&, unsigned long) { return false; }
bool DeviceNandWrite(const unsigned char*, unsigned int, const std::string&, unsigned long) {
  return false;
}
bool DeviceEmmcRead(unsigned char*, unsigned int, const std::string&, unsigned long) { return false; }
bool DeviceEmmcWrite(const unsigned char*, unsigned int, const std::string&, unsigned long) {
  return false;
}

void OpenComponentLocation(Extruder& stream, const ComponentLocation*, bool) {
  stream.isInitedOK = false;
}

}  // namespace streams
}  // namespace stbplat
