#include "device_root.h"

#include <dirent.h>

#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <vector>

#include "util/ini_core.h"

namespace stbplat {
namespace hostsim {
namespace {

using devmodel::Geometry;
using devmodel::Medium;
using devmodel::SimKind;

constexpr int kMaxMtd = 30;
constexpr int kMaxNameLength = 100;
constexpr const char kIniSuffix[] = ".ini";
constexpr size_t kIniSuffixLength = sizeof kIniSuffix - 1;
constexpr uint64_t kDefaultNandPage = 2048;
constexpr const char* kDevicePrefixes[] = {"/dev/", "/proc/", "/sys/"};

using Settings = std::map<std::string, std::string>;

bool CollectSettings(void* user, const char*, const char* name, const char* value) {
  (*static_cast<Settings*>(user))[name] = value;
  return true;
}

char* ReadLine(char* buffer, int size, FILE* file) { return std::fgets(buffer, size, file); }

// dev/NAME.ini; an absent file is no settings.
bool ReadSettings(const std::string& path, Settings* settings, std::string* error) {
  FILE* file = std::fopen(path.c_str(), "r");
  if (file == nullptr) return true;
  int bad = stbplat::ini::IniParseFile(file, ReadLine, CollectSettings, nullptr, settings, path.c_str());
  std::fclose(file);
  if (bad != 0) {
    *error = path + ":" + std::to_string(bad) + ": bad line";
    return false;
  }
  return true;
}

bool Number(const Settings& settings, const char* key, uint64_t* value, const std::string& where,
            std::string* error) {
  auto it = settings.find(key);
  if (it == settings.end()) return true;
  char* end = nullptr;
  unsigned long long parsed = std::strtoull(it->second.c_str(), &end, 0);
  if (end == it->second.c_str() || *end != '\0') {
    *error = where + ": " + key + " = " + it->second + " is not a number";
    return false;
  }
  *value = parsed;
  return true;
}

bool StartsWith(const std::string& text, const char* prefix) {
  return text.compare(0, std::strlen(prefix), prefix) == 0;
}

Medium GuessMedium(const std::string& name) {
  std::string upper;
  for (char c : name) upper += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  if (StartsWith(upper, "NAND") || StartsWith(upper, "FLASH1")) return Medium::kNand;
  if (StartsWith(upper, "EMMC") || StartsWith(upper, "MMC")) return Medium::kEmmc;
  return Medium::kNor;
}

bool ParseMedium(const Settings& settings, Medium* medium, const std::string& where, std::string* error) {
  auto it = settings.find("medium");
  if (it == settings.end()) return true;
  if (it->second == "nor") *medium = Medium::kNor;
  else if (it->second == "nand") *medium = Medium::kNand;
  else if (it->second == "emmc") *medium = Medium::kEmmc;
  else {
    *error = where + ": medium = " + it->second + " (expected nor, nand or emmc)";
    return false;
  }
  return true;
}

// Geometry from the settings over the defaults given.
bool ApplySettings(const Settings& settings, Geometry* g, const std::string& where, std::string* error) {
  if (!ParseMedium(settings, &g->medium, where, error)) return false;
  if (g->medium == Medium::kNand) g->writeSize = kDefaultNandPage;
  if (!Number(settings, "size", &g->size, where, error) ||
      !Number(settings, "erasesize", &g->eraseSize, where, error) ||
      !Number(settings, "writesize", &g->writeSize, where, error) ||
      !Number(settings, "oobsize", &g->oobSize, where, error))
    return false;
  if (g->writeSize == 0 || g->size == 0 || (g->medium != Medium::kEmmc && g->eraseSize == 0)) {
    *error = where + ": size, erasesize and writesize must not be 0";
    return false;
  }
  return true;
}

}  // namespace

bool DeviceRoot::Load(const std::string& root, devmodel::FlashSim& sim, std::string* error) {
  DeviceRoot loader(root, sim);
  DeviceRoot* device = &loader;
  std::string tablePath = root + "/proc/mtd";
  std::ifstream table(tablePath);
  if (!table) {
    *error = tablePath + ": cannot be read";
    return false;
  }
  struct Row {
    int number;
    uint64_t size, eraseSize;
    std::string name;
  };
  std::vector<Row> rows;
  std::string line;
  std::getline(table, line);  // column header
  while (std::getline(table, line)) {
    if (line.empty()) continue;
    int number = -1;
    unsigned long long size = 0, erase = 0;
    char name[kMaxNameLength + 1] = {0};
    if (std::sscanf(line.c_str(), "mtd%d: %llx %llx \"%100[^\"]\"", &number, &size, &erase, name) != 4 ||
        number < 0 || number >= kMaxMtd) {
      *error = tablePath + ": cannot read line '" + line + "'";
      return false;
    }
    rows.push_back({number, size, erase, name});
    device->mtdSizes_["mtd" + std::to_string(number)] = {size, erase};
    device->mtdNames_["mtd" + std::to_string(number)] = name;
  }
  for (const Row& row : rows)
    if (!device->LoadNode(row.number, row.size, row.eraseSize, row.name, error)) return false;
  if (!device->LoadEmmcDevices(error)) return false;
  return true;
}

devmodel::DeviceNode* DeviceRoot::Image(const std::string& name, std::string* error) {
  std::string devicePath = "/dev/" + name;
  if (images_.count(name) != 0) return sim_.Find(devicePath);
  std::string path = root_ + devicePath;
  Settings settings;
  if (!ReadSettings(path + ".ini", &settings, error)) return nullptr;
  Geometry g;
  auto mtd = mtdSizes_.find(name);
  if (mtd != mtdSizes_.end()) {
    g.medium = GuessMedium(mtdNames_[name]);
    g.size = mtd->second.first;
    g.eraseSize = mtd->second.second;
  } else {
    g.medium = Medium::kEmmc;
  }
  if (!ApplySettings(settings, &g, path + ".ini", error)) return nullptr;
  std::unique_ptr<devmodel::SimStorage> storage = devmodel::OpenImageStorage(path, g, error);
  if (!storage) return nullptr;
  images_[name] = g;
  // An eMMC image under an MTD node is an MTD over a block device.
  SimKind kind = g.medium == Medium::kNand  ? SimKind::kNand
                 : g.medium == Medium::kNor ? SimKind::kNor
                 : mtd != mtdSizes_.end()   ? SimKind::kRam
                                            : SimKind::kEmmc;
  return sim_.AddNode(devicePath, kind, std::move(storage), static_cast<uint32_t>(g.eraseSize),
                      static_cast<uint32_t>(g.writeSize), static_cast<uint32_t>(g.oobSize));
}

bool DeviceRoot::LoadNode(int number, uint64_t size, uint64_t eraseSize, const std::string& name,
                          std::string* error) {
  std::string self = "mtd" + std::to_string(number);
  std::string settingsPath = root_ + "/dev/" + self + ".ini";
  Settings settings;
  if (!ReadSettings(settingsPath, &settings, error)) return false;
  std::string imageName = settings.count("image") ? settings["image"] : self;
  devmodel::DeviceNode* image = Image(imageName, error);
  if (image == nullptr) return false;
  uint64_t base = 0;
  if (!Number(settings, "offset", &base, settingsPath, error)) return false;
  const Geometry& g = images_[imageName];
  if (eraseSize != 0 && eraseSize != g.eraseSize && g.medium != Medium::kEmmc) {
    *error = root_ + "/proc/mtd: " + self + " (" + name + ") erase size differs from its image's";
    return false;
  }
  if (base > g.size || size > g.size - base || (g.eraseSize != 0 && base % g.eraseSize != 0)) {
    *error = settingsPath + ": offset and size do not fit image " + imageName;
    return false;
  }
  if (imageName == self) {
    sim_.ListInProcMtd(number, name, size, static_cast<uint32_t>(eraseSize));
    return true;
  }
  devmodel::DeviceNode* node = sim_.AddPartition(number, name, "/dev/" + imageName, base, size);
  if (node != nullptr && node->kind == SimKind::kEmmc) node->kind = SimKind::kRam;
  return true;
}

// Every dev/NAME.ini of medium emmc that no MTD partition is: a whole eMMC
// device, reached through its block node /dev/NAME.
bool DeviceRoot::LoadEmmcDevices(std::string* error) {
  DIR* dir = opendir((root_ + "/dev").c_str());
  if (dir == nullptr) return true;
  std::vector<std::string> names;
  while (const dirent* entry = readdir(dir)) {
    std::string file = entry->d_name;
    size_t stem = file.size() - kIniSuffixLength;
    if (file.size() > kIniSuffixLength && file.compare(stem, kIniSuffixLength, kIniSuffix) == 0)
      names.push_back(file.substr(0, stem));
  }
  closedir(dir);
  for (const std::string& name : names) {
    if (mtdSizes_.count(name) != 0 || images_.count(name) != 0) continue;
    Settings settings;
    if (!ReadSettings(root_ + "/dev/" + name + ".ini", &settings, error)) return false;
    auto medium = settings.find("medium");
    if (medium != settings.end() && medium->second == "emmc" && Image(name, error) == nullptr) return false;
  }
  return true;
}

std::string HostPath(const std::string& root, const char* path) {
  if (path == nullptr) return "";
  for (const char* prefix : kDevicePrefixes)
    if (std::strncmp(path, prefix, std::strlen(prefix)) == 0) return root + path;
  return path;
}

}  // namespace hostsim
}  // namespace stbplat
