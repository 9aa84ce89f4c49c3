// The line parser shared by INIReader and the memory-map loader, fed through
// real fgets over temporary files.
#include "util/ini_core.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "support/ini_recorder.h"

namespace {

using stbplat::test::IniEntry;
using stbplat::test::IniRecorder;
using stbplat::test::TempTextFile;
namespace ini = stbplat::ini;

struct ParseOutcome {
  int result;
  std::string output;  // standard output during the parse
};

ParseOutcome ParseText(const std::string& text, IniRecorder& recorder, bool withDirectives = true,
                       const char* name = "test.ini") {
  TempTextFile file(text);
  FILE* in = std::fopen(file.path().c_str(), "r");
  EXPECT_NE(in, nullptr);
  testing::internal::CaptureStdout();
  int result = ini::IniParseFile(in, ::fgets, IniRecorder::OnValue,
                                 withDirectives ? IniRecorder::OnDirective : nullptr, &recorder,
                                 name);
  std::string output = testing::internal::GetCapturedStdout();
  std::fclose(in);
  return {result, output};
}

TEST(IniCore, InlineCommentNeedsWhitespaceBeforeIt) {
  IniRecorder r;
  ParseOutcome out = ParseText("name = value ; note\nother = a;b\nthird = ;x\n", r);
  EXPECT_EQ(out.result, 0);
  EXPECT_EQ(out.output, "");
  ASSERT_EQ(r.entries.size(), 3u);
  EXPECT_EQ(r.entries[0], (IniEntry{"", "name", "value"}));
  EXPECT_EQ(r.entries[1], (IniEntry{"", "other", "a;b"}));
  EXPECT_EQ(r.entries[2], (IniEntry{"", "third", ";x"}));
}

TEST(IniCore, ColonIsTheSecondSeparator) {
  IniRecorder r;
  ParseOutcome out = ParseText("[s]\nkey: value\na:b = c\n", r);
  EXPECT_EQ(out.result, 0);
  ASSERT_EQ(r.entries.size(), 2u);
  EXPECT_EQ(r.entries[0], (IniEntry{"s", "key", "value"}));
  EXPECT_EQ(r.entries[1], (IniEntry{"s", "a:b", "c"}));
}

TEST(IniCore, SectionsKeepTheirSpacesAndAreCutAt49) {
  IniRecorder r;
  std::string longName(60, 'S');
  ParseOutcome out =
      ParseText("top = 1\n[ my section ]\nx=1\n[" + longName + "]\ny = 2\n", r);
  EXPECT_EQ(out.result, 0);
  ASSERT_EQ(r.entries.size(), 3u);
  EXPECT_EQ(r.entries[0], (IniEntry{"", "top", "1"}));
  EXPECT_EQ(r.entries[1], (IniEntry{" my section ", "x", "1"}));
  EXPECT_EQ(r.entries[2], (IniEntry{std::string(49, 'S'), "y", "2"}));
}

TEST(IniCore, CommentedClosingBracketIsAnErrorAndKeepsTheSection) {
  IniRecorder r;
  ParseOutcome out = ParseText("[a]\n[sec ; note]\nk = v\n", r);
  EXPECT_EQ(out.result, 2);
  EXPECT_EQ(out.output, "ERROR: No closing ']' found on line 2 in file test.ini: [sec ; note]\r\n");
  ASSERT_EQ(r.entries.size(), 1u);
  EXPECT_EQ(r.entries[0], (IniEntry{"a", "k", "v"}));
}

TEST(IniCore, MissingSeparatorOverwritesAnEarlierErrorLine) {
  IniRecorder r;
  ParseOutcome out = ParseText("a = 1\nb = 2\n[open\nc = 3\n\n; c\njustaname\nd = 4\n", r);
  EXPECT_EQ(out.result, 7);
  EXPECT_EQ(out.output,
            "ERROR: No closing ']' found on line 3 in file test.ini: [open\r\n"
            "ERROR: No value found on line 7 in file test.ini for parameter justaname\r\n");
  EXPECT_EQ(r.entries.size(), 4u);  // bad lines do not stop the parse
}

TEST(IniCore, SecondBracketErrorIsSilent) {
  IniRecorder r;
  ParseOutcome out = ParseText("[one\n[two\n", r);
  EXPECT_EQ(out.result, 1);
  EXPECT_EQ(out.output, "ERROR: No closing ']' found on line 1 in file test.ini: [one\r\n");
}

TEST(IniCore, RefusedValuesKeepTheFirstErrorLine) {
  IniRecorder r;
  r.refusedNames = {"bad1", "bad2"};
  ParseOutcome out = ParseText("x=1\ny=2\nbad1 = a\nz=3\n#\n;\nbad2 = b\nw=4\n", r);
  EXPECT_EQ(out.result, 3);
  EXPECT_EQ(out.output, "");
  EXPECT_EQ(r.entries.size(), 6u);
}

TEST(IniCore, CommentBeforeTheSeparatorLeavesNoValue) {
  IniRecorder r;
  ParseOutcome out = ParseText("a ; b = c\n", r);
  EXPECT_EQ(out.result, 1);
  EXPECT_EQ(out.output,
            "ERROR: No value found on line 1 in file test.ini for parameter a ; b = c\r\n");
  EXPECT_TRUE(r.entries.empty());
}

TEST(IniCore, WhitespaceAndLineEndsAreTrimmed) {
  IniRecorder r;
  ParseOutcome out = ParseText("  name   =   some value  \r\n\t[s]\r\nempty =\r\n", r);
  EXPECT_EQ(out.result, 0);
  ASSERT_EQ(r.entries.size(), 2u);
  EXPECT_EQ(r.entries[0], (IniEntry{"", "name", "some value"}));
  EXPECT_EQ(r.entries[1], (IniEntry{"s", "empty", ""}));
}

TEST(IniCore, EmptyAndCommentOnlyFilesAreGood) {
  IniRecorder r;
  EXPECT_EQ(ParseText("", r).result, 0);
  ParseOutcome out = ParseText("; one\n# two\n   ; three\n\n\t\n", r);
  EXPECT_EQ(out.result, 0);
  EXPECT_EQ(out.output, "");
  EXPECT_TRUE(r.entries.empty());
  EXPECT_TRUE(r.directives.empty());
}

TEST(IniCore, DirectivesReachTheirHandlerWithTheColon) {
  IniRecorder r;
  r.acceptDirectives = false;
  ParseOutcome out = ParseText("a=1\n  :include other.ini  \n:second\n", r);
  EXPECT_EQ(out.result, 2);
  ASSERT_EQ(r.directives.size(), 2u);
  EXPECT_EQ(r.directives[0], ":include other.ini");
  EXPECT_EQ(r.directives[1], ":second");
}

TEST(IniCore, DirectivesAreSkippedWithoutAHandler) {
  IniRecorder r;
  ParseOutcome out = ParseText(":directive\nk = v\n", r, false);
  EXPECT_EQ(out.result, 0);
  ASSERT_EQ(r.entries.size(), 1u);
  EXPECT_TRUE(r.directives.empty());
}

TEST(IniCore, LongLineArrivesInPiecesCountedAsLines) {
  IniRecorder r;
  // 6000 characters: 4999 in the first piece, the rest (no separator) in the second.
  std::string longLine = "k=" + std::string(5998, 'x');
  ParseOutcome out = ParseText(longLine + "\nnovalue\n", r);
  EXPECT_EQ(out.result, 3);
  ASSERT_EQ(r.entries.size(), 1u);
  EXPECT_EQ(r.entries[0].value, std::string(4997, 'x'));
  EXPECT_EQ(out.output, "ERROR: No value found on line 2 in file test.ini for parameter " +
                            std::string(1001, 'x') +
                            "\r\nERROR: No value found on line 3 in file test.ini for parameter "
                            "novalue\r\n");
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
            "ERROR: No value found on line 2 in file (null) for parameter abcdefg\r\n");
  EXPECT_EQ(ini::ParseLines(NextLine, &source, IniRecorder::OnValue, nullptr, &r, nullptr, small,
                            1),
            0);
}

TEST(IniCore, Helpers) {
  char text[] = "  ab \t\r\n";
  EXPECT_EQ(ini::StripWhitespacesAtEnd(text), text);
  EXPECT_STREQ(text, "  ab");
  EXPECT_STREQ(ini::FindFirstNonWhitespace(text), "ab");
  EXPECT_STREQ(ini::FindFirstNonWhitespace("   "), "");
  EXPECT_STREQ(ini::FindCharOrComment(";x=1", '='), "=1");
  EXPECT_STREQ(ini::FindCharOrComment("x ;=1", '='), ";=1");
  EXPECT_STREQ(ini::FindCharOrComment("x\t;", '\0'), ";");
  EXPECT_STREQ(ini::FindCharOrComment("abc", 'z'), "");
  char dst[4];
  EXPECT_EQ(ini::strncpy0(dst, "abcdef", sizeof dst), dst);
  EXPECT_STREQ(dst, "abc");
}

}  // namespace
