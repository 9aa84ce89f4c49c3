// The records against hand-made golden bytes, stored back byte for byte;
// optional trailing fields, old layouts, partial lists, the containers'
// dispatch on nested entry types; and every record cut short at each byte, its
// statuses and messages.
#include <gtest/gtest.h>

#include <tuple>
#include <type_traits>

#include "record_test_util.h"
#include "stbplat/bseck_reload.h"
#include "stbplat/build_config.h"
#include "stbplat/code_object_info.h"
#include "stbplat/front_panel.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/memory_config.h"
#include "stbplat/version_entry.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

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

template <class R>
unsigned int ReadRecord(R& record, Extruder& in) {
  if constexpr (std::is_base_of_v<SystemDescriptor, R>)
    return record.ReadTLVAndData(in, nullptr);
  else
    return record.Read(in);
}

// The status of reading a record of class R from the first `cut` bytes.
template <class R>
unsigned int ReadCut(const Bytes& bytes, size_t cut) {
  In in(bytes, cut);
  R record;
  return ReadRecord(record, in);
}

// The status of storing the record read from `bytes` (its payload, or the
// whole entry when framed) into a buffer of `cut` bytes.
template <class R, bool framed = false>
unsigned int StoreCut(const Bytes& bytes, size_t cut) {
  In in(bytes);
  R record;
  EXPECT_EQ(ReadRecord(record, in), 0u);
  Bytes buffer(cut + 1);
  Intruder out(buffer.data(), static_cast<unsigned int>(cut));
  if constexpr (framed) return record.StoreTLVAndData(&out);
  return record.Store(&out);
}

