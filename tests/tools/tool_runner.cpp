#include "tool_runner.h"

#include <sys/wait.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <string>

#include "support/scratch_dir.h"

namespace stbplat {
namespace test {
namespace {

// One shell word holding text as it is.
std::string Quoted(const std::string& text) {
  std::string quoted = "'";
  for (char c : text) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

// No command may run away: one that still runs after this long is killed,
// and its output files stop growing at this size (512-byte blocks), which
// ends the program too.
constexpr int kSecondsAllowed = 20;
constexpr int kOutputBlocksAllowed = 16384;
// A failing command says why in fewer lines than this.
constexpr long kMaxErrorLines = 50;

// NAME=VALUE with an upper-case name, as the shell takes assignments.
bool IsAssignment(const std::string& arg) {
  const size_t equals = arg.find('=');
  return equals != std::string::npos && equals > 0 &&
         arg.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZ_") == equals;
}

}  // namespace

ToolRun RunTool(const std::vector<std::string>& args, const std::string& input) {
  ScratchDir scratch;
  std::string command = "ulimit -f " + std::to_string(kOutputBlocksAllowed) + "; env";
  std::string environment = " -u STBPLAT_ROOT -u STBPLAT_LOG_LEVEL";
  size_t first = 0;  // leading NAME=VALUE arguments set the environment
  for (; first < args.size() && IsAssignment(args[first]); ++first) environment += " " + Quoted(args[first]);
  command += environment + " timeout -s KILL " + std::to_string(kSecondsAllowed) + " " + Quoted(STBPLAT_TOOL_PATH);
  for (size_t i = first; i < args.size(); ++i) command += " " + Quoted(args[i]);
  command += " <" + Quoted(scratch.Write("stdin", input)) + " >" + Quoted(scratch / "stdout") +
             " 2>" + Quoted(scratch / "stderr");
  const int status = std::system(command.c_str());
  ToolRun run;
  run.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
  const std::vector<unsigned char> out = scratch.Read("stdout");
  const std::vector<unsigned char> err = scratch.Read("stderr");
  run.out.assign(out.begin(), out.end());
  run.err.assign(err.begin(), err.end());
  EXPECT_LT(run.exitCode, 128) << "ended by a signal, or ran past " << kSecondsAllowed << " s";
  EXPECT_LT(std::count(run.err.begin(), run.err.end(), '\n'), kMaxErrorLines);
  return run;
}

}  // namespace test
}  // namespace stbplat
