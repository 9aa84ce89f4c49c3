// Decodes a record with the library's own readers and describes it as a
// tree (for text and JSON output), with the records' own display output
// where the library has one.
#ifndef STBPLAT_TOOL_RECORD_DECODE_H
#define STBPLAT_TOOL_RECORD_DECODE_H

#include <string>
#include <vector>

#include "output.h"
#include "record_kinds.h"

namespace stbtool {

struct DecodedRecord {
  RecordKind kind = RecordKind::kUnknown;
  unsigned int status = 0;      // the reader's status, 0 when it read
  unsigned long size = 0;       // bytes the record takes
  Json tree;                    // its fields
  std::string display;          // the library's display lines, if any
};

// Reads the record at the start of bytes. kind kUnknown detects it from the
// type code; with no known code the bytes are read as a package header.
DecodedRecord DecodeRecord(const std::vector<unsigned char>& bytes, RecordKind kind);

// "0xA004 (wrong type, too little data or a nested record failed)".
std::string StatusText(unsigned int status);

// Indented "name: value" lines of a tree.
std::string TreeText(const Json& tree, int indent);

}  // namespace stbtool

#endif
