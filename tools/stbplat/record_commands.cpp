// record show | make | check: decode, build and validate stored records.
#include <CLI/CLI.hpp>
#include <unistd.h>

#include <cstring>
#include <iostream>
#include <string>
#include <vector>

#include "actions.h"
#include "location_arg.h"
#include "output.h"
#include "record_check.h"
#include "record_decode.h"
#include "record_kinds.h"
#include "record_source.h"
#include "stbplat/code_object_info.h"
#include "stbplat/front_panel.h"
#include "stbplat/intruder.h"
#include "stbplat/version_entry.h"
#include "tool.h"

namespace stbtool {
namespace {

// Room for any record the tool builds (a full package header is 618 bytes).
constexpr unsigned int kBuildBuffer = 64 * 1024;
constexpr unsigned int kMaxComponents = 16;
constexpr size_t kTagWidth = 4;

RecordKind KindOption(const std::string& name) {
  if (name.empty()) return RecordKind::kUnknown;
  const RecordKindInfo* info = KindByName(name);
  if (info == nullptr) throw UsageError("--type " + name + ": unknown type (known: " + KindNames() + ")");
  return info->kind;
}

std::vector<std::string> Lines(const std::string& text) {
  std::vector<std::string> lines;
  size_t start = 0;
  while (start < text.size()) {
    size_t end = text.find('\n', start);
    if (end == std::string::npos) end = text.size();
    lines.push_back(text.substr(start, end - start));
    start = end + 1;
  }
  return lines;
}

constexpr unsigned char kErasedByte = 0xFF;
constexpr size_t kErasedProbe = 4;

// Erased flash reads as 0xFF; without a type given, nothing is stored there.
void RefuseErased(const RecordSource& source, RecordKind wanted, const std::string& command) {
  if (wanted != RecordKind::kUnknown || source.bytes.size() < kErasedProbe) return;
  for (size_t i = 0; i < kErasedProbe; ++i)
    if (source.bytes[i] != kErasedByte) return;
  throw Failure(command + ": " + source.label + " at " + Hex(source.base) +
                " is erased (0xFF bytes): no record there");
}

// "error at offset 0x2A (package/componentLocations[0]): ...".
std::string ErrorText(const CheckIssue& error) {
  return "error at offset " + Hex(error.offset) + (error.where.empty() ? "" : " (" + error.where + ")") + ": " +
         error.message;
}

const char* const kPackageHelp =
    "A package header has no type code: bytes that start with no known type code are taken for one\n"
    "only when they have its shape: 42 bytes and 36 more for each of at most 16 components, tags of up\n"
    "to 4 printable characters padded with zero bytes, and location names of 1 to 8 of A-Z, 0-9, '_',\n"
    "'-' padded with '.'. Other bytes are reported as no known record (exit 1).\n";

struct ShowArgs {
  std::string source;
  std::string type;
  unsigned long at = 0;
  bool noDisplay = false;
};

void RunShow(const ShowArgs& args) {
  RecordKind wanted = KindOption(args.type);
  RecordSource source = LoadRecordSource(args.source, args.at);
  RefuseErased(source, wanted, "record show");
  if (wanted == RecordKind::kUnknown) {
    CheckResult detected = CheckRecord(source.bytes.data(), source.bytes.size(), source.base, wanted);
    const CheckIssue* error = detected.firstError();
    if (error != nullptr && (detected.kind == RecordKind::kPackageHeader || detected.kind == RecordKind::kUnknown))
      throw Failure("record show: " + source.label + ": " + ErrorText(*error));
  }
  DecodedRecord record = DecodeRecord(source.bytes, wanted);
  const RecordKindInfo& info = KindInfo(record.kind);
  if (Options().json) {
    Json out = {{"source", source.label}, {"offset", source.base}, {"type", info.name},
                {"class", info.className}, {"size", record.size}, {"status", record.status},
                {"statusText", StatusText(record.status)}, {"record", record.tree}};
    out["display"] = Lines(record.display);
    PrintJson(out);
  } else {
    std::cout << info.description << " (" << info.className << "), " << record.size << " bytes at "
              << Hex(source.base) << " of " << source.label << ": " << StatusText(record.status) << "\n"
              << TreeText(record.tree, 2);
    if (!args.noDisplay && !record.display.empty())
      std::cout << "as the library displays it:\n" << record.display;
  }
  if (record.status != 0)
    throw Failure("record show: " + source.label + ": the " + info.className + " reader returned " +
                  StatusText(record.status) + "; try: stbplat record check " + source.label);
}

struct CheckArgs {
  std::string source;
  std::string type;
  unsigned long at = 0;
};

void RunCheck(const CheckArgs& args) {
  RecordKind wanted = KindOption(args.type);
  RecordSource source = LoadRecordSource(args.source, args.at);
  RefuseErased(source, wanted, "record check");
  CheckResult result = CheckRecord(source.bytes.data(), source.bytes.size(), source.base, wanted);
  const RecordKindInfo& info = KindInfo(result.kind);
  if (Options().json) {
    Json issues = Json::array();
    for (const CheckIssue& issue : result.issues)
      issues.push_back({{"offset", issue.offset}, {"where", issue.where}, {"message", issue.message},
                        {"severity", issue.error ? "error" : "warning"}});
    Json out = {{"source", source.label}, {"type", info.name}, {"ok", result.ok()},
                {"offset", source.base}, {"end", result.ok() ? Json(result.end + source.base) : Json(nullptr)},
                {"issues", issues}};
    PrintJson(out);
  } else {
    for (const CheckIssue& issue : result.issues)
      if (!issue.error)
        std::cout << "warning at offset " << Hex(issue.offset) << " (" << issue.where << "): " << issue.message << "\n";
    if (result.ok())
      std::cout << "ok: " << info.description << " (" << info.className << "), "
                << result.end << " bytes from " << Hex(source.base) << " to " << Hex(source.base + result.end)
                << "\n";
  }
  if (const CheckIssue* error = result.firstError())
    throw Failure("record check: " + source.label + ": " + ErrorText(*error));
}

// Writes a built record to -o FILE, or to standard output when it is not
// a terminal.
void Emit(const std::vector<unsigned char>& bytes, const std::string& output) {
  if (output.empty() && isatty(STDOUT_FILENO))
    throw UsageError("record make: give -o FILE (the record is binary; standard output is a terminal)");
  WriteWholeFile(output.empty() ? "-" : output, bytes);
}

template <typename Store>
std::vector<unsigned char> Build(const char* what, Store store) {
  std::vector<unsigned char> buffer(kBuildBuffer);
  Intruder out(buffer.data(), kBuildBuffer);
  unsigned int status = store(&out);
  if (status != 0) throw Failure(std::string("record make ") + what + ": storing failed: " + StatusText(status));
  buffer.resize(static_cast<size_t>(out.pCurrent - out.pStart));
  return buffer;
}

// Text payloads keep a terminating zero: readers print them with %s.
void SetText(DataEntry* entry, const std::string& text) {
  entry->CreateData(static_cast<unsigned int>(text.size() + 1),
                    reinterpret_cast<const unsigned char*>(text.c_str()));
}

struct VersionArgs {
  unsigned int major = 0, minor = 0, temp = 0;
  std::string letter, description, sequenceName, output;
  unsigned int otpEpoch = kDefaultOtpEpoch, nvSequence = 0;
};

void RunMakeVersion(const VersionArgs& args) {
  if (args.letter.size() > 1) throw UsageError("--letter '" + args.letter + "': one character");
  if (args.sequenceName.size() > kSequenceNameLength)
    throw UsageError("--sequence '" + args.sequenceName + "': at most 20 characters");
  VersionEntry record;
  record.majorVersion = static_cast<unsigned short>(args.major);
  record.minorVersion = static_cast<unsigned short>(args.minor);
  record._temp = static_cast<unsigned short>(args.temp);
  SetText(&record.description, args.description);
  record.versionLetter = args.letter.empty() ? 0 : static_cast<unsigned char>(args.letter[0]);
  std::memcpy(record.sequenceControl.controlledSequenceName, args.sequenceName.data(), args.sequenceName.size());
  record.sequenceControl.otpEpoch = args.otpEpoch;
  record.sequenceControl.nvSequence = args.nvSequence;
  Emit(Build("version", [&](Intruder* out) { return record.StoreTLVAndData(out); }), args.output);
}

struct FrontPanelArgs {
  std::string text, output;
};

void RunMakeFrontPanel(const FrontPanelArgs& args) {
  AnimatedFrontPanelDisplayEntry record;
  SetText(&record.text, args.text);
  Emit(Build("front-panel", [&](Intruder* out) { return record.StoreTLVAndData(out); }), args.output);
}

struct PackageArgs {
  std::string header, headerTag, output;
  std::vector<std::string> components;
};

ComponentLocation ComponentArg(const std::string& text, const std::string& option, const std::string& tag) {
  if (tag.size() > kTagWidth) throw UsageError(option + " '" + text + "': tag '" + tag + "' is longer than 4 characters");
  LocationArg arg;
  std::string where = text.substr(text.find('=') == std::string::npos ? 0 : text.find('=') + 1);
  if (!ParseLocationArg(where, option + " '" + text + "'", &arg))
    throw UsageError(option + " '" + text + "': expected a location DEVICE.PARTITION.SLOT[+OFFSET]");
  return ToComponentLocation(arg, tag);
}

void RunMakePackage(const PackageArgs& args) {
  if (args.components.size() > kMaxComponents)
    throw UsageError("--component: at most 16 components, " + std::to_string(args.components.size()) + " given");
  CodeObjectInfo record;
  static_cast<ComponentLocation&>(record.packageHeaderLocation) = ComponentArg(args.header, "--header", args.headerTag);
  for (const std::string& component : args.components) {
    size_t equals = component.find('=');
    if (equals == std::string::npos)
      throw UsageError("--component '" + component + "': expected TAG=DEVICE.PARTITION.SLOT[+OFFSET]");
    static_cast<ComponentLocation&>(record.componentLocations[record.numComponents++]) =
        ComponentArg(component, "--component", component.substr(0, equals));
  }
  Emit(Build("package", [&](Intruder* out) { return record.Store(out); }), args.output);
}

}  // namespace

void RegisterRecordCommands(CLI::App& app) {
  CLI::App* record = app.add_subcommand("record", "Decode, build and check stored records");
  record->require_subcommand(1);
  const std::string sourceHelp =
      "A file, - for standard input, or a location DEVICE.PARTITION.SLOT[+OFFSET]";

  static ShowArgs show;
  CLI::App* showCommand = record->add_subcommand(
      "show", "Decode a record (its type from its type code) and show its fields");
  showCommand->add_option("SOURCE", show.source, sourceHelp)->required();
  showCommand->add_option("-t,--type", show.type, "Read as this type: " + KindNames());
  AddNumberOption(showCommand, "--at", &show.at, "Offset of the record in the file or slot");
  showCommand->footer(std::string(kPackageHelp) + "--type package reads any bytes as a package header.");
  showCommand->add_flag("--no-display", show.noDisplay, "Leave out the library's own display lines");
  SetAction(showCommand, []() { RunShow(show); });

  static CheckArgs check;
  CLI::App* checkCommand = record->add_subcommand(
      "check", "Check a record's framing, sizes and nested entries; report the first problem's offset");
  checkCommand->add_option("SOURCE", check.source, sourceHelp)->required();
  checkCommand->add_option("-t,--type", check.type, "Check as this type: " + KindNames());
  AddNumberOption(checkCommand, "--at", &check.at, "Offset of the record in the file or slot");
  checkCommand->footer(std::string(kPackageHelp) + "With --type package the same rules are checked.");
  SetAction(checkCommand, []() { RunCheck(check); });

  CLI::App* make = record->add_subcommand("make", "Build a record from arguments");
  make->require_subcommand(1);

  static VersionArgs version;
  CLI::App* makeVersion = make->add_subcommand("version", "A version record (VERS)");
  makeVersion->add_option("--major", version.major, "Major version number")->check(CLI::Range(0, 0xFFFF));
  makeVersion->add_option("--minor", version.minor, "Minor version number")->check(CLI::Range(0, 0xFFFF));
  makeVersion->add_option("--temp", version.temp, "The _temp word")->check(CLI::Range(0, 0xFFFF));
  makeVersion->add_option("--letter", version.letter, "Version letter");
  makeVersion->add_option("-d,--description", version.description, "Description text");
  makeVersion->add_option("--sequence", version.sequenceName, "Controlled sequence name (up to 20 characters)");
  makeVersion->add_option("--otp-epoch", version.otpEpoch, "OTP epoch")->capture_default_str();
  makeVersion->add_option("--nv-sequence", version.nvSequence, "NV sequence number");
  makeVersion->add_option("-o,--output", version.output, "Output file (- for standard output)");
  SetAction(makeVersion, []() { RunMakeVersion(version); });

  static FrontPanelArgs panel;
  CLI::App* makePanel = make->add_subcommand("front-panel", "A front-panel text record (AFPD)");
  makePanel->add_option("TEXT", panel.text, "Text to show")->required();
  makePanel->add_option("-o,--output", panel.output, "Output file (- for standard output)");
  SetAction(makePanel, []() { RunMakeFrontPanel(panel); });

  static PackageArgs package;
  CLI::App* makePackage = make->add_subcommand("package", "A package header listing up to 16 components");
  makePackage->add_option("--header", package.header, "Where the package header lies: DEVICE.PARTITION.SLOT[+OFFSET]")
      ->required();
  makePackage->add_option("--header-tag", package.headerTag, "Tag of the header itself (up to 4 characters)");
  makePackage->add_option("-c,--component", package.components, "A component: TAG=DEVICE.PARTITION.SLOT[+OFFSET]");
  makePackage->add_option("-o,--output", package.output, "Output file (- for standard output)");
  SetAction(makePackage, []() { RunMakePackage(package); });
}

}  // namespace stbtool
