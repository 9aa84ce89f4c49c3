// Shared pieces of the stbplat command-line tool: exit codes, the errors the
// commands raise, the global options, and the registration of each command
// group.
#ifndef STBPLAT_TOOL_TOOL_H
#define STBPLAT_TOOL_TOOL_H

#include <stdexcept>
#include <string>

namespace CLI {
class App;
}

namespace stbtool {

enum ExitCode { kExitOk = 0, kExitFailed = 1, kExitUsage = 2 };

// An operation that failed (exit code 1). The message goes to standard error
// behind the program name.
class Failure : public std::runtime_error {
 public:
  explicit Failure(const std::string& message) : std::runtime_error(message) {}
};

// A bad argument that the option parser could not catch (exit code 2).
class UsageError : public std::runtime_error {
 public:
  explicit UsageError(const std::string& message) : std::runtime_error(message) {}
};

struct GlobalOptions {
  bool json = false;
  // Device emulated from files (host mode); empty on a real device.
  std::string root;
  // Library log level for error output; raised with -v.
  int verbose = 0;
  // -q: no library messages and no progress; the command's own errors stay.
  bool quiet = false;
};

GlobalOptions& Options();

// Each command group adds its subcommands to the top-level app.
void RegisterRecordCommands(CLI::App& app);
void RegisterFlashCommands(CLI::App& app);
// mtd info, under the mtd group.
void RegisterMtdInfoCommand(CLI::App& mtd);
void RegisterMapCommand(CLI::App& app);
void RegisterDiskCommands(CLI::App& app);
void RegisterChecksumCommands(CLI::App& app);
void RegisterUtilCommands(CLI::App& app);
void RegisterRootCommands(CLI::App& app);
void RegisterRunCommand(CLI::App& app);

}  // namespace stbtool

#endif
