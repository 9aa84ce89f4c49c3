// The only file of the library that names device-touching C library calls.
#include "os/seam.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

namespace stbplat {
namespace os {
namespace {

int LibcOpen(const char* path, int flags, mode_t mode) { return ::open(path, flags, mode); }
int LibcIoctl(int fd, unsigned long request, void* argument) {
  return ::ioctl(fd, request, argument);
}
int LibcGetPageSize() { return ::getpagesize(); }

const SysCalls kLibc = {
    LibcOpen,  ::close,  ::lseek64, ::read,   ::write,   LibcIoctl, ::fopen64,
    ::fclose,  ::fread,  ::fwrite,  ::fseek,  ::ftell,   ::fgets,   ::ferror,
    ::popen,   ::pclose, ::mmap64,  ::munmap, LibcGetPageSize, ::readlink, ::unlink,
    ::sleep,
};

SysCalls& Current() {
  static SysCalls current = kLibc;
  return current;
}

}  // namespace

const SysCalls& LibcSysCalls() { return kLibc; }

const SysCalls& Sys() { return Current(); }

ScopedSysCalls::ScopedSysCalls(const SysCalls& calls) : previous_(Current()) { Current() = calls; }

ScopedSysCalls::~ScopedSysCalls() { Current() = previous_; }

}  // namespace os
}  // namespace stbplat
