// Minimal scenario harness of the guest programs: scenarios register by name
// and group, checks record failures with the expression and line, and the
// program reports one "PASS <name>" or "FAIL <name>: <why>" line to the
// results channel (STBPLAT_SYSTEST_RESULTS, else standard output).
#ifndef STBPLAT_SYSTEST_HARNESS_H
#define STBPLAT_SYSTEST_HARNESS_H

#include <cstdint>
#include <sstream>
#include <string>
#include <vector>

namespace systest {

using ScenarioFn = void (*)();

struct Registrar {
  Registrar(const char* name, ScenarioFn fn);
};

// Records a failure of the running scenario (the first one is reported).
void Fail(const char* file, int line, const std::string& what);
bool Failed();
// A line for the host's summary ("INFO <text>").
void Info(const std::string& text);

// Log messages the library produced since the last ClearLog (formatted).
const std::vector<std::string>& Log();
bool LogContains(const std::string& text);
void ClearLog();
// Level for every module while capturing (default: everything).
void SetLogLevel(unsigned int level);

// Runs a shell command, returns its exit status (-1 when it could not run).
int Shell(const std::string& command);
std::string ShellOutput(const std::string& command);

std::vector<unsigned char> Pattern(std::size_t size, unsigned int seed);
std::vector<unsigned char> ReadFile(const std::string& path);
bool WriteFile(const std::string& path, const std::vector<unsigned char>& data);
std::string Describe(const std::vector<unsigned char>& a, const std::vector<unsigned char>& b);
double NowSeconds();

// Redirects standard output (file descriptor 1) into a file while alive;
// Text() returns what was written since construction.
class StdoutCapture {
 public:
  StdoutCapture();
  ~StdoutCapture();
  StdoutCapture(const StdoutCapture&) = delete;
  StdoutCapture& operator=(const StdoutCapture&) = delete;
  std::string Text();

 private:
  void Restore();
  int saved_;
  std::string path_;
};

template <typename A, typename B>
std::string Pair(const A& a, const B& b) {
  std::ostringstream out;
  out << a << " vs " << b;
  return out.str();
}

}  // namespace systest

#define SYSTEST_CAT2(a, b) a##b
#define SYSTEST_CAT(a, b) SYSTEST_CAT2(a, b)
#define SCENARIO(name)                                                                   \
  static void SYSTEST_CAT(scenario_, __LINE__)();                                         \
  static ::systest::Registrar SYSTEST_CAT(registrar_, __LINE__)(name,                     \
                                                                SYSTEST_CAT(scenario_, __LINE__)); \
  static void SYSTEST_CAT(scenario_, __LINE__)()

#define CHECK(cond)                                                   \
  do {                                                                \
    if (!(cond)) ::systest::Fail(__FILE__, __LINE__, #cond);          \
  } while (0)
#define CHECK_EQ(a, b)                                                                  \
  do {                                                                                  \
    auto&& systest_a_ = (a);                                                            \
    auto&& systest_b_ = (b);                                                            \
    if (!(systest_a_ == systest_b_))                                                    \
      ::systest::Fail(__FILE__, __LINE__,                                               \
                      std::string(#a " == " #b " (") + ::systest::Pair(systest_a_, systest_b_) + ")"); \
  } while (0)
#define CHECK_BYTES(a, b)                                                              \
  do {                                                                                 \
    if (!((a) == (b)))                                                                 \
      ::systest::Fail(__FILE__, __LINE__, std::string(#a " == " #b ": ") + ::systest::Describe(a, b)); \
  } while (0)
#define CHECK_LOG(text)                                                                \
  do {                                                                                 \
    if (!::systest::LogContains(text))                                                 \
      ::systest::Fail(__FILE__, __LINE__, std::string("log lacks: ") + (text));        \
  } while (0)
// Stops the scenario when an earlier check failed (later steps would only
// repeat the failure).
#define REQUIRE(cond)                                                 \
  do {                                                                \
    if (!(cond)) {                                                    \
      ::systest::Fail(__FILE__, __LINE__, #cond);                     \
      return;                                                         \
    }                                                                 \
  } while (0)

#endif
