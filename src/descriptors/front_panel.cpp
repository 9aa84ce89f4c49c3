// "AFPD": the front-panel display text.
#include "stbplat/front_panel.h"

#include <algorithm>
#include <cstring>
#include <string>

#include "descriptors/record_io.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kAfpdMajorVersion = 0;
constexpr unsigned char kAfpdMinorVersion = 0;
constexpr unsigned int kPrefixSize = 100;
constexpr unsigned int kPrefixMaxIndent = kPrefixSize - 1;
}  // namespace

AnimatedFrontPanelDisplayEntry::AnimatedFrontPanelDisplayEntry()
    : SystemDescriptor(kEntryTypeAFPD, 0, kAfpdMajorVersion, kAfpdMinorVersion) {}

AnimatedFrontPanelDisplayEntry::~AnimatedFrontPanelDisplayEntry() {}

unsigned int AnimatedFrontPanelDisplayEntry::Read(Extruder& in, unsigned int) {
  if (text.ReadTLVAndData(in, nullptr, false) != kDescriptorOk) {
    RECORD_ERROR("Read", "Error reading text\r\n");
    return kDescriptorWrongType;
  }
  return kDescriptorOk;
}

unsigned int AnimatedFrontPanelDisplayEntry::Store(Intruder* out) const {
  if (text.StoreTLVAndData(out) != kDescriptorOk) {
    RECORD_ERROR("Store", "Error writing text\r\n");
    return kDescriptorWrongType;
  }
  return kDescriptorOk;
}

void AnimatedFrontPanelDisplayEntry::Display(unsigned char indent) const {
  char prefix[kPrefixSize] = {};
  std::fill(prefix, prefix + std::min<unsigned int>(indent, kPrefixMaxIndent), ' ');
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "Display", "%s", prefix);
  // A payload without a terminator is shown up to its length, never beyond.
  const char* payload = reinterpret_cast<const char*>(text.GetData());
  const std::string shown =
      payload != nullptr ? std::string(payload, strnlen(payload, text.length)) : "(null)";
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "Display",
              "AnimatedFrontPanelDisplayEntry text = %s\r\n", shown.c_str());
}
