#include "os/seam.h"

#include <fcntl.h>
#include <gtest/gtest.h>

namespace {

using stbplat::os::LibcSysCalls;
using stbplat::os::ScopedFd;
using stbplat::os::ScopedSysCalls;
using stbplat::os::Sys;
using stbplat::os::SysCalls;

int g_closed = -1;
int RecordClose(int fd) {
  g_closed = fd;
  return 0;
}
int RefuseOpen(const char*, int, mode_t) { return -1; }

TEST(OsSeam, GuardSwapsAndRestoresTheTable) {
  EXPECT_EQ(Sys().open, LibcSysCalls().open);
  {
    SysCalls calls = LibcSysCalls();
    calls.open = RefuseOpen;
    ScopedSysCalls guard(calls);
    EXPECT_EQ(Sys().open("/dev/null", O_RDONLY, 0), -1);
    {
      SysCalls inner = Sys();
      inner.close = RecordClose;
      ScopedSysCalls nested(inner);
      EXPECT_EQ(Sys().open, RefuseOpen);
    }
    EXPECT_EQ(Sys().close, LibcSysCalls().close);
  }
  EXPECT_EQ(Sys().open, LibcSysCalls().open);
  int fd = Sys().open("/dev/null", O_RDONLY, 0);
  ASSERT_GE(fd, 0);
  Sys().close(fd);
}

TEST(OsSeam, ScopedFdClosesThroughTheSeamOnce) {
  SysCalls calls = LibcSysCalls();
  calls.close = RecordClose;
  ScopedSysCalls guard(calls);
  g_closed = -1;
  {
    ScopedFd fd(42);
    EXPECT_TRUE(fd.valid());
  }
  EXPECT_EQ(g_closed, 42);
  g_closed = -1;
  {
    ScopedFd none(-1);
    EXPECT_FALSE(none.valid());
  }
  EXPECT_EQ(g_closed, -1);
}

}  // namespace
