// flash read by physical offset (--raw, --bb, --oob): a partition's pages
// as its node gives them, bad blocks skipped, padded or read as they are,
// each page followed by its OOB bytes on request; the layout nanddump
// writes and host mode reads back as a device image.
#ifndef STBPLAT_TOOL_RAW_READ_H
#define STBPLAT_TOOL_RAW_READ_H

#include <string>

#include "device_table.h"

namespace stbtool {

enum class BadBlockMethod { kSkip, kPad, kDump };

// The names --bb takes, in the order of BadBlockMethod.
extern const char* const kBadBlockMethodNames[3];

// A method from its name; false for any other text.
bool ParseBadBlockMethod(const std::string& name, BadBlockMethod* method);

struct RawReadArgs {
  std::string label;           // the target as the user gave it
  unsigned long offset = 0;    // physical, on a page
  unsigned long length = 0;    // data bytes; with skipbad, good bytes only
  bool hasLength = false;      // else to the end of the partition
  BadBlockMethod method = BadBlockMethod::kSkip;
  bool oob = false;
  std::string output;          // "-" is standard output
};

void RunRawRead(const MtdPartition& partition, const RawReadArgs& args);

}  // namespace stbtool

#endif
