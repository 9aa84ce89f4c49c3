#include "support/scratch_dir.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

namespace stbplat {
namespace test {

namespace fs = std::filesystem;

ScratchDir::ScratchDir() : path_((fs::temp_directory_path() / "stbplat-test-XXXXXX").string()) {
  if (mkdtemp(&path_[0]) == nullptr) throw fs::filesystem_error("mkdtemp", path_, std::error_code());
}

ScratchDir::~ScratchDir() {
  std::error_code ignored;
  fs::remove_all(path_, ignored);
}

std::string ScratchDir::Write(const std::string& name, const std::string& contents) const {
  return Write(name, std::vector<unsigned char>(contents.begin(), contents.end()));
}

std::string ScratchDir::Write(const std::string& name, const std::vector<unsigned char>& contents) const {
  const fs::path file = fs::path(path_) / name;
  fs::create_directories(file.parent_path());
  std::ofstream(file, std::ios::binary).write(reinterpret_cast<const char*>(contents.data()),
                                              static_cast<std::streamsize>(contents.size()));
  return file.string();
}

std::vector<unsigned char> ScratchDir::Read(const std::string& name) const {
  std::ifstream in(fs::path(path_) / name, std::ios::binary);
  return std::vector<unsigned char>(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

}  // namespace test
}  // namespace stbplat
