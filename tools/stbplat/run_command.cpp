// run: starts a program built against libstbplat.so with the device of --root
// under it. The program gets libstbplat-hostsim.so preloaded (its library
// calls then reach the emulated device) and STBPLAT_ROOT set; the tool
// replaces itself with the program, so the exit code is the program's.
#include <CLI/CLI.hpp>

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "actions.h"
#include "tool.h"

namespace stbtool {
namespace {

namespace fs = std::filesystem;

constexpr char kCommand[] = "run";
constexpr char kPreloadName[] = "libstbplat-hostsim.so";
// Set to the preload library's path, it overrides where the tool looks.
constexpr char kPreloadVariable[] = "STBPLAT_HOSTSIM_LIBRARY";

// Installed, the preload library lies in the library folder beside the
// tool's; in the build tree, beside the tool.
std::string PreloadLibrary() {
  const char* given = std::getenv(kPreloadVariable);
  if (given != nullptr && *given != '\0') return given;
  std::error_code error;
  const fs::path self = fs::read_symlink("/proc/self/exe", error);
  std::vector<fs::path> candidates;
  if (!error) {
    candidates.push_back(self.parent_path().parent_path() / STBPLAT_INSTALL_LIBDIR / kPreloadName);
    candidates.push_back(self.parent_path() / kPreloadName);
  }
  for (const fs::path& candidate : candidates)
    if (fs::exists(candidate, error)) return candidate.string();
  throw Failure(std::string(kCommand) + ": " + kPreloadName + " is not installed beside the tool (or set " +
                kPreloadVariable + ")");
}

void RunProgram(const std::vector<std::string>& command) {
  if (Options().root.empty())
    throw UsageError(std::string(kCommand) + ": give the device with --root DIR (or STBPLAT_ROOT)");
  const std::string preload = PreloadLibrary();
  const char* before = std::getenv("LD_PRELOAD");
  const std::string preloads = preload + (before != nullptr && *before != '\0' ? std::string(":") + before : "");
  std::error_code error;
  const std::string root = fs::absolute(Options().root, error).string();
  if (setenv("LD_PRELOAD", preloads.c_str(), 1) != 0 || setenv("STBPLAT_ROOT", root.c_str(), 1) != 0)
    throw Failure(std::string(kCommand) + ": cannot set the environment: " + std::strerror(errno));
  std::vector<char*> argv;
  for (const std::string& word : command) argv.push_back(const_cast<char*>(word.c_str()));
  argv.push_back(nullptr);
  std::fflush(nullptr);
  execvp(argv[0], argv.data());
  throw Failure(std::string(kCommand) + ": " + command.front() + ": " + std::strerror(errno));
}

}  // namespace

void RegisterRunCommand(CLI::App& app) {
  static std::vector<std::string> command;
  CLI::App* run = app.add_subcommand(
      kCommand,
      "Run a program built against libstbplat.so on the device of --root: every call it makes into the library "
      "reaches the emulated device (stbplat --root DIR run -- PROGRAM ARGS)");
  run->add_option("PROGRAM", command, "The program and its arguments, after --")->required();
  SetAction(run, []() { RunProgram(command); });
}

}  // namespace stbtool
