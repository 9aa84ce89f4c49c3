#include "support/ini_recorder.h"

#include <cstdio>
#include <cstdlib>
#include <unistd.h>

#include <gtest/gtest.h>

namespace stbplat {
namespace test {

bool IniRecorder::OnValue(void* user, const char* section, const char* name, const char* value) {
  IniRecorder* self = static_cast<IniRecorder*>(user);
  self->entries.push_back({section, name, value});
  return self->refusedNames.count(name) == 0;
}

bool IniRecorder::OnDirective(void* user, const char* line) {
  IniRecorder* self = static_cast<IniRecorder*>(user);
  self->directives.push_back(line);
  return self->acceptDirectives;
}

TempTextFile::TempTextFile(const std::string& text) {
  const char* dir = std::getenv("TMPDIR");
  std::string pattern = std::string(dir != nullptr && *dir != '\0' ? dir : "/tmp") +
                        "/stbplat-test-XXXXXX";
  std::vector<char> name(pattern.begin(), pattern.end());
  name.push_back('\0');
  int fd = mkstemp(name.data());
  if (fd < 0) {
    ADD_FAILURE() << "cannot create a temporary file from " << pattern;
    return;
  }
  path_ = name.data();
  FILE* file = fdopen(fd, "w");
  if (file == nullptr) {
    ::close(fd);
    ADD_FAILURE() << "cannot write " << path_;
    return;
  }
  if (!text.empty() && std::fwrite(text.data(), 1, text.size(), file) != text.size())
    ADD_FAILURE() << "short write to " << path_;
  std::fclose(file);
}

TempTextFile::~TempTextFile() {
  if (!path_.empty()) ::unlink(path_.c_str());
}

}  // namespace test
}  // namespace stbplat
