#include "example_records.h"

#include <cstring>
#include <functional>
#include <vector>

#include "stbplat/stbplat.h"

namespace stbplat {
namespace example {
namespace {

constexpr unsigned int kBuffer = 16 * 1024;
constexpr unsigned int kEntryHeader = 8;      // type, size
constexpr unsigned int kSizeFieldOffset = 4;
constexpr unsigned short kNoFlags = 0;
constexpr unsigned char kContainerMajor = 0;
constexpr unsigned char kContainerMinor = 0;
constexpr uint64_t kKernelImageBytes = 160 * kKiB;  // runs across the bad block of KERNEL.A

// Output into a fixed buffer; Bytes() is what was written.
class Output {
 public:
  Output() : buffer_(kBuffer), stream_(buffer_.data(), kBuffer) {}
  Intruder* stream() { return &stream_; }
  std::vector<unsigned char> Bytes() const {
    return std::vector<unsigned char>(buffer_.begin(), buffer_.begin() + (stream_.pCurrent - stream_.pStart));
  }

 private:
  std::vector<unsigned char> buffer_;
  Intruder stream_;
};

bool Written(unsigned int status) { return status == kIntrudeOk || status == kIntrudeFull; }

void SetText(DataEntry* entry, const char* text) {
  entry->CreateData(static_cast<unsigned int>(std::strlen(text) + 1),
                    reinterpret_cast<const unsigned char*>(text));
}

void SetVersion(VersionEntry* v, unsigned short major, unsigned short minor, char letter,
                const char* description, const char* sequence, unsigned int nv) {
  v->majorVersion = major;
  v->minorVersion = minor;
  v->versionLetter = static_cast<unsigned char>(letter);
  SetText(&v->description, description);
  std::memset(v->sequenceControl.controlledSequenceName, 0, kSequenceNameLength);
  std::memcpy(v->sequenceControl.controlledSequenceName, sequence, std::strlen(sequence));
  v->sequenceControl.nvSequence = nv;
}

bool StoreEntry(const SystemDescriptor& record, std::vector<unsigned char>* out, std::string* error) {
  Output o;
  if (record.StoreTLVAndData(o.stream()) != kDescriptorOk) {
    *error = "storing a record failed";
    return false;
  }
  *out = o.Bytes();
  return true;
}

// A record the library only reads (FSBLInfo, BuildConfig and their
// DeviceConfigDescriptor and BuildEnvironmentDescriptor members): type, size
// (patched once the payload is written), the common header, then what
// `payload` writes, with the members' own StoreTLVAndData where they have
// one.
bool StoreByHand(unsigned int type, const std::function<bool(Intruder*)>& payload,
                 std::vector<unsigned char>* out, std::string* error) {
  Output o;
  Intruder* s = o.stream();
  bool ok = Written(s->intrude(type)) && Written(s->intrude(0u)) && Written(s->intrude(kNoFlags)) &&
            Written(s->intrude(kContainerMajor)) && Written(s->intrude(kContainerMinor)) && payload(s);
  if (!ok) {
    char code[5] = {static_cast<char>(type >> 24), static_cast<char>(type >> 16), static_cast<char>(type >> 8),
                    static_cast<char>(type), 0};
    *error = std::string("storing a ") + code + " record failed";
    return false;
  }
  std::vector<unsigned char> bytes = o.Bytes();
  unsigned int size = static_cast<unsigned int>(bytes.size() - kEntryHeader);
  for (int i = 0; i < 4; ++i)
    bytes[kSizeFieldOffset + static_cast<size_t>(i)] = static_cast<unsigned char>(size >> (24 - 8 * i));
  *out = bytes;
  return true;
}

MemoryControllerDescriptor Controller(unsigned short sizeMiB, unsigned long base, unsigned int segmentMiB) {
  MemoryControllerDescriptor c;
  c.ddrCfgWidth = 32;
  c.ddrSize = sizeMiB;
  c.ddrSpeed = 2133;
  c.ddrDevTech = 4;   // DDR4
  c.ddrMode = 1;
  c.ddrDevWidth = 16;
  MemoryControllerSegmentDescriptor low;
  low.segmentPhysicalAddressStart = base;
  low.segmentSize = segmentMiB;
  c.memorySegments.push_back(low);
  MemoryControllerSegmentDescriptor high;
  high.segmentPhysicalAddressStart = base + 0x100000000UL;
  high.segmentSize = sizeMiB - segmentMiB;
  c.memorySegments.push_back(high);
  return c;
}

bool FsblInfo(std::vector<unsigned char>* out, std::string* error) {
  VersionEntry version;
  SetVersion(&version, 3, 2, 'c', "FSBL 3.2c (example board)", "FSBL", 7);
  MemoryConfigDescriptor memory;
  memory.memoryControllers.push_back(Controller(1024, 0x40000000UL, 768));
  memory.memoryControllers.push_back(Controller(512, 0x80000000UL, 256));
  std::vector<unsigned char> device;
  const unsigned short scbClock = 432;
  const unsigned char avsEnabled = 1;
  const unsigned char reserved = 0;
  if (!StoreByHand(
          kEntryTypeDEVC,
          [&](Intruder* s) {
            return Written(s->intrude(scbClock)) && Written(s->intrude(avsEnabled)) && Written(s->intrude(reserved));
          },
          &device, error))
    return false;
  BseckReloadDescriptor security;
  security.ExecutingType = 2;
  BseckReloadError reload;
  reload.flags = 0;
  reload.majorVer = 0;
  reload.minorVer = 1;
  reload.Type = 1;
  reload.Error = 0x0031;
  security.ReloadErrors.push_back(reload);
  const unsigned int nestedCount = 3;
  return StoreByHand(
      kEntryTypeFSBL,
      [&](Intruder* s) {
        return version.StoreTLVAndData(s) == kDescriptorOk && Written(s->intrude(nestedCount)) &&
               memory.StoreTLVAndData(s) == kDescriptorOk &&
               Written(s->intrude(device.data(), static_cast<unsigned int>(device.size()))) &&
               security.StoreTLVAndData(s) == kDescriptorOk;
      },
      out, error);
}

bool BuildConfiguration(std::vector<unsigned char>* out, std::string* error) {
  SequenceControlDescriptor sequence;
  std::memcpy(sequence.sequenceControl.controlledSequenceName, "MAIN", 4);
  sequence.sequenceControl.nvSequence = 12;
  DataEntry text;
  SetText(&text, "gcc 12.2 aarch64-linux-gnu, glibc 2.36, release build");
  std::vector<unsigned char> environment;
  if (!StoreByHand(
          kEntryTypeBCFG, [&](Intruder* s) { return text.StoreTLVAndData(s) == kDescriptorOk; }, &environment,
          error))
    return false;
  static const unsigned char tag[4] = {'K', 'R', 'N', 'L'};
  static const unsigned char major[2] = {0, 5};
  static const unsigned char minor[2] = {0, 15};
  static const unsigned char reserved[3] = {0, 0, 0};
  const unsigned char letter = 'a';
  const unsigned int unused1 = 0;
  const unsigned int count = 2;
  return StoreByHand(
      kEntryTypeBLDC,
      [&](Intruder* s) {
        return Written(s->intrude(tag, 4)) && Written(s->intrude(major, 2)) && Written(s->intrude(minor, 2)) &&
               Written(s->intrude(letter)) && Written(s->intrude(reserved, 3)) && Written(s->intrude(unused1)) &&
               Written(s->intrude(count)) && sequence.StoreTLVAndData(s) == kDescriptorOk &&
               Written(s->intrude(environment.data(), static_cast<unsigned int>(environment.size())));
      },
      out, error);
}

bool Version(unsigned short major, unsigned short minor, char letter, const char* text, const char* sequence,
             std::vector<unsigned char>* out, std::string* error) {
  VersionEntry v;
  SetVersion(&v, major, minor, letter, text, sequence, 1);
  return StoreEntry(v, out, error);
}

void SetComponent(ComponentLocation* c, const char* tag, const char* device, const char* partition,
                  const char* slot, unsigned long offset) {
  ComponentLocation made(reinterpret_cast<const unsigned char*>(device),
                         reinterpret_cast<const unsigned char*>(partition),
                         reinterpret_cast<const unsigned char*>(slot), 0);
  std::memcpy(made.componentTag, tag, 4);
  made.slotOffset = offset;
  *c = made;
}

bool PackageHeader(std::vector<unsigned char>* out, std::string* error) {
  CodeObjectInfo header;
  SetComponent(&header.packageHeaderLocation, "PKGH", "NAND0", "PKGHDR", "A", 0);
  SetComponent(&header.componentLocations[0], "BOOT", "NOR0", "BOOT", "A", 0);
  SetComponent(&header.componentLocations[1], "KRNL", "NAND0", "KERNEL", "A", 0);
  SetComponent(&header.componentLocations[2], "ROOT", "NAND0", "ROOTFS", "A", 0);
  SetComponent(&header.componentLocations[3], "APPS", "EMMC0", "APPS", "A", 0);
  header.numComponents = 4;
  Output o;
  if (header.Store(o.stream()) != kDescriptorOk) {
    *error = "storing the package header failed";
    return false;
  }
  *out = o.Bytes();
  return true;
}

bool FrontPanel(std::vector<unsigned char>* out, std::string* error) {
  AnimatedFrontPanelDisplayEntry panel;
  SetText(&panel.text, "HELLO FROM STBPLAT");
  return StoreEntry(panel, out, error);
}

// Stand-in for an image body: a recognisable pattern behind the version record.
std::vector<unsigned char> ImageBody(const char* name, uint64_t size) {
  std::vector<unsigned char> body(size);
  size_t n = std::strlen(name);
  for (uint64_t i = 0; i < size; ++i) body[i] = static_cast<unsigned char>(name[i % n]);
  return body;
}

}  // namespace

bool FillImages(Layout* layout, std::string* error) {
  std::vector<unsigned char> bytes;
  auto place = [&](const char* partition, uint64_t offset, const char* slot = "A") {
    return layout->Place(partition, slot, offset, bytes, error);
  };

  if (!Version(3, 2, 'c', "boot loader 3.2c", "FSBL", &bytes, error) || !place("BOOT", 0)) return false;
  if (!FsblInfo(&bytes, error) || !place("FSBLINFO", 0)) return false;
  if (!BuildConfiguration(&bytes, error) || !place("BLDCFG", 0)) return false;
  if (!FrontPanel(&bytes, error) || !place("PANEL", 0)) return false;
  if (!PackageHeader(&bytes, error) || !place("PKGHDR", 0)) return false;

  if (!Version(5, 15, 'a', "kernel 5.15a", "MAIN", &bytes, error) || !place("KERNEL", 0)) return false;
  uint64_t kernelHeader = bytes.size();
  bytes = ImageBody("kernel image ", kKernelImageBytes);
  if (!place("KERNEL", kernelHeader)) return false;

  if (!Version(2026, 11, 'b', "root file system 2026.11b", "MAIN", &bytes, error) || !place("ROOTFS", 0))
    return false;
  if (!Version(1, 4, 'a', "applications 1.4a", "APPS", &bytes, error) || !place("APPS", 0)) return false;
  if (!Version(1, 3, 'c', "applications 1.3c", "APPS", &bytes, error) || !place("APPS", 0, "B")) return false;
  return true;
}

}  // namespace example
}  // namespace stbplat
