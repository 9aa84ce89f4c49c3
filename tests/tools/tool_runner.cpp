#include "tool_runner.h"

#include <sys/wait.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>

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

// Every command, on every root and input the tests give it, ends by itself
// within this time, and a failing one says why in fewer than kMaxErrorLines.
constexpr int kMaxSeconds = 20;
constexpr long kMaxErrorLines = 50;

}  // namespace

ToolRun RunTool(const std::vector<std::string>& args, const std::string& input) {
  ScratchDir scratch;
  std::string command = "timeout -s KILL " + std::to_string(kMaxSeconds) + " env -u STBPLAT_ROOT -u STBPLAT_LOG_LEVEL " + Quoted(STBPLAT_TOOL_PATH);
  for (const std::string& arg : args) command += " " + Quoted(arg);
  command += " <" + Quoted(scratch.Write("stdin", input)) + " >" + Quoted(scratch / "stdout") +
             " 2>" + Quoted(scratch / "stderr");
  const int status = std::system(command.c_str());
  ToolRun run;
  run.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
  const std::vector<unsigned char> out = scratch.Read("stdout");
  const std::vector<unsigned char> err = scratch.Read("stderr");
  run.out.assign(out.begin(), out.end());
  run.err.assign(err.begin(), err.end());
  EXPECT_LT(run.exitCode, 128) << "ended by a signal, or ran past " << kMaxSeconds << " s";
  EXPECT_LT(std::count(run.err.begin(), run.err.end(), '\n'), kMaxErrorLines);
  return run;
}

}  // namespace test
}  // namespace stbplat
