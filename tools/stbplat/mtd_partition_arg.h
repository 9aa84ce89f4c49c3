// An MTD partition named on the command line. Each of these names it:
// the flash layer's name (NAND0.KERNEL.A, NAND0...), the slot name in any
// case (nand0.kernel.a), the chip alone (NAND0), the node (mtd5, /dev/mtd5)
// and the kernel's own name from /proc/mtd (flash1.KERNEL.A, flash1).
#ifndef STBPLAT_TOOL_MTD_PARTITION_ARG_H
#define STBPLAT_TOOL_MTD_PARTITION_ARG_H

#include <string>

#include "device_table.h"
#include "mtdio/mtd_node.h"

namespace stbtool {

// The partition `text` names, or null.
const MtdPartition* FindMtdPartition(const DeviceTable& table, const std::string& text);

// The partition `text` names; a UsageError for `command` otherwise.
const MtdPartition& RequireMtdPartition(const DeviceTable& table, const std::string& text,
                                        const std::string& command);

// Opens p's node for reading and asks its geometry (with erase blocks, when
// needBlocks); a Failure for `what` naming the node and the reason otherwise.
void OpenPartitionNode(const MtdPartition& p, const std::string& what, bool needBlocks,
                       stbplat::mtdio::MtdNode* node, stbplat::mtdio::MtdGeometry* g);

// The kernel's name of /dev/mtdN, as /proc/mtd lists it; empty when unknown.
std::string KernelName(int number);

}  // namespace stbtool

#endif
