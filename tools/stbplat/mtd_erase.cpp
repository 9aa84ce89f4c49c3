#include "mtd_erase.h"

#include <algorithm>
#include <cstring>
#include <iostream>
#include <vector>

#include "bad_blocks.h"
#include "mtd_partition_arg.h"
#include "mtdio/mtd_node.h"
#include "output.h"
#include "tool.h"

namespace stbtool {
namespace {

using stbplat::mtdio::MtdGeometry;
using stbplat::mtdio::MtdNode;

const char kCommand[] = "flash erase";
constexpr unsigned char kErasedByte = 0xFF;

std::string ErrorText(int error) { return std::strerror(error); }

// The good blocks of [from, to) and the bad ones, asked of the node.
void SortBlocks(MtdNode& node, const std::string& what, unsigned long from, unsigned long to, unsigned long block,
                std::vector<unsigned long>* good, std::vector<unsigned long>* bad) {
  for (unsigned long at = from; at < to; at += block) {
    bool isBad = false;
    if (!node.IsBadBlock(at, &isBad))
      throw Failure(what + ": cannot ask whether block " + std::to_string(at / block) +
                    " is bad: " + ErrorText(node.Error()) + "; nothing was erased");
    (isBad ? bad : good)->push_back(at);
  }
}

}  // namespace

void RunMtdErase(const MtdPartition& p, const RangeEraseArgs& args) {
  const std::string what = std::string(kCommand) + ": " + args.label;
  MtdNode node;
  MtdGeometry g;
  OpenPartitionNode(p, what, true, &node, &g);
  const unsigned long block = g.eraseSize;
  const unsigned long length = args.hasLength ? args.length : (args.offset < p.size ? p.size - args.offset : 0);
  if (args.offset % block != 0 || length % block != 0 || length == 0)
    throw UsageError(what + ": " + Hex(args.offset) + " +" + Hex(length) + " is not whole " + Hex(block) +
                     "-byte erase blocks (the block holding the offset starts at " +
                     Hex(args.offset - args.offset % block) + ")");
  if (args.offset > p.size || length > p.size - args.offset)
    throw UsageError(what + ": " + Hex(args.offset) + " +" + Hex(length) + " runs past the end of " + p.path + " (" +
                     Hex(p.size) + " bytes)");
  if (!g.writable) throw Failure(what + ": " + p.path + " is read-only; nothing was erased");
  std::vector<unsigned long> good, bad;
  SortBlocks(node, what, args.offset, args.offset + length, block, &good, &bad);
  if (!args.yes) throw UsageError(what + " changes the device; add --yes to go ahead");

  MtdNode writer;
  if (!writer.Open(p.path, true))
    throw Failure(what + ": cannot open " + p.path + " for writing: " + ErrorText(writer.Error()) +
                  "; nothing was erased");
  Progress progress("erasing " + args.label, good.size());
  for (size_t i = 0; i < good.size(); ++i) {
    if (!writer.Erase(good[i], block))
      throw Failure(what + ": erasing block " + std::to_string(good[i] / block) + " (at " + Hex(good[i]) +
                    ") failed: " + ErrorText(writer.Error()) + "; " + std::to_string(i) +
                    " blocks before it are erased");
    progress.Update(i + 1);
  }
  // Read back: an erase that reports success must have left erased bytes.
  std::vector<unsigned char> bytes(block);
  for (unsigned long at : good) {
    if (!writer.Read(at, bytes.data(), block))
      throw Failure(what + ": reading block " + std::to_string(at / block) + " back failed: " +
                    ErrorText(writer.Error()) + "; it may not be erased");
    const auto left = std::find_if(bytes.begin(), bytes.end(), [](unsigned char b) { return b != kErasedByte; });
    if (left != bytes.end())
      throw Failure(what + ": " + Hex(at + static_cast<unsigned long>(left - bytes.begin())) +
                    " is not erased after the erase");
  }
  if (Options().json) {
    Json skipped = Json::array();
    for (unsigned long at : bad) skipped.push_back(at);
    PrintJson({{"target", args.label}, {"device", p.path}, {"offset", args.offset}, {"length", length},
               {"erasedBlocks", good.size()}, {"skippedBadBlocks", skipped}});
    return;
  }
  std::cerr << "erased " << good.size() << (good.size() == 1 ? " block" : " blocks") << " of " << args.label << " ("
            << p.path << ", " << Hex(args.offset) << " to " << Hex(args.offset + length) << ")";
  if (!bad.empty()) std::cerr << "; skipped " << BadBlockText(bad, block);
  std::cerr << "\n";
}

}  // namespace stbtool
