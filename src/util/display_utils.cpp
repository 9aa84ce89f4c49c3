#include "stbplat/display_utils.h"

#include <cctype>
#include <cstdio>
#include <cstring>

#include "util/log_gate.h"

namespace {

constexpr const char* kSourceFile = "DisplayUtils";
constexpr const char* kFunction = "DumpBuffer";
constexpr unsigned int kBytesPerLine = 16;
constexpr unsigned int kHexWidth = 3;  // "%02X "
constexpr size_t kMaxIndent = 103;

class DumpLines {
 public:
  DumpLines(etLogUtilModuleId module, unsigned char indent) : module_(module) {
    const size_t spaces = indent > kMaxIndent ? kMaxIndent : indent;
    std::memset(indent_, ' ', spaces);
    indent_[spaces] = '\0';
    hex_[0] = '\0';
    text_[kBytesPerLine] = '\0';
  }

  void Put(unsigned int column, unsigned char byte) {
    const size_t at = column * kHexWidth;
    std::snprintf(hex_ + at, sizeof hex_ - at, "%02X ", byte);
    text_[column] = std::isprint(byte) != 0 ? static_cast<char>(byte) : '.';
  }

  void Pad(unsigned int column) {
    const size_t at = column * kHexWidth;
    std::snprintf(hex_ + at, sizeof hex_ - at, "%s", "   ");
    text_[column] = ' ';
  }

  void Emit() const {
    STBPLAT_LOG(module_, eLogLevelDisplay, kSourceFile, kFunction, "%s%s     %s\r\n", indent_,
                hex_, text_);
  }

 private:
  etLogUtilModuleId module_;
  char indent_[kMaxIndent + 1];
  char hex_[kBytesPerLine * kHexWidth + 1];
  char text_[kBytesPerLine + 1];
};

}  // namespace

extern "C" {

void DumpBuffer(etLogUtilModuleId moduleId, unsigned char indent, unsigned char const* data,
                unsigned int length) {
  // The level table has no entry to gate other modules with.
  if (static_cast<unsigned int>(moduleId) >= static_cast<unsigned int>(eLogModuleCount)) return;
  if (data == nullptr || length == 0) {
    STBPLAT_LOG(moduleId, eLogLevelDisplay, kSourceFile, kFunction, "<none>\r\n");
    return;
  }
  DumpLines lines(moduleId, indent);
  unsigned int column = 0;
  for (unsigned int i = 0; i < length; ++i) {
    if (i % kBytesPerLine == 0 && i != 0) {
      lines.Emit();
      column = 0;
    }
    lines.Put(column, data[i]);
    ++column;
  }
  for (; column < kBytesPerLine; ++column) lines.Pad(column);
  lines.Emit();
}

}  // extern "C"
