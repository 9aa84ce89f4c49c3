// Checks the framing of a stored record byte by byte, before any reader is
// trusted with it: entry headers, sizes against their containers, counts
// against the room they need, nested entry types and major versions. The
// first error stops the check; it names the byte offset of the field at
// fault. Warnings (bytes a reader would skip) do not stop it.
#ifndef STBPLAT_TOOL_RECORD_CHECK_H
#define STBPLAT_TOOL_RECORD_CHECK_H

#include <cstddef>
#include <string>
#include <vector>

#include "record_kinds.h"

namespace stbtool {

struct CheckIssue {
  unsigned long offset;  // of the field at fault, counted like the input
  std::string where;     // path of nested entries, such as FSBL/MCFG/MCET[1]
  std::string message;
  bool error;
};

struct CheckResult {
  RecordKind kind = RecordKind::kUnknown;
  unsigned long end = 0;         // first byte behind the record
  std::vector<CheckIssue> issues;
  bool ok() const;
  const CheckIssue* firstError() const;
};

// Checks the record at data[0]; `base` is the offset of data[0] in the
// input, added to every offset reported. kind kUnknown detects the type from
// the type code; with no known code the bytes must pass as a package header:
// its size and count, tags of up to 4 printable characters padded with zero
// bytes, and location names in the library's form (1 to 8 of A-Z, 0-9, '_'
// and '-', padded with '.'); an error then says the type code is unknown.
CheckResult CheckRecord(const unsigned char* data, size_t size, unsigned long base, RecordKind kind);

}  // namespace stbtool

#endif
