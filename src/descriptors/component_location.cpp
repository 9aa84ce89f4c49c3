// ComponentLocation: a component tag, the slot that holds it, and its offset.
#include "stbplat/component_location.h"

#include <cstring>

#include "descriptors/display_line.h"
#include "descriptors/record_io.h"

using namespace stbplat::records;

namespace {
constexpr unsigned int kTagWidth = sizeof(ComponentLocation::componentTag);
}  // namespace

ComponentLocation::ComponentLocation() : location(), slotOffset(0) {
  std::memset(componentTag, 0, sizeof componentTag);
}

ComponentLocation::ComponentLocation(const ComponentLocation& other) : ComponentLocation() {
  *this = other;
}

ComponentLocation::ComponentLocation(const unsigned char* device, const unsigned char* partition,
                                     const unsigned char* slot, unsigned int offset)
    : location(device, partition, slot), slotOffset(offset) {
  // The offset argument is dropped on purpose: a component starts at offset 0
  // with an empty tag, and callers set both.
  std::memset(componentTag, 0, sizeof componentTag);
  slotOffset = 0;
}

ComponentLocation& ComponentLocation::operator=(const ComponentLocation& other) {
  std::memcpy(componentTag, other.componentTag, sizeof componentTag);
  location = other.location;
  slotOffset = other.slotOffset;
  return *this;
}

bool ComponentLocation::operator==(const ComponentLocation& other) const {
  return std::strncmp(reinterpret_cast<const char*>(componentTag),
                      reinterpret_cast<const char*>(other.componentTag), kTagWidth) == 0 &&
         location == other.location && slotOffset == other.slotOffset;
}

void ComponentLocation::Display(unsigned char indent) const {
  char tag[kTagWidth + 1] = {};
  std::memcpy(tag, componentTag, kTagWidth);
  DisplayLabelLine("Display", indent, "%s\r\n", "componentTag", tag);
  location.Display(indent);
  DisplayLabelLine("Display", indent, "0x%lX\r\n", "slotOffset", slotOffset);
}

ComponentLocationStorage::ComponentLocationStorage() : ComponentLocation() {}

unsigned int ComponentLocationStorage::Read(Extruder& in) {
  if (!Extruded(in.extrude(componentTag, kTagWidth))) {
    RECORD_ERROR("Read", "Error reading componentTag\r\n");
    return kDescriptorFieldError;
  }
  // The names are read raw, in place: a name the stream did not reach keeps
  // its old bytes, not the standard form that building the storage applies.
  static_assert(sizeof(LocationStorage) == sizeof(Location), "no added fields");
  LocationStorage names(location);
  std::memcpy(static_cast<void*>(&names), static_cast<const void*>(&location), sizeof(Location));
  unsigned int status = names.Read(in);
  std::memcpy(static_cast<void*>(&location), static_cast<const void*>(&names), sizeof(Location));
  if (status != kDescriptorOk) {
    RECORD_ERROR("Read", "Error reading (*pLocationStorage)\r\n");
    return kDescriptorWrongType;
  }
  if (!Extruded(in.extrude(&slotOffset))) {
    RECORD_ERROR("Read", "Error reading slotOffset\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}

unsigned int ComponentLocationStorage::Store(Intruder* out) const {
  if (!Intruded(out->intrude(componentTag, kTagWidth))) {
    RECORD_ERROR("Store", "Error writing componentTag\r\n");
    return kDescriptorFieldError;
  }
  // The location's own Store names the field that failed.
  if (LocationStorage(location).Store(out) != kDescriptorOk) return kDescriptorFieldError;
  if (!Intruded(out->intrude(slotOffset))) {
    RECORD_ERROR("Store", "Error writing slotOffset\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}
