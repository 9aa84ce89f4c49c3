// File, standard-input and device-path streams: reads, short reads, the
// counts and positions of a file, appending, failing seeks and writes, and
// the standard-input history.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
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
using Bytes = std::vector<unsigned char>;
using Texts = std::vector<std::string>;

namespace {

class TempFile {
 public:
  explicit TempFile(const Bytes& bytes) {
    char name[] = "/tmp/stbplat-stream-XXXXXX";
    ::close(mkstemp(name));
    path_ = name;
    std::ofstream(path_, std::ios::binary)
        .write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
  }
  ~TempFile() { std::remove(path_.c_str()); }
  const char* path() const { return path_.c_str(); }
  Bytes Read() const {
    std::ifstream f(path_, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(f), {});
  }

 private:
  std::string path_;
};

unsigned char* At(std::uintptr_t offset) { return reinterpret_cast<unsigned char*>(offset); }

int FailSeek(FILE*, long, int) { return -1; }

size_t ShortWrite(const void*, size_t, size_t, FILE*) {
  errno = ENOSPC;
  return 1;
}

TEST(ExtruderFile, ReadsCountsAndEndsWithAShortRead) {
  TempFile file({0x00, 0x2A, 0xDE, 0xAD, 0xBE, 0xEF, 1, 2, 3});
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
  EXPECT_EQ(in.getP(), At(6));
  EXPECT_EQ(in.currNandOffset, 6u);
  LogCapture log;
  unsigned char dst[10] = {};
  unsigned int got = 99;
  EXPECT_EQ(in.extrude(dst, 10, &got), 3u);
  EXPECT_EQ(got, 3u);
  EXPECT_EQ(dst[2], 3);
  EXPECT_EQ(in.extrude(&b), 2u);
  EXPECT_EQ(log.texts(), (Texts{"Extruded less than length specified\r\n", "Can't extrude from a file\r\n"}));
  EXPECT_EQ(log.messages()[0].level, 6u);
}

TEST(StreamFile, OpenFailuresLogOnlyWhenAsked) {
  LogCapture log;
  EXPECT_FALSE(Extruder("/nonexistent/stbplat/file", false).isInitedOK);
  EXPECT_TRUE(log.messages().empty());
  EXPECT_FALSE(Extruder("/nonexistent/stbplat/file", true).isInitedOK);
  EXPECT_FALSE(Intruder("/nonexistent/stbplat/out", true).isInitedOK);
  EXPECT_EQ(log.texts(), (Texts{"Unable to open file /nonexistent/stbplat/file\r\n",
                                "Unable to open file /nonexistent/stbplat/out\r\n"}));
  EXPECT_EQ(log.messages()[1].function, "Intruder");
}

TEST(ExtruderFile, MovesAreSeeksAndAFailingSeekIsReported) {
  TempFile file({0, 1, 2, 3, 4, 5, 6, 7});
  Extruder in(file.path(), true);
  in += 5;
  in -= 2;
  unsigned char b = 0;
  in.extrude(&b, 1);
  EXPECT_EQ(b, 3);
  EXPECT_TRUE(in.setP(At(1)));
  in.extrude(&b, 1);
  EXPECT_EQ(b, 1);
  SysCalls calls = LibcSysCalls();
  calls.fseek = FailSeek;
  ScopedSysCalls guard(calls);
  LogCapture log;
  EXPECT_FALSE(in.setP(At(0x180000002ul)));
  EXPECT_EQ(log.texts(), Texts{"Extruder::setP: fseek 0x80000002 failed\r\n"});
  EXPECT_EQ(in.count(), 0u) << "a file that cannot seek tells no size";
}

TEST(IntruderFile, TruncatesAppendsCreatesAndExtendsWhenTheSeekFails) {
  TempFile file({0xAA, 0xBB});
  {
    Intruder out(file.path(), true);
    EXPECT_EQ(out.intrude(static_cast<unsigned short>(0x0102)), 1u);
  }
  EXPECT_EQ(file.Read(), (Bytes{0xAA, 0xBB, 1, 2}));
  {
    Intruder out(file.path(), false);
    out.intrude(static_cast<unsigned char>(7));
    out.intrude(static_cast<unsigned short>(0x0809));
    EXPECT_EQ(out.currNandOffset, 3u);
    SysCalls calls = LibcSysCalls();
    calls.fseek = FailSeek;
    ScopedSysCalls guard(calls);
    out += 2;  // written as filler instead
  }
  EXPECT_EQ(file.Read(), (Bytes{7, 8, 9, 0, 0}));
  std::remove(file.path());
  {
    Intruder out(file.path(), true);
    ASSERT_TRUE(out.isInitedOK);
    out.intrude(true);
  }
  EXPECT_EQ(file.Read(), Bytes{1});
}

TEST(IntruderFile, ShortWriteFailsWithItsMessage) {
  TempFile file({});
  Intruder out(file.path(), false);
  out.intrude(static_cast<unsigned short>(0xFFFF));
  SysCalls calls = LibcSysCalls();
  calls.fwrite = ShortWrite;
  ScopedSysCalls guard(calls);
  LogCapture log;
  EXPECT_EQ(out.intrude(0x01020304u), 3u);
  EXPECT_EQ(out.currNandOffset, 2u);
  EXPECT_EQ(log.texts(), Texts{"fwrite of 4 bytes failed, wrote 1 bytes, file location = 2, errno = 28, "
                               "ferror = 0\r\n"});
}

TEST(ExtruderDevicePath, PositionsAreTheDeviceOffset) {
  TempFile file({});
  Extruder in(file.path(), 5ul, true);
  ASSERT_TRUE(in.isInitedOK);
  EXPECT_TRUE(in.Is64Address());
  in += 4;
  in -= 2;
  EXPECT_EQ(in.getP(), At(7));
  EXPECT_TRUE(in.setP(At(0x30)));
  EXPECT_EQ(in.currNandOffset, 0x30u);
  LogCapture log;
  EXPECT_TRUE(in.setP64(3));
  in -= 4;
  in -= 3;
  EXPECT_EQ(in.getP64(), 0u);
  EXPECT_EQ(log.texts(), (Texts{"setP64 0x3 \r\n", "Unable to go back 4 bytes, currNandOffset = 3\r\n",
                                "getP64 0x0 \r\n"}));
}

// Standard input: the case runs in a child whose fd 0 is a pipe fed by the
// test, so the test process's own stdin is untouched.
#define CHILD_CHECK(cond, code) \
  do {                          \
    if (!(cond)) _exit(code);   \
  } while (0)

void StdinKeepsAHistoryToGoBackInto() {
  Bytes data(3000);
  for (size_t i = 0; i < data.size(); ++i) data[i] = static_cast<unsigned char>(i * 7 + i / 256);
  auto be32 = [&](size_t i) {
    return static_cast<unsigned int>(data[i] << 24 | data[i + 1] << 16 | data[i + 2] << 8 | data[i + 3]);
  };
  int fds[2];
  CHILD_CHECK(pipe(fds) == 0 && write(fds[1], data.data(), 3000) == 3000, 90);
  ::close(fds[1]);
  dup2(fds[0], 0);
  ::close(fds[0]);
  clearerr(stdin);
  Extruder in(stdin);
  Bytes buf(2000);
  CHILD_CHECK(in.IsUsingStdin() && in.extrude(buf.data(), 1990) == 0 && in.stdinHistoryCount == 1990, 1);
  CHILD_CHECK(in.extrude(buf.data(), 20) == 0 && in.stdinHistoryCount == 2000, 2);
  LogCapture log;
  in -= 2001;  // beyond the history: refused
  CHILD_CHECK(log.texts() == Texts{"Extruder::operator -=: unable to decrease pointer"}, 3);
  in -= 2000;
  unsigned char b = 0;
  CHILD_CHECK(in.getP() == At(10) && in.extrude(&b, 1) == 0 && b == data[10], 4);
  CHILD_CHECK(in.setP(At(2009)) && in.stdinTotalRead == 2010, 5);  // a move inside the history
  unsigned int u = 0;
  CHILD_CHECK(in.extrude(&u) == 0 && u == be32(2009), 6);  // one byte old, three new
  in -= 4;
  CHILD_CHECK(in.extrude(&u) == 0 && u == be32(2009), 7);  // all four from the history
  in -= 2;
  unsigned int got = 0;
  CHILD_CHECK(in.extrude(buf.data(), 5, &got) == 0 && got == 5, 8);
  CHILD_CHECK(std::equal(buf.begin(), buf.begin() + 5, data.begin() + 2011), 9);
  in += 3;  // beyond the history: read and dropped
  CHILD_CHECK(in.extrude(&b, 1) == 0 && b == data[2019], 10);
  CHILD_CHECK(in.extrude(buf.data(), 978, &got) == 0 && got == 978, 11);
  CHILD_CHECK(in.extrude(&u) == 2 && in.getP() == At(2998), 12);  // two bytes were left
  CHILD_CHECK(in.extrude(buf.data(), 10, &got) == 3 && got == 0, 13);
  _exit(0);
}

TEST(ExtruderStdin, KeepsAHistoryToGoBackInto) {
  EXPECT_EXIT(StdinKeepsAHistoryToGoBackInto(), testing::ExitedWithCode(0), "");
}

}  // namespace
