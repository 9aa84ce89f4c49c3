// What the tool says when a command is missing or mistyped: the commands
// the user can choose from, and the nearest one to a typo.
#ifndef STBPLAT_TOOL_USAGE_HINTS_H
#define STBPLAT_TOOL_USAGE_HINTS_H

#include <string>

namespace CLI {
class App;
}

namespace stbtool {

// The innermost command the parser entered (app itself when none).
const CLI::App& InnermostCommand(const CLI::App& app);

// "record, flash, mtd, ...": the commands under app, in the order of --help.
std::string CommandNames(const CLI::App& app);

// The command under app nearest to word (at most two edits away, or one
// that word starts), or "" when none is near.
std::string NearestCommand(const CLI::App& app, const std::string& word);

}  // namespace stbtool

#endif
