// File, device-path and standard-input streams: reads and short reads,
// counts and positions, appending, failing seeks and writes, and the
// standard-input history.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>

#include "descriptors/record_test_util.h"
#include "flash/flash_fixture.h"
#include "os/seam.h"
#include "stbplat/component_location.h"

using stbplat::os::LibcSysCalls;
using stbplat::os::ScopedSysCalls;
using stbplat::os::SysCalls;
using stbplat::test::LogCapture;
using stbplat::test::ScratchDir;
using namespace records_test;

namespace {

unsigned char* At(std::uintptr_t offset) { return reinterpret_cast<unsigned char*>(offset); }

int FailSeek(FILE*, long, int) { return -1; }

size_t ShortWrite(const void*, size_t, size_t, FILE*) {
  errno = ENOSPC;
  return 1;
}

TEST(FileStreams, ReadsMovesCountsShortReadsAndDevicePaths) {
  const ScratchDir dir;
  const std::string path = dir.Write("in.bin", Bytes{0x00, 0x2A, 0xDE, 0xAD, 0xBE, 0xEF, 1, 2, 3});
  LogCapture log;
  EXPECT_FALSE(Extruder("/nonexistent/stbplat/file", false).isInitedOK);
  EXPECT_FALSE(Extruder("/nonexistent/stbplat/file", true).isInitedOK);
  Extruder in(path.c_str(), true);
  unsigned short a = 0;
  unsigned int b = 0;
  EXPECT_EQ(in.count(), 9u);
  EXPECT_EQ(in.extrude(&a), 0u) << "file reads never return 1";
  EXPECT_EQ(in.extrude(&b), 0u);
  EXPECT_EQ(b, 0xDEADBEEFu);
  EXPECT_EQ(in.count(), 3u);
  EXPECT_EQ(in.getP(), At(6));
  unsigned char dst[10] = {};
  unsigned int got = 99;
  EXPECT_EQ(in.extrude(dst, 10, &got), 3u);
  EXPECT_EQ(got, 3u);
  EXPECT_EQ(in.extrude(&b), 2u);
  EXPECT_EQ(log.texts(), (Texts{"Unable to open file /nonexistent/stbplat/file\r\n",
                                "Extruded less than length specified\r\n", "Can't extrude from a file\r\n"}));
  EXPECT_EQ(log.messages()[1].level, 6u);
  Extruder device(path.c_str(), 5ul, true);  // a device path: positions are the device offset
  EXPECT_TRUE(device.Is64Address());
  device += 2;
  EXPECT_EQ(device.getP(), At(7));
  EXPECT_TRUE(device.setP(At(0x30)));
  EXPECT_EQ(device.currNandOffset, 0x30u);
  log.Clear();
  EXPECT_TRUE(device.setP64(3));
  device -= 4;
  device -= 3;
  EXPECT_EQ(device.getP64(), 0u);
  EXPECT_EQ(log.texts(), (Texts{"setP64 0x3 \r\n", "Unable to go back 4 bytes, currNandOffset = 3\r\n",
                                "getP64 0x0 \r\n"}));
  SysCalls calls = LibcSysCalls();
  calls.fseek = FailSeek;
  ScopedSysCalls guard(calls);
  EXPECT_FALSE(in.setP(At(0x180000002ul)));
  EXPECT_EQ(log.texts().back(), "Extruder::setP: fseek 0x80000002 failed\r\n");
  EXPECT_EQ(in.count(), 0u) << "a file that cannot seek tells no size";
}

TEST(FileStreams, WritersAppendTruncateCreateExtendAndReportShortWrites) {
  const ScratchDir dir;
  const std::string path = dir.Write("out.bin", Bytes{0xAA, 0xBB});
  Intruder(path.c_str(), true).intrude(static_cast<unsigned short>(0x0102));
  EXPECT_EQ(dir.Read(path), (Bytes{0xAA, 0xBB, 1, 2}));
  {
    Intruder out(path.c_str(), false);
    EXPECT_EQ(out.intrude(static_cast<unsigned short>(0x0809)), 1u);
    SysCalls calls = LibcSysCalls();
    calls.fseek = FailSeek;
    ScopedSysCalls guard(calls);
    out += 2;  // written as filler instead
    calls.fwrite = ShortWrite;
    ScopedSysCalls shortWrites(calls);
    LogCapture log;
    EXPECT_EQ(out.intrude(0x01020304u), 3u);
    EXPECT_EQ(out.currNandOffset, 2u);
    EXPECT_EQ(log.texts(), Texts{"fwrite of 4 bytes failed, wrote 1 bytes, file location = 4, errno = 28, "
                                 "ferror = 0\r\n"});
  }
  EXPECT_EQ(dir.Read(path).size(), 4u);
  std::remove(path.c_str());
  Intruder(path.c_str(), true).intrude(true);
  EXPECT_EQ(dir.Read(path), Bytes{1});
  LogCapture log;
  EXPECT_FALSE(Intruder("/nonexistent/stbplat/out", false).isInitedOK);
  EXPECT_EQ(log.texts(), Texts{"Unable to open file /nonexistent/stbplat/out\r\n"});
  EXPECT_EQ(log.messages()[0].function, "Intruder");
}

class PhysicalMemoryStream : public stbplat::test::FlashTest {};

TEST_F(PhysicalMemoryStream, ASlotTheMapDoesNotPlaceIsNotOpened) {
  ComponentLocation nowhere;
  nowhere.location = stbplat::test::MakeLocation("SDRAM0", "RESV", "NONE");
  LogCapture log;
  Extruder in(&nowhere, false);
  EXPECT_FALSE(in.isInitedOK);
  EXPECT_EQ(in.pStart, nullptr);
  EXPECT_EQ(log.texts(), Texts{"Package location SDRAM0.RESV.NONE not found\r\n"});
}

// Standard input: the case runs in a child whose fd 0 is a pipe fed by the
// test, so the test process's own stdin is untouched.
#define CHILD_CHECK(cond, code) if (!(cond)) _exit(code)

void StdinKeepsAHistoryToGoBackInto() {
  Bytes data(3000);
  for (size_t i = 0; i < data.size(); ++i) data[i] = static_cast<unsigned char>(i * 7 + i / 256);
  const unsigned int at2009 =
      static_cast<unsigned int>(data[2009] << 24 | data[2010] << 16 | data[2011] << 8 | data[2012]);
  int fds[2];
  CHILD_CHECK(pipe(fds) == 0 && write(fds[1], data.data(), 3000) == 3000, 90);
  ::close(fds[1]);
  dup2(fds[0], 0);
  ::close(fds[0]);
  clearerr(stdin);
  (void)Extruder(data.data(), 1);  // a memory stream's destruction leaves descriptor 0 alone
  Extruder in(stdin);
  Bytes buf(2000);
  unsigned int u = 0;
  unsigned int got = 0;
  unsigned char b = 0;
  CHILD_CHECK(in.IsUsingStdin() && in.extrude(buf.data(), 1990) == 0 && in.stdinHistoryCount == 1990, 1);
  CHILD_CHECK(in.extrude(buf.data(), 20) == 0 && in.stdinHistoryCount == 2000, 2);
  LogCapture log;
  in -= 2001;  // beyond the history: refused
  CHILD_CHECK(log.texts() == Texts{"Extruder::operator -=: unable to decrease pointer"}, 3);
  in -= 2000;
  CHILD_CHECK(in.getP() == At(10) && in.extrude(&b, 1) == 0 && b == data[10], 4);
  CHILD_CHECK(in.setP(At(2009)) && in.stdinTotalRead == 2010, 5);  // a move inside the history
  CHILD_CHECK(in.extrude(&u) == 0 && u == at2009, 6);           // one byte old, three new
  in -= 4;
  CHILD_CHECK(in.extrude(&u) == 0 && u == at2009, 7);  // all four from the history
  in -= 2;
  CHILD_CHECK(in.extrude(buf.data(), 5, &got) == 0 && got == 5, 8);
  CHILD_CHECK(std::equal(buf.begin(), buf.begin() + 5, data.begin() + 2011), 9);
  in += 3;  // beyond the history: read and dropped
  CHILD_CHECK(in.extrude(&b, 1) == 0 && b == data[2019], 10);
  CHILD_CHECK(in.extrude(buf.data(), 978, &got) == 0 && got == 978, 11);
  CHILD_CHECK(in.extrude(&u) == 2 && in.getP() == At(2998), 12);  // two bytes were left
  CHILD_CHECK(in.extrude(buf.data(), 10, &got) == 3 && got == 0, 13);
  _exit(0);
}

TEST(FileStreams, StandardInputKeepsAHistoryToGoBackInto) {
  EXPECT_EXIT(StdinKeepsAHistoryToGoBackInto(), testing::ExitedWithCode(0), "");
}

}  // namespace
