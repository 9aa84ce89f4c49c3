#include "actions.h"

#include <CLI/CLI.hpp>

#include <cstdio>
#include <exception>
#include <utility>

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
  try {
    Pending()();
  } catch (const UsageError& e) {
    std::fprintf(stderr, "stbplat: %s\n", e.what());
    return kExitUsage;
  } catch (const Failure& e) {
    std::fprintf(stderr, "stbplat: %s\n", e.what());
    return kExitFailed;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "stbplat: %s\n", e.what());
    return kExitFailed;
  }
  return kExitOk;
}

}  // namespace stbtool
