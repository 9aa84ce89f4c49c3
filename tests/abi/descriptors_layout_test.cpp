#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>

#include "stbplat/bseck_reload.h"
#include "stbplat/build_config.h"
#include "stbplat/data_entry.h"
#include "stbplat/front_panel.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/memory_config.h"
#include "stbplat/system_descriptor.h"
#include "stbplat/version_entry.h"

#pragma GCC diagnostic ignored "-Winvalid-offsetof"

// The table pointer comes first; a derived class's first field goes into the
// base's tail padding (behind entryType, at 20) when its alignment allows.
static_assert(offsetof(SystemDescriptor, flags) == 8, "SystemDescriptor::flags");
static_assert(offsetof(SystemDescriptor, majorVer) == 10, "SystemDescriptor::majorVer");
static_assert(offsetof(SystemDescriptor, minorVer) == 11, "SystemDescriptor::minorVer");
static_assert(offsetof(SystemDescriptor, valid) == 12, "SystemDescriptor::valid");
static_assert(offsetof(SystemDescriptor, entryType) == 16, "SystemDescriptor::entryType");
static_assert(sizeof(SystemDescriptor) == 24, "SystemDescriptor size");

static_assert(offsetof(DataEntry, length) == 0, "DataEntry::length");
static_assert(offsetof(DataEntry, pPayload) == 8, "DataEntry::pPayload");
static_assert(offsetof(DataEntry, ownsData) == 16, "DataEntry::ownsData");
static_assert(offsetof(DataEntry, source) == 24, "DataEntry::source");
static_assert(sizeof(DataEntry) == 32, "DataEntry size");

static_assert(offsetof(SequenceControl, controlledSequenceName) == 0, "SequenceControl::name");
static_assert(offsetof(SequenceControl, otpEpoch) == 20, "SequenceControl::otpEpoch");
static_assert(offsetof(SequenceControl, nvSequence) == 24, "SequenceControl::nvSequence");
static_assert(sizeof(SequenceControl) == 28, "SequenceControl size");
static_assert(sizeof(SequenceControlStorage) == 28, "SequenceControlStorage size");

static_assert(offsetof(SequenceControlDescriptor, sequenceControl) == 20,
              "SequenceControlDescriptor::sequenceControl");
static_assert(sizeof(SequenceControlDescriptor) == 48, "SequenceControlDescriptor size");

static_assert(offsetof(VersionEntry, majorVersion) == 20, "VersionEntry::majorVersion");
static_assert(offsetof(VersionEntry, minorVersion) == 22, "VersionEntry::minorVersion");
static_assert(offsetof(VersionEntry, _temp) == 24, "VersionEntry::_temp");
static_assert(offsetof(VersionEntry, description) == 32, "VersionEntry::description");
static_assert(offsetof(VersionEntry, versionLetter) == 64, "VersionEntry::versionLetter");
static_assert(offsetof(VersionEntry, pad) == 65, "VersionEntry::pad");
static_assert(offsetof(VersionEntry, sequenceControl) == 68, "VersionEntry::sequenceControl");
static_assert(sizeof(VersionEntry) == 96, "VersionEntry size");

static_assert(offsetof(MemoryControllerSegmentDescriptor, segmentPhysicalAddressStart) == 24,
              "MemoryControllerSegmentDescriptor::segmentPhysicalAddressStart");
static_assert(offsetof(MemoryControllerSegmentDescriptor, segmentSize) == 32,
              "MemoryControllerSegmentDescriptor::segmentSize");
static_assert(sizeof(MemoryControllerSegmentDescriptor) == 40,
              "MemoryControllerSegmentDescriptor size");

static_assert(offsetof(MemoryControllerDescriptor, ddrCfgWidth) == 20, "ddrCfgWidth");
static_assert(offsetof(MemoryControllerDescriptor, ddrSize) == 22, "ddrSize");
static_assert(offsetof(MemoryControllerDescriptor, ddrSpeed) == 24, "ddrSpeed");
static_assert(offsetof(MemoryControllerDescriptor, ddrDevTech) == 26, "ddrDevTech");
static_assert(offsetof(MemoryControllerDescriptor, ddrMode) == 28, "ddrMode");
static_assert(offsetof(MemoryControllerDescriptor, ddrDevWidth) == 30, "ddrDevWidth");
static_assert(offsetof(MemoryControllerDescriptor, memorySegments) == 32, "memorySegments");
static_assert(sizeof(MemoryControllerDescriptor) == 56, "MemoryControllerDescriptor size");

