#include "device_root.h"

#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <vector>

#include "util/ini_core.h"

namespace stbplat {
namespace hostsim {
namespace {

constexpr int kMaxMtd = 30;
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

int MtdNumberOfPath(const char* path) {
  static const char kPrefix[] = "/dev/mtd";
  if (path == nullptr || std::strncmp(path, kPrefix, sizeof kPrefix - 1) != 0) return -1;
  const char* digits = path + sizeof kPrefix - 1;
  if (!std::isdigit(static_cast<unsigned char>(*digits))) return -1;
  char* end = nullptr;
  long number = std::strtol(digits, &end, 10);
  if (*end != '\0' || number >= kMaxMtd) return -1;
  return static_cast<int>(number);
}

std::unique_ptr<DeviceRoot> DeviceRoot::Load(const std::string& root, std::string* error) {
  std::unique_ptr<DeviceRoot> device(new DeviceRoot(root));
  std::string tablePath = root + "/proc/mtd";
  std::ifstream table(tablePath);
  if (!table) {
    *error = tablePath + ": cannot be read";
    return nullptr;
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
    char name[101] = {0};
    if (std::sscanf(line.c_str(), "mtd%d: %llx %llx \"%100[^\"]\"", &number, &size, &erase, name) != 4 ||
        number < 0 || number >= kMaxMtd) {
      *error = tablePath + ": cannot read line '" + line + "'";
      return nullptr;
    }
    rows.push_back({number, size, erase, name});
    device->mtdSizes_["mtd" + std::to_string(number)] = {size, erase};
    device->mtdNames_["mtd" + std::to_string(number)] = name;
  }
  for (const Row& row : rows)
    if (!device->LoadNode(row.number, row.size, row.eraseSize, row.name, error)) return nullptr;
  return device;
}

FlashImage* DeviceRoot::Image(const std::string& name, std::string* error) {
  auto found = images_.find(name);
  if (found != images_.end()) return found->second.get();
  std::string path = root_ + "/dev/" + name;
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
  std::unique_ptr<FlashImage> image = FlashImage::Open(path, g, error);
  if (!image) return nullptr;
  FlashImage* raw = image.get();
  images_[name] = std::move(image);
  return raw;
}

bool DeviceRoot::LoadNode(int number, uint64_t size, uint64_t eraseSize, const std::string& name,
                          std::string* error) {
  std::string self = "mtd" + std::to_string(number);
  std::string settingsPath = root_ + "/dev/" + self + ".ini";
  Settings settings;
  if (!ReadSettings(settingsPath, &settings, error)) return false;
  std::string imageName = settings.count("image") ? settings["image"] : self;
  MtdNode node;
  node.image = Image(imageName, error);
  if (node.image == nullptr) return false;
  if (!Number(settings, "offset", &node.base, settingsPath, error)) return false;
  node.geometry = node.image->geometry();
  node.geometry.size = size;
  if (eraseSize != 0 && eraseSize != node.geometry.eraseSize && node.geometry.medium != Medium::kEmmc) {
    *error = root_ + "/proc/mtd: " + self + " (" + name + ") erase size differs from its image's";
    return false;
  }
  if (node.base > node.image->geometry().size || size > node.image->geometry().size - node.base ||
      (node.geometry.eraseSize != 0 && node.base % node.geometry.eraseSize != 0)) {
    *error = settingsPath + ": offset and size do not fit image " + imageName;
    return false;
  }
  nodes_[number] = node;
  return true;
}

MtdNode* DeviceRoot::Node(int number) {
  auto it = nodes_.find(number);
  return it == nodes_.end() ? nullptr : &it->second;
}

std::string DeviceRoot::HostPath(const char* path) const {
  if (path == nullptr) return "";
  for (const char* prefix : kDevicePrefixes)
    if (std::strncmp(path, prefix, std::strlen(prefix)) == 0) return root_ + path;
  return path;
}

}  // namespace hostsim
}  // namespace stbplat
