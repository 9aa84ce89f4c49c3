// The ini line parser, fed through fgets, and INIReader around it.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "stbplat/ini_reader.h"
#include "support/scratch_dir.h"
#include "util/ini_core.h"

namespace {

// Records what a parse hands to its handlers: one line for each call,
// "[section] name=value" or the directive line.
// The handlers refuse the name "refused" and the directive ":refused".
struct IniRecorder {
  std::string seen;
  static bool OnValue(void* user, const char* section, const char* name, const char* value) {
    static_cast<IniRecorder*>(user)->seen += "[" + std::string(section) + "] " + name + "=" + value + "\n";
    return std::string(name) != "refused";
  }
  static bool OnDirective(void* user, const char* line) {
    static_cast<IniRecorder*>(user)->seen += std::string(line) + "\n";
    return std::string(line) != ":refused";
  }
};

TEST(IniParse, LinesSectionsCommentsAndErrors) {
  struct Row {
    std::string text;
    int result;  // 0, or the bad line that counts
    std::string output;
    std::string seen;
  };
  const Row rows[] = {
      // An inline comment needs whitespace before it; ':' separates where no '=' comes first.
      // A byte-order mark before the first line is skipped; names are passed whole.
      {"\xEF\xBB\xBF  name =  a value ; note\r\nother = a;b\n; one\n# two\n\n\t[ my section ]\r\n"
       "key: v\na:b = c\nempty =\n[" + std::string(60, 'S') + "]\n" + std::string(60, 'n') +
       " = ;v\n",
       0, "", "[] name=a value\n[] other=a;b\n[ my section ] key=v\n[ my section ] a:b=c\n"
       "[ my section ] empty=\n[" + std::string(49, 'S') + "] " + std::string(60, 'n') + "=;v\n"},
      {"\xEF\xBB\xBF[net]\nip = 1\n\xEF\xBB\xBFk = 2\n", 0, "", "[net] ip=1\n[net] \xEF\xBB\xBFk=2\n"},
      // A commented ']' leaves the section as it was.
      {"[a]\n[sec ; note]\nk = v\n", 2,
       "ERROR: No closing ']' found on line 2 in file test.ini: [sec ; note]\r\n", "[a] k=v\n"},
      // Bad lines do not stop the parse; a line without a separator replaces the result.
      {"[open\nc = 3\n[two\nrefused = 4\njustaname\nd = 4\n", 5,
       "ERROR: No closing ']' found on line 1 in file test.ini: [open\r\n"
       "ERROR: No value found on line 5 in file test.ini for parameter justaname\r\n",
       "[] c=3\n[] refused=4\n[] d=4\n"},
      // A refused value or directive counts while no earlier error is kept.
      {"x=1\nrefused = a\n  :refused  \n", 2, "", "[] x=1\n[] refused=a\n:refused\n"},
      // 6000 characters arrive as 4999 and the rest, each counted as a line.
      {"k=" + std::string(5998, 'x') + "\nnovalue\n", 3,
       "ERROR: No value found on line 2 in file test.ini for parameter " + std::string(1001, 'x') +
           "\r\nERROR: No value found on line 3 in file test.ini for parameter novalue\r\n",
       "[] k=" + std::string(4997, 'x') + "\n"},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.text.substr(0, 40));
    FILE* in = fmemopen(const_cast<char*>(row.text.data()), row.text.size(), "r");
    IniRecorder recorder;
    testing::internal::CaptureStdout();
    EXPECT_EQ(stbplat::ini::IniParseFile(in, ::fgets, IniRecorder::OnValue,
                                         IniRecorder::OnDirective, &recorder, "test.ini"),
              row.result);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), row.output);
    EXPECT_EQ(recorder.seen, row.seen);
    std::fclose(in);
  }
}

TEST(INIReader, OwnCopyOfTheNameDirectiveHandlerAndMissingFiles) {
  const stbplat::test::ScratchDir dir;
  const std::string path = dir.Write("reader.ini", ":refused\n[s]\nk = v\n");
  std::string name = path;
  IniRecorder recorder;
  INIReader reader(name.c_str(), IniRecorder::OnValue, &recorder);
  name[1] = 'X';  // the reader keeps its own copy
  EXPECT_EQ(reader.Parse(), 0);  // without a directive handler ':' lines are skipped
  reader.SetDirectiveHandler(IniRecorder::OnDirective);
  EXPECT_EQ(reader.Parse(), 1);
  EXPECT_EQ(recorder.seen, "[s] k=v\n:refused\n[s] k=v\n");
  unlink(path.c_str());
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), -1);
  EXPECT_EQ(INIReader(nullptr, IniRecorder::OnValue, &recorder).Parse(), -1);
  // A directory opens, but no line can be read.
  EXPECT_EQ(INIReader(dir.path().c_str(), IniRecorder::OnValue, &recorder).Parse(), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Unable to open ini file " + path + "\r\nFile name not specified to INIReader\r\n"
            "Unable to open ini file (null)\r\nUnable to read ini file " + dir.path() + "\r\n");
  char copy[] = "abc";
  EXPECT_EQ(reader.strncpy0(copy + 1, "xyz", 0), copy + 1);
  EXPECT_STREQ(copy, "abc");  // no room, nothing written
}

}  // namespace
