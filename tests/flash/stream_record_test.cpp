// Records on every stream a component location opens: NOR, a slot file,
// physical memory, NAND (its slot starting on a bad block) and eMMC. The
// bytes land where the slot and offset say; the framing leaves each stream
// exactly behind every entry, whatever the reader consumed; where the
// medium takes a back-patched size (NOR, slot files, memory), a record is
// stored in place and reads back equal. And why a stream does not open.
#include <cstring>
#include <string>

#include "descriptors/record_test_util.h"
#include "flash_fixture.h"
#include "stbplat/component_location.h"
#include "stbplat/data_entry.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/intruder.h"
#include "stbplat/version_entry.h"

namespace stbplat {
namespace test {
namespace {

using records_test::Append;
using records_test::Bytes;
using records_test::PutU32;

struct Place {
  const char* device;
  const char* partition;
  const char* slot;
  unsigned long offset;
  bool takesBackPatch;  // false: NAND writes pages in order, eMMC whole pages
  const char* node;  // null: physical memory
  unsigned long at;  // where the first byte lands in the node (or memory)
};

const Place kPlaces[] = {
    {"NOR0", "BOOT", "CONFIG", 0x20, true, "/dev/mtd1", 0x20},
    {"FS0", "CFG", "USER", 0x10, true, "/data/user.cfg", 0x10},
    {"SDRAM0", "RESV", "ARGS", 0x10, true, nullptr, kSdramBase + 0x1020},
    {"NAND0", "SYS", "DATA", 0, false, kNandData, kNandBlock},  // block 0 is bad
    {"EMMC0", "APP", "STORE", 0x800, false, kEmmcNode, 0x100800},
};

ComponentLocation At(const char* device, const char* partition, const char* slot,
                     unsigned long offset = 0) {
  ComponentLocation component;
  component.location = MakeLocation(device, partition, slot);
  component.slotOffset = offset;
  return component;
}
ComponentLocation At(const Place& place) {
  return At(place.device, place.partition, place.slot, place.offset);
}

void PutHeader(Bytes& bytes, const char* type, unsigned int size) {
  bytes.insert(bytes.end(), type, type + 4);
  PutU32(bytes, size);
  Append(bytes, {0, 0, 0, 2});  // flags 0, major 0, minor 2
}

// An older VERS that ends behind its description; a newer one with four
// bytes behind its sequence control that no reader knows; a DATA entry.
Bytes ThreeEntries() {
  Bytes bytes;
  PutHeader(bytes, "VERS", 4 + 6 + 8 + 3);
  Append(bytes, {0, 1, 0, 2, 0, 0});
  Append(bytes, records_test::Data("old"));
  PutHeader(bytes, "VERS", 4 + 6 + 8 + 1 + 2 + 28 + 4);
  Append(bytes, {0, 3, 0, 4, 0, 0});
  Append(bytes, records_test::Data("n"));
  Append(bytes, {'z', 0});
  Append(bytes, Bytes(20, 'S'));
  PutU32(bytes, 0x40000001);
  PutU32(bytes, 5);
  Append(bytes, {0xDE, 0xAD, 0xBE, 0xEF});
  Append(bytes, records_test::Data("end"));
  return bytes;
}

void WriteRaw(const ComponentLocation& component, const Bytes& bytes) {
  Intruder out(&component);
  ASSERT_TRUE(out.isInitedOK);
  ASSERT_LE(out.intrude(bytes.data(), static_cast<unsigned int>(bytes.size())), 2u);
  FlashInterface::Instance()->NANDFlushWrite();
}

class RecordStreams : public FlashTest {
 protected:
  void SetUp() override {
    FlashTest::SetUp();
    sim_.MarkBad(kNandData, 0);
  }
};

TEST_F(RecordStreams, FramingKeepsEveryStreamBehindEachEntry) {
  for (const Place& place : kPlaces) {
    SCOPED_TRACE(place.device);
    const ComponentLocation component = At(place);
    WriteRaw(component, ThreeEntries());
    const uint8_t* memory = place.node == nullptr ? sim_.Memory(place.at) : nullptr;
    Bytes landed = memory != nullptr ? Bytes(memory, memory + 4) : sim_.Bytes(place.node, place.at, 4);
    EXPECT_EQ(landed, (Bytes{'V', 'E', 'R', 'S'}));
    Extruder in(&component, false);
    ASSERT_TRUE(in.isInitedOK);
    VersionEntry older, newer;
    ASSERT_EQ(older.ReadTLVAndData(in, nullptr), 0u);
    EXPECT_EQ(older.versionLetter, 0);
    EXPECT_EQ(older.sequenceControl.otpEpoch, 0x40000000u);
    ASSERT_EQ(newer.ReadTLVAndData(in, nullptr), 0u);
    EXPECT_EQ(newer.versionLetter, 'z');
    EXPECT_EQ(newer.sequenceControl.nvSequence, 5u);
    // In place is refused on these 64-bit streams, which stay behind the
    // entry's header; the payload is then read as an owned copy.
    DataEntry last;
    unsigned int length = 0;
    ASSERT_EQ(last.ReadTLVAndData(in, &length, true), 0xA006u);
    in -= 8;
    ASSERT_EQ(last.ReadTLVAndData(in, &length, false), 0u);
    EXPECT_EQ(length, 3u);
    EXPECT_EQ(std::memcmp(last.GetData(), "end", 3), 0);
  }
}

TEST_F(RecordStreams, RecordsStoredInPlaceReadBackEqual) {
  VersionEntry version;
  version.majorVersion = 7;
  version.description.CreateData(5, reinterpret_cast<const unsigned char*>("k7.42"));
  version.versionLetter = 'c';
  version.sequenceControl.nvSequence = 9;
  for (const Place& place : kPlaces) {
    if (!place.takesBackPatch) continue;
    SCOPED_TRACE(place.device);
    const ComponentLocation component = At(place);
    {
      Intruder out(&component);
      ASSERT_TRUE(out.isInitedOK);
      ASSERT_EQ(version.StoreTLVAndData(&out), 0u);
      ASSERT_EQ(version.StoreTLVAndData(&out), 0u);
    }
    Extruder in(&component, false);
    for (int copy = 0; copy < 2; ++copy) {
      VersionEntry back;
      ASSERT_EQ(back.ReadTLVAndData(in, nullptr), 0u) << copy;
      EXPECT_EQ(back.majorVersion, 7);
      EXPECT_TRUE(back.description == version.description);
      EXPECT_EQ(back.sequenceControl.nvSequence, 9u);
    }
  }
}

TEST_F(RecordStreams, PaddingSizedPastTheFlashIsNotSkippedByWriting) {
  // On a NOR partition, which refuses a seek past its end.
  Bytes vers;
  PutHeader(vers, "VERS", 4 + 6 + 8);
  Append(vers, {0, 1, 0, 0, 0, 0});
  Append(vers, records_test::Data(""));
  Bytes bytes = {'F', 'S', 'B', 'L'};
  PutU32(bytes, static_cast<unsigned int>(4 + vers.size() + 4 + 8));
  Append(bytes, {0, 0, 0, 0});
  Append(bytes, vers);
  PutU32(bytes, 1);
  Append(bytes, {'P', 'A', 'D', 'D'});
  PutU32(bytes, 0x7FFFFFF0);
  const ComponentLocation component = At(kPlaces[0]);
  WriteRaw(component, bytes);
  const std::vector<uint8_t> before = sim_.Bytes("/dev/mtd1", 0, 0x40000);
  Extruder in(&component, false);
  FSBLInfo info;
  EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0xA012u);
  EXPECT_TRUE(sim_.Bytes("/dev/mtd1", 0, 0x40000) == before);
  // A NOR read that fails still reports nothing: the value is erased flash.
  sim_.FailCall(SimCall::kRead, 1, EIO);
  unsigned int value = 0;
  Extruder again(&component, false);
  again.extrude(&value);
  EXPECT_EQ(value, 0xFFFFFFFFu);
}

TEST_F(RecordStreams, FailuresToOpenSayWhy) {
  EXPECT_FALSE(Extruder(static_cast<const ComponentLocation*>(nullptr), false).isInitedOK);
  // A file slot is created only by a writable stream.
  ComponentLocation user = At("FS0", "CFG", "USER");
  Extruder reader(&user, false);
  EXPECT_FALSE(reader.isInitedOK);
  ComponentLocation args = At("SDRAM0", "RESV", "ARGS");
  sim_.FailCall(SimCall::kMmap, 1, ENOMEM);
  LogCapture log;
  Extruder memory(&args, false);
  EXPECT_FALSE(memory.isInitedOK);
  EXPECT_TRUE(log.Contains("mmap failed: errno = 12\r\n"));
  EXPECT_EQ(memory.memFd, 0);
  const char* const messages[] = {"Device XYZ..... not found\r\n",
                                  "Package location NOR0.BOOT.NONE not found\r\n",
                                  "Can't find mtd partition or file name for NAND0.SYS.NONE\r\n"};
  const ComponentLocation places[] = {At("XYZ", "A", "B"), At("NOR0", "BOOT", "NONE"),
                                      At("NAND0", "SYS", "NONE")};
  for (int i = 0; i < 3; ++i) {
    Extruder in(&places[i], false);
    EXPECT_FALSE(in.isInitedOK);
    EXPECT_TRUE(log.Contains(messages[i]));
  }
}

}  // namespace
}  // namespace test
}  // namespace stbplat
