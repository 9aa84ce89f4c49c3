#include "tool_runner.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

#include "scratch_dir.h"

namespace stbplat {
namespace test {
ToolRun RunTool(const std::vector<std::string>& args, const std::string& input) {
  ScratchDir scratch;
  std::string in = scratch.Write("stdin", input);
  std::string out = scratch / "stdout";
  std::string err = scratch / "stderr";
  pid_t child = fork();
  if (child < 0) throw std::runtime_error("fork failed");
  if (child == 0) {
    int inFd = open(in.c_str(), O_RDONLY);
    int outFd = open(out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    int errFd = open(err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    dup2(inFd, 0);
    dup2(outFd, 1);
    dup2(errFd, 2);
    unsetenv("STBPLAT_ROOT");
    unsetenv("STBPLAT_LOG_LEVEL");
    std::vector<char*> argv;
    argv.push_back(const_cast<char*>(STBPLAT_TOOL_PATH));
    for (const std::string& arg : args) argv.push_back(const_cast<char*>(arg.c_str()));
    argv.push_back(nullptr);
    execv(STBPLAT_TOOL_PATH, argv.data());
    _exit(127);
  }
  int status = 0;
  waitpid(child, &status, 0);
  ToolRun run;
  run.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
  std::vector<unsigned char> printed = scratch.Read("stdout"), complained = scratch.Read("stderr");
  run.out.assign(printed.begin(), printed.end());
  run.err.assign(complained.begin(), complained.end());
  return run;
}

}  // namespace test
}  // namespace stbplat