Bytes Patched(Bytes bytes, size_t at, unsigned char value) {
  bytes[at] = value;
  return bytes;
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

TEST(Records, GoldenRecordsStoreBackByteForByteAndFreshOnesTheirDefaults) {
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
  BseckReloadDescriptor oneError;
  oneError.ReloadErrors.resize(1);
  EXPECT_EQ(Stored(oneError), Entry("BSCK", {0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 0}));
  EXPECT_EQ(Stored(AnimatedFrontPanelDisplayEntry()), Entry("AFPD", Data("")));
  EXPECT_EQ(Stored(MemoryConfigDescriptor()), Entry("MCFG", {0, 0}, 0, 6));
  EXPECT_EQ(Stored(MemoryControllerDescriptor()), Entry("MCET", Bytes(14, 0), 0, 6));
  EXPECT_EQ(Stored(MemoryControllerSegmentDescriptor()), Entry("MCSD", Bytes(12, 0), 0, 6));
  const BuildConfig config;
  EXPECT_EQ(std::tie(config.componentVerLetter, config.unused1, config.numDescriptors),
            std::make_tuple(0, 0u, 0u));
  EXPECT_EQ(Text(config.componentTag, 4) + Text(config.componentMajorVer, 2) + Text(config.componentMinorVer, 2),
            std::string(8, '\0'));
  EXPECT_EQ(BuildEnvironmentDescriptor().flags, 0);
  // The read-only records store nothing.
  Intruder out(64u, 0u);
  EXPECT_EQ(FSBLInfo().Store(&out), 0xA00Au);
  EXPECT_EQ(DeviceConfigDescriptor().Store(&out), 0xA00Au);
  EXPECT_EQ(config.Store(&out), 0xA00Au);
  EXPECT_EQ(BuildEnvironmentDescriptor().Store(&out), 0xA00Au);
  EXPECT_EQ(out.pCurrent, out.pStart);
}

TEST(BseckReload, GoldenRecordPartialListsAndEquality) {
  const Bytes golden = Golden("bseck.bin");
  BseckReloadDescriptor d;
  ReadWhole(d, golden);
  ASSERT_EQ(d.ReloadErrors.size(), 3u);
  const BseckReloadError first = d.ReloadErrors[0];
  EXPECT_EQ(d.ReloadErrors[2].majorVer, 9) << "elements carry no version check";
  In cut(golden, golden.size() - 5);  // inside the third element
  EXPECT_EQ(d.ReadTLVAndData(cut, nullptr), 0xA012u);
  EXPECT_EQ(d.ReloadErrors.size(), 2u);
  const Bytes huge = Entry("BSCK", {0, 1, 0xFF, 0xFF, 0, 0, 1, 1, 0, 5, 0, 6});
  In in(huge);
  EXPECT_EQ(d.ReadTLVAndData(in, nullptr), 0xA012u);
  EXPECT_EQ(d.ReloadErrors.size(), 1u) << "a count beyond the stream stops at its end";
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
  MemoryConfigDescriptor old;
  ReadWhole(old, Golden("mcfg_minor5.bin"));
  const MemoryControllerDescriptor& o = old.memoryControllers.at(0);
  EXPECT_FALSE(o.valid) << "no DDR settings in the old layout";
  EXPECT_EQ(o.minorVer, 5);  // an old record is still told apart
  EXPECT_EQ(o.memorySegments.at(0).minorVer, 5);
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

// A failing controller stays in its configuration; a failing segment goes.
TEST(MemoryConfig, AFailingControllerStaysAndAFailingSegmentGoes) {
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
  controller[25] = 3;  // three segments, two present
  In in2(controller);
  MemoryControllerDescriptor c;
  c.memorySegments.resize(4);
  EXPECT_EQ(c.ReadTLVAndData(in2, nullptr), 0xA012u);
  EXPECT_EQ(c.memorySegments.size(), 2u);
  EXPECT_FALSE(c.valid);
}

TEST(Containers, DispatchOnNestedTypesAndSkipPaddingAndUnknownEntries) {
  FSBLInfo info;
  BuildConfig config;
  LogCapture capture;
  ReadWhole(info, Golden("fsbl_info.bin"));
  EXPECT_EQ(info.versionEntry.sequenceControl.nvSequence, 7u) << "a nested version entry's optional fields";
  EXPECT_EQ(std::tie(info.deviceConfig.scbClock, info.deviceConfig.avsEnabled), std::make_tuple(432, 1));
  EXPECT_EQ(info.memConfig.memoryControllers.size(), 2u);
  EXPECT_EQ(info.BseckInfo.ReloadErrors.size(), 3u);
  ReadWhole(config, Golden("build_config.bin"));
  EXPECT_EQ(std::tie(config.unused1, config.sequenceControl.sequenceControl.nvSequence),
            std::make_tuple(0xDEADBEEFu, 42u));
  EXPECT_EQ(Text(config.buildEnvironment.text.GetData(), 12), std::string("gcc 12; -O2", 12));
  EXPECT_TRUE(config.buildEnvironment.text.ownsData);
  // Padding is silent; an unknown entry has one message in FSBL information only.
  EXPECT_EQ(RecordTexts(capture), Texts{"Unknown entry type 0x58545241 in FSBL info\r\n"});
  // Padding that ends a file is skipped too.
  Bytes nested = Entry("DEVC", {0, 5, 1, 0});
  Append(nested, Skipped("PADD", 4));
  const stbplat::test::ScratchDir dir;
  Extruder in(dir.Write("fsbl.bin", Fsbl(2, nested)).c_str(), true);
  EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(info.deviceConfig.scbClock, 5);
}

TEST(Containers, StopAtTheFirstFailingOrMissingEntry) {
  const Bytes devc = Entry("DEVC", {0, 5, 1, 0}, 1);  // major 1: newer than the member accepts
  const Bytes build = Golden("build_config.bin");
  const struct {
    unsigned int (*read)(const Bytes&, size_t);
    Bytes bytes;
    unsigned int status;
  } cases[] = {
      {ReadCut<VersionEntry>, Entry("VERS", {0, 1, 0, 2, 0, 3, 'X', 'X', 'X', 'X', 0, 0, 0, 0}), 0xA004},
      {ReadCut<FSBLInfo>, Fsbl(0, devc), 0},  // present but not counted
      {ReadCut<FSBLInfo>, Fsbl(1, devc), 0xA004},
      {ReadCut<FSBLInfo>, Fsbl(1, Entry("MCFG", {})), 0xA004},
      {ReadCut<FSBLInfo>, Fsbl(1, Entry("BSCK", {})), 0xA004},
      {ReadCut<FSBLInfo>, Fsbl(0xFFFFFFFF, Skipped("PADD", 4)), 0xA012},
      {ReadCut<FSBLInfo>, Fsbl(2, Skipped("PADD", 0x7F000000)), 0xA012},
      {ReadCut<FSBLInfo>, Fsbl(2, Skipped("ZZZZ", 0xFFFFFFFF)), 0xA012},
      {ReadCut<BuildConfig>, Patched(build, 42, 9), 0xA004},  // the members' major versions
      {ReadCut<BuildConfig>, Patched(build, 116, 9), 0xA004},
      {ReadCut<BuildConfig>, Patched(build, 28, 0xFF), 0xA012},  // the count
      {ReadCut<BuildConfig>, Patched(build, 76, 0x7F), 0xA012},  // an unknown entry's size
      {ReadCut<BuildEnvironmentDescriptor>, Entry("BCFG", Entry("VERS", {})), 0xA004},  // the text's status
      {ReadCut<MemoryConfigDescriptor>, Patched(Golden("mcfg_minor5.bin"), 0x1E, 0xFF), 0xA012},
  };
  for (const auto& c : cases) EXPECT_EQ(c.read(c.bytes, c.bytes.size()), c.status) << &c - cases;
}

// "Error <verb> <field>\r\n" for each field of a '|'-separated list; a field
// that starts with '!' is a whole message.
Texts Messages(const char* verb, const std::string& fields) {
  Texts texts;
  for (size_t at = 0, end = 0; at < fields.size(); at = end + 1) {
    end = std::min(fields.find('|', at), fields.size());
    const std::string field = fields.substr(at, end - at);
    const std::string text = field[0] == '!' ? field.substr(1) : "Error " + std::string(verb) + " " + field;
    texts.push_back(text + "\r\n");
  }
  return texts;
}

// The record cut short at every byte from `from` to `to` in turn: its
// statuses, each change once, and every message, each text once, in the
// order they first come.
struct Sweep {
  std::vector<unsigned int> statuses;
  Texts messages;
};

Sweep CutEverywhere(unsigned int (*cut)(const Bytes&, size_t), const Bytes& bytes, size_t from, size_t to) {
  Sweep sweep;
  for (size_t n = from; n <= to; ++n) {
    LogCapture capture;
    const unsigned int status = cut(bytes, n);
    if (sweep.statuses.empty() || sweep.statuses.back() != status) sweep.statuses.push_back(status);
    for (const std::string& text : RecordTexts(capture))
      if (std::find(sweep.messages.begin(), sweep.messages.end(), text) == sweep.messages.end())
        sweep.messages.push_back(text);
  }
  return sweep;
}

TEST(RecordMessages, StreamsAndBuffersEndingInsideEachField) {
  const Bytes vers = Golden("vers_minor2.bin");
  const Bytes bsck = Golden("bseck.bin");
  const Bytes mcfg = Golden("mcfg_minor6.bin");
  const Bytes old = Golden("mcfg_minor5.bin");
  const Bytes bldc = Golden("build_config.bin");
  const Bytes afpd = Golden("afpd.bin");
  const Bytes devc = Entry("DEVC", {0, 5, 1, 0});
  const Bytes pkg = PackageHeaderWire(2);
  Bytes fsbl = Golden("vers_no_tail.bin");
  PutU32(fsbl, 5);
  Append(fsbl, devc);
  Append(fsbl, {'P', 'A', 'D', 'D', 0, 0, 0, 0, 'Z', 'Z', 'Z', 'Z', 0, 0, 0, 0});
  Append(fsbl, Entry("MCFG", {0, 0}));
  Append(fsbl, Entry("BSCK", {0, 0, 0, 0}));
  fsbl = Entry("FSBL", fsbl);
  const char* const in = "reading";
  const char* const out = "writing";
  const struct {
    unsigned int (*cut)(const Bytes&, size_t);
    const Bytes& bytes;
    size_t from, to;  // 0: the record's length
    std::vector<unsigned int> statuses;
    const char* verb;
    std::string fields;
  } cases[] = {
      {ReadCut<VersionEntry>, vers, 0, 0, {0xA012, 0}, in,
       "storedEntryType|entrySize|localFlags|localMajorVer|minorVer|majorVersion|minorVersion|_temp|"
       "entryType|description|versionLetter|pad|(uint8_t *)controlledSequenceName|sequenceControl|otpEpoch|"
       "nvSequence"},
      {ReadCut<BseckReloadDescriptor>, bsck, 12, 0, {0xA012, 0}, in,
       "ExecutingType|numReloadError|flags|ReloadErrors|majorVer|minorVer|Type|Error"},
      {ReadCut<MemoryConfigDescriptor>, mcfg, 12, 64, {0xA012}, in,
       "numControllers|reserved|storedEntryType|memoryControllers|entrySize|localFlags|localMajorVer|"
       "minorVer|ddrCfgWidth|ddrSize|ddrSpeed|ddrDevTech|ddrMode|ddrDevWidth|numSegments|memorySegments|"
       "segmentPhysicalAddressStart|segmentSize"},
      {ReadCut<MemoryConfigDescriptor>, old, 26, 33, {0xA012}, in,
       "memoryControllerNumber|memoryControllers|numSegments"},
      {ReadCut<FSBLInfo>, fsbl, 12, 0, {0xA012, 0}, in,
       "storedEntryType|versionEntry|entrySize|localFlags|localMajorVer|minorVer|majorVersion|minorVersion|"
       "_temp|entryType|description|numDescriptors|deviceConfig|scbClock|avsEnabled|reserved|"
       "!Unknown entry type 0x5A5A5A5A in FSBL info|memConfig|numControllers|BseckInfo|ExecutingType|"
       "numReloadError"},
      {ReadCut<BuildConfig>, bldc, 12, 0, {0xA012, 0}, in,
       "componentTag|(uint8_t *)componentMajorVer|(uint8_t *)componentMinorVer|componentVerLetter|reserved|"
       "unused1|numDescriptors|entrySize|sequenceControl|localFlags|localMajorVer|minorVer|"
       "(uint8_t *)controlledSequenceName|otpEpoch|nvSequence|buildEnvironment|entryType"},
      {ReadCut<AnimatedFrontPanelDisplayEntry>, afpd, 12, 0, {0xA012, 0}, in, "entryType|text|entrySize"},
      {ReadCut<CodeObjectInfo>, pkg, 0, 0, {0xA012, 0xA004, 0xA012, 0xA004, 0}, in,
       "unused|componentTag|packageHeaderLocation|deviceName|(*pLocationStorage)|partitionName|slotName|"
       "slotOffset|numComponents|componentLocations[i]"},
      {StoreCut<VersionEntry, true>, vers, 0, 11, {0xA012}, out,
       "entryType|!Insufficient memory to add entry of type VERS|flags|majorVer|minorVer"},
      // The sequence-control block's failure is not looked at.
      {StoreCut<VersionEntry>, vers, 0, 57, {0xA012, 0xA004, 0xA012, 0}, out,
       "majorVersion|minorVersion|_temp|DATA_ENTRY_TYPE|description|length|pPayload|versionLetter|pad|"
       "(uint8_t *)controlledSequenceName|otpEpoch|nvSequence"},
      {StoreCut<BseckReloadDescriptor>, bsck, 0, 28, {0xA012, 0xA004, 0}, out,
       "ExecutingType|numReloadError|flags|ReloadErrors|majorVer|minorVer|Type|Error"},
      {StoreCut<MemoryConfigDescriptor>, mcfg, 0, 52, {0xA012, 0xA004}, out,
       "numControllers|reserved|entryType|memoryControllers|!Insufficient memory to add entry of type MCET|"
       "flags|majorVer|minorVer|ddrCfgWidth|ddrSize|ddrSpeed|ddrDevTech|ddrMode|ddrDevWidth|numSegments|"
       "memorySegments|!Insufficient memory to add entry of type MCSD|segmentPhysicalAddressStart|"
       "segmentSize"},
      {StoreCut<AnimatedFrontPanelDisplayEntry>, afpd, 0, 14, {0xA004, 0}, out,
       "DATA_ENTRY_TYPE|text|length|pPayload"},
      {StoreCut<CodeObjectInfo>, pkg, 0, 114, {0xA012, 0xA004, 0xA012, 0xA004, 0}, out,
       "unused|componentTag|packageHeaderLocation|deviceName|partitionName|slotName|slotOffset|numComponents|"
       "componentLocations[i]"},
  };
  for (const auto& c : cases) {
    const Sweep sweep = CutEverywhere(c.cut, c.bytes, c.from, c.to != 0 ? c.to : c.bytes.size());
    EXPECT_EQ(sweep.statuses, c.statuses) << c.fields;
    EXPECT_EQ(sweep.messages, Messages(c.verb, c.fields)) << c.fields;
  }
}

}  // namespace
