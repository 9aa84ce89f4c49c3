// DataEntry: owned, borrowed and in-place payloads, the bounded allocation,
// chunked copies out of the source stream, display and comparison.
#include <gtest/gtest.h>

#include "record_test_util.h"
#include "stbplat/data_entry.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

std::string Payload(const DataEntry& e) { return Text(e.GetData(), e.length); }

TEST(DataEntryRead, OwnedBorrowedAndEmptyPayloads) {
  Bytes bytes = Data("payload");
  bytes.push_back(0x99);
  In in(bytes);
  DataEntry e;
  unsigned int length = 0;
  EXPECT_EQ(e.ReadTLVAndData(in, &length, false), 0u);
  EXPECT_EQ(length, 7u);
  EXPECT_EQ(Payload(e), "payload");
  EXPECT_TRUE(e.ownsData);
  EXPECT_EQ(in.bytesLeft, 1u);
  unsigned char target[3] = {};
  In raw(bytes, 3);
  EXPECT_EQ(e.Read(raw, 3, reinterpret_cast<unsigned long>(target)), 0u);
  EXPECT_FALSE(e.ownsData);
  EXPECT_EQ(e.GetData(), target);
  EXPECT_EQ(Payload(e), "DAT");
  unsigned char other[3] = {};
  In again(bytes, 3);
  EXPECT_EQ(e.Read(again, 3, reinterpret_cast<unsigned long>(other)), 0u) << "the borrowed buffer stays";
  const Bytes empty = Data("");
  In none(empty);
  EXPECT_EQ(e.ReadTLVAndData(none, nullptr, false), 0u);
  EXPECT_EQ(Payload(e), "DAT") << "a zero length leaves the entry as it was";
}

TEST(DataEntryRead, ForeignTypesAndLengthsBeyondTheStreamAreRefusedBeforeAnythingIsTaken) {
  const Bytes foreign = Entry("VERS", {1, 2});
  In other(foreign);
  DataEntry e;
  LogCapture capture;
  EXPECT_EQ(e.ReadTLVAndData(other, nullptr, false), 0xA004u);
  EXPECT_EQ(other.Offset(), 0u);
  EXPECT_EQ(RecordTexts(capture), Texts{"DataEntry::ReadTLVAndData: Invalid entry type VERS\r\n"});
  Bytes bytes = Data("abc");
  bytes[4] = 0x7F;  // length 0x7F000003
  In in(bytes);
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr, false), 0xA012u) << "nor can the framing move behind it";
  In payload(bytes, 10);
  payload += 8;
  EXPECT_EQ(e.Read(payload, 3, 0), 0xA004u);
  EXPECT_EQ(payload.bytesLeft, 2u);
  In inPlace(bytes);
  EXPECT_EQ(e.ReadTLVAndData(inPlace, nullptr, true), 0xA012u) << "in place: nor can the skip";
  EXPECT_EQ(e.GetData(), nullptr);
  EXPECT_EQ(e.length, 0u);
}

TEST(DataEntryInPlace, MemoryPayloadStaysAndIsCopiedOutInChunksOfOneKibibyte) {
  Bytes payload(2500);
  for (size_t i = 0; i < payload.size(); ++i) payload[i] = static_cast<unsigned char>(i * 7 + i / 256);
  Bytes bytes = {'D', 'A', 'T', 'A'};
  PutU32(bytes, 2500);
  Append(bytes, payload);
  In in(bytes);
  DataEntry e;
  ASSERT_EQ(e.ReadTLVAndData(in, nullptr, true), 0u);
  EXPECT_EQ(e.GetData(), bytes.data() + 8);
  Bytes all(2500);
  Intruder out(all.data(), 2500);
  EXPECT_TRUE(e.GetInPlaceData(&out));
  EXPECT_EQ(all, payload);
  Bytes part(2499);
  Intruder small(part.data(), 2499);
  LogCapture capture;
  EXPECT_FALSE(e.GetInPlaceData(&small));
  EXPECT_EQ(Written(small).size(), 2048u) << "a chunk that does not fit is not written";
  e.length = 2600;  // more than the source holds
  Bytes sink(2600);
  Intruder roomy(sink.data(), 2600);
  EXPECT_FALSE(e.GetInPlaceData(&roomy));
  EXPECT_EQ(RecordTexts(capture), (Texts{"DataEntry::GetInPlaceData: unable to store data\r\n",
                                         "DataEntry::GetInPlaceData: unable to read data\r\n"}));
  EXPECT_FALSE(DataEntry().GetInPlaceData(&out)) << "no payload";
}

TEST(DataEntryInPlace, FileSourceIsReachedThroughTheStream) {
  Bytes bytes = {0xEE};
  Append(bytes, Data("Z"));
  bytes.push_back(0xEE);
  const stbplat::test::ScratchDir dir;
  Extruder in(dir.Write("data.bin", bytes).c_str(), true);
  in += 1;
  DataEntry e;
  ASSERT_EQ(e.ReadTLVAndData(in, nullptr, true), 0u);
  EXPECT_EQ(reinterpret_cast<unsigned long>(e.GetData()), 9u) << "a file offset";
  unsigned char tail = 0;
  EXPECT_EQ(in.extrude(&tail, 1), 0u);
  EXPECT_EQ(tail, 0xEE);
  DataEntry copy;
  copy = e;
  EXPECT_EQ(Payload(copy), "Z");
  EXPECT_TRUE(copy == e);
  Bytes stored(9);
  Intruder out(stored.data(), 9);
  EXPECT_EQ(e.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(stored, Data("Z"));
  EXPECT_EQ(in.getP(), reinterpret_cast<unsigned char*>(11)) << "the source is put back";
  LogCapture capture;
  e.DisplayAsText();
  e.length = 3;  // past the file's end: not read at all
  e.DisplayAsText();
  EXPECT_FALSE(e == e) << "a payload that cannot be read equals nothing";
  EXPECT_EQ(capture.texts(), (Texts{"Z\r\n", "[none]\r\n"}));
}

TEST(DataEntry, PayloadlessEntriesDisplayAndComparison) {
  DataEntry header;
  header.length = 3;  // a length without a payload
  unsigned char buffer[16];
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(header.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(Written(out), (Bytes{'D', 'A', 'T', 'A', 0, 0, 0, 3}));
  EXPECT_EQ(Payload(DataEntry(header)), std::string(3, '\0'));
  LogCapture capture;
  header.DisplayAsText();
  const Bytes payloads[] = {{'A', 'B', 'C', 'D', 'E'}, {'A', 'B', 0, 'C'}, {0, 'x'}};
  for (const Bytes& payload : payloads) {
    DataEntry e;
    e.CreateData(static_cast<unsigned int>(payload.size()), payload.data());
    e.DisplayAsText();
  }
  EXPECT_EQ(capture.texts(), (Texts{"[none]\r\n", "ABCDE\r\n", "AB\r\n", " \r\n"}));
  DataEntry a;
  DataEntry b;
  EXPECT_TRUE(a == b);
  a.CreateData(2, U("ab"));
  EXPECT_FALSE(b == a);
  b.CreateData(3, U("abc"));
  EXPECT_FALSE(a == b);
}

}  // namespace
