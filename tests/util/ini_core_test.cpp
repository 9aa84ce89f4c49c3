// The line parser shared by INIReader and the memory-map loader, fed through
// real fgets over temporary files.
#include "util/ini_core.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <set>
#include <string>
#include <vector>

#include "support/ini_recorder.h"

namespace {

using stbplat::test::IniEntry;
using stbplat::test::IniRecorder;
using stbplat::test::TempTextFile;
namespace ini = stbplat::ini;

// Returns the parse result; `output` receives what went to standard output.
int ParseText(const std::string& text, IniRecorder& recorder, std::string& output,
              bool withDirectives = true) {
  TempTextFile file(text);
  FILE* in = std::fopen(file.path().c_str(), "r");
  EXPECT_NE(in, nullptr);
  testing::internal::CaptureStdout();
  int result = ini::IniParseFile(in, ::fgets, IniRecorder::OnValue,
                                 withDirectives ? IniRecorder::OnDirective : nullptr, &recorder,
                                 "test.ini");
  output = testing::internal::GetCapturedStdout();
  std::fclose(in);
  return result;
}

struct Case {
  std::string text;
  int result;  // 0, or the last bad line that counts
  std::string output;
  std::vector<IniEntry> entries;
  std::set<std::string> refused;
};

const std::string kNoClose = "ERROR: No closing ']' found on line ";
const std::string kNoValue = "ERROR: No value found on line ";

TEST(IniCore, LinesSectionsCommentsAndErrors) {
  const Case cases[] = {
      // an inline comment needs whitespace before it
      {"name = value ; note\nother = a;b\nthird = ;x\n", 0, "",
       {{"", "name", "value"}, {"", "other", "a;b"}, {"", "third", ";x"}}, {}},
      // ':' separates only where no '=' comes first
      {"[s]\nkey: value\na:b = c\n", 0, "", {{"s", "key", "value"}, {"s", "a:b", "c"}}, {}},
      {"top = 1\n[ my section ]\nx=1\n[" + std::string(60, 'S') + "]\ny = 2\n", 0, "",
       {{"", "top", "1"}, {" my section ", "x", "1"}, {std::string(49, 'S'), "y", "2"}}, {}},
      {"  name   =   some value  \r\n\t[s]\r\nempty =\r\n", 0, "",
       {{"", "name", "some value"}, {"s", "empty", ""}}, {}},
      {"", 0, "", {}, {}},
      {"; one\n# two\n   ; three\n\n\t\n", 0, "", {}, {}},
      // a commented ']' leaves the section as it was
      {"[a]\n[sec ; note]\nk = v\n", 2, kNoClose + "2 in file test.ini: [sec ; note]\r\n",
       {{"a", "k", "v"}}, {}},
      // a later bad line replaces the result; bad lines do not stop the parse
      {"a = 1\nb = 2\n[open\nc = 3\n\n; c\njustaname\nd = 4\n", 7,
       kNoClose + "3 in file test.ini: [open\r\n" + kNoValue +
           "7 in file test.ini for parameter justaname\r\n",
       {{"", "a", "1"}, {"", "b", "2"}, {"", "c", "3"}, {"", "d", "4"}}, {}},
      // only the first bracket error is printed
      {"[one\n[two\n", 1, kNoClose + "1 in file test.ini: [one\r\n", {}, {}},
      // a refused value counts only while no earlier error is kept
      {"x=1\nbad1 = a\nz=3\n#\nbad2 = b\n", 2, "",
       {{"", "x", "1"}, {"", "bad1", "a"}, {"", "z", "3"}, {"", "bad2", "b"}}, {"bad1", "bad2"}},
      {"a ; b = c\n", 1, kNoValue + "1 in file test.ini for parameter a ; b = c\r\n", {}, {}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    IniRecorder r;
    r.refusedNames = c.refused;
    std::string output;
    EXPECT_EQ(ParseText(c.text, r, output), c.result);
    EXPECT_EQ(output, c.output);
    EXPECT_EQ(r.entries, c.entries);
  }
}

TEST(IniCore, Directives) {
  IniRecorder r;
  r.acceptDirectives = false;
  std::string output;
  EXPECT_EQ(ParseText("a=1\n  :include other.ini  \n:second\n", r, output), 2);
  EXPECT_EQ(r.directives, (std::vector<std::string>{":include other.ini", ":second"}));
  IniRecorder skipped;
  EXPECT_EQ(ParseText(":directive\nk = v\n", skipped, output, false), 0);
  EXPECT_EQ(skipped.entries.size(), 1u);
  EXPECT_TRUE(skipped.directives.empty());
}

TEST(IniCore, LongLineArrivesInPiecesCountedAsLines) {
  IniRecorder r;
  std::string output;
  // 6000 characters: 4999 in the first piece, the rest (no separator) in the second.
  EXPECT_EQ(ParseText("k=" + std::string(5998, 'x') + "\nnovalue\n", r, output), 3);
  ASSERT_EQ(r.entries.size(), 1u);
  EXPECT_EQ(r.entries[0].value, std::string(4997, 'x'));
  EXPECT_EQ(output, kNoValue + "2 in file test.ini for parameter " + std::string(1001, 'x') +
                        "\r\n" + kNoValue + "3 in file test.ini for parameter novalue\r\n");
}

TEST(IniCore, NullValueHandlerIsNeverCalled) {
  TempTextFile file("a = 1\n");
  FILE* in = std::fopen(file.path().c_str(), "r");
  ASSERT_NE(in, nullptr);
  EXPECT_EQ(ini::IniParseFile(in, ::fgets, nullptr, nullptr, nullptr, "x"), 0);
  std::fclose(in);
}

// A line source over fixed strings, as the memory-map loader might use.
struct Lines {
  const char* const* lines;
  int next;
};
char* NextLine(char* buffer, int size, void* context) {
  Lines* l = static_cast<Lines*>(context);
  if (l->lines[l->next] == nullptr) return nullptr;
  ini::strncpy0(buffer, l->lines[l->next++], static_cast<unsigned long>(size));
  return buffer;
}

TEST(IniCore, CallerBufferAndLineSource) {
  const char* const lines[] = {"[m]", "abcdefghij = 1", nullptr};
  Lines source{lines, 0};
  IniRecorder r;
  char small[8];
  // "abcdefg" is all that fits: no separator, so line 2 is bad.
  testing::internal::CaptureStdout();
  EXPECT_EQ(ini::ParseLines(NextLine, &source, IniRecorder::OnValue, nullptr, &r, nullptr, small,
                            sizeof small),
            2);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            kNoValue + "2 in file (null) for parameter abcdefg\r\n");
  EXPECT_EQ(ini::ParseLines(NextLine, &source, IniRecorder::OnValue, nullptr, &r, nullptr, small,
                            1),
            0);
}

}  // namespace
