// Closes a stream opened through the OS seam when it goes out of scope.
#ifndef STBPLAT_SRC_OS_SCOPED_FILE_H
#define STBPLAT_SRC_OS_SCOPED_FILE_H

#include <cstdio>

#include "os/seam.h"

namespace stbplat {
namespace os {

class ScopedFile {
 public:
  explicit ScopedFile(FILE* file) : file_(file) {}
  ~ScopedFile() {
    if (file_ != nullptr) Sys().fclose(file_);
  }
  ScopedFile(const ScopedFile&) = delete;
  ScopedFile& operator=(const ScopedFile&) = delete;
  FILE* get() const { return file_; }

 private:
  FILE* file_;
};

}  // namespace os
}  // namespace stbplat

#endif
