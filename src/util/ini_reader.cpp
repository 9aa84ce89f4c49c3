#include "stbplat/ini_reader.h"

#include <cstdio>
#include <cstring>
#include <new>

#include "os/scoped_file.h"
#include "os/seam.h"
#include "util/ini_core.h"

namespace {

char* ReadLineThroughSeam(char* buffer, int size, void* context) {
  return stbplat::os::Sys().fgets(buffer, size, static_cast<FILE*>(context));
}

}  // namespace

INIReader::INIReader(const char* name, ValueHandler handler, void* userData)
    : fileName(nullptr),
      valueHandler(handler),
      directiveHandler(nullptr),
      user(userData),
      lineBuffer(nullptr) {
  if (name == nullptr) {
    std::puts("File name not specified to INIReader\r");
    return;
  }
  const size_t length = std::strlen(name);
  fileName = new (std::nothrow) char[length + 1];
  if (fileName == nullptr) return;
  std::memcpy(fileName, name, length + 1);
  lineBuffer = new (std::nothrow) char[stbplat::ini::kLineBufferSize];
}

INIReader::~INIReader() {
  delete[] fileName;
  delete[] lineBuffer;
}

int INIReader::Parse() {
  stbplat::os::ScopedFile file(fileName != nullptr ? stbplat::os::Sys().fopen64(fileName, "r")
                                                   : nullptr);
  if (file.get() == nullptr || lineBuffer == nullptr) {
    std::printf("Unable to open ini file %s\r\n", fileName != nullptr ? fileName : "(null)");
    return -1;
  }
  const int errorLine = stbplat::ini::ParseLines(ReadLineThroughSeam, file.get(), valueHandler,
                                                 directiveHandler, user, fileName, lineBuffer,
                                                 stbplat::ini::kLineBufferSize);
  // fgets ends the same way at the end and on a read error: only the stream
  // tells them apart.
  if (stbplat::os::Sys().ferror(file.get()) != 0) {
    std::printf("Unable to read ini file %s\r\n", fileName);
    return -1;
  }
  return errorLine;
}

void INIReader::SetDirectiveHandler(DirectiveHandler handler) { directiveHandler = handler; }

char* INIReader::StripWhitespacesAtEnd(char* s) { return stbplat::ini::StripWhitespacesAtEnd(s); }

char* INIReader::FindFirstNonWhitespace(const char* s) {
  return stbplat::ini::FindFirstNonWhitespace(s);
}

char* INIReader::FindCharOrComment(const char* s, char c) {
  return stbplat::ini::FindCharOrComment(s, c);
}

char* INIReader::strncpy0(char* dst, const char* src, unsigned long size) {
  return stbplat::ini::strncpy0(dst, src, size);
}
