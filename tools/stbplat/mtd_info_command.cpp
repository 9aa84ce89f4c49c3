// mtd info NAME: one partition in detail, as the kernel reports it on its
// node: type, size, erase blocks, page and OOB size, bad blocks, ECC
// counters, whether it may be written, and its names.
#include <CLI/CLI.hpp>

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "actions.h"
#include "bad_blocks.h"
#include "device_table.h"
#include "mtd_partition_arg.h"
#include "mtdio/mtd_node.h"
#include "output.h"
#include "tool.h"

namespace stbtool {
namespace {

using stbplat::mtdio::EccCounts;
using stbplat::mtdio::MtdGeometry;
using stbplat::mtdio::MtdNode;

const char kCommand[] = "mtd info";

void Line(const char* label, const std::string& value) { std::printf("  %-13s %s\n", label, value.c_str()); }

std::string Bytes(unsigned long n) { return std::to_string(n) + " bytes (" + HumanSize(n) + ")"; }

void RunMtdInfo(const std::string& name) {
  const DeviceTable table = LoadDeviceTable(false);
  const MtdPartition& p = RequireMtdPartition(table, name, kCommand);
  MtdNode node;
  MtdGeometry g;
  OpenPartitionNode(p, kCommand, false, &node, &g);
  const unsigned long blocks = g.eraseSize != 0 ? p.size / g.eraseSize : 0;
  std::vector<unsigned long> bad;
  bool badKnown = g.eraseSize != 0;
  for (unsigned long b = 0; badKnown && b < blocks; ++b) {
    bool isBad = false;
    badKnown = node.IsBadBlock(b * g.eraseSize, &isBad);
    if (isBad) bad.push_back(b * g.eraseSize);
  }
  EccCounts ecc;
  const bool eccKnown = node.GetEccCounts(&ecc);
  // A partition the kernel calls writable can still have a node that only
  // opens for reading (the kernel's read-only mtdNro node): ask it.
  MtdNode probe;
  const bool nodeWritable = probe.Open(p.path, true);
  const bool writable = g.writable && nodeWritable;
  const std::string kernelName = KernelName(p.number);

  if (Options().json) {
    Json badList = Json::array();
    for (unsigned long at : bad) badList.push_back(at);
    Json out = {{"mtd", p.number}, {"name", p.name}, {"kernelName", kernelName}, {"device", p.path},
                {"type", stbplat::mtdio::MtdTypeName(g.type)}, {"size", p.size}, {"eraseSize", g.eraseSize},
                {"eraseBlocks", blocks}, {"pageSize", g.pageSize}, {"oobSize", g.oobSize},
                {"badBlocks", badKnown ? badList : Json(nullptr)}, {"writable", writable}};
    out["ecc"] = eccKnown ? Json{{"corrected", ecc.corrected}, {"failed", ecc.failed},
                                 {"badBlocks", ecc.badBlocks}, {"bbtBlocks", ecc.bbtBlocks}}
                          : Json(nullptr);
    PrintJson(out);
    return;
  }
  std::printf("mtd%d: %s\n", p.number, p.name.c_str());
  Line("kernel name", kernelName.empty() ? "-" : kernelName);
  Line("node", p.path);
  Line("type", stbplat::mtdio::MtdTypeName(g.type));
  Line("size", Bytes(p.size));
  Line("erase blocks", std::to_string(blocks) + " of " + Bytes(g.eraseSize));
  Line("page", std::to_string(g.pageSize) + (g.pageSize == 1 ? " byte" : " bytes"));
  Line("OOB", std::to_string(g.oobSize) + " bytes a page");
  Line("bad blocks",
       !badKnown ? "-" : bad.empty() ? "0" : std::to_string(bad.size()) + ": " + BlockList(bad, g.eraseSize));
  Line("ECC", !eccKnown ? "-"
                        : std::to_string(ecc.corrected) + " corrected, " + std::to_string(ecc.failed) +
                              " failed; " + std::to_string(ecc.badBlocks) + " bad, " +
                              std::to_string(ecc.bbtBlocks) + " bad-block-table blocks");
  Line("writable", writable ? "yes" : !g.writable ? "no" : "no (" + p.path + " opens for reading only)");
}

}  // namespace

void RegisterMtdInfoCommand(CLI::App& mtd) {
  static std::string name;
  CLI::App* info = mtd.add_subcommand(
      "info", "One partition in detail: type, sizes, erase blocks, page and OOB size, bad blocks, ECC counters");
  info->add_option("NAME", name, "Partition: NAND0.KERNEL.A (any case), NAND0, mtd5, /dev/mtd5 or flash1.KERNEL.A")
      ->required();
  SetAction(info, []() { RunMtdInfo(name); });
}

}  // namespace stbtool
