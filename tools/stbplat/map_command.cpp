// map: a picture of the device's flash, chips drawn to scale with their
// partitions and slots, bad blocks marked; on the terminal or as SVG.
#include <CLI/CLI.hpp>
#include <langinfo.h>

#include <clocale>
#include <cstring>

#include <algorithm>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

#include "actions.h"
#include "device_table.h"
#include "memory_layout.h"
#include "output.h"
#include "tool.h"

namespace stbtool {
namespace {

constexpr int kBarWidth = 64;  // columns inside a chip's bar
constexpr int kMargin = 8;     // columns left of the bar
constexpr int kSvgWidth = 880;
constexpr int kSvgLeft = 90;
constexpr int kSvgBarWidth = 760;
constexpr int kSvgRowHeight = 110;
constexpr int kSvgBarHeight = 48;

// One row of a bar: cells that cover the device, each [first, last) in
// columns, with a label.
struct Cell {
  unsigned long offset, size;
  std::string label;
  int first = 0, last = 0;
};
using Row = std::vector<Cell>;

std::string Fit(const std::string& text, int width) {
  if (width <= 0) return "";
  if (static_cast<int>(text.size()) <= width) return text + std::string(static_cast<size_t>(width) - text.size(), ' ');
  return text.substr(0, static_cast<size_t>(width));
}

std::string ShortSize(unsigned long bytes) {
  std::string s = HumanSize(bytes);
  size_t space = s.find(' ');
  if (space != std::string::npos) s = s.substr(0, space) + s.substr(space + 1, 1);
  return s;
}

int Column(unsigned long offset, unsigned long size) {
  return size == 0 ? 0 : static_cast<int>(offset * kBarWidth / size);
}

// Cells for the given ranges, with unlabelled cells for the gaps.
Row MakeRow(const std::vector<Cell>& ranges, unsigned long size) {
  Row row;
  unsigned long at = 0;
  for (const Cell& c : ranges) {
    if (c.offset > at) row.push_back({at, c.offset - at, "", 0, 0});
    row.push_back(c);
    at = c.offset + c.size;
  }
  if (at < size) row.push_back({at, size - at, "", 0, 0});
  for (Cell& c : row) {
    c.first = Column(c.offset, size);
    c.last = Column(c.offset + c.size, size);
  }
  return row;
}

// Box drawing where the terminal's locale is UTF-8, ASCII elsewhere.
struct Glyphs {
  const char *topLeft, *topRight, *bottomLeft, *bottomRight, *left, *right, *cross, *up, *down, *across, *side;
  const char *bad, *good;
};

const Glyphs& MapGlyphs() {
  static const Glyphs glyphs = [] {
    static const Glyphs box{"┌", "┐", "└", "┘", "├", "┤", "┼", "┴", "┬", "─", "│", "▓", "·"};
    static const Glyphs ascii{"+", "+", "+", "+", "+", "+", "+", "+", "+", "-", "|", "#", "."};
    const std::string saved = std::setlocale(LC_CTYPE, nullptr);
    std::setlocale(LC_CTYPE, "");
    const bool utf8 = std::strcmp(nl_langinfo(CODESET), "UTF-8") == 0;
    std::setlocale(LC_CTYPE, saved.c_str());
    return utf8 ? box : ascii;
  }();
  return glyphs;
}

bool BoundaryAt(const Row& row, int column) {
  for (const Cell& c : row)
    if (c.first == column || c.last == column) return true;
  return false;
}

// The line between two rows (either may be null: the top or bottom edge).
std::string Rule(const Row* above, const Row* below) {
  std::string line;
  for (int c = 0; c <= kBarWidth; ++c) {
    bool up = above && BoundaryAt(*above, c);
    bool down = below && BoundaryAt(*below, c);
    const Glyphs& g = MapGlyphs();
    if (c == 0) line += !above ? g.topLeft : !below ? g.bottomLeft : g.left;
    else if (c == kBarWidth) line += !above ? g.topRight : !below ? g.bottomRight : g.right;
    else if (up && down) line += g.cross;
    else if (up) line += g.up;
    else if (down) line += g.down;
    else line += g.across;
  }
  return line;
}

std::string Cells(const Row& row) {
  std::string line = MapGlyphs().side;
  for (const Cell& c : row) line += Fit(c.label, c.last - c.first - 1) + MapGlyphs().side;
  return line;
}

bool BadInColumn(const LayoutDevice& device, int column) {
  if (device.size == 0) return false;
  unsigned long from = static_cast<unsigned long>(column) * device.size / kBarWidth;
  unsigned long to = static_cast<unsigned long>(column + 1) * device.size / kBarWidth;
  for (unsigned long bad : device.badBlocks)
    if (bad < to && bad + device.eraseSize > from) return true;
  return false;
}

std::string DeviceTitle(const LayoutDevice& device) {
  std::ostringstream title;
  std::string technology = device.technology;
  while (!technology.empty() && technology.back() == '.') technology.pop_back();
  title << device.name << "  " << (technology.empty() ? MediumName(device.medium) : technology) << " "
        << HumanSize(device.size);
  if (device.medium == Medium::kNor && device.base != 0) title << " at " << Hex(device.base);
  if (device.eraseSize) title << ", " << HumanSize(device.eraseSize) << (device.medium == Medium::kNand ? " blocks" : " sectors");
  if (device.pageSize) title << ", " << HumanSize(device.pageSize) << " pages";
  if (device.medium == Medium::kNand)
    title << ", " << device.badBlocks.size() << " bad block" << (device.badBlocks.size() == 1 ? "" : "s");
  if (!device.wholeNode.empty()) title << "  [" << device.wholeNode << "]";
  return title.str();
}

std::string SlotLabel(const LayoutSlot& s) {
  std::string node = s.node.compare(0, 5, "/dev/") == 0 ? s.node.substr(5) : s.node;
  return s.name + " " + ShortSize(s.size) + (node.empty() ? "" : " " + node);
}

void DrawTerminal(const std::vector<LayoutDevice>& devices) {
  const std::string pad(kMargin, ' ');
  for (const LayoutDevice& device : devices) {
    std::vector<Cell> partitions, slots;
    for (const LayoutPartition& p : device.partitions) {
      partitions.push_back({p.offset, p.size, p.name, 0, 0});
      for (const LayoutSlot& s : p.slots) slots.push_back({s.offset, s.size, SlotLabel(s), 0, 0});
    }
    Row partitionRow = MakeRow(partitions, device.size);
    Row slotRow = MakeRow(slots, device.size);
    std::cout << DeviceTitle(device) << "\n";
    std::string ruler(static_cast<size_t>(kBarWidth) + 1, ' ');
    for (const Cell& c : partitionRow) {
      std::string mark = Hex(c.offset);
      size_t at = static_cast<size_t>(c.first);
      if (!c.label.empty() && (at == 0 || ruler[at - 1] == ' ') && at + mark.size() <= ruler.size())
        ruler.replace(at, mark.size(), mark);
    }
    while (!ruler.empty() && ruler.back() == ' ') ruler.pop_back();
    std::cout << pad << ruler << "\n";
    std::cout << pad << Rule(nullptr, &partitionRow) << "\n";
    std::cout << "  part  " << Cells(partitionRow) << "\n";
    std::cout << pad << Rule(&partitionRow, &slotRow) << "\n";
    std::cout << "  slots " << Cells(slotRow) << "\n";
    if (device.medium == Medium::kNand) {
      std::string blocks = MapGlyphs().side;
      for (int c = 1; c < kBarWidth; ++c) blocks += BadInColumn(device, c) ? MapGlyphs().bad : MapGlyphs().good;
      blocks += MapGlyphs().side;
      std::cout << "  bad   " << blocks << "\n";
    }
    std::cout << pad << Rule(&slotRow, nullptr) << "\n";
    if (!device.badBlocks.empty()) {
      std::cout << pad << "bad blocks:";
      for (unsigned long bad : device.badBlocks)
        std::cout << " " << bad / (device.eraseSize ? device.eraseSize : 1) << " (at " << Hex(bad) << ")";
      std::cout << "\n";
    }
    std::cout << "\n";
  }
}

std::string Escape(const std::string& text) {
  std::string out;
  for (char c : text) {
    if (c == '<') out += "&lt;";
    else if (c == '>') out += "&gt;";
    else if (c == '&') out += "&amp;";
    else out += c;
  }
  return out;
}

double SvgX(unsigned long offset, unsigned long size) {
  return kSvgLeft + (size ? static_cast<double>(offset) * kSvgBarWidth / static_cast<double>(size) : 0);
}

std::string Svg(const std::vector<LayoutDevice>& devices) {
  std::ostringstream svg;
  int height = static_cast<int>(devices.size()) * kSvgRowHeight + 20;
  svg << "<svg xmlns=\"http://www.w3.org/2000/svg\" width=\"" << kSvgWidth << "\" height=\"" << height
      << "\" font-family=\"monospace\" font-size=\"12\">\n"
      << "<defs><pattern id=\"bad\" width=\"6\" height=\"6\" patternUnits=\"userSpaceOnUse\" "
         "patternTransform=\"rotate(45)\"><rect width=\"3\" height=\"6\" fill=\"#c0392b\"/></pattern></defs>\n"
      << "<rect width=\"100%\" height=\"100%\" fill=\"white\"/>\n";
  static const char* const fills[] = {"#d6eaf8", "#d5f5e3", "#fcf3cf", "#fadbd8", "#e8daef", "#d0ece7"};
  int y = 10;
  for (const LayoutDevice& device : devices) {
    svg << "<text x=\"10\" y=\"" << y + 14 << "\" font-weight=\"bold\">" << Escape(DeviceTitle(device)) << "</text>\n";
    int partY = y + 24, slotY = partY + kSvgBarHeight / 2;
    size_t colour = 0;
    svg << "<rect x=\"" << kSvgLeft << "\" y=\"" << partY << "\" width=\"" << kSvgBarWidth << "\" height=\"" << kSvgBarHeight
        << "\" fill=\"#eeeeee\" stroke=\"#333\"/>\n";
    for (const LayoutPartition& p : device.partitions) {
      double x = SvgX(p.offset, device.size), w = SvgX(p.offset + p.size, device.size) - x;
      svg << "<rect x=\"" << x << "\" y=\"" << partY << "\" width=\"" << w << "\" height=\"" << kSvgBarHeight / 2
          << "\" fill=\"" << fills[colour++ % 6] << "\" stroke=\"#333\"><title>" << Escape(device.name + "." + p.name) << " at "
          << Hex(p.offset) << ", " << HumanSize(p.size) << "</title></rect>\n"
          << "<text x=\"" << x + 4 << "\" y=\"" << partY + 16 << "\">" << Escape(p.name) << "</text>\n"
          << "<text x=\"" << x << "\" y=\"" << partY + kSvgBarHeight + 14 << "\" fill=\"#555\" font-size=\"10\">"
          << Hex(p.offset) << "</text>\n";
      for (const LayoutSlot& s : p.slots) {
        double sx = SvgX(s.offset, device.size), sw = SvgX(s.offset + s.size, device.size) - sx;
        svg << "<rect x=\"" << sx << "\" y=\"" << slotY << "\" width=\"" << sw << "\" height=\"" << kSvgBarHeight / 2
            << "\" fill=\"white\" stroke=\"#333\"><title>" << Escape(device.name + "." + p.name + "." + s.name) << "</title></rect>\n"
            << "<text x=\"" << sx + 4 << "\" y=\"" << slotY + 16 << "\" fill=\"#333\">" << Escape(SlotLabel(s)) << "</text>\n";
      }
    }
    for (unsigned long bad : device.badBlocks) {
      double x = SvgX(bad, device.size), w = SvgX(bad + device.eraseSize, device.size) - x;
      svg << "<rect x=\"" << x << "\" y=\"" << partY << "\" width=\"" << w << "\" height=\"" << kSvgBarHeight
          << "\" fill=\"url(#bad)\" opacity=\"0.6\"><title>bad block at " << Hex(bad) << "</title></rect>\n";
    }
    svg << "<text x=\"10\" y=\"" << partY + 16 << "\">partitions</text>\n"
        << "<text x=\"10\" y=\"" << slotY + 16 << "\">slots</text>\n";
    y += kSvgRowHeight;
  }
  svg << "</svg>\n";
  return svg.str();
}

Json MapJson(const std::vector<LayoutDevice>& devices, bool fromMemoryMap) {
  Json list = Json::array();
  for (const LayoutDevice& device : devices) {
    Json partitions = Json::array();
    for (const LayoutPartition& p : device.partitions) {
      Json slots = Json::array();
      for (const LayoutSlot& s : p.slots)
        slots.push_back({{"name", s.name}, {"offset", s.offset}, {"size", s.size}, {"node", s.node}});
      partitions.push_back({{"name", p.name}, {"offset", p.offset}, {"size", p.size}, {"slots", slots}});
    }
    Json bad = Json::array();
    for (unsigned long b : device.badBlocks) bad.push_back(b);
    list.push_back({{"name", device.name}, {"technology", device.technology}, {"medium", MediumName(device.medium)},
                    {"base", device.base}, {"size", device.size}, {"eraseSize", device.eraseSize},
                    {"pageSize", device.pageSize}, {"partitions", partitions}, {"badBlocks", bad}});
  }
  return {{"source", fromMemoryMap ? "memory map" : "MTD table"}, {"devices", list}};
}

void RunMap(const std::string& svgFile) {
  DeviceTable table = LoadDeviceTable(true);
  bool fromMemoryMap = false;
  std::vector<LayoutDevice> devices = LoadLayout(table, &fromMemoryMap);
  if (devices.empty()) throw Failure("map: no memory map and no MTD partitions to draw");
  if (!svgFile.empty()) {
    std::string svg = Svg(devices);
    if (svgFile == "-") {
      std::cout << svg;
      return;
    }
    std::ofstream out(svgFile);
    out << svg;
    if (!out) throw Failure("map: cannot write " + svgFile);
  }
  if (Options().json) PrintJson(MapJson(devices, fromMemoryMap));
  else DrawTerminal(devices);
}

}  // namespace

void RegisterMapCommand(CLI::App& app) {
  static std::string svg;
  CLI::App* map = app.add_subcommand("map", "Picture of the device's flash: chips, partitions and slots to scale, bad blocks marked");
  map->add_option("--svg", svg, "Also write the picture as SVG to FILE (- for standard output only)");
  SetAction(map, []() { RunMap(svg); });
}

}  // namespace stbtool
