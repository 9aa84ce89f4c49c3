#include "stbplat/ini_reader.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "os/seam.h"
#include "support/ini_recorder.h"

namespace {

using stbplat::os::LibcSysCalls;
using stbplat::os::ScopedSysCalls;
using stbplat::os::SysCalls;
using stbplat::test::IniEntry;
using stbplat::test::IniRecorder;
using stbplat::test::TempTextFile;

int g_opens = 0;
int g_closes = 0;
FILE* CountingOpen(const char* path, const char* mode) {
  ++g_opens;
  EXPECT_STREQ(mode, "r");
  return LibcSysCalls().fopen64(path, mode);
}
int CountingClose(FILE* file) {
  ++g_closes;
  return LibcSysCalls().fclose(file);
}

TEST(INIReader, ParsesAFileThroughTheSeamAndClosesIt) {
  SysCalls calls = LibcSysCalls();
  calls.fopen64 = CountingOpen;
  calls.fclose = CountingClose;
  ScopedSysCalls guard(calls);
  g_opens = g_closes = 0;

  TempTextFile file("; settings\n[net]\nip = 10.0.0.1 ; static\nmask: 255.0.0.0\n[ui]\nlang=en\n");
  IniRecorder r;
  INIReader reader(file.path().c_str(), IniRecorder::OnValue, &r);
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), 0);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
  EXPECT_EQ(g_opens, 1);
  EXPECT_EQ(g_closes, 1);
  ASSERT_EQ(r.entries.size(), 3u);
  EXPECT_EQ(r.entries[0], (IniEntry{"net", "ip", "10.0.0.1"}));
  EXPECT_EQ(r.entries[1], (IniEntry{"net", "mask", "255.0.0.0"}));
  EXPECT_EQ(r.entries[2], (IniEntry{"ui", "lang", "en"}));
}

TEST(INIReader, ErrorLinesAndMessagesNameTheFile) {
  TempTextFile file("a=1\nb=2\n[x\nc=3\nd=4\ne=5\nnovalue\n");
  IniRecorder r;
  INIReader reader(file.path().c_str(), IniRecorder::OnValue, &r);
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), 7);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "ERROR: No closing ']' found on line 3 in file " + file.path() + ": [x\r\n" +
                "ERROR: No value found on line 7 in file " + file.path() +
                " for parameter novalue\r\n");
  EXPECT_EQ(r.entries.size(), 5u);
}

TEST(INIReader, DirectiveLinesAreSkippedUntilAHandlerIsSet) {
  TempTextFile file(":load extra\nk = v\n");
  IniRecorder r;
  INIReader reader(file.path().c_str(), IniRecorder::OnValue, &r);
  EXPECT_EQ(reader.directiveHandler, nullptr);
  EXPECT_EQ(reader.Parse(), 0);
  EXPECT_TRUE(r.directives.empty());

  reader.SetDirectiveHandler(IniRecorder::OnDirective);
  r.acceptDirectives = false;
  EXPECT_EQ(reader.Parse(), 1);
  ASSERT_EQ(r.directives.size(), 1u);
  EXPECT_EQ(r.directives[0], ":load extra");
  EXPECT_EQ(r.entries.size(), 2u);  // both parses reached k
}

TEST(INIReader, MissingFile) {
  IniRecorder r;
  INIReader reader("/nonexistent/dir/settings.ini", IniRecorder::OnValue, &r);
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Unable to open ini file /nonexistent/dir/settings.ini\r\n");
}

TEST(INIReader, NoFileNameAllocatesNothingAndCannotParse) {
  IniRecorder r;
  testing::internal::CaptureStdout();
  INIReader reader(nullptr, IniRecorder::OnValue, &r);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "File name not specified to INIReader\r\n");
  EXPECT_EQ(reader.fileName, nullptr);
  EXPECT_EQ(reader.lineBuffer, nullptr);
  EXPECT_EQ(reader.user, &r);
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "Unable to open ini file (null)\r\n");
}

TEST(INIReader, KeepsACopyOfTheName) {
  std::string name = "/tmp/some.ini";
  INIReader reader(name.c_str(), nullptr, nullptr);
  name[1] = 'X';
  EXPECT_STREQ(reader.fileName, "/tmp/some.ini");
  EXPECT_NE(reader.lineBuffer, nullptr);
}

TEST(INIReader, EmptyFileAndLongLine) {
  IniRecorder r;
  {
    TempTextFile empty("");
    INIReader reader(empty.path().c_str(), IniRecorder::OnValue, &r);
    EXPECT_EQ(reader.Parse(), 0);
  }
  TempTextFile file("v=" + std::string(5000, 'y') + "\n[s]\nk=1\n");
  INIReader reader(file.path().c_str(), IniRecorder::OnValue, &r);
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), 2);  // the 3-character tail has no separator
  testing::internal::GetCapturedStdout();
  ASSERT_EQ(r.entries.size(), 2u);
  EXPECT_EQ(r.entries[0].value.size(), 4997u);
  EXPECT_EQ(r.entries[1], (IniEntry{"s", "k", "1"}));
}

}  // namespace
