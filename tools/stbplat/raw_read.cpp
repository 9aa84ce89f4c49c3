#include "raw_read.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <vector>

#include "bad_blocks.h"
#include "command_file.h"
#include "mtd_partition_arg.h"
#include "mtdio/mtd_node.h"
#include "output.h"
#include "tool.h"

namespace stbtool {

const char* const kBadBlockMethodNames[3] = {"skipbad", "padbad", "dumpbad"};

namespace {

using stbplat::mtdio::EccCounts;
using stbplat::mtdio::MtdGeometry;
using stbplat::mtdio::MtdNode;

const char kCommand[] = "flash read";
// What stands in for a bad block's bytes with padbad, as erased flash reads.
constexpr unsigned char kPadByte = 0xFF;

std::string ErrorText(int error) { return std::strerror(error); }

// The bad blocks from the block holding `from` to the end, asked of the
// node block by block before anything is read.
std::vector<unsigned long> BadBlocksFrom(MtdNode& node, const MtdPartition& p, unsigned long block,
                                         unsigned long from) {
  std::vector<unsigned long> bad;
  for (unsigned long at = from - from % block; at < p.size; at += block) {
    bool isBad = false;
    if (!node.IsBadBlock(at, &isBad))
      throw Failure(std::string(kCommand) + ": " + p.path + ": cannot ask whether block " + std::to_string(at / block) +
                    " is bad: " + ErrorText(node.Error()));
    if (isBad) bad.push_back(at);
  }
  return bad;
}

// Bytes a read from `from` can give: every byte to the end, or with
// skipbad those of good blocks only.
unsigned long Available(const MtdPartition& p, unsigned long block, unsigned long from,
                        const std::vector<unsigned long>& bad, BadBlockMethod method) {
  unsigned long bytes = p.size - from;
  if (method != BadBlockMethod::kSkip) return bytes;
  for (unsigned long at : bad) bytes -= std::min(block, at + block - std::max(at, from));
  return bytes;
}

}  // namespace

bool ParseBadBlockMethod(const std::string& name, BadBlockMethod* method) {
  for (size_t i = 0; i < sizeof kBadBlockMethodNames / sizeof kBadBlockMethodNames[0]; ++i)
    if (name == kBadBlockMethodNames[i]) {
      *method = static_cast<BadBlockMethod>(i);
      return true;
    }
  return false;
}

void RunRawRead(const MtdPartition& p, const RawReadArgs& args) {
  const std::string what = std::string(kCommand) + ": " + args.label;
  MtdNode node;
  MtdGeometry g;
  OpenPartitionNode(p, what, true, &node, &g);
  const unsigned long page = std::max<unsigned long>(g.pageSize, 1), block = g.eraseSize;
  if (args.oob && g.oobSize == 0)
    throw UsageError(what + ": --oob: " + p.path + " (" + stbplat::mtdio::MtdTypeName(g.type) + ") has no OOB bytes");
  if (args.offset % page != 0)
    throw UsageError(what + ": raw reads start on a page (" + Hex(page) + " bytes); the page holding " +
                     Hex(args.offset) + " starts at " + Hex(args.offset - args.offset % page));
  if (args.offset >= p.size)
    throw UsageError(what + ": offset " + Hex(args.offset) + " lies past the end (" + Hex(p.size) + ")");
  const std::vector<unsigned long> bad = BadBlocksFrom(node, p, block, args.offset);
  const unsigned long available = Available(p, block, args.offset, bad, args.method);
  const unsigned long length = args.hasLength ? args.length : available;
  if (length > available)
    throw UsageError(what + ": --length " + Hex(length) + " runs past the end (" + std::to_string(available) +
                     " bytes left" + (args.method == BadBlockMethod::kSkip ? " in good blocks)" : ")"));
  if (args.oob && length % page != 0)
    throw UsageError(what + ": --oob reads whole pages: --length " + Hex(length) + " is not a multiple of " +
                     Hex(page));
  if (args.output == "-" && isatty(STDOUT_FILENO))
    throw UsageError(std::string(kCommand) + ": give -o FILE (standard output is a terminal)");

  CommandFile out(args.output, true);
  std::vector<unsigned char> data(block), oob(args.oob ? block / page * g.oobSize : 0);
  std::vector<unsigned long> met, eccFailed;
  EccCounts before;
  const bool counted = node.GetEccCounts(&before);
  Progress progress("reading " + args.label, length);
  for (unsigned long at = args.offset, left = length; left > 0;) {
    const unsigned long start = at - at % block;
    const unsigned long n = std::min(left, start + block - at);
    const bool isBad = std::binary_search(bad.begin(), bad.end(), start);
    if (isBad) met.push_back(start);
    if (isBad && args.method == BadBlockMethod::kSkip) {
      at = start + block;
      continue;
    }
    const unsigned long pages = (n + page - 1) / page;
    if (isBad && args.method == BadBlockMethod::kPad) {
      std::fill(data.begin(), data.end(), kPadByte);
      std::fill(oob.begin(), oob.end(), kPadByte);
    } else {
      if (!node.Read(at, data.data(), n))
        throw Failure(what + ": reading " + p.path + " failed at " + Hex(at) + ": " + ErrorText(node.Error()));
      for (unsigned long i = 0; args.oob && i < pages; ++i)
        if (!node.ReadOob(at + i * page, &oob[i * g.oobSize], g.oobSize))
          throw Failure(what + ": reading the OOB bytes of " + p.path + " failed at " + Hex(at + i * page) + ": " +
                        ErrorText(node.Error()));
    }
    EccCounts now;
    if (counted && node.GetEccCounts(&now) && now.failed != before.failed) {
      eccFailed.push_back(start);
      before = now;
    }
    if (!args.oob) out.Write(data.data(), n);
    for (unsigned long i = 0; args.oob && i < pages; ++i) {
      out.Write(&data[i * page], page);
      out.Write(&oob[i * g.oobSize], g.oobSize);
    }
    at += n;
    left -= n;
    progress.Update(length - left);
  }
  out.Close();
  static const char* const kDone[] = {"skipped", "padded with 0xFF", "read as they are"};
  if (!met.empty())
    std::cerr << what << ": " << BadBlockText(met, block) << " " << kDone[static_cast<int>(args.method)] << "\n";
  if (!eccFailed.empty())
    std::cerr << what << ": ECC failed (uncorrectable) in " << (eccFailed.size() == 1 ? "block " : "blocks ")
              << BlockList(eccFailed, block) << "; their bytes are as the chip gave them\n";
}

}  // namespace stbtool
