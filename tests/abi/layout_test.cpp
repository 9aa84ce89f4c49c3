// What programs built against the library rely on (LP64): the sizes of the
// objects they allocate themselves, the offsets of the fields they read and
// the order of the virtual slots they call through.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>

#include "stbplat/stbplat.h"

#pragma GCC diagnostic ignored "-Winvalid-offsetof"

// The record header: the table pointer, then flags, versions, valid and type.
static_assert(offsetof(SystemDescriptor, flags) == 8);
static_assert(offsetof(SystemDescriptor, majorVer) == 10);
static_assert(offsetof(SystemDescriptor, minorVer) == 11);
static_assert(offsetof(SystemDescriptor, valid) == 12);
static_assert(offsetof(SystemDescriptor, entryType) == 16);
static_assert(sizeof(SystemDescriptor) == 24);
// A record's first field goes into the header's tail padding when it fits.
static_assert(offsetof(VersionEntry, majorVersion) == 20);
static_assert(offsetof(VersionEntry, sequenceControl) == 68);
static_assert(sizeof(VersionEntry) == 96);
static_assert(sizeof(SequenceControlDescriptor) == 48);
static_assert(sizeof(DataEntry) == 32);
static_assert(offsetof(MemoryControllerDescriptor, memorySegments) == 32);
static_assert(sizeof(MemoryControllerDescriptor) == 56);
static_assert(sizeof(MemoryControllerSegmentDescriptor) == 40);
static_assert(sizeof(MemoryConfigDescriptor) == 48);
static_assert(sizeof(BseckReloadError) == 8);
static_assert(sizeof(BseckReloadDescriptor) == 48);
static_assert(sizeof(DeviceConfigDescriptor) == 24);
static_assert(sizeof(FSBLInfo) == 240);
static_assert(sizeof(BuildEnvironmentDescriptor) == 56);
static_assert(offsetof(BuildConfig, buildEnvironment) == 88);
static_assert(sizeof(BuildConfig) == 144);
static_assert(sizeof(AnimatedFrontPanelDisplayEntry) == 56);

static_assert(sizeof(LocationStorage) == 24);
static_assert(offsetof(ComponentLocation, slotOffset) == 32);
static_assert(sizeof(ComponentLocationStorage) == 40);
static_assert(sizeof(CodeObjectInfo) == 56 + 16 * 40);

static_assert(offsetof(Extruder, pFile) == 40);
static_assert(offsetof(Extruder, partitionName) == 2096);
static_assert(offsetof(Intruder, growthStep) == 2128);
static_assert(sizeof(Intruder) == 2136);
static_assert(offsetof(FlashInterface, pendingNANDDevice) == 6328);
static_assert(offsetof(INIReader, lineBuffer) == 40);
static_assert(sizeof(INIReader) == 48);
// The temperature probes read the node number at byte 8 of the record.
static_assert(offsetof(HardDriveNodeInfo, deviceNode) == 8);
static_assert(sizeof(HardDriveNodeInfo) == 12);

namespace {

// A pointer to a virtual member holds its slot's byte offset in the table,
// with the low bit set on x86-64 (ARM marks a virtual member elsewhere).
template <typename F>
unsigned long Slot(F member) {
  unsigned long word = 0;
  std::memcpy(&word, &member, sizeof word);
  return word & ~1UL;
}

// Two destructor slots come first.
TEST(Abi, VirtualSlotOrder) {
  EXPECT_EQ(Slot(&SystemDescriptor::ReadBase), 16u);
  EXPECT_EQ(Slot(&SystemDescriptor::Read), 24u);
  EXPECT_EQ(Slot(&SystemDescriptor::Store), 32u);
  EXPECT_EQ(Slot(&Extruder::operator-=), 16u);
  EXPECT_EQ(Slot(&Extruder::operator+=), 24u);
  EXPECT_EQ(Slot(&Extruder::getP), 32u);
  EXPECT_EQ(Slot(&Extruder::setP), 40u);
  EXPECT_EQ(Slot(&Extruder::getP64), 48u);
  EXPECT_EQ(Slot(&Extruder::setP64), 56u);
}

}  // namespace
