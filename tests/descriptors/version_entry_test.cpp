// VersionEntry and the sequence-control records against hand-made golden
// bytes; optional trailing fields decided by the entry size.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "record_test_util.h"
#include "stbplat/version_entry.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

std::string Name(const SequenceControl& s) {
  return std::string(reinterpret_cast<const char*>(s.controlledSequenceName),
                     sizeof s.controlledSequenceName);
}

std::string Padded(const std::string& name) { return name + std::string(20 - name.size(), '\0'); }

TEST(VersionEntry, ConstructsAsVersionTwoWithDefaults) {
  VersionEntry v;
  EXPECT_EQ(v.entryType, 0x56455253u);
  EXPECT_EQ(v.majorVer, 0);
  EXPECT_EQ(v.minorVer, 2);
  EXPECT_EQ(v.flags, 0);
  EXPECT_FALSE(v.valid);
  EXPECT_EQ(v.sequenceControl.otpEpoch, 0x40000000u);
  EXPECT_EQ(v.sequenceControl.nvSequence, 0u);
  EXPECT_EQ(Name(v.sequenceControl), std::string(20, '\0'));
}

TEST(VersionEntry, GoldenRecordReadsFieldByField) {
  const Bytes golden = Golden("vers_minor2.bin");
  ASSERT_EQ(golden.size(), 69u);
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  VersionEntry v;
  unsigned int size = 0;
  ASSERT_EQ(v.ReadTLVAndData(in, &size), 0u);
  EXPECT_EQ(size, 61u);
  EXPECT_EQ(v.flags, 0x8001);
  EXPECT_EQ(v.minorVer, 2);
  EXPECT_TRUE(v.valid);
  EXPECT_EQ(v.majorVersion, 3);
  EXPECT_EQ(v.minorVersion, 14);
  EXPECT_EQ(v._temp, 0x0102);
  ASSERT_EQ(v.description.length, 13u);
  EXPECT_STREQ(reinterpret_cast<const char*>(v.description.GetData()), "Release 3.14");
  EXPECT_EQ(v.versionLetter, 'b');
  EXPECT_EQ(v.pad, 0);
  EXPECT_EQ(Name(v.sequenceControl), Padded("MAINLINE"));
  EXPECT_EQ(v.sequenceControl.otpEpoch, 0x40000002u);
  EXPECT_EQ(v.sequenceControl.nvSequence, 7u);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_EQ(Stored(v, golden.size()), golden);
}

