// Writes seed corpora for the fuzz targets: valid records as the library
// stores them (the read-only boot-loader and build records are framed here
// around nested records that the library stores).
//   fuzz_make_seeds DIR   -> DIR/<target>/<seed>.bin
#include <sys/stat.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "fuzz_support.h"

namespace {

using Bytes = std::vector<unsigned char>;

template <typename StoreFn>
Bytes Stored(StoreFn store) {
  Bytes out;
  if (!stbplat::fuzz::StoreToBytes(store, &out)) {
    std::fprintf(stderr, "fuzz_make_seeds: a seed record failed to store\n");
    std::exit(1);
  }
  return out;
}

void Write(const std::string& dir, const std::string& target, const std::string& name,
           const Bytes& bytes) {
  std::string folder = dir + "/" + target;
  mkdir(folder.c_str(), 0755);
  std::string path = folder + "/" + name + ".bin";
  FILE* f = std::fopen(path.c_str(), "wb");
  if (f == nullptr || std::fwrite(bytes.data(), 1, bytes.size(), f) != bytes.size()) std::exit(1);
  std::fclose(f);
}

void Text(DataEntry& entry, const char* text) {
  entry.CreateData(static_cast<unsigned int>(std::strlen(text) + 1),
                   reinterpret_cast<const unsigned char*>(text));
}

VersionEntry Version() {
  VersionEntry v;
  v.majorVersion = 3;
  v.minorVersion = 14;
  Text(v.description, "boot loader 3.14");
  v.versionLetter = 'b';
  std::memcpy(v.sequenceControl.controlledSequenceName, "main", 4);
  v.sequenceControl.nvSequence = 7;
  return v;
}

MemoryConfigDescriptor Memory() {
  MemoryConfigDescriptor config;
  for (int c = 0; c < 2; ++c) {
    MemoryControllerDescriptor controller;
    controller.ddrSize = static_cast<unsigned short>(1024 * (c + 1));
    controller.ddrSpeed = 1600;
    for (int s = 0; s < 2; ++s) {
      MemoryControllerSegmentDescriptor segment;
      segment.segmentPhysicalAddressStart = 0x40000000ul * static_cast<unsigned long>(c + 1) + 0x10000000ul * s;
      segment.segmentSize = 256;
      controller.memorySegments.push_back(segment);
    }
    config.memoryControllers.push_back(controller);
  }
  return config;
}

BseckReloadDescriptor Bseck() {
  BseckReloadDescriptor b;
  b.ExecutingType = 2;
  for (unsigned short i = 0; i < 3; ++i) {
    BseckReloadError e;
    e.flags = 0;
    e.majorVer = 0;
    e.minorVer = 1;
    e.Type = i;
    e.Error = static_cast<unsigned short>(0x100 + i);
    b.ReloadErrors.push_back(e);
  }
  return b;
}

// A container's framing with the given payload: type, size, header.
Bytes Frame(unsigned int type, const Bytes& payload) {
  Bytes out(12 + payload.size());
  Intruder w(out.data(), static_cast<unsigned int>(out.size()));
  w.intrude(type);
  w.intrude(static_cast<unsigned int>(4 + payload.size()));
  w.intrude(static_cast<unsigned short>(0));
  w.intrude(static_cast<unsigned char>(0));
  w.intrude(static_cast<unsigned char>(0));
  w.intrude(payload.data(), static_cast<unsigned int>(payload.size()));
  return out;
}

void Append(Bytes& out, const Bytes& more) { out.insert(out.end(), more.begin(), more.end()); }

Bytes Be32(unsigned int v) {
  return {static_cast<unsigned char>(v >> 24), static_cast<unsigned char>(v >> 16),
          static_cast<unsigned char>(v >> 8), static_cast<unsigned char>(v)};
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: fuzz_make_seeds DIR\n");
    return 2;
  }
  const std::string dir = argv[1];
  mkdir(dir.c_str(), 0755);
  const VersionEntry version = Version();
  const MemoryConfigDescriptor memory = Memory();
  const BseckReloadDescriptor bseck = Bseck();
  const Bytes versionBytes = Stored([&](Intruder& o) { return version.StoreTLVAndData(&o); });
  const Bytes memoryBytes = Stored([&](Intruder& o) { return memory.StoreTLVAndData(&o); });
  const Bytes bseckBytes = Stored([&](Intruder& o) { return bseck.StoreTLVAndData(&o); });
  Write(dir, "version_entry_fuzz", "version", versionBytes);
  Write(dir, "memory_config_fuzz", "two_controllers", memoryBytes);
  Write(dir, "bseck_reload_fuzz", "three_errors", bseckBytes);

  AnimatedFrontPanelDisplayEntry panel;
  Text(panel.text, "HELLO");
  Write(dir, "front_panel_fuzz", "hello", Stored([&](Intruder& o) { return panel.StoreTLVAndData(&o); }));

  DataEntry blob;
  Text(blob, "build 2026-11-22 aarch64");
  Write(dir, "data_entry_fuzz", "text", Stored([&](Intruder& o) { return blob.StoreTLVAndData(&o); }));

  CodeObjectInfo package;
  package.packageHeaderLocation.location.Set(reinterpret_cast<const unsigned char*>("nor0"),
                                             reinterpret_cast<const unsigned char*>("boot"),
                                             reinterpret_cast<const unsigned char*>("a"));
  package.numComponents = 3;
  for (unsigned int i = 0; i < package.numComponents; ++i) {
    std::memcpy(package.componentLocations[i].componentTag, "CMP0", 4);
    package.componentLocations[i].componentTag[3] = static_cast<unsigned char>('0' + i);
    package.componentLocations[i].location = package.packageHeaderLocation.location;
    package.componentLocations[i].slotOffset = 0x1000ul * i;
  }
  Write(dir, "code_object_info_fuzz", "three_components",
        Stored([&](Intruder& o) { return package.Store(&o); }));

  // Boot-loader information: version, count, then DEVC, MCFG, PADD, BSCK.
  // (The device-configuration and build-environment records are read-only,
  // so their framing is written here.)
  Bytes fsbl = versionBytes;
  Append(fsbl, Be32(4));
  Append(fsbl, Frame(kEntryTypeDEVC, {0x01, 0xB0, 1, 0}));
  Append(fsbl, memoryBytes);
  Bytes pad = Be32(kEntryTypePADD);
  Append(pad, Be32(4));
  Append(pad, Be32(0));
  Append(fsbl, pad);
  Append(fsbl, bseckBytes);
  Write(dir, "fsbl_info_fuzz", "full", Frame(kEntryTypeFSBL, fsbl));

  // Build configuration: component fields, count, then SEQC and BCFG.
  SequenceControlDescriptor sequence;
  std::memcpy(sequence.sequenceControl.controlledSequenceName, "release", 7);
  DataEntry environment;
  Text(environment, "gcc 12 -O2");
  Bytes build = {'K', 'R', 'N', 'L', 0, 5, 0, 10, 'a', 0, 0, 0};
  Append(build, Be32(0));
  Append(build, Be32(2));
  Append(build, Stored([&](Intruder& o) { return sequence.StoreTLVAndData(&o); }));
  Append(build, Frame(kEntryTypeBCFG, Stored([&](Intruder& o) { return environment.StoreTLVAndData(&o); })));
  Write(dir, "build_config_fuzz", "full", Frame(kEntryTypeBLDC, build));
  return 0;
}
