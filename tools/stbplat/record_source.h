// Where a record is read from: a file (at an offset), standard input ("-"),
// or a component location on the device (DEVICE.PARTITION.SLOT[+OFFSET]).
#ifndef STBPLAT_TOOL_RECORD_SOURCE_H
#define STBPLAT_TOOL_RECORD_SOURCE_H

#include <string>
#include <vector>

namespace stbtool {

struct RecordSource {
  std::string label;                // as given
  bool isLocation = false;
  unsigned long base = 0;           // offset of bytes[0] in the file or slot
  std::vector<unsigned char> bytes; // from base to the end (file) or the record (location)
};

// A file that exists wins over a location of the same spelling. Throws
// UsageError for a source that is neither, Failure when reading fails.
RecordSource LoadRecordSource(const std::string& source, unsigned long offset);

}  // namespace stbtool

#endif
