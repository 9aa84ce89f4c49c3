// root make: writes a new device root for --root, from a geometry (chips and
// slots) or from what was taken off a box (its /proc/mtd text, dumps and
// memory map). The root is written beside DIR, loaded as --root would load
// it, and only then put in place: a root that would not load is not left
// behind.
#include <CLI/CLI.hpp>

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "actions.h"
#include "hostsim/host_mode.h"
#include "location_arg.h"
#include "output.h"
#include "root_layout.h"
#include "tool.h"

namespace stbtool {
namespace {

namespace fs = std::filesystem;

// Where the platform's fixed mapping puts the NOR chip.
constexpr unsigned long kDefaultNorBase = 0xE0000000;
constexpr unsigned long kDefaultNorSector = 64 * 1024;
constexpr char kCommand[] = "root make";

struct RootArgs {
  std::string dir;
  std::string nor, nand, emmc;
  std::vector<std::string> slots;
  std::string procMtd, memoryMap;
  std::vector<std::string> dumps, windows;
};

std::vector<std::string> Split(const std::string& text, char separator) {
  std::vector<std::string> parts;
  std::stringstream in(text);
  for (std::string part; std::getline(in, part, separator);) parts.push_back(part);
  return parts;
}

// NUMBER,NUMBER,...: between `least` and `most` of them.
std::vector<unsigned long> Numbers(const std::string& text, const std::string& option, size_t least, size_t most,
                                   const std::string& shape) {
  const std::vector<std::string> parts = Split(text, ',');
  if (parts.size() < least || parts.size() > most)
    throw UsageError(std::string(kCommand) + ": " + option + " " + text + ": expected " + shape);
  std::vector<unsigned long> numbers;
  for (const std::string& part : parts) numbers.push_back(ParseNumber(part, option));
  return numbers;
}

// NAME=VALUE, as --slot, --dump and --window take them.
std::pair<std::string, std::string> Assignment(const std::string& text, const std::string& option,
                                               const std::string& shape) {
  const size_t equals = text.find('=');
  if (equals == std::string::npos || equals == 0 || equals + 1 == text.size())
    throw UsageError(std::string(kCommand) + ": " + option + " " + text + ": expected " + shape);
  return {text.substr(0, equals), text.substr(equals + 1)};
}

std::string Upper(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::toupper(c); });
  return text;
}

RootGeometry GeometryOf(const RootArgs& args) {
  RootGeometry g;
  if (!args.nor.empty()) {
    const auto n = Numbers(args.nor, "--nor", 1, 3, "SIZE[,SECTOR[,BASE]]");
    g.nor = {true, n[0], n.size() > 1 ? n[1] : kDefaultNorSector, 0, 0, n.size() > 2 ? n[2] : kDefaultNorBase};
  }
  if (!args.nand.empty()) {
    const auto n = Numbers(args.nand, "--nand", 4, 4, "SIZE,PAGE,OOB,BLOCK");
    g.nand = {true, n[0], n[3], n[1], n[2], 0};
  }
  if (!args.emmc.empty()) g.emmc = {true, Numbers(args.emmc, "--emmc", 1, 1, "SIZE")[0], 0, 0, 0, 0};
  for (const std::string& text : args.slots) {
    const auto slot = Assignment(text, "--slot", "DEVICE.PARTITION.SLOT=SIZE");
    LocationArg name;
    if (!ParseLocationArg(slot.first, "--slot", &name) || name.hasOffset)
      throw UsageError(std::string(kCommand) + ": --slot " + text + ": expected DEVICE.PARTITION.SLOT=SIZE");
    g.slots.push_back({Upper(name.device), Upper(name.partition), Upper(name.slot),
                       ParseNumber(slot.second, "--slot " + text)});
  }
  return g;
}

std::string ReadWhole(const std::string& path, const std::string& option) {
  std::ifstream in(path, std::ios::binary);
  if (!in) throw UsageError(std::string(kCommand) + ": " + option + " " + path + ": " + std::strerror(errno));
  std::ostringstream text;
  text << in.rdbuf();
  return text.str();
}

// A node name under dev/: mtdN or mmca.
std::string NodeName(const std::string& name, const std::string& option) {
  const bool mtd = name.size() > 3 && name.compare(0, 3, "mtd") == 0 &&
                   std::all_of(name.begin() + 3, name.end(), [](unsigned char c) { return std::isdigit(c); });
  if (!mtd && name != "mmca")
    throw UsageError(std::string(kCommand) + ": " + option + " " + name + ": the node is mtdN or mmca");
  return name;
}

