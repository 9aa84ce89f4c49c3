// The TLV framing: type check and rewind, the version rule, repositioning
// behind the entry whatever the payload reader did, back-patched sizes, and
// abandoned entries.
#include <gtest/gtest.h>

#include <tuple>

#include "record_test_util.h"
#include "stbplat/system_descriptor.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

// A record whose payload reader consumes a chosen number of bytes and whose
// writer writes a chosen number of bytes or fails.
class Probe : public SystemDescriptor {
 public:
  explicit Probe(unsigned char major = 1) : SystemDescriptor(0x50524245, 0, major, 3) {}  // "PRBE"
  unsigned int Read(Extruder& in, unsigned int entrySize) override {
    seenEntrySize = entrySize;
    unsigned char sink[64];
    if (readBytes > 0) (void)in.extrude(sink, readBytes);
    return readStatus;
  }
  unsigned int Store(Intruder* out) const override {
    for (unsigned int i = 0; i < storeBytes; ++i)
      if (out->intrude(static_cast<unsigned char>(0xC0 + i)) > kIntrudeFull) return 0xA012;
    return 0;
  }
  unsigned int readBytes = 0;
  unsigned int readStatus = 0;
  unsigned int storeBytes = 0;
  unsigned int seenEntrySize = 0;
};

Bytes ProbeEntry(unsigned int payloadBytes, unsigned char major = 1) {
  return Entry("PRBE", Bytes(payloadBytes, 0x5A), major, 7, 0x1234);
}

TEST(FramingRead, ForeignTypeRewindsToTheEntryStart) {
  Bytes bytes = {0xEE, 0xEE};
  Append(bytes, Entry("VERS", {}));
  In in(bytes);
  in += 2;
  Probe probe;
  unsigned int size = 99;
  LogCapture capture;
  EXPECT_EQ(probe.ReadTLVAndData(in, &size), 0xA004u);
  EXPECT_EQ(in.Offset(), 2u);
  EXPECT_EQ(size, 99u);
  EXPECT_EQ(capture.texts(), Texts{"SystemDescriptor::ReadTLVAndData: entry must be of type PRBE, found VERS "
                                   "instead\r\n"});
}

TEST(FramingRead, NewerMajorIsRefusedAndTheStreamStillMovesBehindIt) {
  const Bytes bytes = ProbeEntry(0, 2);
  In in(bytes);
  Probe probe(1);
  LogCapture capture;
  EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), 0xA011u);
  EXPECT_EQ(std::tie(probe.flags, probe.majorVer, probe.minorVer, probe.valid),
            std::make_tuple(0, 1, 3, false));
  EXPECT_EQ(in.bytesLeft, 0u) << "behind the entry all the same";
  EXPECT_EQ(RecordTexts(capture), Texts{"Invalid major version (2), should be 1 for entry type PRBE\r\n"});
}

TEST(FramingRead, TheEntrySizeDecidesWhereTheNextEntryBegins) {
  Bytes bytes = ProbeEntry(6, 0);  // an older major is kept
  Append(bytes, {0xAB, 0xCD});
  const struct {
    unsigned int consumed, status;
  } cases[] = {{0, 0}, {2, 0}, {6, 0}, {8, 0}, {1, 0xA004}};
  for (const auto& c : cases) {
    In in(bytes);
    Probe probe;
    probe.readBytes = c.consumed;
    probe.readStatus = c.status;
    EXPECT_EQ(probe.ReadTLVAndData(in, nullptr), c.status) << c.consumed;
    EXPECT_EQ(in.bytesLeft, 2u) << c.consumed;
    EXPECT_EQ(probe.valid, c.status == 0) << c.consumed;
    EXPECT_EQ(probe.seenEntrySize, 10u) << c.consumed;
  }
  bytes[7] = 0x40;  // an entry size past the stream
  In past(bytes);
  EXPECT_EQ(Probe().ReadTLVAndData(past, nullptr), 0xA012u);
}

TEST(FramingStore, SizeIsBackPatchedAlsoWhenTheBufferGrows) {
  Probe probe;
  probe.flags = 0xA55A;
  probe.storeBytes = 3;
  const Bytes expected = {'P', 'R', 'B', 'E', 0, 0, 0, 7, 0xA5, 0x5A, 1, 3, 0xC0, 0xC1, 0xC2};
  unsigned char buffer[32];
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(probe.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(Written(out), expected);
  for (unsigned int size : {5u, 6u, 7u, 8u}) {  // up to 4 bytes left behind the type
    Intruder growing(size, 0);
    growing.growthStep = 16;
    EXPECT_EQ(probe.StoreTLVAndData(&growing), 0u) << size;
    EXPECT_EQ(Written(growing), expected) << size;
  }
}

TEST(FramingStore, AFailingPayloadAbandonsTheEntryAtItsStart) {
  Probe probe;
  probe.storeBytes = 10;  // more than the buffer holds
  unsigned char buffer[20] = {};
  Intruder out(buffer, sizeof buffer);
  out.intrude(static_cast<unsigned short>(0xBEEF));
  LogCapture capture;
  EXPECT_EQ(probe.StoreTLVAndData(&out), 0xA012u);
  EXPECT_EQ(out.pCurrent, buffer + 2);
  EXPECT_EQ(RecordTexts(capture), Texts{"Insufficient memory to add entry of type PRBE\r\n"});
}

}  // namespace