TEST(VersionEntry, EntryEndingBehindTheDescriptionTakesDefaults) {
  const Bytes golden = Golden("vers_no_tail.bin");
  Bytes bytes = golden;
  Append(bytes, {0x11, 0x22});  // the next entry's bytes must not be taken
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  VersionEntry v;
  v.versionLetter = 'z';
  v.pad = 1;
  v.sequenceControl.nvSequence = 5;
  v.sequenceControl.otpEpoch = 1;
  ASSERT_EQ(v.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(v.majorVersion, 1);
  EXPECT_EQ(v.minorVersion, 2);
  EXPECT_EQ(v.versionLetter, 0);
  EXPECT_EQ(v.pad, 0);
  EXPECT_EQ(v.sequenceControl.otpEpoch, 0x40000000u);
  EXPECT_EQ(v.sequenceControl.nvSequence, 0u);
  EXPECT_EQ(v.minorVer, 0);
  EXPECT_EQ(in.bytesLeft, 2u);
}

TEST(VersionEntry, EntryEndingBehindPadTakesLetterAndPadOnly) {
  Bytes bytes = Golden("vers_to_pad.bin");
  Append(bytes, {0x11, 0x22, 0x33, 0x44});
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  VersionEntry v;
  v.sequenceControl.nvSequence = 9;
  ASSERT_EQ(v.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(v.versionLetter, 'a');
  EXPECT_EQ(v.pad, 0x5A);
  EXPECT_EQ(v.sequenceControl.otpEpoch, 0x40000000u);
  EXPECT_EQ(v.sequenceControl.nvSequence, 0u);
  EXPECT_EQ(in.bytesLeft, 4u);
}

TEST(VersionEntry, ShortRecordStoredAgainGainsTheOptionalFields) {
  const Bytes golden = Golden("vers_no_tail.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  VersionEntry v;
  ASSERT_EQ(v.ReadTLVAndData(in, nullptr), 0u);
  Bytes expected = golden;
  expected[7] = static_cast<unsigned char>(expected[7] + 30);  // size grows by 2 + 28
  Append(expected, {0, 0});
  Append(expected, Bytes(20, 0));
  PutU32(expected, 0x40000000);
  PutU32(expected, 0);
  EXPECT_EQ(Stored(v, 128), expected);
}

TEST(VersionEntry, MajorVersionOneIsRefused) {
  Bytes bytes = Golden("vers_no_tail.bin");
  bytes[10] = 1;
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  VersionEntry v;
  LogCapture capture;
  EXPECT_EQ(v.ReadTLVAndData(in, nullptr), 0xA011u);
  EXPECT_EQ(RecordTexts(capture),
            std::vector<std::string>{"Invalid major version (1), should be 0 for entry type VERS\r\n"});
}

TEST(VersionEntry, BrokenDescriptionOrSequenceControlIsANestedFailure) {
  Bytes noData = Entry("VERS", {0, 1, 0, 2, 0, 3, 'X', 'X', 'X', 'X', 0, 0, 0, 0});
  Extruder in(noData.data(), static_cast<unsigned int>(noData.size()));
  VersionEntry v;
  LogCapture capture;
  EXPECT_EQ(v.ReadTLVAndData(in, nullptr), 0xA004u);
  EXPECT_EQ(RecordTexts(capture).back(), "Error reading description\r\n");
  EXPECT_FALSE(v.valid);

  // The entry size promises a sequence-control block the stream cuts short.
  Bytes cut = Golden("vers_minor2.bin");
  cut.resize(cut.size() - 3);
  Extruder in2(cut.data(), static_cast<unsigned int>(cut.size()));
  VersionEntry w;
  capture.Clear();
  EXPECT_EQ(w.ReadTLVAndData(in2, nullptr), 0xA012u);  // repositioning past the end
  const auto texts = RecordTexts(capture);
  ASSERT_GE(texts.size(), 2u);
  EXPECT_EQ(texts[0], "Error reading nvSequence\r\n");
  EXPECT_EQ(texts[1], "Error reading sequenceControl\r\n");
}

TEST(VersionEntry, FieldMessagesOnTruncation) {
  const Bytes golden = Golden("vers_minor2.bin");
  const struct {
    size_t keep;
    const char* message;
  } cases[] = {{13, "Error reading majorVersion\r\n"},
               {15, "Error reading minorVersion\r\n"},
               {17, "Error reading _temp\r\n"},
               {39, "Error reading versionLetter\r\n"},
               {40, "Error reading pad\r\n"}};
  for (const auto& c : cases) {
    Bytes bytes(golden.begin(), golden.begin() + c.keep);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    VersionEntry v;
    LogCapture capture;
    EXPECT_NE(v.ReadTLVAndData(in, nullptr), 0u) << c.keep;
    EXPECT_EQ(RecordTexts(capture).at(0), c.message) << c.keep;
  }
}

TEST(VersionEntry, StoreFailureMessages) {
  VersionEntry v;
  v.description.CreateData(2);
  const struct {
    unsigned int room;
    const char* message;
    unsigned int status;
  } cases[] = {{13, "Error writing majorVersion\r\n", 0xA012},
               {15, "Error writing minorVersion\r\n", 0xA012},
               {17, "Error writing _temp\r\n", 0xA012},
               {20, "Error writing description\r\n", 0xA004},
               {28, "Error writing versionLetter\r\n", 0xA012},
               {29, "Error writing pad\r\n", 0xA012}};
  for (const auto& c : cases) {
    Bytes buffer(c.room);
    Intruder out(buffer.data(), c.room);
    out += 12;  // behind a header
    LogCapture capture;
    EXPECT_EQ(v.Store(&out), c.status) << c.room;
    EXPECT_EQ(RecordTexts(capture).back(), c.message) << c.room;
  }
}

TEST(VersionEntry, SequenceControlWriteFailureIsIgnored) {
  VersionEntry v;
  Bytes buffer(20);
  Intruder out(buffer.data(), 20);
  // 6 + 8 + 2 bytes fit, the block does not.
  EXPECT_EQ(v.Store(&out), 0u);
  EXPECT_EQ(out.pCurrent - out.pStart, 16);
}

TEST(SequenceControl, StorageRoundTripAndMessages) {
  SequenceControlStorage s;
  std::memcpy(s.controlledSequenceName, "SEQNAME", 7);
  s.otpEpoch = 0x01020304;
  s.nvSequence = 0xA0B0C0D0;
  Bytes buffer(28);
  Intruder out(buffer.data(), 28);
  ASSERT_EQ(s.Store(&out), 0u);
  Bytes expected;
  const std::string name = Padded("SEQNAME");
  expected.insert(expected.end(), name.begin(), name.end());
  PutU32(expected, 0x01020304);
  PutU32(expected, 0xA0B0C0D0);
  EXPECT_EQ(buffer, expected);

  Extruder in(buffer.data(), 28);
  SequenceControlStorage r;
  ASSERT_EQ(r.Read(in), 0u);
  EXPECT_EQ(Name(r), name);
  EXPECT_EQ(r.nvSequence, 0xA0B0C0D0u);

  const struct {
    unsigned int keep;
    const char* read;
    const char* write;
  } cases[] = {{10, "Error reading (uint8_t *)controlledSequenceName\r\n",
                "Error writing (uint8_t *)controlledSequenceName\r\n"},
               {22, "Error reading otpEpoch\r\n", "Error writing otpEpoch\r\n"},
               {26, "Error reading nvSequence\r\n", "Error writing nvSequence\r\n"}};
  for (const auto& c : cases) {
    Extruder cut(buffer.data(), c.keep);
    SequenceControlStorage t;
    LogCapture capture;
    EXPECT_EQ(t.Read(cut), 0xA012u);
    Bytes small(c.keep);
    Intruder tight(small.data(), c.keep);
    EXPECT_EQ(s.Store(&tight), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), (std::vector<std::string>{c.read, c.write}));
  }
}

TEST(SequenceControl, CopiesAllFields) {
  SequenceControl a;
  std::memcpy(a.controlledSequenceName, "ABC", 3);
  a.otpEpoch = 1;
  a.nvSequence = 2;
  SequenceControl b(a);
  SequenceControl c;
  c = a;
  for (const SequenceControl* s : {&b, &c}) {
    EXPECT_EQ(Name(*s), Padded("ABC"));
    EXPECT_EQ(s->otpEpoch, 1u);
    EXPECT_EQ(s->nvSequence, 2u);
  }
}

TEST(SequenceControlDescriptor, FramedRoundTrip) {
  SequenceControlDescriptor d;
  EXPECT_EQ(d.entryType, 0x53455143u);
  std::memcpy(d.sequenceControl.controlledSequenceName, "X", 1);
  d.sequenceControl.nvSequence = 3;
  Bytes buffer(40);
  Intruder out(buffer.data(), 40);
  ASSERT_EQ(d.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(out.pCurrent - out.pStart, 40);
  Extruder in(buffer.data(), 40);
  SequenceControlDescriptor r;
  ASSERT_EQ(r.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(r.sequenceControl.nvSequence, 3u);
  EXPECT_EQ(r.sequenceControl.otpEpoch, 0x40000000u);
  EXPECT_EQ(Name(r.sequenceControl), Padded("X"));
}

}  // namespace
