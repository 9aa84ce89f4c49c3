// The command chosen on the command line runs after all options are parsed
// (global ones may follow the command), so that host mode is bound first.
#ifndef STBPLAT_TOOL_ACTIONS_H
#define STBPLAT_TOOL_ACTIONS_H

#include <functional>

namespace CLI {
class App;
}

namespace stbtool {

// Makes `action` the one to run when `command` is chosen. The action reports
// failure by throwing Failure or UsageError; otherwise it exits with 0.
void SetAction(CLI::App* command, std::function<void()> action);

// Runs the chosen action and turns what it threw into an exit code.
int RunPendingAction();

}  // namespace stbtool

#endif
