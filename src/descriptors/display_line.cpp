#include "descriptors/display_line.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstring>

#include "descriptors/record_io.h"

namespace stbplat {
namespace records {

namespace {
constexpr unsigned int kMaxLabelIndent = kLabelLineSize - 1;
constexpr unsigned int kMaxPlainIndent = kIndentLineSize - 1;
}  // namespace

void DisplayLabelLine(const char* function, unsigned char indent, const char* valueFormat,
                      const char* label, ...) {
  if (!LogEnabled(eLogModuleRecords, eLogLevelDisplay)) return;
  char line[kLabelLineSize] = {};
  const unsigned int spaces = std::min<unsigned int>(indent, kMaxLabelIndent);
  std::memset(line, ' ', spaces);
  char value[kLabelLineSize] = {};
  va_list args;
  va_start(args, label);
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
  std::vsnprintf(value, sizeof value, valueFormat, args);
#pragma GCC diagnostic pop
  va_end(args);
  std::snprintf(line + spaces, kMaxLabelIndent - spaces, "%-20s = %s", label, value);
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, function, "%s", line);
}

void DisplayIndentLine(const char* function, unsigned char indent) {
  char line[kIndentLineSize] = {};
  std::memset(line, ' ', std::min<unsigned int>(indent, kMaxPlainIndent));
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, function, "%s", line);
}

}  // namespace records
}  // namespace stbplat
