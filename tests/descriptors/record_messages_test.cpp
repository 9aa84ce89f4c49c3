// Every record's failure messages and statuses: streams that end inside each
// field, and buffers too small for each field, nested records included.
#include <gtest/gtest.h>

#include <algorithm>
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

// A package header with two components, all names and offsets zero.
Bytes PackageHeader() {
  Bytes bytes(2 + 36 + 4 + 2 * 36, 0);
  bytes[2 + 36 + 3] = 2;
  return bytes;
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

std::string R(const char* field) { return std::string("Error reading ") + field + "\r\n"; }
std::string W(const char* field) { return std::string("Error writing ") + field + "\r\n"; }

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
  const Bytes pkg = PackageHeader();
  Bytes fsbl = Golden("vers_no_tail.bin");
  PutU32(fsbl, 5);
  Append(fsbl, devc);
  Append(fsbl, {'P', 'A', 'D', 'D', 0, 0, 0, 0, 'Z', 'Z', 'Z', 'Z', 0, 0, 0, 0});
  Append(fsbl, Entry("MCFG", {0, 0}));
  Append(fsbl, Entry("BSCK", {0, 0, 0, 0}));
  fsbl = Entry("FSBL", fsbl);
  const char* const seq = "(uint8_t *)controlledSequenceName";
  const std::string mcet = "Insufficient memory to add entry of type MCET\r\n";
  const std::string pkgHeader = "packageHeaderLocation";
  const struct {
    unsigned int (*cut)(const Bytes&, size_t);
    const Bytes& bytes;
    size_t from, to;  // 0: the record's length
    std::vector<unsigned int> statuses;
    Texts messages;
  } cases[] = {
      {ReadCut<VersionEntry>, vers, 0, 0, {0xA012, 0},
       {R("storedEntryType"), R("entrySize"), R("localFlags"), R("localMajorVer"), R("minorVer"),
        R("majorVersion"), R("minorVersion"), R("_temp"), R("entryType"), R("description"),
        R("versionLetter"), R("pad"), R(seq), R("sequenceControl"), R("otpEpoch"), R("nvSequence")}},
      {ReadCut<BseckReloadDescriptor>, bsck, 12, 0, {0xA012, 0},
       {R("ExecutingType"), R("numReloadError"), R("flags"), R("ReloadErrors"), R("majorVer"), R("minorVer"),
        R("Type"), R("Error")}},
      {ReadCut<DeviceConfigDescriptor>, devc, 12, 0, {0xA012, 0},
       {R("scbClock"), R("avsEnabled"), R("reserved")}},
      {ReadCut<MemoryConfigDescriptor>, mcfg, 12, 64, {0xA012},
       {R("numControllers"), R("reserved"), R("storedEntryType"), R("memoryControllers"), R("entrySize"),
        R("localFlags"), R("localMajorVer"), R("minorVer"), R("ddrCfgWidth"), R("ddrSize"), R("ddrSpeed"),
        R("ddrDevTech"), R("ddrMode"), R("ddrDevWidth"), R("numSegments"), R("memorySegments"),
        R("segmentPhysicalAddressStart"), R("segmentSize")}},
      {ReadCut<MemoryConfigDescriptor>, old, 26, 33, {0xA012},
       {R("memoryControllerNumber"), R("memoryControllers"), R("numSegments")}},
      {ReadCut<FSBLInfo>, fsbl, 12, 0, {0xA012, 0},
       {R("storedEntryType"), R("versionEntry"), R("entrySize"), R("localFlags"), R("localMajorVer"),
        R("minorVer"), R("majorVersion"), R("minorVersion"), R("_temp"), R("entryType"), R("description"),
        R("numDescriptors"), R("deviceConfig"), R("scbClock"), R("avsEnabled"), R("reserved"),
        "Unknown entry type 0x5A5A5A5A in FSBL info\r\n", R("memConfig"), R("numControllers"), R("BseckInfo"),
        R("ExecutingType"), R("numReloadError")}},
      {ReadCut<BuildConfig>, bldc, 12, 0, {0xA012, 0},
       {R("componentTag"), R("(uint8_t *)componentMajorVer"), R("(uint8_t *)componentMinorVer"),
        R("componentVerLetter"), R("reserved"), R("unused1"), R("numDescriptors"), R("entrySize"),
        R("sequenceControl"), R("localFlags"), R("localMajorVer"), R("minorVer"), R(seq),
        R("otpEpoch"), R("nvSequence"), R("buildEnvironment"), R("entryType")}},
      {ReadCut<AnimatedFrontPanelDisplayEntry>, afpd, 12, 0, {0xA012, 0},
       {R("entryType"), R("text"), R("entrySize")}},
      {ReadCut<CodeObjectInfo>, pkg, 0, 0, {0xA012, 0xA004, 0xA012, 0xA004, 0},
       {R("unused"), R("componentTag"), R(pkgHeader.c_str()), R("deviceName"), R("(*pLocationStorage)"),
        R("partitionName"), R("slotName"), R("slotOffset"), R("numComponents"), R("componentLocations[i]")}},
      {StoreCut<VersionEntry, true>, vers, 0, 11, {0xA012},
       {W("entryType"), "Insufficient memory to add entry of type VERS\r\n", W("flags"), W("majorVer"),
        W("minorVer")}},
      // The sequence-control block's failure is not looked at.
      {StoreCut<VersionEntry>, vers, 0, 57, {0xA012, 0xA004, 0xA012, 0},
       {W("majorVersion"), W("minorVersion"), W("_temp"), W("DATA_ENTRY_TYPE"), W("description"), W("length"),
        W("pPayload"), W("versionLetter"), W("pad"), W(seq), W("otpEpoch"), W("nvSequence")}},
      {StoreCut<BseckReloadDescriptor>, bsck, 0, 28, {0xA012, 0xA004, 0},
       {W("ExecutingType"), W("numReloadError"), W("flags"), W("ReloadErrors"), W("majorVer"), W("minorVer"),
        W("Type"), W("Error")}},
      {StoreCut<MemoryConfigDescriptor>, mcfg, 0, 52, {0xA012, 0xA004},
       {W("numControllers"), W("reserved"), W("entryType"), W("memoryControllers"), mcet, W("flags"),
        W("majorVer"), W("minorVer"), W("ddrCfgWidth"), W("ddrSize"), W("ddrSpeed"), W("ddrDevTech"),
        W("ddrMode"), W("ddrDevWidth"), W("numSegments"), W("memorySegments"),
        "Insufficient memory to add entry of type MCSD\r\n", W("segmentPhysicalAddressStart"),
        W("segmentSize")}},
      {StoreCut<AnimatedFrontPanelDisplayEntry>, afpd, 0, 14, {0xA004, 0},
       {W("DATA_ENTRY_TYPE"), W("text"), W("length"), W("pPayload")}},
      {StoreCut<CodeObjectInfo>, pkg, 0, 114, {0xA012, 0xA004, 0xA012, 0xA004, 0},
       {W("unused"), W("componentTag"), W(pkgHeader.c_str()), W("deviceName"), W("partitionName"),
        W("slotName"), W("slotOffset"), W("numComponents"), W("componentLocations[i]")}},
  };
  for (const auto& c : cases) {
    const Sweep sweep = CutEverywhere(c.cut, c.bytes, c.from, c.to != 0 ? c.to : c.bytes.size());
    EXPECT_EQ(sweep.statuses, c.statuses) << c.messages.at(0);
    EXPECT_EQ(sweep.messages, c.messages) << c.messages.at(0);
  }
}

}  // namespace
