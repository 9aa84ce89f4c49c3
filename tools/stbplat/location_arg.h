// Component locations on the command line: DEVICE.PARTITION.SLOT[+OFFSET],
// such as NAND0.FSBLINFO.A or NOR0.BOOT.A+0x400. Names are at most 8
// characters and are upper-cased as the library stores them.
#ifndef STBPLAT_TOOL_LOCATION_ARG_H
#define STBPLAT_TOOL_LOCATION_ARG_H

#include <string>

#include "stbplat/component_location.h"

namespace CLI {
class App;
class Option;
}

namespace stbtool {

struct LocationArg {
  std::string device, partition, slot;
  unsigned long offset = 0;
  bool hasOffset = false;
};

// True when text has the shape of a location. On a shape that is almost one
// (three dot-separated names, but a name too long or a bad offset), throws
// UsageError naming `what` and the problem.
bool ParseLocationArg(const std::string& text, const std::string& what, LocationArg* out);

// The library's form, with the given component tag (up to 4 characters).
ComponentLocation ToComponentLocation(const LocationArg& arg, const std::string& tag = "");

// Refuses (UsageError, exit 2) a slot the memory map does not hold, naming
// the slots it holds. Without a memory map there is nothing to check.
void RequireKnownSlot(const LocationArg& arg, const std::string& command);

// "NAND0.KERNEL.A" from the library's 8-byte names.
std::string LocationText(const Location& location);

// Parses a number in C notation (0x.., 0.., decimal) with an optional K, M
// or G suffix (powers of 1024). Throws UsageError naming `what`, also for a
// value that does not fit in 64 bits.
unsigned long ParseNumber(const std::string& text, const std::string& what);

// An option (such as "-n,--length") whose value ParseNumber reads into
// *value. A bad value stops the parsing with an error naming the option's
// long name (exit 2); *given, if set, tells whether the option came.
CLI::Option* AddNumberOption(CLI::App* app, const std::string& names, unsigned long* value,
                             const std::string& help, bool* given = nullptr);

}  // namespace stbtool

#endif
