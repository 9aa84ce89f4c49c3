#include "support/ini_recorder.h"

namespace stbplat {
namespace test {

bool IniRecorder::OnValue(void* user, const char* section, const char* name, const char* value) {
  IniRecorder* self = static_cast<IniRecorder*>(user);
  self->seen += "[" + std::string(section) + "] " + name + "=" + value + "\n";
  return self->refused.count(name) == 0;
}

bool IniRecorder::OnDirective(void* user, const char* line) {
  IniRecorder* self = static_cast<IniRecorder*>(user);
  self->seen += std::string(line) + "\n";
  return self->refused.count(line) == 0;
}

}  // namespace test
}  // namespace stbplat
