// Prints the version record of a slot, such as NAND0.KERNEL.A: the library
// finds the slot through the platform's memory map and reads it through the
// flash layer (bad blocks skipped).
#include <stbplat/stbplat.h>

#include <cstdio>
#include <string>

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: read-version DEVICE PARTITION SLOT   (e.g. NAND0 KERNEL A)\n");
    return 2;
  }
  auto name = [](const char* text) { return reinterpret_cast<const unsigned char*>(text); };
  ComponentLocation slot;
  slot.location = Location(name(argv[1]), name(argv[2]), name(argv[3]));
  Extruder in(&slot, false);
  VersionEntry version;
  if (!in.isInitedOK || version.ReadTLVAndData(in, nullptr) != 0) {
    std::fprintf(stderr, "read-version: no version record in %s.%s.%s\n", argv[1], argv[2], argv[3]);
    return 1;
  }
  std::printf("%u.%u%c\n", version.majorVersion, version.minorVersion,
              version.versionLetter != 0 ? version.versionLetter : ' ');
  return 0;
}
