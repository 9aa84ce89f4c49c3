// Records stored through a stream on a flash component read back equal,
// on NOR, on NAND across a bad block, and on eMMC. A package header writes
// its fields in order and goes straight to the device. A framed record
// back-patches its size field, which flash cannot take in place (NAND
// writes whole pages in order; NOR streams do not move their 64-bit
// position), so it is stored into memory first and its bytes are written
// to the device in one piece.
#include <cstring>
#include <string>

#include "flash_fixture.h"
#include "stbplat/code_object_info.h"
#include "stbplat/component_location.h"
#include "stbplat/intruder.h"
#include "stbplat/version_entry.h"

namespace stbplat {
namespace test {
namespace {

struct Place {
  const char* device;
  const char* partition;
  const char* slot;
  unsigned long offset;
};

class StreamRecordTest : public FlashTest, public testing::WithParamInterface<Place> {
 protected:
  ComponentLocation Component() const {
    ComponentLocation component;
    component.location = MakeLocation(GetParam().device, GetParam().partition, GetParam().slot);
    component.slotOffset = GetParam().offset;
    return component;
  }
};

VersionEntry SampleVersion() {
  VersionEntry v;
  v.majorVersion = 7;
  v.minorVersion = 42;
  static const char kText[] = "kernel 7.42 (flash round trip)";
  v.description.CreateData(sizeof kText, reinterpret_cast<const unsigned char*>(kText));
  v.versionLetter = 'c';
  std::memcpy(v.sequenceControl.controlledSequenceName, "stable", 6);
  v.sequenceControl.nvSequence = 9;
  return v;
}

CodeObjectInfo SamplePackage() {
  CodeObjectInfo info;
  info.unused = 0x1234;
  info.packageHeaderLocation.location = MakeLocation("NOR0", "BOOT", "CONFIG");
  info.numComponents = 3;
  for (unsigned int i = 0; i < info.numComponents; ++i) {
    std::memcpy(info.componentLocations[i].componentTag, "CMP0", 4);
    info.componentLocations[i].componentTag[3] = static_cast<unsigned char>('0' + i);
    info.componentLocations[i].location = MakeLocation("NAND0", "SYS", "DATA");
    info.componentLocations[i].slotOffset = 0x1000ul * (i + 1);
  }
  return info;
}

TEST_P(StreamRecordTest, VersionAndPackageHeaderReadBackEqual) {
  sim_.MarkBad(kNandData, 0);  // the NAND slot starts on a bad block
  const ComponentLocation component = Component();
  const VersionEntry version = SampleVersion();
  const CodeObjectInfo package = SamplePackage();
  {
    Intruder framed(256u, 0u);
    ASSERT_EQ(version.StoreTLVAndData(&framed), 0u);
    Intruder out(&component);
    ASSERT_TRUE(out.isInitedOK);
    ASSERT_EQ(out.intrude(framed.pStart, static_cast<unsigned int>(framed.pCurrent - framed.pStart)), 1u);
    ASSERT_EQ(package.Store(&out), 0u);
  }
  FlashInterface::Instance()->NANDFlushWrite();

  Extruder in(&component, false);
  ASSERT_TRUE(in.isInitedOK);
  VersionEntry versionBack;
  ASSERT_EQ(versionBack.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(versionBack.majorVersion, 7);
  EXPECT_EQ(versionBack.minorVersion, 42);
  EXPECT_TRUE(versionBack.description == version.description);
  EXPECT_EQ(versionBack.versionLetter, 'c');
  EXPECT_EQ(std::memcmp(versionBack.sequenceControl.controlledSequenceName, "stable", 6), 0);
  EXPECT_EQ(versionBack.sequenceControl.nvSequence, 9u);

  CodeObjectInfo packageBack;
  ASSERT_EQ(packageBack.Read(in), 0u);
  EXPECT_EQ(packageBack.unused, 0x1234);
  EXPECT_TRUE(packageBack.packageHeaderLocation == package.packageHeaderLocation);
  ASSERT_EQ(packageBack.numComponents, 3u);
  for (unsigned int i = 0; i < 3; ++i)
    EXPECT_TRUE(packageBack.componentLocations[i] == package.componentLocations[i]) << i;
  EXPECT_EQ(sim_.OpenCount(), 1) << "only the reading stream's file is open";
}

INSTANTIATE_TEST_SUITE_P(Media, StreamRecordTest,
                         testing::Values(Place{"NOR0", "BOOT", "CONFIG", 0x20},
                                         Place{"NAND0", "SYS", "DATA", 0},
                                         Place{"EMMC0", "APP", "STORE", 0x800}),
                         [](const testing::TestParamInfo<Place>& param) {
                           return std::string(param.param.device);
                         });

}  // namespace
}  // namespace test
}  // namespace stbplat
