// FSBL information and build configuration: dispatch on nested entry types,
// padding and unknown entries, counts the stream cannot hold, and the
// read-only Store.
#include <gtest/gtest.h>

#include <string>

#include "record_test_util.h"
#include "stbplat/build_config.h"
#include "stbplat/fsbl_info.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

Bytes VersOnly() { return Golden("vers_no_tail.bin"); }

Bytes FsblEntry(unsigned int count, const Bytes& nested) {
  Bytes payload = VersOnly();
  PutU32(payload, count);
  Append(payload, nested);
  return Entry("FSBL", payload);
}

Bytes Padd(unsigned int size) {
  Bytes bytes;
  PutType(bytes, "PADD");
  PutU32(bytes, size);
  Append(bytes, Bytes(size, 0xA5));
  return bytes;
}

Bytes Devc(unsigned short clock) {
  Bytes payload;
  PutU16(payload, clock);
  payload.push_back(1);
  payload.push_back(0);
  return Entry("DEVC", payload);
}

TEST(FSBLInfo, ConstructsWithTheChosenTypeAndVersions) {
  EXPECT_EQ(FSBLInfo().majorVer, 0);
  FSBLInfo other(0x41424344, 1, 2, 3);
  EXPECT_EQ(other.entryType, 0x41424344u);
  EXPECT_EQ(other.flags, 1);
  EXPECT_EQ(other.majorVer, 2);
  EXPECT_EQ(other.minorVer, 3);
}

