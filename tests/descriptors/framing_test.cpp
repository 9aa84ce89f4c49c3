// The TLV framing: type check and rewind, version rule, repositioning behind
// the entry whatever the payload reader did, back-patched sizes, abandoned
// entries, and the header's messages.
#include <gtest/gtest.h>

#include <cstring>

#include "record_test_util.h"
#include "stbplat/system_descriptor.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

constexpr unsigned int kProbeType = 0x50524245;  // "PRBE"

// A record whose payload reader consumes a chosen number of bytes and whose
// writer writes a chosen number of bytes or fails.
class Probe : public SystemDescriptor {
 public:
  explicit Probe(unsigned char major = 1) : SystemDescriptor(kProbeType, 0, major, 3) {}
  unsigned int Read(Extruder& in, unsigned int entrySize) override {
    seenEntrySize = entrySize;
    unsigned char sink[64];
    if (readBytes > 0) (void)in.extrude(sink, readBytes);
    return readStatus;
  }
  unsigned int Store(Intruder* out) const override {
    for (unsigned int i = 0; i < storeBytes; ++i)
      if (out->intrude(static_cast<unsigned char>(0xC0 + i)) > kIntrudeFull) return 0xA012;
    return storeStatus;
  }
  unsigned int readBytes = 0;
  unsigned int readStatus = 0;
  unsigned int storeBytes = 0;
  unsigned int storeStatus = 0;
  unsigned int seenEntrySize = 0;
};

Bytes ProbeEntry(unsigned int payloadBytes, unsigned char major = 1) {
  Bytes payload;
  for (unsigned int i = 0; i < payloadBytes; ++i) payload.push_back(static_cast<unsigned char>(i));
  return Entry("PRBE", payload, major, 7, 0x1234);
}

TEST(FramingRead, ForeignTypeRewindsToTheEntryStartWithExactMessage) {
  Bytes bytes = {0xEE, 0xEE};
  Append(bytes, Entry("VERS", {}));
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  in += 2;
  Probe probe;
  unsigned int size = 99;
  LogCapture capture;
  EXPECT_EQ(probe.ReadTLVAndData(in, &size), 0xA004u);
  EXPECT_EQ(Offset(in), 2u);
  EXPECT_EQ(size, 99u);
  EXPECT_FALSE(probe.valid);
  ASSERT_EQ(capture.messages().size(), 1u);
  const auto& m = capture.messages()[0];
  EXPECT_EQ(m.text,
            "SystemDescriptor::ReadTLVAndData: entry must be of type PRBE, found VERS instead\r\n");
  EXPECT_EQ(m.module, eLogModuleRecords);
  EXPECT_EQ(m.level, 2u);
  EXPECT_EQ(m.sourceFile, "SystemDescriptor");
  EXPECT_EQ(m.function, "ReadTLVAndData");
}

TEST(FramingRead, HeaderFieldsAndEntrySizeAreTaken) {
  Bytes bytes = ProbeEntry(5);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  Probe probe;
  probe.readBytes = 5;
  unsigned int size = 0;
  EXPECT_FALSE(probe.valid);
  EXPECT_EQ(probe.ReadTLVAndData(in, &size), 0u);
  EXPECT_EQ(size, 9u);
  EXPECT_EQ(probe.seenEntrySize, 9u);
  EXPECT_EQ(probe.flags, 0x1234);
  EXPECT_EQ(probe.majorVer, 1);
  EXPECT_EQ(probe.minorVer, 7);
  EXPECT_TRUE(probe.valid);
  EXPECT_EQ(in.bytesLeft, 0u);
}

TEST(FramingRead, NewerMajorIsRefusedAndLeavesTheMembersAlone) {
  Bytes bytes = ProbeEntry(0, 2);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  Probe probe(1);
  LogCapture capture;
  EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), 0xA011u);
  EXPECT_EQ(probe.majorVer, 1);
  EXPECT_EQ(probe.minorVer, 3);
  EXPECT_EQ(probe.flags, 0);
  EXPECT_FALSE(probe.valid);
  EXPECT_EQ(RecordTexts(capture),
            std::vector<std::string>{"Invalid major version (2), should be 1 for entry type PRBE\r\n"});
  // Behind the entry all the same.
  EXPECT_EQ(in.bytesLeft, 0u);
  // The refusal does not hang on the message being produced.
  capture.Clear();
  capture.SetLevel(eLogModuleRecords, 0);
  Extruder again(bytes.data(), static_cast<unsigned int>(bytes.size()));
  EXPECT_EQ(probe.ReadTLVAndData(again, nullptr), 0xA011u);
  EXPECT_TRUE(capture.messages().empty());
}

TEST(FramingRead, OlderAndEqualMajorsAreKept) {
  for (unsigned char stored : {0, 1}) {
    Bytes bytes = ProbeEntry(0, stored);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    Probe probe(1);
    EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), 0u);
    EXPECT_EQ(probe.majorVer, stored);
  }
}

TEST(FramingRead, ShortAndLongPayloadReadersLeaveTheStreamBehindTheEntry) {
  Bytes bytes = ProbeEntry(6);
  Append(bytes, {0xAB, 0xCD});
  for (unsigned int consumed : {0u, 2u, 6u, 8u}) {
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    Probe probe;
    probe.readBytes = consumed;
    EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), 0u) << consumed;
    EXPECT_EQ(Offset(in), bytes.size() - 2) << consumed;
  }
}

