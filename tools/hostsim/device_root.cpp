#include "device_root.h"

#include "disk_root.h"

#include <dirent.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iterator>
#include <regex>
#include <sstream>
#include <vector>

#include "util/ini_core.h"

namespace stbplat {
namespace hostsim {
namespace {

using devmodel::Geometry;
using devmodel::Medium;
using devmodel::ParseNumber;
using devmodel::SimKind;

constexpr int kMaxMtd = 30;
constexpr const char kIniSuffix[] = ".ini";
constexpr size_t kIniSuffixLength = sizeof kIniSuffix - 1;
constexpr uint64_t kDefaultNandPage = 2048;
// MEMGETINFO reports the erase, page and OOB sizes in 32-bit fields.
constexpr uint64_t kMax32 = 0xFFFFFFFFu;
constexpr const char* kDevicePrefixes[] = {"/dev/", "/proc/", "/sys/"};
constexpr const char* kKeys[] = {"medium",   "size",      "erasesize", "writesize", "oobsize",  "layout",  "image",
                                 "offset",   "readonly",  "weakpages", "eccpages",  "fullfrom", "powercut"};
// A line of /proc/mtd as the kernel prints it: "mtdN: size erasesize "name"",
// both sizes in hexadecimal without 0x.
const char kTableLine[] = "mtd([0-9]{1,3}): ([0-9a-fA-F]{1,16}) ([0-9a-fA-F]{1,16}) \"([^\"]{1,100})\"";

std::string Hex(uint64_t value) {
  char text[24];
  std::snprintf(text, sizeof text, "0x%llX", static_cast<unsigned long long>(value));
  return text;
}

bool PowerOfTwo(uint64_t value) { return value != 0 && (value & (value - 1)) == 0; }

// dev/NAME.ini: known keys, each once, with the line it is on.
struct Settings {
  std::string path;
  std::map<std::string, std::pair<std::string, int>> values;  // key: value and line
  FILE* file = nullptr;
  int line = 0;
  std::string error;  // the first refused key
  int errorLine = 0;

