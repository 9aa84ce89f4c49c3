// libstbplat-hostsim.so: what `stbplat run` preloads into a program built
// against libstbplat.so. It holds its own copy of the library, with host mode
// bound into that copy's OS seam, and exports the same interface; preloaded,
// its definitions come first, so every call the program makes into the
// library reaches the device emulated from STBPLAT_ROOT. libstbplat.so is
// loaded as usual and left alone, and exports nothing for this.
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "hostsim/host_mode.h"

namespace {

constexpr char kRootVariable[] = "STBPLAT_ROOT";
// The exit code of a program whose device root does not load: bad usage.
constexpr int kExitUsage = 2;

void DetachAtExit() { stbplat::hostsim::Detach(); }

// Runs as the program starts, before its main and before its first call into
// the library (FlashInterface reads the partition table on that call).
__attribute__((constructor)) void AttachFromEnvironment() {
  const char* root = std::getenv(kRootVariable);
  if (root == nullptr || *root == '\0') return;  // preloaded without a root: nothing is emulated
  std::string error;
  if (!stbplat::hostsim::Attach(root, &error)) {
    std::fprintf(stderr, "stbplat run: --root %s: %s\n", root, error.c_str());
    _exit(kExitUsage);
  }
  // Images written through the emulation are flushed when the program ends.
  std::atexit(DetachAtExit);
}

}  // namespace
