// The records' display lines: a zeroed fixed buffer, an indent of spaces
// clamped to the buffer, then a formatted label line, logged at level 4.
#ifndef STBPLAT_SRC_DESCRIPTORS_DISPLAY_LINE_H
#define STBPLAT_SRC_DESCRIPTORS_DISPLAY_LINE_H

namespace stbplat {
namespace records {

// Size of the label-line buffer; the indent is cut to one less.
constexpr unsigned int kLabelLineSize = 200;
// Size of the plain indent-line buffer of the package header.
constexpr unsigned int kIndentLineSize = 100;

// Logs "%-20s = <valueFormat>" behind the clamped indent, under `function`.
void DisplayLabelLine(const char* function, unsigned char indent, const char* valueFormat,
                      const char* label, ...);

// Logs a line of `indent` spaces (clamped to kIndentLineSize - 1), no line end.
void DisplayIndentLine(const char* function, unsigned char indent);

}  // namespace records
}  // namespace stbplat

#endif