  bool Has(const char* key) const { return values.count(key) != 0; }
  const std::string& Value(const char* key) const { return values.at(key).first; }
  // "path:line" of key, or the path alone when the key is not set.
  std::string Where(const std::string& key) const {
    auto it = values.find(key);
    return it == values.end() ? path : path + ":" + std::to_string(it->second.second);
  }
};

char* NextLine(char* buffer, int size, void* context) {
  auto* settings = static_cast<Settings*>(context);
  char* line = std::fgets(buffer, size, settings->file);
  if (line != nullptr) ++settings->line;
  return line;
}

bool Collect(void* user, const char*, const char* name, const char* value) {
  auto* settings = static_cast<Settings*>(user);
  std::string refusal;
  if (std::find_if(std::begin(kKeys), std::end(kKeys), [&](const char* key) { return std::strcmp(key, name) == 0; }) ==
      std::end(kKeys))
    refusal = std::string("unknown key '") + name + "'";
  else if (settings->Has(name))
    refusal = std::string(name) + " given again (first at line " + std::to_string(settings->values[name].second) + ")";
  else
    settings->values[name] = {value, settings->line};
  if (!refusal.empty() && settings->error.empty()) {
    settings->error = settings->path + ":" + std::to_string(settings->line) + ": " + refusal;
    settings->errorLine = settings->line;
  }
  return refusal.empty();
}

// dev/NAME.ini; an absent file is no settings.
bool ReadSettings(const std::string& path, Settings* settings, std::string* error) {
  settings->path = path;
  settings->file = std::fopen(path.c_str(), "r");
  if (settings->file == nullptr) return true;
  int bad = ini::IniParse(NextLine, settings, Collect, nullptr, settings, path.c_str());
  std::fclose(settings->file);
  settings->file = nullptr;
  if (bad == 0) return true;
  *error = bad == settings->errorLine ? settings->error : path + ":" + std::to_string(bad) + ": bad line";
  return false;
}

// The setting key as a number from low to high; an absent key leaves value.
bool Number(const Settings& settings, const char* key, uint64_t low, uint64_t high, uint64_t* value,
            std::string* error) {
  if (!settings.Has(key)) return true;
  const std::string& text = settings.Value(key);
  uint64_t parsed = 0;
  std::string where = settings.Where(key) + ": " + key + " = " + text;
  if (!ParseNumber(text, &parsed)) {
    *error = where + ": not a decimal or 0x hexadecimal number";
    return false;
  }
  if (parsed < low || parsed > high) {
    *error = where + ": out of range (" + std::to_string(low) + " to " + Hex(high) + ")";
    return false;
  }
  *value = parsed;
  return true;
}

bool Refuse(const std::string& where, const std::string& what, std::string* error) {
  *error = where + ": " + what;
  return false;
}

// A list of offsets in an image of `size` bytes, separated by blanks.
bool Offsets(const Settings& settings, const char* key, uint64_t size, std::vector<uint64_t>* offsets,
             std::string* error) {
  if (!settings.Has(key)) return true;
  std::istringstream words(settings.Value(key));
  std::string where = settings.Where(key) + ": " + key;
  for (std::string word; words >> word;) {
    uint64_t offset = 0;
    if (!ParseNumber(word, &offset) || offset >= size) {
      *error = where + ": " + word + " is not an offset in the image (0 to " + Hex(size - 1) + ")";
      return false;
    }
    offsets->push_back(offset);
  }
  return true;
}

bool YesNo(const Settings& settings, const char* key, bool* value, std::string* error) {
  if (!settings.Has(key)) return true;
  const std::string& text = settings.Value(key);
  if (text != "yes" && text != "no") {
    *error = settings.Where(key) + ": " + key + " = " + text + " (expected yes or no)";
    return false;
  }
  *value = text == "yes";
  return true;
}

// The faults an image declares, on its node at path.
bool ApplyFaults(const Settings& s, const Geometry& g, const std::string& path, devmodel::FlashSim& sim,
                 std::string* error) {
  std::vector<uint64_t> weak, ecc;
  uint64_t fullFrom = g.size, powerCut = 0;
  if (!Offsets(s, "weakpages", g.size, &weak, error) || !Offsets(s, "eccpages", g.size, &ecc, error) ||
      !Number(s, "fullfrom", 0, g.size, &fullFrom, error) || !Number(s, "powercut", 0, UINT64_MAX, &powerCut, error))
    return false;
  const bool flash = g.medium != Medium::kEmmc;
  if ((!weak.empty() || !ecc.empty()) && g.medium != Medium::kNand)
    return Refuse(s.Where(weak.empty() ? "eccpages" : "weakpages"), "pages that fail are NAND pages", error);
  if (flash && fullFrom % g.writeSize != 0)
    return Refuse(s.Where("fullfrom"), "fullfrom " + Hex(fullFrom) + " is not on a page of " + Hex(g.writeSize),
                  error);
  for (uint64_t offset : weak) sim.FailWritesAt(path, offset);
  for (uint64_t offset : ecc) sim.AddEccFailure(path, offset);
  if (s.Has("fullfrom")) sim.FullFrom(path, fullFrom);
  if (s.Has("powercut")) sim.CutPowerAfter(path, powerCut);
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

// An image's geometry, with where each of its numbers comes from.
struct Layout {
  Geometry g;
  std::string sizeFrom, eraseFrom, writeFrom;
};

bool ParseMedium(const Settings& settings, Medium* medium, std::string* error) {
  if (!settings.Has("medium")) return true;
  const std::string& text = settings.Value("medium");
  if (text == "nor") *medium = Medium::kNor;
  else if (text == "nand") *medium = Medium::kNand;
  else if (text == "emmc") *medium = Medium::kEmmc;
  else return Refuse(settings.Where("medium"), "medium = " + text + " (expected nor, nand or emmc)", error);
  return true;
}

// The settings over the defaults in layout, checked as the kernel would
// have them: pages a power of two dividing the erase block, the image whole
// erase blocks, room for the bad-block marker in an image with OOB bytes.
bool ApplySettings(const Settings& s, Layout* layout, std::string* error) {
  Geometry& g = layout->g;
  if (!ParseMedium(s, &g.medium, error)) return false;
  if (g.medium == Medium::kNand) g.writeSize = kDefaultNandPage;
  if (!Number(s, "size", 1, UINT64_MAX, &g.size, error) || !Number(s, "erasesize", 1, kMax32, &g.eraseSize, error) ||
      !Number(s, "writesize", 1, kMax32, &g.writeSize, error) || !Number(s, "oobsize", 0, kMax32, &g.oobSize, error))
    return false;
  if (s.Has("size")) layout->sizeFrom = s.Where("size");
  if (s.Has("erasesize")) layout->eraseFrom = s.Where("erasesize");
  if (s.Has("writesize")) layout->writeFrom = s.Where("writesize");
  const bool flash = g.medium != Medium::kEmmc;
  if (g.size == 0) return Refuse(layout->sizeFrom, "the size must not be 0", error);
  if (flash && g.eraseSize == 0) return Refuse(layout->eraseFrom, "a flash image needs an erase size", error);
  if (g.medium == Medium::kNand && !PowerOfTwo(g.eraseSize))
    return Refuse(layout->eraseFrom, "erase size " + Hex(g.eraseSize) + ": a NAND erase block is a power of two",
                  error);
  if (!PowerOfTwo(g.writeSize) || (g.eraseSize != 0 && g.eraseSize % g.writeSize != 0))
    return Refuse(layout->writeFrom,
                  "page size " + std::to_string(g.writeSize) + " is not a power of two dividing the erase size " +
                      Hex(g.eraseSize),
                  error);
  if (g.eraseSize != 0 && g.size % g.eraseSize != 0)
    return Refuse(layout->sizeFrom, "size " + Hex(g.size) + " is not whole erase blocks of " + Hex(g.eraseSize), error);
  const bool dump = g.medium == Medium::kNand && g.oobSize != 0;
  const std::string oob = s.Has("layout") ? s.Value("layout") : dump ? "oob" : "plain";
  if (oob != "oob" && oob != "plain")
    return Refuse(s.Where("layout"), "layout = " + oob + " (expected oob or plain)", error);
  g.oobInImage = oob == "oob";
  if (g.oobInImage && (g.medium != Medium::kNand || g.oobSize <= devmodel::BadMarkerByte(g)))
    return Refuse(s.Where("layout"),
                  "layout = oob needs a NAND image whose oobsize holds the bad-block marker (byte " +
                      std::to_string(devmodel::BadMarkerByte(g)) + ")",
                  error);
  return true;
}

}  // namespace

bool DeviceRoot::Load(const std::string& root, devmodel::FlashSim& sim, std::string* error) {
  DeviceRoot device(root, sim);
  std::string tablePath = root + "/proc/mtd";
  std::ifstream table(tablePath);
  if (!table) {
    *error = tablePath + ": cannot be read";
    return false;
  }
  const std::regex format(kTableLine);
  std::vector<Row> rows;
  std::map<int, int> lineOf;
  std::string line;
  std::getline(table, line);  // column header
  for (int number = 2; std::getline(table, line); ++number) {
    if (line.empty()) continue;
    std::smatch match;
    std::string where = tablePath + ":" + std::to_string(number);
    Row row{std::stoi(std::regex_match(line, match, format) ? match[1].str() : "-1"), 0, 0, "", where};
    if (row.number < 0 || row.number >= kMaxMtd || !ParseNumber("0x" + match[2].str(), &row.size) ||
        !ParseNumber("0x" + match[3].str(), &row.eraseSize) || row.eraseSize > kMax32)
      return Refuse(where, "cannot read line '" + line + "' (mtd0 to mtd29, sizes in hexadecimal)", error);
    if (lineOf.count(row.number) != 0)
      return Refuse(where, "mtd" + match[1].str() + " listed again (first at line " +
                               std::to_string(lineOf[row.number]) + ")",
                    error);
    lineOf[row.number] = number;
    row.name = match[4].str();
    rows.push_back(row);
    device.rows_["mtd" + std::to_string(row.number)] = row;
  }
  for (const Row& row : rows)
    if (!device.LoadNode(row, error)) return false;
  return device.LoadEmmcDevices(error);
}

devmodel::DeviceNode* DeviceRoot::Image(const std::string& name, std::string* error) {
  std::string devicePath = "/dev/" + name;
  if (images_.count(name) != 0) return sim_.Find(devicePath);
  std::string path = root_ + devicePath;
  Settings settings;
  if (!ReadSettings(path + ".ini", &settings, error)) return nullptr;
  Layout layout;
  layout.writeFrom = path + ".ini";
  auto row = rows_.find(name);
  if (row != rows_.end()) {
    layout.g.medium = GuessMedium(row->second.name);
    layout.g.size = row->second.size;
    layout.g.eraseSize = row->second.eraseSize;
    layout.sizeFrom = layout.eraseFrom = row->second.where;
  } else {
    layout.g.medium = Medium::kEmmc;
    layout.sizeFrom = layout.eraseFrom = path + ".ini";
  }
  if (!ApplySettings(settings, &layout, error)) return nullptr;
  const Geometry& g = layout.g;
  std::unique_ptr<devmodel::SimStorage> storage = devmodel::OpenImageStorage(path, g, error);
  if (!storage) return nullptr;
  images_[name] = g;
  // An eMMC image under an MTD node is an MTD over a block device.
  SimKind kind = g.medium == Medium::kNand  ? SimKind::kNand
                 : g.medium == Medium::kNor ? SimKind::kNor
                 : row != rows_.end()       ? SimKind::kRam
                                            : SimKind::kEmmc;
  devmodel::DeviceNode* node = sim_.AddNode(devicePath, kind, std::move(storage), static_cast<uint32_t>(g.eraseSize),
                                            static_cast<uint32_t>(g.writeSize), static_cast<uint32_t>(g.oobSize));
  bool readOnly = false;
  if (!YesNo(settings, "readonly", &readOnly, error) || !ApplyFaults(settings, g, devicePath, sim_, error))
    return nullptr;
  if (readOnly) sim_.SetReadOnly(devicePath);
  return node;
}

bool DeviceRoot::LoadNode(const Row& row, std::string* error) {
  std::string self = "mtd" + std::to_string(row.number);
  Settings settings;
  if (!ReadSettings(root_ + "/dev/" + self + ".ini", &settings, error)) return false;
  std::string imageName = settings.Has("image") ? settings.Value("image") : self;
  if (imageName.empty() || imageName.find('/') != std::string::npos)
    return Refuse(settings.Where("image"), "image = " + imageName + " (a file name in dev/)", error);
  // A window takes its geometry from its image.
  const bool window = imageName != self;
  for (const auto& setting : settings.values) {
    const std::string& key = setting.first;
    if (window && key != "image" && key != "offset" && key != "readonly")
      return Refuse(settings.Where(key), key + " belongs in " + imageName + ".ini, the settings of the image", error);
    if (!window && key == "offset")
      return Refuse(settings.Where(key), "offset without image = another image to be a window of", error);
  }
  devmodel::DeviceNode* image = Image(imageName, error);
  if (image == nullptr) return false;
  uint64_t base = 0;
  if (!Number(settings, "offset", 0, UINT64_MAX, &base, error)) return false;
  const Geometry& g = images_[imageName];
  const std::string what = self + " (" + row.name + ")";
  if (g.medium != Medium::kEmmc && row.eraseSize != g.eraseSize)
    return Refuse(row.where, what + " erase size " + Hex(row.eraseSize) + " differs from its image's", error);
  if (g.eraseSize != 0 && row.size % g.eraseSize != 0)
    return Refuse(row.where, what + " size " + Hex(row.size) + " is not whole erase blocks of " + Hex(g.eraseSize),
                  error);
  if (g.eraseSize != 0 && base % g.eraseSize != 0)
    return Refuse(settings.Where("offset"), "offset " + Hex(base) + " is not on an erase block", error);
  if (base > g.size || row.size > g.size - base || (!window && row.size != g.size))
    return Refuse(window ? settings.Where("offset") : row.where,
                  what + ": " + Hex(row.size) + " bytes at " + Hex(base) + " do not fit image " + imageName + " (" +
                      Hex(g.size) + " bytes)",
                  error);
  if (!window) {
    sim_.ListInProcMtd(row.number, row.name, row.size, static_cast<uint32_t>(row.eraseSize));
    return true;
  }
  bool readOnly = false;
  if (!YesNo(settings, "readonly", &readOnly, error)) return false;
  devmodel::DeviceNode* node = sim_.AddPartition(row.number, row.name, "/dev/" + imageName, base, row.size);
  if (node != nullptr && node->kind == SimKind::kEmmc) node->kind = SimKind::kRam;
  if (readOnly) sim_.SetReadOnly("/dev/" + self);
  return true;
}

// Every other dev/NAME.ini is a whole eMMC device reached through its block
// node /dev/NAME; one of another medium would be an image nothing uses.
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
  std::sort(names.begin(), names.end());
  for (const std::string& name : names) {
    if (rows_.count(name) != 0 || images_.count(name) != 0 || IsDiskName(name)) continue;
    Settings settings;
    std::string path = root_ + "/dev/" + name + ".ini";
    if (!ReadSettings(path, &settings, error)) return false;
    if (!settings.Has("medium") || settings.Value("medium") != "emmc")
      return Refuse(path, "an image no partition uses (no mtd row names it) and no eMMC device (medium = emmc)",
                    error);
    if (Image(name, error) == nullptr) return false;
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
