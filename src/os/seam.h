// The OS seam: every call by which the library touches a device or the file
// system goes through this table. Production binds it to the C library; tests
// swap in a simulator with ScopedSysCalls. The table is read at call time, so
// a swap takes effect on the next call. No exported class stores any of it.
#ifndef STBPLAT_SRC_OS_SEAM_H
#define STBPLAT_SRC_OS_SEAM_H

#include <cstddef>
#include <cstdio>
#include <sys/types.h>

namespace stbplat {
namespace os {

struct SysCalls {
  int (*open)(const char* path, int flags, mode_t mode);
  int (*close)(int fd);
  off64_t (*lseek64)(int fd, off64_t offset, int whence);
  ssize_t (*read)(int fd, void* buffer, size_t count);
  ssize_t (*write)(int fd, const void* buffer, size_t count);
  int (*ioctl)(int fd, unsigned long request, void* argument);

  FILE* (*fopen64)(const char* path, const char* mode);
  int (*fclose)(FILE* file);
  size_t (*fread)(void* buffer, size_t size, size_t count, FILE* file);
  size_t (*fwrite)(const void* buffer, size_t size, size_t count, FILE* file);
  int (*fseek)(FILE* file, long offset, int whence);
  long (*ftell)(FILE* file);
  char* (*fgets)(char* buffer, int size, FILE* file);
  int (*ferror)(FILE* file);

  FILE* (*popen)(const char* command, const char* mode);
  int (*pclose)(FILE* pipe);

  void* (*mmap64)(void* address, size_t length, int protection, int flags, int fd, off64_t offset);
  int (*munmap)(void* address, size_t length);
  int (*getpagesize)();

  ssize_t (*readlink)(const char* path, char* buffer, size_t size);
  int (*unlink)(const char* path);
  unsigned int (*sleep)(unsigned int seconds);
};

// The table bound to the C library.
const SysCalls& LibcSysCalls();

// The table in force. Library code calls through this on every use.
const SysCalls& Sys();

// Replaces the table for the guard's lifetime and restores the previous one.
class ScopedSysCalls {
 public:
  explicit ScopedSysCalls(const SysCalls& calls);
  ~ScopedSysCalls();
  ScopedSysCalls(const ScopedSysCalls&) = delete;
  ScopedSysCalls& operator=(const ScopedSysCalls&) = delete;

 private:
  SysCalls previous_;
};

// Closes a descriptor through the seam when it goes out of scope.
class ScopedFd {
 public:
  explicit ScopedFd(int fd) : fd_(fd) {}
  ~ScopedFd() { Reset(); }
  ScopedFd(const ScopedFd&) = delete;
  ScopedFd& operator=(const ScopedFd&) = delete;
  int get() const { return fd_; }
  bool valid() const { return fd_ >= 0; }
  void Reset() {
    if (fd_ >= 0) Sys().close(fd_);
    fd_ = -1;
  }

 private:
  int fd_;
};

}  // namespace os
}  // namespace stbplat

#endif
