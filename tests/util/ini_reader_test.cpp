#include "stbplat/ini_reader.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <vector>

#include "os/seam.h"
#include "support/ini_recorder.h"

namespace {

using stbplat::os::LibcSysCalls;
using stbplat::test::IniEntry;
using stbplat::test::IniRecorder;
using stbplat::test::TempTextFile;

int g_opens = 0;
int g_closes = 0;

TEST(INIReader, ParsesAFileThroughTheSeamAndClosesIt) {
  stbplat::os::SysCalls calls = LibcSysCalls();
  calls.fopen64 = [](const char* path, const char* mode) {
    ++g_opens;
    EXPECT_STREQ(mode, "r");
    return LibcSysCalls().fopen64(path, mode);
  };
  calls.fclose = [](FILE* file) {
    ++g_closes;
    return LibcSysCalls().fclose(file);
  };
  stbplat::os::ScopedSysCalls guard(calls);
  g_opens = g_closes = 0;
  // The second line is cut by the reader's buffer; its 3-character tail has no separator.
  TempTextFile file("[net]\nip = 10.0.0.1 ; static\n[x\nv=" + std::string(5000, 'y') +
                    "\nnovalue\n");
  IniRecorder r;
  std::string name = file.path();
  INIReader reader(name.c_str(), IniRecorder::OnValue, &r);
  name[1] = 'X';  // the reader keeps its own copy
  testing::internal::CaptureStdout();
  EXPECT_EQ(reader.Parse(), 6);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "ERROR: No closing ']' found on line 3 in file " + file.path() + ": [x\r\n" +
                "ERROR: No value found on line 5 in file " + file.path() + " for parameter yyy\r\n" +
                "ERROR: No value found on line 6 in file " + file.path() +
                " for parameter novalue\r\n");
  EXPECT_EQ(g_opens, 1);
  EXPECT_EQ(g_closes, 1);
  ASSERT_EQ(r.entries.size(), 2u);
  EXPECT_EQ(r.entries[0], (IniEntry{"net", "ip", "10.0.0.1"}));
  EXPECT_EQ(r.entries[1].value, std::string(4997, 'y'));
}

TEST(INIReader, DirectiveLinesAreSkippedUntilAHandlerIsSet) {
  TempTextFile file(":load extra\nk = v\n");
  IniRecorder r;
  INIReader reader(file.path().c_str(), IniRecorder::OnValue, &r);
  EXPECT_EQ(reader.Parse(), 0);
  EXPECT_TRUE(r.directives.empty());
  reader.SetDirectiveHandler(IniRecorder::OnDirective);
  r.acceptDirectives = false;
  EXPECT_EQ(reader.Parse(), 1);
  EXPECT_EQ(r.directives, (std::vector<std::string>{":load extra"}));
  EXPECT_EQ(r.entries.size(), 2u);  // both parses reached k
}

TEST(INIReader, MissingOrUnnamedFile) {
  IniRecorder r;
  INIReader missing("/nonexistent/dir/settings.ini", IniRecorder::OnValue, &r);
  testing::internal::CaptureStdout();
  EXPECT_EQ(missing.Parse(), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Unable to open ini file /nonexistent/dir/settings.ini\r\n");
  testing::internal::CaptureStdout();
  INIReader unnamed(nullptr, IniRecorder::OnValue, &r);
  EXPECT_EQ(unnamed.fileName, nullptr);
  EXPECT_EQ(unnamed.lineBuffer, nullptr);
  EXPECT_EQ(unnamed.Parse(), -1);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "File name not specified to INIReader\r\nUnable to open ini file (null)\r\n");
}

}  // namespace
