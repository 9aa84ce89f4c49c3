#include "record_decode.h"

#include <cctype>
#include <cstdio>
#include <sstream>

#include "location_arg.h"
#include "log_sink.h"
#include "stbplat/build_config.h"
#include "stbplat/code_object_info.h"
#include "stbplat/extruder.h"
#include "stbplat/front_panel.h"
#include "stbplat/fsbl_info.h"

namespace stbtool {
namespace {

constexpr unsigned long kHexFrom = 10;  // smaller numbers read the same in both bases
constexpr unsigned int kTagWidth = 4;
constexpr unsigned long kEntryHeader = 8;
constexpr unsigned long kPackageFixed = 42;
constexpr unsigned long kComponentBytes = 36;
constexpr unsigned int kMaxComponents = 16;

Json Text(const unsigned char* data, size_t length) {
  if (data == nullptr) return nullptr;
  return PrintableText(data, length);
}

Json Header(const SystemDescriptor& d) {
  return {{"type", TypeCodeText(d.entryType)}, {"flags", d.flags}, {"majorVer", d.majorVer},
          {"minorVer", d.minorVer}, {"valid", d.valid}};
}

Json Character(unsigned char c) {
  if (std::isprint(c)) return std::string(1, static_cast<char>(c));
  return c;
}

Json Sequence(const SequenceControl& s) {
  return {{"controlledSequenceName", PrintableText(s.controlledSequenceName, kSequenceNameLength)},
          {"otpEpoch", s.otpEpoch},
          {"nvSequence", s.nvSequence}};
}

Json Version(const VersionEntry& v) {
  Json t = Header(v);
  t["majorVersion"] = v.majorVersion;
  t["minorVersion"] = v.minorVersion;
  t["_temp"] = v._temp;
  t["description"] = Text(v.description.GetData(), v.description.length);
  t["versionLetter"] = Character(v.versionLetter);
  t["pad"] = v.pad;
  t["sequenceControl"] = Sequence(v.sequenceControl);
  return t;
}

Json Segment(const MemoryControllerSegmentDescriptor& s) {
  Json t = Header(s);
  t["segmentPhysicalAddressStart"] = s.segmentPhysicalAddressStart;
  t["segmentSize"] = s.segmentSize;
  t["segmentSizeUnit"] = "MiB";
  return t;
}

Json Controller(const MemoryControllerDescriptor& c) {
  Json t = Header(c);
  t["ddrCfgWidth"] = c.ddrCfgWidth;
  t["ddrSize"] = c.ddrSize;
  t["ddrSpeed"] = c.ddrSpeed;
  t["ddrDevTech"] = c.ddrDevTech;
  t["ddrMode"] = c.ddrMode;
  t["ddrDevWidth"] = c.ddrDevWidth;
  Json segments = Json::array();
  for (const MemoryControllerSegmentDescriptor& s : c.memorySegments) segments.push_back(Segment(s));
  t["memorySegments"] = segments;
  return t;
}

Json MemoryConfig(const MemoryConfigDescriptor& m) {
  Json t = Header(m);
  Json controllers = Json::array();
  for (const MemoryControllerDescriptor& c : m.memoryControllers) controllers.push_back(Controller(c));
  t["memoryControllers"] = controllers;
  return t;
}

Json DeviceConfig(const DeviceConfigDescriptor& d) {
  Json t = Header(d);
  t["scbClock"] = d.scbClock;
  t["avsEnabled"] = d.avsEnabled;
  t["reserved"] = d.reserved;
  return t;
}

Json BootSecurity(const BseckReloadDescriptor& b) {
  Json t = Header(b);
  t["ExecutingType"] = b.ExecutingType;
  Json errors = Json::array();
  for (const BseckReloadError& e : b.ReloadErrors)
    errors.push_back({{"flags", e.flags}, {"majorVer", e.majorVer}, {"minorVer", e.minorVer},
                      {"Type", e.Type}, {"Error", e.Error}});
  t["ReloadErrors"] = errors;
  return t;
}

Json SequenceDescriptor(const SequenceControlDescriptor& s) {
  Json t = Header(s);
  t["sequenceControl"] = Sequence(s.sequenceControl);
  return t;
}

Json BuildEnvironment(const BuildEnvironmentDescriptor& b) {
  Json t = Header(b);
  t["text"] = Text(b.text.GetData(), b.text.length);
  return t;
}

Json BootLoaderInfo(const FSBLInfo& f) {
  Json t = Header(f);
  t["versionEntry"] = Version(f.versionEntry);
  t["memConfig"] = MemoryConfig(f.memConfig);
  t["deviceConfig"] = DeviceConfig(f.deviceConfig);
  t["BseckInfo"] = BootSecurity(f.BseckInfo);
  return t;
}

// Two bytes as stored, shown as the big-endian number they spell.
unsigned int StoredPair(const unsigned char* pair) { return static_cast<unsigned int>(pair[0]) << 8 | pair[1]; }

Json Build(const BuildConfig& b) {
  Json t = Header(b);
  t["componentTag"] = PrintableText(b.componentTag, kTagWidth);
  t["componentMajorVer"] = StoredPair(b.componentMajorVer);
  t["componentMinorVer"] = StoredPair(b.componentMinorVer);
  t["componentVerLetter"] = Character(b.componentVerLetter);
  t["unused1"] = b.unused1;
  t["numDescriptors"] = b.numDescriptors;
  t["sequenceControl"] = SequenceDescriptor(b.sequenceControl);
  t["buildEnvironment"] = BuildEnvironment(b.buildEnvironment);
  return t;
}

Json FrontPanel(const AnimatedFrontPanelDisplayEntry& a) {
  Json t = Header(a);
  t["text"] = Text(a.text.GetData(), a.text.length);
  return t;
}

Json Component(const ComponentLocation& c) {
  return {{"componentTag", PrintableText(c.componentTag, kTagWidth)},
          {"location", LocationText(c.location)},
          {"slotOffset", c.slotOffset}};
}

Json Package(const CodeObjectInfo& p) {
  Json t;
  t["unused"] = p.unused;
  t["packageHeaderLocation"] = Component(p.packageHeaderLocation);
  t["numComponents"] = p.numComponents;
  Json components = Json::array();
  for (unsigned int i = 0; i < p.numComponents && i < kMaxComponents; ++i)
    components.push_back(Component(p.componentLocations[i]));
  t["componentLocations"] = components;
  return t;
}

template <typename Record>
unsigned int ReadEntry(Record& record, Extruder& in, unsigned long* size) {
  unsigned int entrySize = 0;
  unsigned int status = record.ReadTLVAndData(in, &entrySize);
  *size = kEntryHeader + entrySize;
  return status;
}

void DisplayErrors(const BseckReloadDescriptor& b, std::string* display) {
  DisplayCapture capture(eLogModuleRecords);
  for (const BseckReloadError& e : b.ReloadErrors) e.Display(2);
  *display += capture.Text();
}

}  // namespace

std::string StatusText(unsigned int status) {
  const char* meaning = "unknown status";
  switch (status) {
    case kDescriptorOk: meaning = "ok"; break;
    case kDescriptorWrongType: meaning = "wrong type, too little data or a nested record failed"; break;
    case kDescriptorInPlaceOn64Bit: meaning = "in-place read on a 64-bit stream"; break;
    case kDescriptorStoreNotSupported: meaning = "store not supported"; break;
    case kDescriptorNoBuffer: meaning = "no buffer"; break;
    case kDescriptorNewerMajorVersion: meaning = "stored major version newer than the reader's"; break;
    case kDescriptorFieldError: meaning = "a field could not be read"; break;
  }
  return Hex(status, 4) + " (" + meaning + ")";
}

DecodedRecord DecodeRecord(const std::vector<unsigned char>& bytes, RecordKind kind) {
  DecodedRecord out;
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  if (kind == RecordKind::kUnknown) {
    unsigned int code = 0;
    if (bytes.size() >= 4) {
      in.extrude(&code);
      in -= 4;
    }
    const RecordKindInfo* info = KindByCode(code);
    kind = info ? info->kind : RecordKind::kPackageHeader;
  }
  out.kind = kind;
  switch (kind) {
    case RecordKind::kVersion: {
      VersionEntry r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = Version(r);
      break;
    }
    case RecordKind::kSegment: {
      MemoryControllerSegmentDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = Segment(r);
      break;
    }
    case RecordKind::kController: {
      MemoryControllerDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = Controller(r);
      break;
    }
    case RecordKind::kMemoryConfig: {
      MemoryConfigDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = MemoryConfig(r);
      break;
    }
    case RecordKind::kFrontPanel: {
      AnimatedFrontPanelDisplayEntry r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = FrontPanel(r);
      if (out.status == kDescriptorOk) {
        DisplayCapture capture(eLogModuleRecords);
        r.Display(2);
        out.display = capture.Text();
      }
      break;
    }
    case RecordKind::kDeviceConfig: {
      DeviceConfigDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = DeviceConfig(r);
      break;
    }
    case RecordKind::kBootSecurity: {
      BseckReloadDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = BootSecurity(r);
      DisplayErrors(r, &out.display);
      break;
    }
    case RecordKind::kSequenceControl: {
      SequenceControlDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = SequenceDescriptor(r);
      break;
    }
    case RecordKind::kBuildEnvironment: {
      BuildEnvironmentDescriptor r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = BuildEnvironment(r);
      break;
    }
    case RecordKind::kBootLoaderInfo: {
      FSBLInfo r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = BootLoaderInfo(r);
      DisplayErrors(r.BseckInfo, &out.display);
      break;
    }
    case RecordKind::kBuildConfig: {
      BuildConfig r;
      out.status = ReadEntry(r, in, &out.size);
      out.tree = Build(r);
      break;
    }
    case RecordKind::kData: {
      DataEntry r;
      unsigned int length = 0;
      out.status = r.ReadTLVAndData(in, &length, false);
      out.size = kEntryHeader + length;
      out.tree = {{"type", "DATA"}, {"length", length}, {"text", Text(r.GetData(), r.length)}};
      DisplayCapture capture(eLogModuleRecords);
      r.DisplayAsText();
      out.display = capture.Text();
      break;
    }
    case RecordKind::kPackageHeader:
    case RecordKind::kUnknown: {
      CodeObjectInfo r;
      out.status = r.Read(in);
      out.size = kPackageFixed + kComponentBytes * (r.numComponents <= kMaxComponents ? r.numComponents : 0);
      out.tree = Package(r);
      if (out.status == kDescriptorOk) {
        DisplayCapture capture(eLogModuleRecords);
        r.Display(2);
        out.display = capture.Text();
      }
      break;
    }
  }
  return out;
}

std::string TreeText(const Json& tree, int indent) {
  std::ostringstream text;
  std::string pad(static_cast<size_t>(indent), ' ');
  auto scalar = [](const Json& value) -> std::string {
    if (value.is_null()) return "(none)";
    if (value.is_boolean()) return value.get<bool>() ? "yes" : "no";
    if (value.is_string()) return "\"" + value.get<std::string>() + "\"";
    if (value.is_number_unsigned() || value.is_number_integer()) {
      unsigned long n = value.get<unsigned long>();
      return n < kHexFrom ? std::to_string(n) : std::to_string(n) + " (" + Hex(n) + ")";
    }
    return value.dump();
  };
  auto element = [&](const std::string& key, const Json& value) {
    if (value.is_object()) {
      text << pad << key << ":\n" << TreeText(value, indent + 2);
    } else if (value.is_array()) {
      text << pad << key << ": " << value.size() << "\n";
      size_t i = 0;
      for (const Json& item : value) {
        if (item.is_structured())
          text << pad << "  [" << i << "]\n" << TreeText(item, indent + 4);
        else
          text << pad << "  [" << i << "] " << scalar(item) << "\n";
        ++i;
      }
    } else {
      text << pad << key << ": " << scalar(value) << "\n";
    }
  };
  // The common header of a record reads best on one line.
  bool header = tree.is_object() && tree.contains("majorVer") && tree.contains("type") && tree.contains("valid");
  if (header) {
    char versions[64];
    std::snprintf(versions, sizeof versions, "version %u.%u, flags 0x%04X", tree["majorVer"].get<unsigned>(),
                  tree["minorVer"].get<unsigned>(), tree["flags"].get<unsigned>());
    text << pad << "type: " << tree["type"].get<std::string>() << " (" << versions
         << (tree["valid"].get<bool>() ? "" : ", not read") << ")\n";
  }
  if (tree.is_object()) {
    for (auto it = tree.begin(); it != tree.end(); ++it) {
      if (header && (it.key() == "type" || it.key() == "flags" || it.key() == "majorVer" ||
                     it.key() == "minorVer" || it.key() == "valid"))
        continue;
      element(it.key(), it.value());
    }
  } else if (tree.is_array()) {
    size_t i = 0;
    for (const Json& item : tree) element("[" + std::to_string(i++) + "]", item);
  }
  return text.str();
}

}  // namespace stbtool