TEST(FSBLInfo, GoldenRecordDispatchesEveryMember) {
  const Bytes golden = Golden("fsbl_info.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  FSBLInfo info;
  LogCapture capture;
  ASSERT_EQ(info.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_TRUE(info.valid);
  EXPECT_EQ(info.versionEntry.majorVersion, 3);
  EXPECT_EQ(info.versionEntry.sequenceControl.nvSequence, 7u);
  EXPECT_EQ(info.deviceConfig.scbClock, 432);
  EXPECT_EQ(info.deviceConfig.avsEnabled, 1);
  EXPECT_TRUE(info.deviceConfig.valid);
  ASSERT_EQ(info.memConfig.memoryControllers.size(), 2u);
  EXPECT_EQ(info.memConfig.memoryControllers[1].ddrSpeed, 1333);
  EXPECT_EQ(info.BseckInfo.ExecutingType, 2);
  ASSERT_EQ(info.BseckInfo.ReloadErrors.size(), 3u);
  // Padding is silent; the unknown entry has exactly one message.
  EXPECT_EQ(RecordTexts(capture),
            std::vector<std::string>{"Unknown entry type 0x58545241 in FSBL info\r\n"});
}

TEST(FSBLInfo, GoldenRecordReadsFromAFileStream) {
  // File positions are offsets carried in the pointer value.
  Extruder in((std::string(STBPLAT_TEST_DATA_DIR) + "/fsbl_info.bin").c_str(), true);
  ASSERT_TRUE(in.isInitedOK);
  FSBLInfo info;
  unsigned int size = 0;
  ASSERT_EQ(info.ReadTLVAndData(in, &size), 0u);
  EXPECT_EQ(size + 8, Golden("fsbl_info.bin").size());
  EXPECT_EQ(info.deviceConfig.scbClock, 432);
  EXPECT_EQ(info.memConfig.memoryControllers.size(), 2u);
  EXPECT_EQ(info.BseckInfo.ReloadErrors.size(), 3u);
  EXPECT_EQ(info.versionEntry.sequenceControl.nvSequence, 7u);
  EXPECT_EQ(in.count(), 0u);
}

TEST(FSBLInfo, ZeroCountReadsTheVersionOnly) {
  Bytes bytes = FsblEntry(0, Devc(5));  // present but not counted
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  FSBLInfo info;
  ASSERT_EQ(info.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(info.versionEntry.majorVersion, 1);
  EXPECT_EQ(info.deviceConfig.scbClock, 0);
  EXPECT_FALSE(info.deviceConfig.valid);
  EXPECT_TRUE(info.memConfig.memoryControllers.empty());
  EXPECT_EQ(in.bytesLeft, 0u);
}

TEST(FSBLInfo, PaddingOfTwelveBetweenKnownEntriesIsSkippedSilently) {
  Bytes nested = Devc(7);
  Append(nested, Padd(12));
  Append(nested, Golden("bseck.bin"));
  Bytes bytes = FsblEntry(3, nested);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  FSBLInfo info;
  LogCapture capture;
  ASSERT_EQ(info.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(info.deviceConfig.scbClock, 7);
  EXPECT_EQ(info.BseckInfo.ReloadErrors.size(), 3u);
  EXPECT_TRUE(RecordTexts(capture).empty());
}

TEST(FSBLInfo, EachFailingMemberIsANestedFailureWithItsMessage) {
  Bytes devc = Devc(7);
  devc[10] = 1;  // major version 1: newer than the member accepts
  const struct {
    Bytes nested;
    const char* message;
  } cases[] = {{devc, "Error reading deviceConfig\r\n"},
               {Entry("MCFG", {}), "Error reading memConfig\r\n"},  // payload missing
               {Entry("BSCK", {}), "Error reading BseckInfo\r\n"}};
  for (const auto& c : cases) {
    Bytes bytes = FsblEntry(1, c.nested);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    FSBLInfo info;
    LogCapture capture;
    EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0xA004u);
    EXPECT_FALSE(info.valid);
    EXPECT_EQ(RecordTexts(capture).back(), c.message);
    EXPECT_EQ(in.bytesLeft, 0u);
  }
}

TEST(FSBLInfo, BrokenVersionOrCountFails) {
  Bytes noVers = Entry("FSBL", Devc(1));
  Extruder in(noVers.data(), static_cast<unsigned int>(noVers.size()));
  FSBLInfo info;
  LogCapture capture;
  EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0xA004u);
  EXPECT_EQ(RecordTexts(capture).back(), "Error reading versionEntry\r\n");

  Bytes noCount = Entry("FSBL", VersOnly());
  Extruder in2(noCount.data(), static_cast<unsigned int>(noCount.size()));
  capture.Clear();
  EXPECT_EQ(info.ReadTLVAndData(in2, nullptr), 0xA012u);
  EXPECT_EQ(RecordTexts(capture).back(), "Error reading numDescriptors\r\n");
}

TEST(FSBLInfo, HugeCountStopsAtTheStreamEnd) {
  Bytes bytes = FsblEntry(0xFFFFFFFF, Padd(4));
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  FSBLInfo info;
  EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0xA012u);
  EXPECT_EQ(info.versionEntry.majorVersion, 1);
  EXPECT_EQ(in.bytesLeft, 0u);
}

TEST(FSBLInfo, SkipsPastTheStreamAreRefused) {
  Bytes unknown;
  PutType(unknown, "ZZZZ");
  PutU32(unknown, 0xFFFFFFFF);
  for (const Bytes& nested : {Padd(0), unknown}) {
    Bytes entry = nested;
    if (entry[0] == 'P') entry[4] = 0x7F;  // padding of ~2 GiB
    Bytes bytes = FsblEntry(2, entry);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    FSBLInfo info;
    EXPECT_EQ(info.ReadTLVAndData(in, nullptr), 0xA012u);
  }
}

TEST(FSBLInfo, StoreIsNotSupported) {
  unsigned char buffer[64];
  Intruder out(buffer, sizeof buffer);
  FSBLInfo info;
  DeviceConfigDescriptor devc;
  BuildConfig build;
  BuildEnvironmentDescriptor env;
  EXPECT_EQ(info.Store(&out), 0xA00Au);
  EXPECT_EQ(devc.Store(&out), 0xA00Au);
  EXPECT_EQ(build.Store(&out), 0xA00Au);
  EXPECT_EQ(env.Store(&out), 0xA00Au);
  EXPECT_EQ(out.pCurrent, out.pStart);
}

TEST(DeviceConfig, FieldMessages) {
  const char* const messages[] = {"Error reading scbClock\r\n", nullptr,
                                  "Error reading avsEnabled\r\n", "Error reading reserved\r\n"};
  for (unsigned int keep : {0u, 2u, 3u}) {
    Bytes bytes = Entry("DEVC", Bytes(keep, 0));
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    DeviceConfigDescriptor d;
    LogCapture capture;
    EXPECT_EQ(d.ReadTLVAndData(in, nullptr), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{messages[keep]});
  }
}

TEST(BuildConfig, GoldenRecordReadsFieldByField) {
  const Bytes golden = Golden("build_config.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  BuildConfig config;
  EXPECT_EQ(config.entryType, 0x424C4443u);
  LogCapture capture;
  ASSERT_EQ(config.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_EQ(std::string(config.componentTag, config.componentTag + 4), "KRNL");
  EXPECT_EQ(config.componentMajorVer[0], 0x00);
  EXPECT_EQ(config.componentMajorVer[1], 0x05);
  EXPECT_EQ(config.componentMinorVer[1], 0x11);
  EXPECT_EQ(config.componentVerLetter, 'c');
  EXPECT_EQ(config.unused1, 0xDEADBEEFu);
  EXPECT_EQ(config.numDescriptors, 4u);
  EXPECT_EQ(config.sequenceControl.sequenceControl.nvSequence, 42u);
  EXPECT_EQ(config.sequenceControl.sequenceControl.otpEpoch, 0x40000001u);
  EXPECT_EQ(std::string(reinterpret_cast<const char*>(
                config.sequenceControl.sequenceControl.controlledSequenceName)),
            "BUILDSEQ");
  ASSERT_EQ(config.buildEnvironment.text.length, 12u);
  EXPECT_STREQ(reinterpret_cast<const char*>(config.buildEnvironment.text.GetData()),
               "gcc 12; -O2");
  // Unknown and padding entries are skipped without a word.
  EXPECT_TRUE(RecordTexts(capture).empty());
}

TEST(BuildConfig, FailingMembersAreNestedFailures) {
  const Bytes golden = Golden("build_config.bin");
  const struct {
    size_t at;
    const char* message;
  } cases[] = {{42, "Error reading sequenceControl\r\n"}, {116, "Error reading buildEnvironment\r\n"}};
  for (const auto& c : cases) {
    Bytes bytes = golden;
    bytes[c.at] = 9;  // the member's major version
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    BuildConfig config;
    LogCapture capture;
    EXPECT_EQ(config.ReadTLVAndData(in, nullptr), 0xA004u) << c.at;
    EXPECT_EQ(RecordTexts(capture).back(), c.message);
  }
}

TEST(BuildConfig, FieldMessages) {
  const struct {
    unsigned int keep;
    const char* message;
  } cases[] = {{3, "Error reading componentTag\r\n"},
               {5, "Error reading (uint8_t *)componentMajorVer\r\n"},
               {7, "Error reading (uint8_t *)componentMinorVer\r\n"},
               {8, "Error reading componentVerLetter\r\n"},
               {10, "Error reading reserved\r\n"},
               {14, "Error reading unused1\r\n"},
               {18, "Error reading numDescriptors\r\n"}};
  for (const auto& c : cases) {
    Bytes bytes = Entry("BLDC", Bytes(c.keep, 0));
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    BuildConfig config;
    LogCapture capture;
    EXPECT_EQ(config.ReadTLVAndData(in, nullptr), 0xA012u) << c.keep;
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{c.message}) << c.keep;
  }
}

TEST(BuildConfig, HugeCountAndOversizedSkipsStop) {
  const Bytes golden = Golden("build_config.bin");
  Bytes bytes = golden;
  bytes[28] = bytes[29] = bytes[30] = bytes[31] = 0xFF;  // count
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  BuildConfig config;
  EXPECT_EQ(config.ReadTLVAndData(in, nullptr), 0xA012u);
  EXPECT_EQ(config.buildEnvironment.text.length, 12u);  // read before the end

  Bytes unknown;
  PutType(unknown, "ZZZZ");
  PutU32(unknown, 0x7FFFFFFF);
  Bytes payload(golden.begin() + 12, golden.begin() + 28);
  PutU32(payload, 1);
  Append(payload, unknown);
  Bytes skip = Entry("BLDC", payload);
  Extruder in2(skip.data(), static_cast<unsigned int>(skip.size()));
  BuildConfig other;
  EXPECT_EQ(other.ReadTLVAndData(in2, nullptr), 0xA012u);
}

TEST(BuildEnvironment, StatusOfTheTextReadIsReturnedAsItStands) {
  Bytes bytes = Entry("BCFG", Entry("VERS", {}));
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  BuildEnvironmentDescriptor env;
  EXPECT_EQ(env.ReadTLVAndData(in, nullptr), 0xA004u);
  Bytes ok = Entry("BCFG", Data("env"));
  Extruder in2(ok.data(), static_cast<unsigned int>(ok.size()));
  EXPECT_EQ(env.ReadTLVAndData(in2, nullptr), 0u);
  EXPECT_EQ(env.text.length, 3u);
}

}  // namespace
