// A file named on the command line, "-" being standard input or output:
// opened at once (a missing file fails before anything else happens), read
// and written in pieces, closed by the destructor when Close was not reached.
#ifndef STBPLAT_TOOL_COMMAND_FILE_H
#define STBPLAT_TOOL_COMMAND_FILE_H

#include <cstdio>
#include <string>

namespace stbtool {

class CommandFile {
 public:
  CommandFile(const std::string& path, bool writing);
  ~CommandFile();
  CommandFile(const CommandFile&) = delete;
  CommandFile& operator=(const CommandFile&) = delete;

  bool IsStream() const { return !owned_; }
  // Takes the stream into a temporary file, at most `limit` bytes, and reads
  // from there; the file's size then tells whether more was there.
  void Spool(unsigned long limit);
  // Size of a regular file; false for standard input and pipes.
  bool Size(unsigned long* size) const;
  // Fills up to n bytes; fewer only at the end of the input.
  unsigned long Read(unsigned char* data, unsigned long n);
  void Write(const unsigned char* data, unsigned long n);
  void Rewind() { std::rewind(file_); }
  // Flushes and closes; a Failure when the bytes did not all get out.
  void Close();

 private:
  std::string path_;
  FILE* file_ = nullptr;
  bool owned_ = false;
};

}  // namespace stbtool

#endif
