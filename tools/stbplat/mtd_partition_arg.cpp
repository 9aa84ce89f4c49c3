#include "mtd_partition_arg.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <vector>

#include "mtdio/mtd_node.h"
#include "tool.h"

namespace stbtool {
namespace {

constexpr char kNodePrefix[] = "/dev/";
constexpr char kNodeName[] = "mtd";
// The flash layer pads a chip's name with '.' to this width (NAND0...).
constexpr size_t kDeviceNameWidth = 8;

std::string Upper(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::toupper(c); });
  return text;
}

// N of "mtdN" or "/dev/mtdN"; -1 otherwise.
int NodeNumber(std::string text) {
  if (text.compare(0, sizeof kNodePrefix - 1, kNodePrefix) == 0) text.erase(0, sizeof kNodePrefix - 1);
  if (text.compare(0, sizeof kNodeName - 1, kNodeName) != 0) return -1;
  const std::string digits = text.substr(sizeof kNodeName - 1);
  if (digits.empty() || digits.size() > 2 || !std::all_of(digits.begin(), digits.end(), ::isdigit)) return -1;
  return std::stoi(digits);
}

const MtdPartition* ByNumber(const DeviceTable& table, int number) {
  for (const MtdPartition& p : table.partitions)
    if (p.number == number) return &p;
  return nullptr;
}

}  // namespace

std::string KernelName(int number) {
  std::vector<stbplat::mtdio::ProcMtdRow> rows;
  if (!stbplat::mtdio::ReadProcMtd(&rows)) return "";
  for (const auto& row : rows)
    if (row.number == number) return row.name;
  return "";
}

const MtdPartition* FindMtdPartition(const DeviceTable& table, const std::string& text) {
  for (const MtdPartition& p : table.partitions)
    if (p.name == text) return &p;
  if (const MtdPartition* p = ByNumber(table, NodeNumber(text))) return p;
  std::vector<stbplat::mtdio::ProcMtdRow> rows;
  stbplat::mtdio::ReadProcMtd(&rows);
  for (const auto& row : rows)
    if (row.name == text) return ByNumber(table, row.number);
  // Names in any case; a chip without its padding.
  std::string upper = Upper(text);
  std::string padded = upper;
  if (padded.size() < kDeviceNameWidth && padded.find('.') == std::string::npos)
    padded.resize(kDeviceNameWidth, '.');
  for (const MtdPartition& p : table.partitions)
    if (p.name == upper || p.name == padded) return &p;
  for (const auto& row : rows)
    if (Upper(row.name) == upper) return ByNumber(table, row.number);
  return nullptr;
}

const MtdPartition& RequireMtdPartition(const DeviceTable& table, const std::string& text,
                                        const std::string& command) {
  const MtdPartition* p = FindMtdPartition(table, text);
  if (p == nullptr)
    throw UsageError(command + ": " + text +
                     ": no such MTD partition (give a name, mtdN or the kernel's name; see stbplat mtd list)");
  return *p;
}

void OpenPartitionNode(const MtdPartition& p, const std::string& what, bool needBlocks,
                       stbplat::mtdio::MtdNode* node, stbplat::mtdio::MtdGeometry* g) {
  if (!node->Open(p.path, false)) throw Failure(what + ": cannot open " + p.path + ": " + std::strerror(node->Error()));
  if (!node->GetGeometry(g) || (needBlocks && g->eraseSize == 0))
    throw Failure(what + ": " + p.path + " tells no geometry (MEMGETINFO): " + std::strerror(node->Error()));
}

}  // namespace stbtool
