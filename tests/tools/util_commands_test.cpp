// The stand-alone commands end to end: checksums, hex dump, ini files, and
// the tool's conventions (exit codes, errors naming the argument, --help).
#include <gtest/gtest.h>

#include <string>

#include "scratch_dir.h"
#include "tool_runner.h"

namespace {

using stbplat::test::RunTool;
using stbplat::test::ScratchDir;
using stbplat::test::ToolRun;

TEST(ChecksumCommands, GiveTheStandardCheckValues) {
  ScratchDir dir;
  std::string file = dir.Write("check.txt", "123456789");
  ToolRun crc16 = RunTool({"crc16", file});
  EXPECT_EQ(0, crc16.exitCode);
  EXPECT_EQ("0x2189  " + file + "\n", crc16.out);
  ToolRun crc32 = RunTool({"crc32", file, "-"}, "123456789");
  EXPECT_EQ(0, crc32.exitCode);
  EXPECT_EQ("0xCBF43926  " + file + "\n0xCBF43926  -\n", crc32.out);
}

TEST(ChecksumCommands, CoverLongFilesInPiecesAndReportJson) {
  ScratchDir dir;
  // Longer than one CRC-16 call covers (65535 bytes).
  std::string file = dir.Write("long.bin", std::string(70000, 'a'));
  ToolRun json = RunTool({"--json", "crc32", file});
  EXPECT_EQ(0, json.exitCode);
  EXPECT_NE(std::string::npos, json.out.find("\"size\": 70000")) << json.out;
  ToolRun crc16 = RunTool({"crc16", file});
  EXPECT_EQ(0, crc16.exitCode);
  // KERMIT over 70000 'a' bytes, worked out bit by bit beside the tool.
  EXPECT_EQ("0x6E80  " + file + "\n", crc16.out);
}

TEST(ChecksumCommands, NameTheFileThatCannotBeRead) {
  ToolRun run = RunTool({"crc32", "/nonexistent/file"});
  EXPECT_EQ(1, run.exitCode);
  EXPECT_NE(std::string::npos, run.err.find("/nonexistent/file")) << run.err;
  EXPECT_EQ("", run.out);
}

TEST(HexdumpCommand, PrintsTheLibraryDumpBehindEachOffset) {
  ScratchDir dir;
  std::string file = dir.Write("dump.bin", std::string("ABCDEFGHIJKLMNOPQ\0\x7f", 19));
  ToolRun run = RunTool({"hexdump", file});
  EXPECT_EQ(0, run.exitCode);
  EXPECT_EQ("00000000  41 42 43 44 45 46 47 48 49 4A 4B 4C 4D 4E 4F 50      ABCDEFGHIJKLMNOP\n"
            "00000010  51 00 7F                                             Q..             \n",
            run.out);
  ToolRun window = RunTool({"hexdump", "--offset", "16", "--length", "2", file});
  EXPECT_EQ("00000010  51 00                                                Q.              \n", window.out);
}

TEST(HexdumpCommand, RefusesAnOffsetPastTheEnd) {
  ScratchDir dir;
  std::string file = dir.Write("small.bin", "abc");
  ToolRun run = RunTool({"hexdump", "--offset", "10", file});
  EXPECT_EQ(2, run.exitCode);
  EXPECT_NE(std::string::npos, run.err.find("--offset 0xA")) << run.err;
}

TEST(IniCommand, PrintsSectionsAndValues) {
  ScratchDir dir;
  std::string file = dir.Write("good.ini", "top = 1\n[net]\naddress = 10.0.0.1 ; home\nmask: 255.0.0.0\n");
  ToolRun run = RunTool({"ini", file});
  EXPECT_EQ(0, run.exitCode);
  EXPECT_EQ("top = 1\n\n[net]\naddress = 10.0.0.1\nmask = 255.0.0.0\n", run.out);
  EXPECT_EQ("", run.err);
}

TEST(IniCommand, ReportsTheFirstBadLineOnStandardError) {
  ScratchDir dir;
  std::string file = dir.Write("bad.ini", "[a]\nx = 1\n[broken\ny = 2\n");
  ToolRun run = RunTool({"--json", "ini", file});
  EXPECT_EQ(1, run.exitCode);
  EXPECT_NE(std::string::npos, run.out.find("\"firstBadLine\": 3")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("\"y\": \"2\"")) << run.out;  // later lines still read
  EXPECT_NE(std::string::npos, run.err.find("No closing ']' found on line 3")) << run.err;
  EXPECT_NE(std::string::npos, run.err.find(file + ":3")) << run.err;
}

TEST(ToolConventions, HelpOnEveryLevelExitsZero) {
  for (const auto& args : std::vector<std::vector<std::string>>{
           {"--help"}, {"disk", "--help"}, {"disk", "info", "--help"}, {"crc32", "--help"}}) {
    ToolRun run = RunTool(args);
    EXPECT_EQ(0, run.exitCode) << args[0];
    EXPECT_NE(std::string::npos, run.out.find("Usage:")) << run.out;
  }
}

TEST(ToolConventions, UsageErrorsExitTwoAndNameTheArgument) {
  ToolRun none = RunTool({});
  EXPECT_EQ(2, none.exitCode);
  ToolRun unknown = RunTool({"frobnicate"});
  EXPECT_EQ(2, unknown.exitCode);
  EXPECT_NE(std::string::npos, unknown.err.find("frobnicate")) << unknown.err;
  ToolRun badOption = RunTool({"hexdump", "--indent", "500", "x"});
  EXPECT_EQ(2, badOption.exitCode);
  EXPECT_NE(std::string::npos, badOption.err.find("--indent")) << badOption.err;
  ToolRun badDisk = RunTool({"disk", "info", "/dev/sda"});
  EXPECT_EQ(2, badDisk.exitCode);
  EXPECT_NE(std::string::npos, badDisk.err.find("/dev/sda")) << badDisk.err;
}

TEST(ToolConventions, BadRootIsAUsageError) {
  ScratchDir dir;
  ToolRun run = RunTool({"--root", dir.path(), "crc16", "-"}, "x");
  EXPECT_EQ(2, run.exitCode);
  EXPECT_NE(std::string::npos, run.err.find("proc/mtd")) << run.err;
  ToolRun fromEnvironment = RunTool({"crc16", "-"}, "x", {"STBPLAT_ROOT=" + dir.path()});
  EXPECT_EQ(2, fromEnvironment.exitCode);
}

}  // namespace
