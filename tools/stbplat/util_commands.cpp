// Stand-alone utilities: a hex dump through the library's
// DumpBuffer, and the ini reader.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstdio>
#include <iostream>
#include <string>
#include <vector>

#include "actions.h"
#include "location_arg.h"
#include "log_sink.h"
#include "output.h"
#include "stbplat/display_utils.h"
#include "stbplat/ini_reader.h"
#include "tool.h"

namespace stbtool {
namespace {

constexpr unsigned int kDumpRow = 16;

struct DumpArgs {
  std::string file;
  unsigned long offset = 0;
  unsigned long length = 0;
  bool lengthGiven = false;  // -n 0 dumps nothing; no -n dumps to the end
  bool allRows = false;      // no squeezing of repeated rows
  int indent = 0;
};

// A full row equal to the row before it, as hexdump -C squeezes it.
bool RepeatsRowBefore(const std::vector<unsigned char>& bytes, unsigned long at, unsigned long end,
                      unsigned long first) {
  return at >= first + kDumpRow && end - at >= kDumpRow &&
         std::equal(bytes.begin() + static_cast<long>(at), bytes.begin() + static_cast<long>(at + kDumpRow),
                    bytes.begin() + static_cast<long>(at - kDumpRow));
}

void RunHexdump(const DumpArgs& args) {
  std::vector<unsigned char> bytes = ReadWholeFile(args.file);
  if (args.offset > bytes.size())
    throw UsageError("hexdump: --offset " + Hex(args.offset) + " lies past the end of " +
                     args.file + " (" + std::to_string(bytes.size()) + " bytes)");
  unsigned long end = !args.lengthGiven ? bytes.size()
                                       : args.offset + std::min<unsigned long>(bytes.size() - args.offset, args.length);
  if (Options().json) {
    Json rows = Json::array();
    for (unsigned long at = args.offset; at < end; at += kDumpRow) {
      std::string hex;
      for (unsigned long i = at; i < std::min<unsigned long>(end, at + kDumpRow); ++i) {
        char two[4];
        std::snprintf(two, sizeof two, "%02X", bytes[i]);
        hex += two;
      }
      rows.push_back({{"offset", at}, {"hex", hex}});
    }
    PrintJson({{"file", args.file}, {"offset", args.offset}, {"length", end - args.offset},
               {"rows", rows}});
    return;
  }
  if (end == args.offset) {
    if (args.lengthGiven) return;  // asked for nothing
    DisplayCapture capture(eLogModuleHWSpecific);
    DumpBuffer(eLogModuleHWSpecific, static_cast<unsigned char>(args.indent), nullptr, 0);
    std::cout << capture.Text();
    return;
  }
  // One library call per row, so that each row can carry its offset. A run
  // of rows equal to the one before shows as one "*", as in hexdump -C.
  bool squeezing = false;
  for (unsigned long at = args.offset; at < end; at += kDumpRow) {
    if (!args.allRows && RepeatsRowBefore(bytes, at, end, args.offset)) {
      if (!squeezing) std::cout << "*\n";
      squeezing = true;
      continue;
    }
    squeezing = false;
    unsigned int n = static_cast<unsigned int>(std::min<unsigned long>(kDumpRow, end - at));
    DisplayCapture capture(eLogModuleHWSpecific);
    DumpBuffer(eLogModuleHWSpecific, static_cast<unsigned char>(args.indent), bytes.data() + at, n);
    char address[24];
    std::snprintf(address, sizeof address, "%08lX  ", at);
    std::cout << address << capture.Text();
  }
}

struct IniEntry {
  std::string section;
  std::string name;
  std::string value;
};

bool CollectIniValue(void* user, const char* section, const char* name, const char* value) {
  static_cast<std::vector<IniEntry>*>(user)->push_back({section, name, value});
  return true;
}

void RunIni(const std::string& file) {
  std::vector<IniEntry> entries;
  int result = 0;
  // The reader reports bad lines on standard output; they belong on standard
  // error here, where they do not mix with the data.
  std::string messages = CaptureStandardOutput([&]() {
    INIReader reader(file.c_str(), CollectIniValue, &entries);
    result = reader.Parse();
  });
  for (size_t start = 0; start < messages.size();) {
    size_t end = messages.find('\n', start);
    std::string line = messages.substr(start, end == std::string::npos ? std::string::npos : end - start);
    if (!line.empty() && line.back() == '\r') line.pop_back();
    if (!line.empty()) std::fprintf(stderr, "stbplat: ini: %s\n", line.c_str());
    if (end == std::string::npos) break;
    start = end + 1;
  }
  if (result < 0) throw Failure("ini: cannot open " + file);

  if (Options().json) {
    Json sections = Json::object();
    for (const IniEntry& e : entries) sections[e.section][e.name] = e.value;
    Json out = {{"file", file}, {"sections", sections}};
    out["firstBadLine"] = result == 0 ? Json(nullptr) : Json(result);
    PrintJson(out);
  } else {
    std::string current;
    bool first = true;
    for (const IniEntry& e : entries) {
      if (first || e.section != current) {
        if (!e.section.empty()) std::cout << (first ? "" : "\n") << "[" << e.section << "]\n";
        current = e.section;
        first = false;
      }
      std::cout << e.name << " = " << e.value << "\n";
    }
  }
  if (result > 0) throw Failure("ini: " + file + ":" + std::to_string(result) + ": first bad line");
}

}  // namespace

void RegisterUtilCommands(CLI::App& app) {
  static DumpArgs dump;
  CLI::App* hexdump = app.add_subcommand("hexdump", "Hex dump of a file, 16 bytes a row");
  hexdump->add_option("FILE", dump.file, "File to dump; - reads standard input")->required();
  AddNumberOption(hexdump, "-s,--offset", &dump.offset, "First byte to dump");
  AddNumberOption(hexdump, "-n,--length", &dump.length, "Number of bytes to dump (default: to the end)",
                  &dump.lengthGiven);
  hexdump->add_flag("--all-rows", dump.allRows,
                    "Show every row; by default a run of rows equal to the one before shows as one *");
  hexdump->add_option("--indent", dump.indent, "Spaces before each row")->check(CLI::Range(0, 103));
  SetAction(hexdump, []() { RunHexdump(dump); });

  static std::string iniFile;
  CLI::App* ini = app.add_subcommand("ini", "Parse an ini file and print it, or report its first bad line");
  ini->add_option("FILE", iniFile, "Ini file")->required();
  SetAction(ini, []() { RunIni(iniFile); });
}

}  // namespace stbtool
