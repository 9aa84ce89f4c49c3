// Records what an ini parse hands to its handlers, and writes ini texts to
// temporary files for the parsers to read.
#ifndef STBPLAT_TESTS_SUPPORT_INI_RECORDER_H
#define STBPLAT_TESTS_SUPPORT_INI_RECORDER_H

#include <set>
#include <string>
#include <vector>

namespace stbplat {
namespace test {

struct IniEntry {
  std::string section;
  std::string name;
  std::string value;
  bool operator==(const IniEntry& other) const {
    return section == other.section && name == other.name && value == other.value;
  }
};

struct IniRecorder {
  std::vector<IniEntry> entries;
  std::vector<std::string> directives;
  std::set<std::string> refusedNames;  // the value handler returns false for these
  bool acceptDirectives = true;

  static bool OnValue(void* user, const char* section, const char* name, const char* value);
  static bool OnDirective(void* user, const char* line);
};

// A file in the temporary directory holding `text`, removed on destruction.
class TempTextFile {
 public:
  explicit TempTextFile(const std::string& text);
  ~TempTextFile();
  TempTextFile(const TempTextFile&) = delete;
  TempTextFile& operator=(const TempTextFile&) = delete;
  const std::string& path() const { return path_; }

 private:
  std::string path_;
};

}  // namespace test
}  // namespace stbplat

#endif