static_assert(offsetof(MemoryConfigDescriptor, memoryControllers) == 24, "memoryControllers");
static_assert(sizeof(MemoryConfigDescriptor) == 48, "MemoryConfigDescriptor size");

static_assert(offsetof(BseckReloadError, flags) == 0, "BseckReloadError::flags");
static_assert(offsetof(BseckReloadError, majorVer) == 2, "BseckReloadError::majorVer");
static_assert(offsetof(BseckReloadError, minorVer) == 3, "BseckReloadError::minorVer");
static_assert(offsetof(BseckReloadError, Type) == 4, "BseckReloadError::Type");
static_assert(offsetof(BseckReloadError, Error) == 6, "BseckReloadError::Error");
static_assert(sizeof(BseckReloadError) == 8, "BseckReloadError size");

static_assert(offsetof(BseckReloadDescriptor, ExecutingType) == 20, "ExecutingType");
static_assert(offsetof(BseckReloadDescriptor, ReloadErrors) == 24, "ReloadErrors");
static_assert(sizeof(BseckReloadDescriptor) == 48, "BseckReloadDescriptor size");

static_assert(offsetof(DeviceConfigDescriptor, scbClock) == 20, "scbClock");
static_assert(offsetof(DeviceConfigDescriptor, avsEnabled) == 22, "avsEnabled");
static_assert(offsetof(DeviceConfigDescriptor, reserved) == 23, "DeviceConfig reserved");
static_assert(sizeof(DeviceConfigDescriptor) == 24, "DeviceConfigDescriptor size");

static_assert(offsetof(FSBLInfo, versionEntry) == 24, "FSBLInfo::versionEntry");
static_assert(offsetof(FSBLInfo, memConfig) == 120, "FSBLInfo::memConfig");
static_assert(offsetof(FSBLInfo, deviceConfig) == 168, "FSBLInfo::deviceConfig");
static_assert(offsetof(FSBLInfo, BseckInfo) == 192, "FSBLInfo::BseckInfo");
static_assert(sizeof(FSBLInfo) == 240, "FSBLInfo size");

static_assert(offsetof(BuildEnvironmentDescriptor, text) == 24, "BuildEnvironment text");
static_assert(sizeof(BuildEnvironmentDescriptor) == 56, "BuildEnvironmentDescriptor size");

static_assert(offsetof(BuildConfig, componentTag) == 20, "componentTag");
static_assert(offsetof(BuildConfig, componentMajorVer) == 24, "componentMajorVer");
static_assert(offsetof(BuildConfig, componentMinorVer) == 26, "componentMinorVer");
static_assert(offsetof(BuildConfig, componentVerLetter) == 28, "componentVerLetter");
static_assert(offsetof(BuildConfig, reserved) == 29, "BuildConfig reserved");
static_assert(offsetof(BuildConfig, unused1) == 32, "unused1");
static_assert(offsetof(BuildConfig, numDescriptors) == 36, "numDescriptors");
static_assert(offsetof(BuildConfig, sequenceControl) == 40, "BuildConfig::sequenceControl");
static_assert(offsetof(BuildConfig, buildEnvironment) == 88, "buildEnvironment");
static_assert(sizeof(BuildConfig) == 144, "BuildConfig size");

static_assert(offsetof(AnimatedFrontPanelDisplayEntry, text) == 24, "AFPD text");
static_assert(sizeof(AnimatedFrontPanelDisplayEntry) == 56, "AnimatedFrontPanelDisplayEntry size");

namespace {

// A pointer to a virtual member holds the byte offset of its slot in the
// table (two destructor slots come first): plus 1 on x86-64; as it stands on
// ARM, whose C++ ABI marks a virtual member in the adjustment word instead.
template <typename F>
unsigned long SlotOffset(F member) {
  unsigned long word = 0;
  std::memcpy(&word, &member, sizeof word);
#if defined(__aarch64__) || defined(__arm__)
  return word;
#else
  return word - 1;
#endif
}

TEST(DescriptorsLayout, VirtualSlotOrder) {
  EXPECT_EQ(SlotOffset(&SystemDescriptor::ReadBase), 16u);
  EXPECT_EQ(SlotOffset(&SystemDescriptor::Read), 24u);
  EXPECT_EQ(SlotOffset(&SystemDescriptor::Store), 32u);
  EXPECT_EQ(SlotOffset(&VersionEntry::Read), 24u);
  EXPECT_EQ(SlotOffset(&FSBLInfo::Store), 32u);
  EXPECT_EQ(SlotOffset(&AnimatedFrontPanelDisplayEntry::ReadBase), 16u);
}

}  // namespace
