#include "actions.h"

#include <CLI/CLI.hpp>

#include <cstdio>
#include <exception>
#include <string>
#include <utility>

#include "log_sink.h"
#include "tool.h"

namespace stbtool {
namespace {

std::function<void()>& Pending() {
  static std::function<void()> pending;
  return pending;
}

}  // namespace

void SetAction(CLI::App* command, std::function<void()> action) {
  command->callback([action]() { Pending() = action; });
}

int RunPendingAction() {
  if (!Pending()) return kExitUsage;
  int code = kExitOk;
  std::string message;
  try {
    Pending()();
  } catch (const UsageError& e) {
    code = kExitUsage;
    message = e.what();
  } catch (const std::exception& e) {  // Failure, and anything unforeseen
    code = kExitFailed;
    message = e.what();
  }
  FlushLogRepeats();
  if (code != kExitOk) std::fprintf(stderr, "stbplat: %s\n", message.c_str());
  return code;
}

}  // namespace stbtool
