// Corrupted records (bytes flipped, records cut short) go through every
// reader: each returns, and the stream stays inside its buffer. Run under
// the sanitizers this also proves no read outside the input or the records.
#include <gtest/gtest.h>

#include <random>
#include <string>

#include "record_test_util.h"
#include "stbplat/bseck_reload.h"
#include "stbplat/build_config.h"
#include "stbplat/front_panel.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/memory_config.h"
#include "stbplat/version_entry.h"

namespace {

using namespace records_test;

template <typename Record>
void Survives(const Bytes& input) {
  Bytes copy = input;  // exactly sized, so that any overread is caught
  Extruder in(copy.data(), static_cast<unsigned int>(copy.size()));
  Record record;
  unsigned int size = 0;
  (void)record.ReadTLVAndData(in, &size);
  ASSERT_LE(in.bytesLeft, in.length);
  ASSERT_GE(in.pCurrent, in.pStart);
}

Bytes Corrupt(const Bytes& golden, std::mt19937& random) {
  Bytes bytes = golden;
  const int flips = 1 + static_cast<int>(random() % 4);
  for (int i = 0; i < flips; ++i) {
    const size_t at = random() % bytes.size();
    // Counts and sizes are the interesting targets: favour extreme values.
    switch (random() % 3) {
      case 0: bytes[at] = 0xFF; break;
      case 1: bytes[at] = 0x00; break;
      default: bytes[at] = static_cast<unsigned char>(random()); break;
    }
  }
  if (random() % 4 == 0) bytes.resize(random() % bytes.size() + 1);
  return bytes;
}

TEST(GarbageInput, EveryReaderReturnsAndStaysInsideTheStream) {
  std::mt19937 random(20261122);
  const struct {
    const char* file;
    void (*read)(const Bytes&);
  } readers[] = {{"vers_minor2.bin", &Survives<VersionEntry>},
                 {"mcfg_minor6.bin", &Survives<MemoryConfigDescriptor>},
                 {"mcfg_minor5.bin", &Survives<MemoryConfigDescriptor>},
                 {"bseck.bin", &Survives<BseckReloadDescriptor>},
                 {"afpd.bin", &Survives<AnimatedFrontPanelDisplayEntry>},
                 {"fsbl_info.bin", &Survives<FSBLInfo>},
                 {"build_config.bin", &Survives<BuildConfig>}};
  for (const auto& reader : readers) {
    const Bytes golden = Golden(reader.file);
    ASSERT_FALSE(golden.empty()) << reader.file;
    for (int round = 0; round < 400; ++round) {
      reader.read(Corrupt(golden, random));
      if (HasFatalFailure()) return;
    }
  }
}

}  // namespace
