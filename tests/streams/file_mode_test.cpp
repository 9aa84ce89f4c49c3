// File and standard-input streams: reading, short reads, appending,
// extending, failing writes, and the standard-input history.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <fstream>
#include <string>
#include <vector>

#include "os/seam.h"
#include "stbplat/intruder.h"
#include "support/log_capture.h"

using stbplat::os::LibcSysCalls;
using stbplat::os::ScopedSysCalls;
using stbplat::os::SysCalls;
using stbplat::test::LogCapture;

namespace {

class TempFile {
 public:
  TempFile() {
    char name[] = "/tmp/stbplat-stream-XXXXXX";
    int fd = mkstemp(name);
    ::close(fd);
    path_ = name;
  }
  ~TempFile() { std::remove(path_.c_str()); }
  const char* path() const { return path_.c_str(); }
  void Write(const std::vector<unsigned char>& bytes) const {
    std::ofstream(path_, std::ios::binary).write(reinterpret_cast<const char*>(bytes.data()),
                                                  static_cast<std::streamsize>(bytes.size()));
  }
  std::vector<unsigned char> Read() const {
    std::ifstream f(path_, std::ios::binary);
    return std::vector<unsigned char>(std::istreambuf_iterator<char>(f), {});
  }

 private:
  std::string path_;
};

TEST(ExtruderFile, ReadsValuesAndCountsWhatIsLeft) {
  TempFile file;
  file.Write({0x00, 0x2A, 0xDE, 0xAD, 0xBE, 0xEF, 1, 2, 3});
  Extruder in(file.path(), true);
  ASSERT_TRUE(in.isInitedOK);
  unsigned short a = 0;
  unsigned int b = 0;
  EXPECT_EQ(in.count(), 9u);
  EXPECT_EQ(in.extrude(&a), 0u) << "file reads never return 1";
  EXPECT_EQ(in.extrude(&b), 0u);
  EXPECT_EQ(a, 0x2A);
  EXPECT_EQ(b, 0xDEADBEEFu);
  EXPECT_EQ(in.count(), 3u);
  EXPECT_EQ(reinterpret_cast<std::uintptr_t>(in.getP()), 6u);
  EXPECT_EQ(in.currNandOffset, 6u) << "counts bytes read in file mode too";
  LogCapture log;
  EXPECT_EQ(in.extrude(&b), 2u);
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Can't extrude from a file\r\n"});
}

TEST(ExtruderFile, ShortArrayReadReportsWhatArrived) {
  TempFile file;
  file.Write({9, 8, 7, 6});
  Extruder in(file.path(), true);
  unsigned char dst[10] = {};
  unsigned int got = 99;
  LogCapture log;
  EXPECT_EQ(in.extrude(dst, 10, &got), 3u);
  EXPECT_EQ(got, 4u);
  EXPECT_EQ(dst[3], 6);
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Extruded less than length specified\r\n"});
  EXPECT_EQ(log.messages()[0].level, 6u);
}

TEST(ExtruderFile, OpenFailureLogsOnlyWhenAsked) {
  LogCapture log;
  Extruder quiet("/nonexistent/stbplat/file", false);
  EXPECT_FALSE(quiet.isInitedOK);
  EXPECT_TRUE(log.messages().empty());
  Extruder loud("/nonexistent/stbplat/file", true);
  EXPECT_FALSE(loud.isInitedOK);
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Unable to open file /nonexistent/stbplat/file\r\n"});
}

int FailSeek(FILE*, long, int) { return -1; }

TEST(ExtruderFile, MovesAreSeeksAndSetPChecksTheSeek) {
  TempFile file;
  file.Write({0, 1, 2, 3, 4, 5, 6, 7});
  Extruder in(file.path(), true);
  in += 5;
  in -= 2;
  unsigned char b = 0;
  in.extrude(&b, 1);
  EXPECT_EQ(b, 3);
  EXPECT_TRUE(in.setP(reinterpret_cast<unsigned char*>(1)));
  in.extrude(&b, 1);
  EXPECT_EQ(b, 1);
  SysCalls calls = LibcSysCalls();
  calls.fseek = FailSeek;
  ScopedSysCalls guard(calls);
  LogCapture log;
  EXPECT_FALSE(in.setP(reinterpret_cast<unsigned char*>(0x180000002ul)));
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Extruder::setP: fseek 0x80000002 failed\r\n"});
}

TEST(IntruderFile, TruncatesOrAppends) {
  TempFile file;
  file.Write({0xAA, 0xBB});
  {
    Intruder out(file.path(), true);
    ASSERT_TRUE(out.isInitedOK);
    EXPECT_EQ(out.intrude(static_cast<unsigned short>(0x0102)), 1u);
  }
  EXPECT_EQ(file.Read(), (std::vector<unsigned char>{0xAA, 0xBB, 1, 2}));
  {
    Intruder out(file.path(), false);
    out.intrude(static_cast<unsigned char>(7));
    out.intrude(static_cast<unsigned short>(0x0809));
    EXPECT_EQ(out.currNandOffset, 3u);
  }
  EXPECT_EQ(file.Read(), (std::vector<unsigned char>{7, 8, 9}));
}

TEST(IntruderFile, AppendCreatesAMissingFile) {
  TempFile file;
  std::remove(file.path());
  {
    Intruder out(file.path(), true);
    ASSERT_TRUE(out.isInitedOK);
    out.intrude(0x01020304u);
  }
  EXPECT_EQ(file.Read(), (std::vector<unsigned char>{1, 2, 3, 4}));
}

TEST(IntruderFile, OpenFailureLogsAndMarksTheStream) {
  LogCapture log;
  Intruder out("/nonexistent/stbplat/out", false);
  EXPECT_FALSE(out.isInitedOK);
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Unable to open file /nonexistent/stbplat/out\r\n"});
  EXPECT_EQ(log.messages()[0].function, "Intruder");
}

TEST(IntruderFile, AdvanceWritesFillerWhenTheSeekFails) {
  TempFile file;
  {
    Intruder out(file.path(), false);
    out.intrude(static_cast<unsigned char>(1));
    SysCalls calls = LibcSysCalls();
    calls.fseek = FailSeek;
    ScopedSysCalls guard(calls);
    out += 3;
  }
  EXPECT_EQ(file.Read().size(), 4u);
}

size_t ShortWrite(const void*, size_t, size_t, FILE*) {
  errno = ENOSPC;
  return 1;
}

TEST(IntruderFile, ShortWriteFailsWithItsMessage) {
  TempFile file;
  Intruder out(file.path(), false);
  out.intrude(static_cast<unsigned short>(0xFFFF));
  SysCalls calls = LibcSysCalls();
  calls.fwrite = ShortWrite;
  ScopedSysCalls guard(calls);
  LogCapture log;
  EXPECT_EQ(out.intrude(0x01020304u), 3u);
  EXPECT_EQ(out.currNandOffset, 2u);
  EXPECT_EQ(log.texts(), std::vector<std::string>{
                             "fwrite of 4 bytes failed, wrote 1 bytes, file location = 2, errno = 28, "
                             "ferror = 0\r\n"});
}

// Standard input: each case runs in a child whose fd 0 is a pipe fed by the
// test, so the test process's own stdin is untouched.
void FeedStdin(const std::vector<unsigned char>& bytes) {
  int fds[2];
  if (pipe(fds) != 0) _exit(90);
  if (write(fds[1], bytes.data(), bytes.size()) != static_cast<ssize_t>(bytes.size())) _exit(91);
  ::close(fds[1]);
  dup2(fds[0], 0);
  ::close(fds[0]);
  clearerr(stdin);
}

#define CHILD_CHECK(cond, code) \
  do {                          \
    if (!(cond)) _exit(code);   \
  } while (0)

void StdinGoesBackWithinItsHistory() {
  std::vector<unsigned char> data(3000);
  for (size_t i = 0; i < data.size(); ++i) data[i] = static_cast<unsigned char>(i * 7);
  FeedStdin(data);
  Extruder in(stdin);
  CHILD_CHECK(in.IsUsingStdin(), 1);
  std::vector<unsigned char> buf(2500);
  CHILD_CHECK(in.extrude(buf.data(), 2500) == 0, 2);
  CHILD_CHECK(in.stdinHistoryCount == 2000 && in.stdinTotalRead == 2500, 3);
  in -= 2001;  // beyond the history: refused
  CHILD_CHECK(in.stdinPosition == 2500, 4);
  in -= 2000;
  CHILD_CHECK(reinterpret_cast<std::uintptr_t>(in.getP()) == 500, 5);
  unsigned char b = 0;
  CHILD_CHECK(in.extrude(&b, 1) == 0 && b == data[500], 6);
  // Forward inside the history is a move; past it, bytes are read.
  CHILD_CHECK(in.setP(reinterpret_cast<unsigned char*>(2600)), 7);
  CHILD_CHECK(in.extrude(&b, 1) == 0 && b == data[2600], 8);
  unsigned int rest = 0;
  std::vector<unsigned char> tail(1000);
  CHILD_CHECK(in.extrude(tail.data(), 1000, &rest) == 3 && rest == 399, 9);
  _exit(0);
}

TEST(ExtruderStdin, GoesBackWithinItsHistoryOnly) {
  EXPECT_EXIT(StdinGoesBackWithinItsHistory(), testing::ExitedWithCode(0), "");
}

void StdinRefusalMessage() {
  FeedStdin({1, 2, 3, 4});
  Extruder in(stdin);
  unsigned short v = 0;
  in.extrude(&v);
  LogCapture log;
  in -= 3;
  CHILD_CHECK(log.texts() == std::vector<std::string>{"Extruder::operator -=: unable to decrease pointer"},
              1);
  in -= 2;
  CHILD_CHECK(in.extrude(&v) == 0 && v == 0x0102, 2);
  _exit(0);
}

TEST(ExtruderStdin, RefusalMessageHasNoLineEnd) {
  EXPECT_EXIT(StdinRefusalMessage(), testing::ExitedWithCode(0), "");
}

}  // namespace
