// Runs the stbplat executable the way a user does and collects what it
// printed and its exit code.
#ifndef STBPLAT_TESTS_TOOLS_TOOL_RUNNER_H
#define STBPLAT_TESTS_TOOLS_TOOL_RUNNER_H

#include <string>
#include <vector>

namespace stbplat {
namespace test {

struct ToolRun {
  int exitCode = -1;
  std::string out;
  std::string err;
};

// args reach the program as they are (leading NAME=VALUE ones go into its
// environment instead); input is its standard input. A run
// is killed after 20 s or 8 MiB of output; one that ends by a signal or
// prints 50 lines or more to standard error fails the calling test.
// STBPLAT_ROOT and STBPLAT_LOG_LEVEL are cleared.
ToolRun RunTool(const std::vector<std::string>& args, const std::string& input = "");

}  // namespace test
}  // namespace stbplat

#endif
