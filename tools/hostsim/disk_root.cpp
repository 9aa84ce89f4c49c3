#include "disk_root.h"

#include <dirent.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <map>
#include <sstream>

#include "devmodel/image_storage.h"
#include "util/ini_core.h"

namespace stbplat {
namespace hostsim {
namespace {

using Settings = std::map<std::string, std::string>;

constexpr const char* kDiskPrefix = "sd";
constexpr const char* kIniSuffix = ".ini";
// Captured tool output beside each disk's settings: file suffix and command.
constexpr const char* kCaptures[][2] = {
    {".hdparm-i", "hdparm -i "}, {".hdparm-I", "hdparm -I "}, {".smartctl-A", "smartctl -d ata -A "}};
constexpr const char* kModuleList = "/proc/modules";
constexpr const char* kScsiGenericPrefix = "/dev/sg";

bool Collect(void* user, const char*, const char* name, const char* value) {
  (*static_cast<Settings*>(user))[name] = value;
  return true;
}

char* ReadLine(char* buffer, int size, FILE* file) { return std::fgets(buffer, size, file); }

// The file's text; false when there is none.
bool Slurp(const std::string& path, std::string* text) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return false;
  std::ostringstream out;
  out << in.rdbuf();
  *text = out.str();
  return true;
}

bool EndsWith(const std::string& text, const std::string& suffix) {
  return text.size() > suffix.size() && text.compare(text.size() - suffix.size(), suffix.size(), suffix) == 0;
}

// A decimal or 0x number of at most `limit`.
bool Number(const Settings& settings, const char* key, uint64_t limit, long long* value,
            const std::string& where, std::string* error) {
  auto it = settings.find(key);
  if (it == settings.end()) return true;
  uint64_t parsed = 0;
  if (!devmodel::ParseNumber(it->second, &parsed) || parsed > limit) {
    *error = where + ": " + key + " = " + it->second + " is not a number up to " + std::to_string(limit);
    return false;
  }
  *value = static_cast<long long>(parsed);
  return true;
}

bool LoadDisk(const std::string& root, const std::string& name, devmodel::DiskSim& sim,
              std::string* error) {
  const std::string base = root + "/dev/" + name, where = base + kIniSuffix;
  Settings settings;
  FILE* file = std::fopen(where.c_str(), "r");
  if (file == nullptr) {
    *error = where + ": cannot be read";
    return false;
  }
  const int bad = ini::IniParseFile(file, ReadLine, Collect, nullptr, &settings, where.c_str());
  std::fclose(file);
  if (bad != 0) {
    *error = where + ":" + std::to_string(bad) + ": bad line";
    return false;
  }
  devmodel::SimDisk& disk = sim.devices["/dev/" + name];
  // Its generic node: sg0 for sda, sg1 for sdb, unless given.
  long long bus = -1, generic = name.size() == 3 ? name[2] - 'a' : 0;
  if (!Number(settings, "size", static_cast<unsigned long long>(LLONG_MAX), &disk.size, where, error) ||
      !Number(settings, "bus", static_cast<unsigned long long>(INT_MAX), &bus, where, error) ||
      !Number(settings, "sg", static_cast<unsigned long long>(INT_MAX), &generic, where, error))
    return false;
  if (settings.count("link") != 0) sim.links[name] = settings["link"];
  if (settings.count("model") != 0 || settings.count("serial") != 0)
    disk.identity = devmodel::IdentityBlock(settings["model"], settings["serial"]);
  if (bus >= 0) sim.devices[kScsiGenericPrefix + std::to_string(generic)].bus = static_cast<int>(bus);
  for (const auto& capture : kCaptures) {
    std::string text;
    if (Slurp(base + capture[0], &text)) sim.tools[capture[1] + std::string("/dev/") + name] = text;
  }
  return true;
}

}  // namespace

bool IsDiskName(const std::string& name) {
  return name.size() > std::strlen(kDiskPrefix) && name.compare(0, std::strlen(kDiskPrefix), kDiskPrefix) == 0 &&
         name.find_first_not_of("abcdefghijklmnopqrstuvwxyz", std::strlen(kDiskPrefix)) == std::string::npos;
}

bool LoadDisks(const std::string& root, devmodel::DiskSim& sim, std::string* error) {
  std::string modules;
  if (Slurp(root + kModuleList, &modules)) sim.tools["lsmod"] = modules;
  DIR* dev = opendir((root + "/dev").c_str());
  if (dev == nullptr) return true;
  bool ok = true;
  for (dirent* entry = readdir(dev); ok && entry != nullptr; entry = readdir(dev)) {
    const std::string file = entry->d_name;
    const std::string name = EndsWith(file, kIniSuffix) ? file.substr(0, file.size() - std::strlen(kIniSuffix)) : "";
    if (IsDiskName(name)) ok = LoadDisk(root, name, sim, error);
  }
  closedir(dev);
  return ok;
}

}  // namespace hostsim
}  // namespace stbplat