// The files taken off a box, and the settings that tell how to read them.
std::map<std::string, std::string> FromBox(const RootArgs& args) {
  std::map<std::string, std::string> files;
  files["proc/mtd"] = ReadWhole(args.procMtd, "--proc-mtd");
  if (!args.memoryMap.empty()) files["memory-map.ini"] = ReadWhole(args.memoryMap, "--memory-map");
  for (const std::string& text : args.dumps) {
    const auto dump = Assignment(text, "--dump", "NODE=FILE[,PAGE,OOB]");
    const std::vector<std::string> parts = Split(dump.second, ',');
    const std::string node = NodeName(dump.first, "--dump");
    if (parts.size() != 1 && parts.size() != 3)
      throw UsageError(std::string(kCommand) + ": --dump " + text + ": expected NODE=FILE or NODE=FILE,PAGE,OOB");
    files["dev/" + node] = ReadWhole(parts[0], "--dump");
    if (parts.size() == 3)
      files["dev/" + node + ".ini"] = "; A NAND dump (nanddump --oob layout when OOB is not 0).\nmedium = nand\n"
                                      "writesize = " + std::to_string(ParseNumber(parts[1], "--dump PAGE")) +
                                      "\noobsize = " + std::to_string(ParseNumber(parts[2], "--dump OOB")) + "\n";
    else if (node == "mmca")
      files["dev/mmca.ini"] = "; The whole eMMC device.\nmedium = emmc\nsize = " +
                              std::to_string(files["dev/mmca"].size()) + "\n";
  }
  for (const std::string& text : args.windows) {
    const auto window = Assignment(text, "--window", "NODE=IMAGE+OFFSET");
    const size_t plus = window.second.find('+');
    if (plus == std::string::npos) throw UsageError(std::string(kCommand) + ": --window " + text + ": expected NODE=IMAGE+OFFSET");
    const std::string node = NodeName(window.first, "--window");
    const std::string image = NodeName(window.second.substr(0, plus), "--window");
    files["dev/" + node + ".ini"] = "; A window of " + image + ".\nimage = " + image + "\noffset = " +
                                    Hex(ParseNumber(window.second.substr(plus + 1), "--window OFFSET")) + "\n";
  }
  return files;
}

void WriteFiles(const fs::path& dir, const std::map<std::string, std::string>& files) {
  for (const auto& file : files) {
    const fs::path path = dir / file.first;
    fs::create_directories(path.parent_path());
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(file.second.data(), static_cast<std::streamsize>(file.second.size()));
    if (!out) throw Failure(std::string(kCommand) + ": cannot write " + path.string());
  }
}

void RunRootMake(const RootArgs& args) {
  const bool geometry = !args.nor.empty() || !args.nand.empty() || !args.emmc.empty() || !args.slots.empty();
  const bool box = !args.procMtd.empty();
  if (geometry == box)
    throw UsageError(std::string(kCommand) + ": give a geometry (--nand, --nor, --emmc, --slot) or a box's "
                     "--proc-mtd with its --dump files, not both");
  if (!box && (!args.dumps.empty() || !args.windows.empty() || !args.memoryMap.empty()))
    throw UsageError(std::string(kCommand) + ": --dump, --window and --memory-map go with --proc-mtd");
  const fs::path dir(args.dir);
  std::error_code ignored;
  if (fs::exists(dir, ignored)) throw UsageError(std::string(kCommand) + ": " + args.dir + " exists; give a new folder");
  const std::map<std::string, std::string> files = box ? FromBox(args) : LayOutRoot(GeometryOf(args));
  const fs::path partial = dir.string() + ".partial." + std::to_string(getpid());
  try {
    WriteFiles(partial, files);
    std::string error;
    // Loading the root as --root does checks every file and key.
    const bool loads = stbplat::hostsim::Attach(partial.string(), &error);
    stbplat::hostsim::Detach();
    if (!loads) throw Failure(std::string(kCommand) + ": the root would not load: " + error + "; nothing was written");
    fs::rename(partial, dir);
  } catch (...) {
    fs::remove_all(partial, ignored);
    throw;
  }
  if (Options().json) {
    Json list = Json::array();
    for (const auto& file : files) list.push_back(file.first);
    PrintJson({{"root", args.dir}, {"files", list}});
  } else {
    std::cerr << "made " << args.dir << " (" << files.size() << " files); use it with --root " << args.dir << "\n";
  }
}

}  // namespace

void RegisterRootCommands(CLI::App& app) {
  CLI::App* root = app.add_subcommand("root", "Device roots for --root: the files of an emulated device");
  root->require_subcommand(1);
  static RootArgs args;
  CLI::App* make = root->add_subcommand(
      "make",
      "Make a new device root, from a geometry (every slot gets a /proc/mtd row of its own, so all can be "
      "written) or from a box's /proc/mtd and dumps");
  make->add_option("DIR", args.dir, "The new root's folder (must not exist)")->required();
  make->add_option("--nand", args.nand, "NAND chip: SIZE,PAGE,OOB,BLOCK (OOB 0: data only)");
  make->add_option("--nor", args.nor, "NOR chip: SIZE[,SECTOR[,BASE]] (sector 64K, base 0xE0000000)");
  make->add_option("--emmc", args.emmc, "eMMC device: SIZE");
  make->add_option("--slot", args.slots,
                   "DEVICE.PARTITION.SLOT=SIZE on NOR0, NAND0 or EMMC0, laid out in the order given (repeat)");
  make->add_option("--proc-mtd", args.procMtd, "From a box: its /proc/mtd text");
  make->add_option("--dump", args.dumps, "From a box: NODE=FILE[,PAGE,OOB], an image of dev/mtdN or dev/mmca (repeat)");
  make->add_option("--window", args.windows, "From a box: NODE=IMAGE+OFFSET, a partition inside another image (repeat)");
  make->add_option("--memory-map", args.memoryMap, "From a box: the platform's memory map (memory-map.ini)");
  // One value each time: a slot does not swallow the folder behind it.
  for (const char* name : {"--slot", "--dump", "--window"}) make->get_option(name)->allow_extra_args(false);
  SetAction(make, []() { RunRootMake(args); });
}

}  // namespace stbtool
