// A temporary directory for one test, removed with everything in it.
#ifndef STBPLAT_TESTS_SUPPORT_SCRATCH_DIR_H
#define STBPLAT_TESTS_SUPPORT_SCRATCH_DIR_H

#include <string>
#include <vector>

namespace stbplat {
namespace test {

class ScratchDir {
 public:
  ScratchDir();
  ~ScratchDir();
  ScratchDir(const ScratchDir&) = delete;
  ScratchDir& operator=(const ScratchDir&) = delete;

  const std::string& path() const { return path_; }
  std::string operator/(const std::string& name) const { return path_ + "/" + name; }
  // Writes a file (creating its directories) and returns its path.
  std::string Write(const std::string& name, const std::string& contents) const;
  std::string Write(const std::string& name, const std::vector<unsigned char>& contents) const;
  // A file's bytes; a name with a leading '/' is read where it is.
  std::vector<unsigned char> Read(const std::string& name) const;

 private:
  std::string path_;
};

}  // namespace test
}  // namespace stbplat

#endif
