#include "os/seam.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

namespace os = stbplat::os;

std::vector<int> g_closed;

TEST(OsSeam, GuardsNestAndRestoreScopedFdClosesThroughTheSeamOnce) {
  os::SysCalls calls = os::LibcSysCalls();
  calls.close = [](int fd) {
    g_closed.push_back(fd);
    return 0;
  };
  {
    os::ScopedSysCalls guard(calls);
    {
      os::SysCalls inner = os::Sys();
      inner.open = [](const char*, int, mode_t) { return -1; };
      os::ScopedSysCalls nested(inner);
      EXPECT_EQ(os::Sys().open("/dev/null", 0, 0), -1);
      os::ScopedFd fd(42);
      os::ScopedFd none(-1);
      fd.Reset();
    }
    EXPECT_EQ(os::Sys().close, calls.close);  // the outer table again
  }
  EXPECT_EQ(g_closed, std::vector<int>{42});
  EXPECT_EQ(os::Sys().close, os::LibcSysCalls().close);
}

}  // namespace
