// Component locations and package headers on the wire: what Store writes for
// names that are not in standard form, where a failed read or write leaves the
// record and the stream, and which messages say so.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "stbplat/code_object_info.h"
#include "stbplat/intruder.h"
#include "support/log_capture.h"

using stbplat::test::LogCapture;

namespace {

std::string Bytes(const unsigned char* p, size_t n) { return std::string(reinterpret_cast<const char*>(p), n); }

void ExpectRecordError(const stbplat::test::LogMessage& m, const char* function, const std::string& text) {
  EXPECT_EQ(m.module, eLogModuleRecords);
  EXPECT_EQ(m.level, 2u);
  EXPECT_EQ(m.sourceFile, "SystemDescriptor");
  EXPECT_EQ(m.function, function);
  EXPECT_EQ(m.text, text);
}

TEST(PackageHeaderWire, EmptyHeaderIsFortyTwoBytesWithTheLocationInStandardForm) {
  CodeObjectInfo info;
  unsigned char stored[42];
  std::memset(stored, 0xEE, sizeof stored);
  Intruder out(stored, sizeof stored);
  ASSERT_EQ(info.Store(&out), 0u);
  EXPECT_EQ(out.pCurrent - out.pStart, 42);
  // unused, then the tag, the 24 name bytes and the offset of the header
  // location, then the count. The empty location goes out as '.' because
  // storing passes it through the standard form.
  std::string expected = std::string(2, '\0') + std::string(4, '\0') + std::string(24, '.') +
                         std::string(8, '\0') + std::string(4, '\0');
  EXPECT_EQ(Bytes(stored, sizeof stored), expected);
}

TEST(PackageHeaderWire, ComponentIsThirtySixBytesWithABigEndianOffset) {
  ComponentLocationStorage c;
  std::memcpy(c.componentTag, "KRNL", 4);
  std::memcpy(c.location.deviceName, "nand0\0xy", 8);  // not in standard form
  std::memcpy(c.location.partitionName, "KERNEL..", 8);
  std::memcpy(c.location.slotName, "A.......", 8);
  c.slotOffset = 0x0102030405060708ul;
  unsigned char stored[36];
  Intruder out(stored, sizeof stored);
  ASSERT_EQ(c.Store(&out), 0u);
  EXPECT_EQ(Bytes(stored, 28), "KRNLNAND0...KERNEL..A.......");
  const unsigned char offset[8] = {1, 2, 3, 4, 5, 6, 7, 8};
  EXPECT_EQ(Bytes(stored + 28, 8), Bytes(offset, 8));
  EXPECT_EQ(Bytes(c.location.deviceName, 8), Bytes(reinterpret_cast<const unsigned char*>("nand0\0xy"), 8))
      << "storing leaves the record itself as it was";
}

TEST(PackageHeaderWire, ComponentStoreNamesTheFieldThatDidNotFit) {
  ComponentLocationStorage c;
  std::memcpy(c.componentTag, "BOOT", 4);
  struct Case {
    unsigned int room;
    std::vector<std::string> texts;
  } cases[] = {
      {3, {"Error writing componentTag\r\n"}},
      {4 + 20, {"Error writing slotName\r\n"}},  // no message of its own
      {4 + 24 + 7, {"Error writing slotOffset\r\n"}},
  };
  for (const Case& k : cases) {
    std::vector<unsigned char> buffer(k.room);
    Intruder out(buffer.data(), k.room);
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(c.Store(&out), 0xA012u) << k.room;
    EXPECT_EQ(log.texts(), k.texts) << k.room;
    ASSERT_FALSE(log.messages().empty());
    ExpectRecordError(log.messages().back(), "Store", k.texts.back());
  }
}

TEST(PackageHeaderWire, FailedReadsLeaveUnreachedNamesAndTheStreamWhereTheyStopped) {
  const std::string wire = "TAG1nand0...kerne";
  {
    Extruder in(reinterpret_cast<const unsigned char*>(wire.data()), static_cast<unsigned int>(wire.size()));
    ComponentLocationStorage c;
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(c.Read(in), 0xA004u);
    EXPECT_EQ(in.bytesLeft, 5u) << "the tag and the device name were consumed";
    EXPECT_EQ(Bytes(c.location.deviceName, 8), "nand0...") << "read raw";
    EXPECT_EQ(Bytes(c.location.slotName, 8), std::string(8, '\0')) << "not reached: still empty";
    ASSERT_EQ(log.messages().size(), 2u);
    ExpectRecordError(log.messages()[0], "Read", "Error reading partitionName\r\n");
    ExpectRecordError(log.messages()[1], "Read", "Error reading (*pLocationStorage)\r\n");
  }
  {
    Extruder in(reinterpret_cast<const unsigned char*>(wire.data()), 3);
    ComponentLocationStorage c;
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(c.Read(in), 0xA012u);
    EXPECT_EQ(in.bytesLeft, 3u);
    ASSERT_EQ(log.messages().size(), 1u);
    ExpectRecordError(log.messages()[0], "Read", "Error reading componentTag\r\n");
  }
}

TEST(PackageHeaderWire, HeaderStoreFailuresKeepTheirStatuses) {
  CodeObjectInfo info;
  info.numComponents = 2;
  struct Case {
    unsigned int room;
    unsigned int status;
    std::vector<std::string> texts;
  } cases[] = {
      {1, 0xA012, {"Error writing unused\r\n"}},
      {2 + 30, 0xA004, {"Error writing slotOffset\r\n", "Error writing packageHeaderLocation\r\n"}},
      {2 + 36 + 3, 0xA012, {"Error writing numComponents\r\n"}},
      {42 + 36 + 2, 0xA004, {"Error writing componentTag\r\n", "Error writing componentLocations[i]\r\n"}},
  };
  for (const Case& k : cases) {
    std::vector<unsigned char> buffer(k.room);
    Intruder out(buffer.data(), k.room);
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(info.Store(&out), k.status) << k.room;
    EXPECT_EQ(log.texts(), k.texts) << k.room;
    ASSERT_FALSE(log.messages().empty());
    ExpectRecordError(log.messages().back(), "Store", k.texts.back());
  }
}

TEST(PackageHeaderWire, HeaderReadFailuresBeforeTheComponents) {
  std::vector<unsigned char> wire(42, 0);
  struct Case {
    unsigned int length;
    unsigned int status;
    std::string last;
  } cases[] = {
      {1, 0xA012, "Error reading unused\r\n"},
      {2 + 10, 0xA004, "Error reading packageHeaderLocation\r\n"},
      {2 + 36 + 2, 0xA012, "Error reading numComponents\r\n"},
  };
  for (const Case& k : cases) {
    Extruder in(wire.data(), k.length);
    CodeObjectInfo info;
    LogCapture log;
    log.SetLevel(eLogModuleByteStreams, 0);
    EXPECT_EQ(info.Read(in), k.status) << k.length;
    ASSERT_FALSE(log.messages().empty());
    ExpectRecordError(log.messages().back(), "Read", k.last);
  }
}

}  // namespace
