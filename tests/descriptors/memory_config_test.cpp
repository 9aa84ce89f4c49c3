// Memory configuration: both controller and segment layouts, nested lists,
// partial lists after a failing element, and counts the stream cannot hold.
#include <gtest/gtest.h>

#include <algorithm>

#include "record_test_util.h"
#include "stbplat/memory_config.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

Bytes Segment(unsigned long address, unsigned int size, unsigned char minor) {
  Bytes payload;
  PutU32(payload, static_cast<unsigned int>(address >> 32));
  PutU32(payload, static_cast<unsigned int>(address));
  PutU32(payload, size);
  return Entry("MCSD", payload, 0, minor);
}

TEST(MemoryConfig, GoldenMinorSixReadsFieldByField) {
  const Bytes golden = Golden("mcfg_minor6.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  MemoryConfigDescriptor config;
  ASSERT_EQ(config.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(in.bytesLeft, 0u);
  ASSERT_EQ(config.memoryControllers.size(), 2u);
  const MemoryControllerDescriptor& c0 = config.memoryControllers[0];
  EXPECT_TRUE(c0.valid);
  EXPECT_EQ(c0.minorVer, 6);
  EXPECT_EQ(c0.ddrCfgWidth, 32);
  EXPECT_EQ(c0.ddrSize, 2048);
  EXPECT_EQ(c0.ddrSpeed, 1600);
  EXPECT_EQ(c0.ddrDevTech, 4);
  EXPECT_EQ(c0.ddrMode, 1);
  EXPECT_EQ(c0.ddrDevWidth, 16);
  ASSERT_EQ(c0.memorySegments.size(), 2u);
  EXPECT_EQ(c0.memorySegments[0].segmentPhysicalAddressStart, 0x40000000ul);
  EXPECT_EQ(c0.memorySegments[0].segmentSize, 1024u);
  EXPECT_EQ(c0.memorySegments[1].segmentPhysicalAddressStart, 0x100000000ul);
  const MemoryControllerDescriptor& c1 = config.memoryControllers[1];
  EXPECT_EQ(c1.ddrSpeed, 1333);
  ASSERT_EQ(c1.memorySegments.size(), 1u);
  EXPECT_EQ(c1.memorySegments[0].segmentPhysicalAddressStart, 0xC0000000ul);
  EXPECT_EQ(c1.memorySegments[0].segmentSize, 512u);
  EXPECT_EQ(Stored(config, golden.size()), golden);
}

TEST(MemoryConfig, MinorFiveLayoutReadsInMiBAndMarksControllersInvalid) {
  const Bytes golden = Golden("mcfg_minor5.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  MemoryConfigDescriptor config;
  ASSERT_EQ(config.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_TRUE(config.valid);
  ASSERT_EQ(config.memoryControllers.size(), 1u);
  const MemoryControllerDescriptor& c = config.memoryControllers[0];
  EXPECT_FALSE(c.valid);
  EXPECT_EQ(c.minorVer, 6);  // converted as read
  EXPECT_EQ(c.memorySegments[0].minorVer, 6);
  EXPECT_EQ(c.ddrCfgWidth + c.ddrSize + c.ddrSpeed + c.ddrDevTech + c.ddrMode + c.ddrDevWidth, 0);
  ASSERT_EQ(c.memorySegments.size(), 2u);
  EXPECT_EQ(c.memorySegments[0].segmentSize, 256u);  // 0x10000000 bytes
  EXPECT_EQ(c.memorySegments[1].segmentSize, 3u);    // 0x00300000 bytes
  EXPECT_EQ(c.memorySegments[1].segmentPhysicalAddressStart, 0x60000000ul);
  EXPECT_TRUE(c.memorySegments[0].valid);
}

TEST(MemoryConfig, MinorFiveControllerIsStoredInTheNewLayoutAndReadsBackEqual) {
  const Bytes golden = Golden("mcfg_minor5.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  MemoryConfigDescriptor config;
  ASSERT_EQ(config.ReadTLVAndData(in, nullptr), 0u);
  Bytes buffer(256);
  Intruder out(buffer.data(), 256);
  ASSERT_EQ(config.memoryControllers[0].StoreTLVAndData(&out), 0u);
  // The header says the layout written: six zero DDR fields, a 16-bit
  // count, sizes in MiB.
  Bytes payload(12, 0);
  PutU16(payload, 2);
  Append(payload, Segment(0x40000000, 256, 6));
  Append(payload, Segment(0x60000000, 3, 6));
  EXPECT_EQ(Written(out), Entry("MCET", payload, 0, 6));
  Extruder back(buffer.data(), 256);
  MemoryControllerDescriptor again;
  ASSERT_EQ(again.ReadTLVAndData(back, nullptr), 0u);
  ASSERT_EQ(again.memorySegments.size(), 2u);
  EXPECT_EQ(again.memorySegments[1].segmentSize, 3u);
  EXPECT_EQ(again.memorySegments[1].segmentPhysicalAddressStart, 0x60000000ul);
}

TEST(MemorySegment, SizeShiftDependsOnTheMinorVersion) {
  for (unsigned char minor : {4, 5, 6, 7}) {
    Bytes bytes = Segment(0x1234, 0x10000000, minor);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    MemoryControllerSegmentDescriptor s;
    ASSERT_EQ(s.ReadTLVAndData(in, nullptr), 0u);
    EXPECT_EQ(s.segmentSize, minor <= 5 ? 256u : 0x10000000u) << int(minor);
  }
  // New records are written in the current layout.
  EXPECT_EQ(MemoryControllerSegmentDescriptor().minorVer, 6);
  EXPECT_EQ(MemoryControllerDescriptor().minorVer, 6);
}

TEST(MemoryController, FailingSegmentLeavesTheEarlierOnes) {
  Bytes payload = {0, 1, 0, 2, 0, 3, 0, 4, 0, 5, 0, 6};
  PutU16(payload, 3);
  Append(payload, Segment(0x1000, 1, 6));
  Append(payload, Segment(0x2000, 2, 6));
  Bytes bytes = Entry("MCET", payload, 0, 6);
  bytes.resize(bytes.size() - 2);  // the second segment's size is cut short
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  MemoryControllerDescriptor c;
  c.memorySegments.resize(4);  // emptied by the read
  LogCapture capture;
  EXPECT_EQ(c.ReadTLVAndData(in, nullptr), 0xA012u);
  ASSERT_EQ(c.memorySegments.size(), 1u);
  EXPECT_EQ(c.memorySegments[0].segmentPhysicalAddressStart, 0x1000ul);
  const auto texts = RecordTexts(capture);
  EXPECT_EQ(texts.at(0), "Error reading segmentSize\r\n");
  EXPECT_EQ(texts.at(1), "Error reading memorySegments\r\n");
  EXPECT_FALSE(c.valid);
}

TEST(MemoryController, FieldMessagesOfBothLayouts) {
  const char* const messages[] = {"Error reading ddrCfgWidth\r\n", "Error reading ddrSize\r\n",
                                  "Error reading ddrSpeed\r\n",    "Error reading ddrDevTech\r\n",
                                  "Error reading ddrMode\r\n",     "Error reading ddrDevWidth\r\n",
                                  "Error reading numSegments\r\n"};
  for (unsigned int field = 0; field < 7; ++field) {
    Bytes bytes = Entry("MCET", Bytes(2 * field + 1, 0), 0, 6);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    MemoryControllerDescriptor c;
    LogCapture capture;
    EXPECT_EQ(c.ReadTLVAndData(in, nullptr), 0xA012u);
    EXPECT_EQ(RecordTexts(capture).at(0), messages[field]);
  }
  for (unsigned int keep : {2u, 6u}) {
    Bytes bytes = Entry("MCET", Bytes(keep, 0), 0, 5);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    MemoryControllerDescriptor c;
    LogCapture capture;
    EXPECT_EQ(c.ReadTLVAndData(in, nullptr), 0xA012u);
    EXPECT_EQ(RecordTexts(capture).at(0), keep == 2 ? "Error reading memoryControllerNumber\r\n"
                                                    : "Error reading numSegments\r\n");
  }
}

TEST(MemoryController, HugeOldCountStopsAtTheStreamEnd) {
  Bytes payload;
  PutU32(payload, 0);
  PutU32(payload, 0xFFFFFFFF);
  Append(payload, Segment(0x1000, 0x100000, 5));
  Bytes bytes = Entry("MCET", payload, 0, 5);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  MemoryControllerDescriptor c;
  EXPECT_EQ(c.ReadTLVAndData(in, nullptr), 0xA012u);
  EXPECT_EQ(c.memorySegments.size(), 1u);
  EXPECT_EQ(in.bytesLeft, 0u);
}

TEST(MemoryConfig, FailingControllerAndFieldMessages) {
  Bytes payload = {2, 0};
  Append(payload, Entry("MCET", Bytes(14, 0), 0, 6));
  Append(payload, Entry("MCSD", Bytes(12, 0), 0, 6));  // not a controller
  Bytes bytes = Entry("MCFG", payload, 0, 6);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  MemoryConfigDescriptor config;
  LogCapture capture;
  EXPECT_EQ(config.ReadTLVAndData(in, nullptr), 0xA004u);
  EXPECT_EQ(config.memoryControllers.size(), 2u);  // the failing controller stays
  EXPECT_EQ(RecordTexts(capture).back(), "Error reading memoryControllers\r\n");
  EXPECT_EQ(in.bytesLeft, 0u);

  for (unsigned int keep : {0u, 1u}) {
    Bytes cut = Entry("MCFG", Bytes(keep, 1), 0, 6);
    Extruder in2(cut.data(), static_cast<unsigned int>(cut.size()));
    MemoryConfigDescriptor c;
    capture.Clear();
    EXPECT_EQ(c.ReadTLVAndData(in2, nullptr), 0xA012u);
    EXPECT_EQ(RecordTexts(capture).at(0),
              keep == 0 ? "Error reading numControllers\r\n" : "Error reading reserved\r\n");
  }
}

TEST(MemoryConfig, ReservedByteIsWrittenAsZeroAndCountIsOneByte) {
  MemoryConfigDescriptor config;
  config.memoryControllers.resize(257);
  Bytes buffer(8192);
  Intruder out(buffer.data(), static_cast<unsigned int>(buffer.size()));
  ASSERT_EQ(config.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(buffer[12], 1);  // 257 truncated to one byte
  EXPECT_EQ(buffer[13], 0);
}

TEST(MemoryConfig, NestedStoreFailureIsReported) {
  MemoryConfigDescriptor config;
  config.memoryControllers.resize(1);
  config.memoryControllers[0].memorySegments.resize(1);
  Bytes buffer(40);
  Intruder out(buffer.data(), 40);
  LogCapture capture;
  EXPECT_EQ(config.Store(&out), 0xA004u);
  const auto texts = RecordTexts(capture);
  EXPECT_EQ(texts.back(), "Error writing memoryControllers\r\n");
  EXPECT_NE(std::find(texts.begin(), texts.end(), "Error writing memorySegments\r\n"), texts.end());
}

}  // namespace
