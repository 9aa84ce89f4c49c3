// The records against hand-made golden bytes: field by field, stored back
// byte for byte, optional trailing fields, old layouts, partial lists, and the
// containers' dispatch on nested entry types.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <tuple>

#include "record_test_util.h"
#include "stbplat/bseck_reload.h"
#include "stbplat/build_config.h"
#include "stbplat/front_panel.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/memory_config.h"
#include "stbplat/version_entry.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

std::string Text(const unsigned char* p, size_t n) { return std::string(reinterpret_cast<const char*>(p), n); }

// Reads `record` from all of `bytes`, which it must take whole.
template <class R>
void ReadWhole(R& record, const Bytes& bytes) {
  In in(bytes);
  ASSERT_EQ(record.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_TRUE(record.valid);
}

template <class R>
Bytes Stored(const R& record) {
  Bytes buffer(8192);
  Intruder out(buffer.data(), 8192);
  EXPECT_EQ(record.StoreTLVAndData(&out), 0u);
  return Written(out);
}

template <class R>
Bytes RoundTrip(const Bytes& golden) {
  R record;
  ReadWhole(record, golden);
  return Stored(record);
}

Bytes Fsbl(unsigned int count, const Bytes& nested) {
  Bytes payload = Golden("vers_no_tail.bin");
  PutU32(payload, count);
  Append(payload, nested);
  return Entry("FSBL", payload);
}

Bytes Skipped(const char* type, unsigned int size) {
  Bytes bytes(type, type + 4);
  PutU32(bytes, size);
  Append(bytes, Bytes(size < 64 ? size : 0, 0xA5));
  return bytes;
}

TEST(Records, GoldenRecordsStoreBackByteForByteAndFreshOnesStoreTheirDefaults) {
  const Bytes build = Golden("build_config.bin");
  const struct {
    Bytes (*roundTrip)(const Bytes&);
    Bytes golden;
  } cases[] = {{RoundTrip<VersionEntry>, Golden("vers_minor2.bin")},
               {RoundTrip<BseckReloadDescriptor>, Golden("bseck.bin")},
               {RoundTrip<AnimatedFrontPanelDisplayEntry>, Golden("afpd.bin")},
               {RoundTrip<MemoryConfigDescriptor>, Golden("mcfg_minor6.bin")},
               {RoundTrip<SequenceControlDescriptor>, Bytes(build.begin() + 32, build.begin() + 72)}};
  for (const auto& c : cases) EXPECT_EQ(c.roundTrip(c.golden), c.golden) << Text(c.golden.data(), 4);
  Bytes vers(6, 0);
  Append(vers, Data(""));
  Append(vers, Bytes(22, 0));
  PutU32(vers, 0x40000000);
  PutU32(vers, 0);
  EXPECT_EQ(Stored(VersionEntry()), Entry("VERS", vers, 0, 2));
  EXPECT_EQ(Stored(BseckReloadDescriptor()), Entry("BSCK", {0, 0, 0, 0}));
  EXPECT_EQ(Stored(AnimatedFrontPanelDisplayEntry()), Entry("AFPD", Data("")));
  EXPECT_EQ(Stored(MemoryConfigDescriptor()), Entry("MCFG", {0, 0}, 0, 6));
  EXPECT_EQ(Stored(MemoryControllerDescriptor()), Entry("MCET", Bytes(14, 0), 0, 6));
  EXPECT_EQ(Stored(MemoryControllerSegmentDescriptor()), Entry("MCSD", Bytes(12, 0), 0, 6));
}

TEST(VersionEntry, GoldenRecordFieldByField) {
  VersionEntry v;
  ReadWhole(v, Golden("vers_minor2.bin"));
  EXPECT_EQ(v.flags, 0x8001);
  EXPECT_EQ(std::tie(v.majorVersion, v.minorVersion, v._temp), std::make_tuple(3, 14, 0x0102));
  EXPECT_EQ(Text(v.description.GetData(), v.description.length), std::string("Release 3.14", 13));
  EXPECT_EQ(v.versionLetter, 'b');
  EXPECT_EQ(Text(v.sequenceControl.controlledSequenceName, 9), std::string("MAINLINE", 9));
  EXPECT_EQ(v.sequenceControl.otpEpoch, 0x40000002u);
}

TEST(VersionEntry, OptionalTrailingFieldsFollowTheEntrySize) {
  for (const char* name : {"vers_no_tail.bin", "vers_to_pad.bin"}) {
    Bytes bytes = Golden(name);
    const size_t size = bytes.size();
    Append(bytes, {0x11, 0x22, 0x33});  // the next entry's bytes must not be taken
    In in(bytes);
    VersionEntry v;
    v.versionLetter = 'z';
    v.pad = 1;
    v.sequenceControl.otpEpoch = 1;
    v.sequenceControl.nvSequence = 5;
    ASSERT_EQ(v.ReadTLVAndData(in, nullptr), 0u) << name;
    EXPECT_EQ(in.bytesLeft, 3u) << name;
    const bool toPad = size == 34;
    EXPECT_EQ(v.versionLetter, toPad ? 'a' : 0) << name;
    EXPECT_EQ(v.pad, toPad ? 0x5A : 0) << name;
    EXPECT_EQ(v.sequenceControl.otpEpoch, 0x40000000u) << name;
    EXPECT_EQ(v.sequenceControl.nvSequence, 0u) << name;
    // Stored again, the record gains the fields it lacked.
    Bytes expected(bytes.begin(), bytes.begin() + static_cast<long>(size));
    expected[7] = static_cast<unsigned char>(expected[7] + (toPad ? 28 : 30));
    if (!toPad) Append(expected, {0, 0});
    Append(expected, Bytes(20, 0));
    PutU32(expected, 0x40000000);
    PutU32(expected, 0);
    EXPECT_EQ(Stored(v), expected) << name;
  }
  const Bytes foreign = Entry("VERS", {0, 1, 0, 2, 0, 3, 'X', 'X', 'X', 'X', 0, 0, 0, 0});
  In in(foreign);
  VersionEntry v;
  EXPECT_EQ(v.ReadTLVAndData(in, nullptr), 0xA004u) << "a description of another type";
  EXPECT_FALSE(v.valid);
}

TEST(BseckReload, GoldenRecordPartialListsAndEquality) {
  const Bytes golden = Golden("bseck.bin");
  BseckReloadDescriptor d;
  ReadWhole(d, golden);
  EXPECT_EQ(d.ExecutingType, 2);
  ASSERT_EQ(d.ReloadErrors.size(), 3u);
  const BseckReloadError first = d.ReloadErrors[0];
  EXPECT_EQ(std::tie(first.flags, first.majorVer, first.minorVer, first.Type, first.Error),
            std::make_tuple(1, 1, 2, 0x10, 0xE001));
  EXPECT_EQ(d.ReloadErrors[2].majorVer, 9) << "elements carry no version check";
  In cut(golden, golden.size() - 5);  // inside the third element
  EXPECT_EQ(d.ReadTLVAndData(cut, nullptr), 0xA012u);
  EXPECT_EQ(d.ReloadErrors.size(), 2u);
  const Bytes huge = Entry("BSCK", {0, 1, 0xFF, 0xFF, 0, 0, 1, 1, 0, 5, 0, 6});
  In in(huge);
  EXPECT_EQ(d.ReadTLVAndData(in, nullptr), 0xA012u);
  EXPECT_EQ(d.ReloadErrors.size(), 1u) << "a count beyond the stream stops at its end";
  ReadWhole(d, Entry("BSCK", {0, 7, 0, 0}));
  EXPECT_TRUE(d.ReloadErrors.empty());
  BseckReloadError a = first;
  a.flags = 7;
  a.majorVer = 8;
  EXPECT_TRUE(a == first) << "equality ignores flags and versions";
  a.Error = 0xE002;
  EXPECT_FALSE(a == first);
  a = first;
  a.Type = 0x11;
  EXPECT_FALSE(a == first);
}

TEST(MemoryConfig, GoldenLayoutsOldSizesInMiBStoredInTheCurrentOne) {
  MemoryConfigDescriptor config;
  ReadWhole(config, Golden("mcfg_minor6.bin"));
  const MemoryControllerDescriptor& c = config.memoryControllers.at(0);
  EXPECT_TRUE(c.valid);
  EXPECT_EQ(std::tie(c.ddrCfgWidth, c.ddrSize, c.ddrSpeed, c.ddrDevTech, c.ddrMode, c.ddrDevWidth),
            std::make_tuple(32, 2048, 1600, 4, 1, 16));
  EXPECT_EQ(c.memorySegments.at(1).segmentPhysicalAddressStart, 0x100000000ul);
  EXPECT_EQ(c.memorySegments.at(1).segmentSize, 1024u);
  EXPECT_EQ(config.memoryControllers.at(1).memorySegments.size(), 1u);
  MemoryConfigDescriptor old;
  ReadWhole(old, Golden("mcfg_minor5.bin"));
  const MemoryControllerDescriptor& o = old.memoryControllers.at(0);
  EXPECT_FALSE(o.valid) << "no DDR settings in the old layout";
  Bytes payload(12, 0);
  Append(payload, {0, 2});
  Append(payload, Entry("MCSD", {0, 0, 0, 0, 0x40, 0, 0, 0, 0, 0, 1, 0}, 0, 6));  // 0x10000000 bytes
  Append(payload, Entry("MCSD", {0, 0, 0, 0, 0x60, 0, 0, 0, 0, 0, 0, 3}, 0, 6));  // 0x00300000 bytes
  EXPECT_EQ(Stored(o), Entry("MCET", payload, 0, 6));
  config.memoryControllers.resize(257);
  const Bytes many = Stored(config);
  EXPECT_EQ(many.at(12), 1) << "257 controllers: the count is one byte";
  EXPECT_EQ(many.at(13), 0);
}

TEST(MemoryConfig, FailingElementsAndCountsBeyondTheStream) {
  // A failing segment is dropped and earlier ones stay; a failing controller stays.
  Bytes controller = Golden("mcfg_minor6.bin");
  controller = Bytes(controller.begin() + 14, controller.begin() + 14 + 8 + 0x42);
  Bytes payload = {2, 0};
  Append(payload, controller);
  Append(payload, Entry("MCSD", Bytes(12, 0), 0, 6));  // not a controller
  const Bytes bytes = Entry("MCFG", payload, 0, 6);
  In in(bytes);
  MemoryConfigDescriptor config;
  EXPECT_EQ(config.ReadTLVAndData(in, nullptr), 0xA004u);
  EXPECT_EQ(config.memoryControllers.size(), 2u);
  EXPECT_EQ(in.bytesLeft, 0u);
  controller[25] = 3;  // three segments, two present
  In in2(controller);
  MemoryControllerDescriptor c;
  c.memorySegments.resize(4);
  EXPECT_EQ(c.ReadTLVAndData(in2, nullptr), 0xA012u);
  EXPECT_EQ(c.memorySegments.size(), 2u);
  EXPECT_FALSE(c.valid);
  Bytes old = Golden("mcfg_minor5.bin");
  old[0x1E] = old[0x1F] = 0xFF;  // a huge segment count
  In in3(old);
  EXPECT_EQ(config.ReadTLVAndData(in3, nullptr), 0xA012u);
  EXPECT_EQ(config.memoryControllers.at(0).memorySegments.size(), 2u);
}

TEST(FSBLInfo, GoldenRecordDispatchesEveryMember) {
  FSBLInfo info;
  LogCapture capture;
  ReadWhole(info, Golden("fsbl_info.bin"));
  EXPECT_EQ(info.versionEntry.sequenceControl.nvSequence, 7u);
  EXPECT_EQ(std::tie(info.deviceConfig.scbClock, info.deviceConfig.avsEnabled), std::make_tuple(432, 1));
  EXPECT_EQ(info.memConfig.memoryControllers.size(), 2u);
  EXPECT_EQ(info.BseckInfo.ReloadErrors.size(), 3u);
  // Padding is silent; the unknown entry has exactly one message.
  EXPECT_EQ(RecordTexts(capture), Texts{"Unknown entry type 0x58545241 in FSBL info\r\n"});
}

TEST(FSBLInfo, PaddingThatEndsAFileIsSkipped) {
  Bytes nested = Entry("DEVC", {0, 5, 1, 0});
  Append(nested, Skipped("PADD", 4));
  const Bytes bytes = Fsbl(2, nested);
  char path[] = "/tmp/stbplat_fsbl_XXXXXX";
  FILE* file = fdopen(mkstemp(path), "wb");
  fwrite(bytes.data(), 1, bytes.size(), file);
  fclose(file);
  Extruder in(path, true);
  FSBLInfo info;
  EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(info.deviceConfig.scbClock, 5);
  std::remove(path);
}

TEST(FSBLInfo, CountsNestedFailuresAndSkipsTheStreamCannotHold) {
  Bytes devc = Entry("DEVC", {0, 5, 1, 0}, 1);  // major 1: newer than the member accepts
  const struct {
    Bytes bytes;
    unsigned int status;
  } cases[] = {
      {Fsbl(0, devc), 0},  // present but not counted
      {Fsbl(1, devc), 0xA004},
      {Fsbl(1, Entry("MCFG", {})), 0xA004},
      {Fsbl(1, Entry("BSCK", {})), 0xA004},
      {Fsbl(0xFFFFFFFF, Skipped("PADD", 4)), 0xA012},
      {Fsbl(2, Skipped("PADD", 0x7F000000)), 0xA012},
      {Fsbl(2, Skipped("ZZZZ", 0xFFFFFFFF)), 0xA012},
  };
  for (const auto& c : cases) {
    In in(c.bytes);
    FSBLInfo info;
    EXPECT_EQ(info.ReadTLVAndData(in, nullptr), c.status) << &c - cases;
    EXPECT_EQ(info.versionEntry.majorVersion, 1) << &c - cases;
    EXPECT_EQ(info.deviceConfig.scbClock, 0) << &c - cases;
  }
}

TEST(BuildConfig, GoldenRecordSkipsUnknownAndPaddingEntriesSilently) {
  BuildConfig config;
  LogCapture capture;
  ReadWhole(config, Golden("build_config.bin"));
  EXPECT_EQ(Text(config.componentTag, 4), "KRNL");
  EXPECT_EQ(Text(config.componentMajorVer, 2) + Text(config.componentMinorVer, 2), std::string("\0\5\0\21", 4));
  EXPECT_EQ(std::tie(config.componentVerLetter, config.unused1, config.numDescriptors),
            std::make_tuple('c', 0xDEADBEEFu, 4u));
  EXPECT_EQ(config.sequenceControl.sequenceControl.nvSequence, 42u);
  EXPECT_EQ(Text(config.buildEnvironment.text.GetData(), 12), std::string("gcc 12; -O2", 12));
  EXPECT_TRUE(config.buildEnvironment.text.ownsData);
  EXPECT_TRUE(RecordTexts(capture).empty());
}

TEST(BuildConfig, NestedFailuresAndCountsBeyondTheStream) {
  const Bytes golden = Golden("build_config.bin");
  const struct {
    size_t at;
    unsigned char value;
    unsigned int status;
  } cases[] = {{42, 9, 0xA004}, {116, 9, 0xA004}, {28, 0xFF, 0xA012}, {76, 0x7F, 0xA012}};
  for (const auto& c : cases) {
    Bytes bytes = golden;
    bytes[c.at] = c.value;  // a member's major version, the count, an unknown entry's size
    In in(bytes);
    BuildConfig config;
    EXPECT_EQ(config.ReadTLVAndData(in, nullptr), c.status) << c.at;
  }
  const Bytes text = Entry("BCFG", Entry("VERS", {}));
  In in(text);
  EXPECT_EQ(BuildEnvironmentDescriptor().ReadTLVAndData(in, nullptr), 0xA004u) << "the text's own status";
}

TEST(ReadOnlyRecords, StoreIsNotSupportedAndFreshOnesAreEmpty) {
  unsigned char buffer[64];
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(FSBLInfo().Store(&out), 0xA00Au);
  EXPECT_EQ(DeviceConfigDescriptor().Store(&out), 0xA00Au);
  EXPECT_EQ(BuildConfig().Store(&out), 0xA00Au);
  EXPECT_EQ(BuildEnvironmentDescriptor().Store(&out), 0xA00Au);
  EXPECT_EQ(out.pCurrent, buffer);
  const BuildConfig config;
  EXPECT_EQ(config.entryType, 0x424C4443u);
  EXPECT_EQ(std::tie(config.componentVerLetter, config.unused1, config.numDescriptors), std::make_tuple(0, 0u, 0u));
  EXPECT_EQ(Text(config.componentTag, 4), std::string(4, '\0'));
  EXPECT_EQ(BuildEnvironmentDescriptor().flags, 0);
}

}  // namespace