TEST(FramingRead, FailingPayloadOrOversizedEntry) {
  Bytes bytes = ProbeEntry(4);
  Append(bytes, {0x77});
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  Probe probe;
  probe.readBytes = 1;
  probe.readStatus = 0xA004;
  EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), 0xA004u);
  EXPECT_FALSE(probe.valid);
  EXPECT_EQ(Offset(in), bytes.size() - 1);
  // An entry size past the stream fails the repositioning.
  bytes[7] = 0x40;
  Extruder past(bytes.data(), static_cast<unsigned int>(bytes.size()));
  probe.readStatus = 0;
  EXPECT_EQ(probe.ReadTLVAndData(past, nullptr), 0xA012u);
}

TEST(FramingRead, EveryTruncatedHeaderFieldHasItsMessage) {
  const Bytes full = ProbeEntry(0);
  const struct {
    size_t keep;
    const char* message;
  } cases[] = {{2, "Error reading storedEntryType\r\n"},
               {6, "Error reading entrySize\r\n"},
               {9, "Error reading localFlags\r\n"},
               {10, "Error reading localMajorVer\r\n"},
               {11, "Error reading minorVer\r\n"}};
  for (const auto& c : cases) {
    Bytes bytes(full.begin(), full.begin() + c.keep);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    Probe probe;
    LogCapture capture;
    EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), 0xA012u) << c.keep;
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{c.message});
  }
}

TEST(FramingStore, EntryIsWrittenWithBackPatchedSize) {
  Probe probe;
  probe.flags = 0xA55A;
  probe.storeBytes = 3;
  unsigned char buffer[32];
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(probe.StoreTLVAndData(&out), 0u);
  const Bytes expected = {'P', 'R', 'B', 'E', 0, 0, 0, 7, 0xA5, 0x5A, 1, 3, 0xC0, 0xC1, 0xC2};
  EXPECT_EQ(Written(out), expected);
  Probe empty;
  Intruder exact(buffer, 12);
  EXPECT_EQ(empty.StoreTLVAndData(&exact), 0u);
  EXPECT_EQ(Written(exact), (Bytes{'P', 'R', 'B', 'E', 0, 0, 0, 4, 0, 0, 1, 3}));
}

TEST(FramingStore, GrowableBufferGrowsBeforeTheSizeField) {
  Probe probe;
  probe.storeBytes = 3;
  for (unsigned int size : {5u, 6u, 7u}) {  // 1 to 3 bytes left behind the type
    Intruder out(size, 0);
    out.growthStep = 16;
    EXPECT_EQ(probe.StoreTLVAndData(&out), 0u) << size;
    EXPECT_EQ(Written(out), (Bytes{'P', 'R', 'B', 'E', 0, 0, 0, 7, 0, 0, 1, 3, 0xC0, 0xC1, 0xC2})) << size;
  }
}

TEST(FramingStore, FailingPayloadWriterLeavesThePositionAtTheEntryStart) {
  Probe probe;
  probe.storeBytes = 10;  // more than the buffer holds
  unsigned char buffer[20] = {};
  Intruder out(buffer, sizeof buffer);
  out.intrude(static_cast<unsigned short>(0xBEEF));
  LogCapture capture;
  EXPECT_EQ(probe.StoreTLVAndData(&out), 0xA012u);
  EXPECT_EQ(out.pCurrent - out.pStart, 2);
  EXPECT_EQ(RecordTexts(capture),
            std::vector<std::string>{"Insufficient memory to add entry of type PRBE\r\n"});
  // A failing status abandons the entry just the same.
  probe.storeBytes = 1;
  probe.storeStatus = 0xA004;
  Intruder roomy(buffer, sizeof buffer);
  EXPECT_EQ(probe.StoreTLVAndData(&roomy), 0xA012u);
  EXPECT_EQ(roomy.pCurrent, roomy.pStart);
}

TEST(FramingStore, HeaderWriteFailuresHaveTheirMessages) {
  const struct {
    unsigned int room;
    const char* message;
  } cases[] = {{1, "Error writing flags\r\n"},
               {2, "Error writing majorVer\r\n"},
               {3, "Error writing minorVer\r\n"}};
  for (const auto& c : cases) {
    Probe probe;
    unsigned char buffer[4];
    Intruder out(buffer, c.room);
    LogCapture capture;
    EXPECT_EQ(probe.StoreBase(&out), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{c.message});
  }
  Probe probe;
  unsigned char buffer[2];
  Intruder out(buffer, sizeof buffer);
  LogCapture capture;
  EXPECT_EQ(probe.StoreTLVAndData(&out), 0xA012u);
  EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{"Error writing entryType\r\n"});
}

TEST(FramingStore, SizeIsPatchedAfterTheBufferGrew) {
  // Room for type and size only: the header write grows (moves) the buffer.
  Intruder out(8u, 0u);
  out.growthStep = 64;
  Probe probe;
  probe.storeBytes = 2;
  EXPECT_EQ(probe.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(Written(out), (Bytes{'P', 'R', 'B', 'E', 0, 0, 0, 6, 0, 0, 1, 3, 0xC0, 0xC1}));
}

}  // namespace
