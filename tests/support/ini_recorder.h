// Records what an ini parse hands to its handlers.
#ifndef STBPLAT_TESTS_SUPPORT_INI_RECORDER_H
#define STBPLAT_TESTS_SUPPORT_INI_RECORDER_H

#include <set>
#include <string>

namespace stbplat {
namespace test {

struct IniRecorder {
  // One line for each call: "[section] name=value" or the directive line.
  std::string seen;
  // Names and directive lines the handlers return false for.
  std::set<std::string> refused = {"refused", ":refused"};

  static bool OnValue(void* user, const char* section, const char* name, const char* value);
  static bool OnDirective(void* user, const char* line);
};

}  // namespace test
}  // namespace stbplat

#endif
