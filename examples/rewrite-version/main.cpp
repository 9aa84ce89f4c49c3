// Raises the minor version of the version record at the start of a NAND slot,
// such as NAND0.KERNEL.A, and reads it back: the read, erase and store an
// application makes when it updates a record. A NAND page takes one program
// after an erase, so the slot is erased first (whatever else it held is gone),
// and the stream's last partial page is written out at the end.
//
// On a desk, against the dumps of a box: stbplat run --root DIR -- rewrite-version NAND0 KERNEL A
#include <stbplat/stbplat.h>

#include <cstdio>

namespace {

// Room for a version record laid out in memory.
constexpr unsigned int kRecordRoom = 256;

const unsigned char* Name(const char* text) { return reinterpret_cast<const unsigned char*>(text); }

bool ReadVersion(const ComponentLocation& slot, VersionEntry* version) {
  Extruder in(&slot, false);
  return in.isInitedOK && version->ReadTLVAndData(in, nullptr) == 0;
}

void Print(const VersionEntry& version) {
  std::printf("%u.%u%c", version.majorVersion, version.minorVersion,
              version.versionLetter != 0 ? version.versionLetter : ' ');
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: rewrite-version DEVICE PARTITION SLOT   (e.g. NAND0 KERNEL A)\n");
    return 2;
  }
  ComponentLocation slot;
  slot.location = Location(Name(argv[1]), Name(argv[2]), Name(argv[3]));
  VersionEntry version;
  if (!ReadVersion(slot, &version)) {
    std::fprintf(stderr, "rewrite-version: no version record in %s.%s.%s\n", argv[1], argv[2], argv[3]);
    return 1;
  }
  Print(version);
  ++version.minorVersion;
  FlashInterface* flash = FlashInterface::Instance();
  if (!flash->EraseSlot(&slot.location)) {
    std::fprintf(stderr, "\nrewrite-version: erasing the slot failed\n");
    return 1;
  }
  {
    // The record is laid out in memory first (its size field is filled in
    // after its payload), then goes to the slot in one piece.
    Intruder record(kRecordRoom, kRecordRoom);
    Intruder out(&slot);
    if (version.StoreTLVAndData(&record) != 0 || !out.isInitedOK ||
        out.intrude(record.pStart, static_cast<unsigned int>(record.pCurrent - record.pStart)) != kIntrudeOk) {
      std::fprintf(stderr, "\nrewrite-version: storing the record failed\n");
      return 1;
    }
    flash->NANDFlushWrite();
  }
  VersionEntry stored;
  if (!ReadVersion(slot, &stored) || stored.minorVersion != version.minorVersion) {
    std::fprintf(stderr, "\nrewrite-version: the record did not read back\n");
    return 1;
  }
  std::printf(" -> ");
  Print(stored);
  std::printf("\n");
  return 0;
}
