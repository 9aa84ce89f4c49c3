// stbplat: inspect and change a set-top box's system records and storage.
// Commands are grouped like git's: stbplat GROUP [COMMAND] [ARGS]; --help works
// on every level. Exit codes: 0 done, 1 the operation failed, 2 bad usage.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>
#include <vector>

#include "hostsim/host_mode.h"
#include "log_sink.h"
#include "stbplat/log.h"
#include "stbplat/stbplat.h"
#include "tool.h"
#include "actions.h"
#include "usage_hints.h"

namespace stbtool {

GlobalOptions& Options() {
  static GlobalOptions options;
  return options;
}

namespace {

// -v steps from errors (2) up to traces (6).
constexpr int kMostVerbose = eLogLevelTrace - eLogLevelError;

int Run(int argc, char** argv) {
  CLI::App app{
      "stbplat: set-top box system records and storage.\n"
      "Reads and writes the device's records, flash and eMMC partitions; with --root DIR\n"
      "(or STBPLAT_ROOT) on a device emulated from the files in DIR.",
      "stbplat"};
  app.set_help_all_flag("--help-all", "Show the help of every command");
  app.require_subcommand(1);
  app.fallthrough();
  GlobalOptions& options = Options();
  app.add_flag("--json", options.json, "Machine-readable output (JSON) where output is data");
  app.add_option("--root", options.root,
                 "Emulate the device from the files in DIR (host mode)")
      ->envname("STBPLAT_ROOT")
      ->type_name("DIR");
  app.add_flag("-v,--verbose", options.verbose,
               "More library messages on standard error (repeat for more)");
  app.add_flag("-q,--quiet", options.quiet,
               "No library messages and no progress; the command's own errors still show");
  app.set_version_flag("--version", "stbplat " STBPLAT_VERSION);

  RegisterRecordCommands(app);
  RegisterFlashCommands(app);
  RegisterMapCommand(app);
  RegisterChecksumCommands(app);
  RegisterDiskCommands(app);
  RegisterUtilCommands(app);
  RegisterRootCommands(app);
  RegisterRunCommand(app);

  try {
    app.parse(argc, argv);
  } catch (const CLI::CallForHelp& e) {
    return app.exit(e);
  } catch (const CLI::CallForAllHelp& e) {
    return app.exit(e);
  } catch (const CLI::CallForVersion& e) {
    return app.exit(e);
  } catch (const CLI::ParseError& e) {
    // A word that is no command leaves the parser asking for one; say which,
    // and what it may have meant.
    std::vector<std::string> left = app.remaining(true);
    const CLI::App& innermost = InnermostCommand(app);
    const bool commandMissing = dynamic_cast<const CLI::RequiredError*>(&e) != nullptr ||
                                dynamic_cast<const CLI::ExtrasError*>(&e) != nullptr;
    const std::string where =
        innermost.get_parent() == nullptr ? "a command is needed" : innermost.get_name() + " needs a command";
    if (!left.empty() && commandMissing) {
      std::fprintf(stderr, "stbplat: unknown command or argument '%s'\n", left.front().c_str());
      const std::string nearest = NearestCommand(innermost, left.front());
      if (!nearest.empty()) std::fprintf(stderr, "Did you mean '%s'?\n", nearest.c_str());
      std::fprintf(stderr, "Run with --help for the commands and their arguments.\n");
    } else if (commandMissing && !innermost.get_subcommands({}).empty()) {
      std::fprintf(stderr, "stbplat: %s: %s\nRun with --help for more.\n",
                   where.c_str(), CommandNames(innermost).c_str());
    } else {
      app.exit(e);
    }
    return kExitUsage;
  } catch (const std::exception& e) {
    // No option handler should throw anything else; if one does, it is
    // still a bad argument, not a reason to abort.
    std::fprintf(stderr, "stbplat: %s\n", e.what());
    return kExitUsage;
  }

  if (options.verbose < 0) {
    std::fprintf(stderr, "stbplat: --verbose: %d is below 0\n", options.verbose);
    return kExitUsage;
  }
  if (options.verbose > 0)
    SetErrorLogLevel(eLogLevelError + static_cast<unsigned>(std::min(options.verbose, kMostVerbose)));
  if (options.quiet) SetErrorLogLevel(0);

  if (!options.root.empty()) {
    std::string error;
    if (!stbplat::hostsim::Attach(options.root, &error)) {
      std::fprintf(stderr, "stbplat: --root %s: %s\n", options.root.c_str(), error.c_str());
      return kExitUsage;
    }
  }
  int code = RunPendingAction();
  stbplat::hostsim::Detach();
  return code;
}

}  // namespace
}  // namespace stbtool

int main(int argc, char** argv) { return stbtool::Run(argc, argv); }
