#include "command_file.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

#include "tool.h"

namespace stbtool {
namespace {

// Standard input is taken into the temporary file in pieces of this size.
constexpr unsigned long kSpoolPiece = 1024 * 1024;

}  // namespace

CommandFile::CommandFile(const std::string& path, bool writing) : path_(path) {
  if (path == "-") {
    file_ = writing ? stdout : stdin;
    return;
  }
  file_ = std::fopen(path.c_str(), writing ? "wb" : "rb");
  if (file_ == nullptr) throw Failure(path + ": " + std::strerror(errno));
  owned_ = true;
}

CommandFile::~CommandFile() {
  if (owned_) std::fclose(file_);
}

void CommandFile::Spool(unsigned long limit) {
  FILE* spool = std::tmpfile();
  if (spool == nullptr) throw Failure(path_ + ": no temporary file: " + std::strerror(errno));
  std::vector<unsigned char> piece(std::min(kSpoolPiece, limit));
  for (unsigned long done = 0, got;
       done < limit && (got = Read(piece.data(), std::min(kSpoolPiece, limit - done))) > 0; done += got)
    if (std::fwrite(piece.data(), 1, got, spool) != got) {
      std::fclose(spool);
      throw Failure(path_ + ": temporary file: " + std::strerror(errno));
    }
  std::rewind(spool);
  file_ = spool;
  owned_ = true;
}

bool CommandFile::Size(unsigned long* size) const {
  struct stat info;
  if (!owned_ || fstat(fileno(file_), &info) != 0 || !S_ISREG(info.st_mode)) return false;
  *size = static_cast<unsigned long>(info.st_size);
  return true;
}

unsigned long CommandFile::Read(unsigned char* data, unsigned long n) {
  unsigned long got = std::fread(data, 1, n, file_);
  if (got < n && std::ferror(file_)) throw Failure(path_ + ": " + std::strerror(errno));
  return got;
}

void CommandFile::Write(const unsigned char* data, unsigned long n) {
  if (std::fwrite(data, 1, n, file_) != n) throw Failure(path_ + ": write failed: " + std::strerror(errno));
}

void CommandFile::Close() {
  bool failed = std::fflush(file_) != 0;
  if (owned_) failed = std::fclose(file_) != 0 || failed;
  owned_ = false;
  if (failed) throw Failure(path_ + ": write failed: " + std::strerror(errno));
}

}  // namespace stbtool
