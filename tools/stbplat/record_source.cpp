#include "record_source.h"

#include <sys/stat.h>

#include <algorithm>
#include <limits>

#include "location_arg.h"
#include "output.h"
#include "record_kinds.h"
#include "stbplat/extruder.h"
#include "stbplat/memory_map.h"
#include "tool.h"

namespace stbtool {
namespace {

constexpr unsigned int kEntryHeader = 8;
// A stored record is small; a size field above this is taken as corrupt and
// only this much is read, for the check to report.
constexpr unsigned int kLargestRecord = 1u << 20;
constexpr unsigned int kPackageFixed = 42;
constexpr unsigned int kPackageCountAt = 38;
constexpr unsigned int kComponentBytes = 36;
constexpr unsigned int kMaxComponents = 16;

bool FileExists(const std::string& path) {
  struct stat info;
  return stat(path.c_str(), &info) == 0;
}

unsigned int BigEndian32(const unsigned char* p) {
  return static_cast<unsigned int>(p[0]) << 24 | static_cast<unsigned int>(p[1]) << 16 |
         static_cast<unsigned int>(p[2]) << 8 | p[3];
}

bool ReadMore(Extruder& in, std::vector<unsigned char>* bytes, unsigned int count) {
  if (count == 0) return true;
  size_t had = bytes->size();
  bytes->resize(had + count);
  unsigned int status = in.extrude(bytes->data() + had, count);
  return status == kExtrudeOk || status == kExtrudeExhausted;
}

// The record's own bytes from a slot: its header says how many. Nothing is
// read past the `room` left in the slot (NOR reads there do not fail, they
// give zero bytes).
std::vector<unsigned char> ReadFromLocation(const std::string& text, const LocationArg& arg, unsigned long room) {
  ComponentLocation component = ToComponentLocation(arg);
  Extruder in(&component, false);
  if (!in.isInitedOK) throw Failure("cannot open location " + text);
  std::vector<unsigned char> bytes;
  auto within = [&](unsigned long n) { return static_cast<unsigned int>(std::min(n, room - bytes.size())); };
  if (!ReadMore(in, &bytes, within(kEntryHeader))) throw Failure("cannot read location " + text);
  if (bytes.size() < kEntryHeader) return bytes;
  unsigned int code = BigEndian32(bytes.data());
  unsigned int rest;
  if (KindByCode(code) != nullptr) {
    unsigned int size = BigEndian32(bytes.data() + 4);
    rest = within(size < kLargestRecord ? size : kLargestRecord);
  } else {
    if (!ReadMore(in, &bytes, within(kPackageFixed - kEntryHeader))) throw Failure("cannot read location " + text);
    if (bytes.size() < kPackageFixed) return bytes;
    unsigned int count = BigEndian32(bytes.data() + kPackageCountAt);
    rest = within((count <= kMaxComponents ? count : kMaxComponents) * kComponentBytes);
  }
  if (rest == 0 || ReadMore(in, &bytes, rest)) return bytes;
  // A record that runs past its slot: keep what is there, for the check to
  // report.
  bytes.resize(bytes.size() - rest);
  while (rest > 0 && ReadMore(in, &bytes, 1)) --rest;
  if (rest > 0) bytes.pop_back();
  return bytes;
}

}  // namespace

RecordSource LoadRecordSource(const std::string& source, unsigned long offset) {
  RecordSource out;
  out.label = source;
  if (source == "-" || FileExists(source)) {
    std::vector<unsigned char> bytes = ReadWholeFile(source);
    if (offset > bytes.size())
      throw UsageError("--at " + Hex(offset) + " lies past the end of " + source + " (" +
                       std::to_string(bytes.size()) + " bytes)");
    out.base = offset;
    out.bytes.assign(bytes.begin() + static_cast<long>(offset), bytes.end());
    return out;
  }
  LocationArg arg;
  if (!ParseLocationArg(source, "SOURCE", &arg))
    // A missing input file fails as it does in every other command.
    throw Failure(source + ": No such file or directory (nor a location DEVICE.PARTITION.SLOT[+OFFSET])");
  if (offset != 0) {
    if (arg.hasOffset) throw UsageError("give the offset of '" + source + "' once, not also with --at");
    arg.offset = offset;
  }
  RequireKnownSlot(arg, "SOURCE");
  Location slot = ToComponentLocation(arg).location;
  unsigned long slotSize = 0, slotOffset = 0, room = std::numeric_limits<unsigned long>::max();
  if (ExtendedMemoryMapStructure::Instance()->GetSlotSizeAndOffset(&slot, &slotSize, &slotOffset)) {
    if (arg.offset >= slotSize)
      throw UsageError((arg.hasOffset ? "SOURCE " + source + ": offset " : "--at ") + Hex(arg.offset) +
                       " lies past the end of the slot (" + std::to_string(slotSize) + " bytes)");
    room = slotSize - arg.offset;
  }
  out.isLocation = true;
  out.base = arg.offset;
  out.bytes = ReadFromLocation(source, arg, room);
  return out;
}

}  // namespace stbtool
