// DataEntry: framing, owned/borrowed/in-place payloads, the bounded
// allocation, chunked in-place copies, display and comparison.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "record_test_util.h"
#include "stbplat/data_entry.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

std::string PayloadString(const DataEntry& e) {
  return std::string(reinterpret_cast<const char*>(e.GetData()), e.length);
}

TEST(DataEntryRead, OwnedPayloadIsCopiedAndTheStreamLeftBehindIt) {
  Bytes bytes = Data("payload");
  bytes.push_back(0x99);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  unsigned int length = 0;
  EXPECT_EQ(e.ReadTLVAndData(in, &length, false), 0u);
  EXPECT_EQ(length, 7u);
  EXPECT_EQ(PayloadString(e), "payload");
  EXPECT_TRUE(e.ownsData);
  EXPECT_EQ(e.source, nullptr);
  EXPECT_NE(e.GetData(), bytes.data() + 8);
  EXPECT_EQ(in.bytesLeft, 1u);
  // Reading again replaces the owned payload; a caller's buffer is borrowed.
  Bytes again = Data("second!");
  Extruder second(again.data(), static_cast<unsigned int>(again.size()));
  ASSERT_EQ(e.ReadTLVAndData(second, nullptr, false), 0u);
  EXPECT_EQ(PayloadString(e), "second!");
  unsigned char target[3] = {};
  Extruder raw(again.data() + 8, 3);
  EXPECT_EQ(e.Read(raw, 3, reinterpret_cast<unsigned long>(target)), 0u);
  EXPECT_FALSE(e.ownsData);
  EXPECT_EQ(e.GetData(), target);
  EXPECT_EQ(std::memcmp(target, "sec", 3), 0);
}

TEST(DataEntryRead, ZeroLengthSucceedsAndLeavesTheEntryAsItWas) {
  Bytes bytes = Data("");
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  e.CreateData(3, reinterpret_cast<const unsigned char*>("abc"));
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr, false), 0u);
  EXPECT_EQ(e.length, 3u);
  EXPECT_EQ(PayloadString(e), "abc");
}

TEST(DataEntryRead, LengthBeyondTheStreamIsRefusedBeforeAllocating) {
  Bytes bytes = Data("abc");
  bytes[7] = 0xFF;
  bytes[6] = 0xFF;
  bytes[5] = 0xFF;
  bytes[4] = 0x7F;  // length 0x7FFFFFFF
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  // Refused by the payload read; the framing then cannot move behind it.
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr, false), 0xA012u);
  EXPECT_EQ(e.GetData(), nullptr);
  EXPECT_EQ(e.length, 0u);
  Extruder payload(bytes.data() + 8, 3);
  EXPECT_EQ(e.Read(payload, 4, 0), 0xA004u);
  EXPECT_EQ(e.GetData(), nullptr);
  EXPECT_EQ(payload.bytesLeft, 3u);
}

TEST(DataEntryRead, ForeignTypeRewindsTheHeader) {
  Bytes bytes = Entry("VERS", {1, 2});
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  LogCapture capture;
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr, false), 0xA004u);
  EXPECT_EQ(Offset(in), 0u);
  ASSERT_EQ(capture.messages().size(), 1u);
  EXPECT_EQ(capture.messages()[0].text, "DataEntry::ReadTLVAndData: Invalid entry type VERS\r\n");
  EXPECT_EQ(capture.messages()[0].function, "ReadTLVAndData");
}

TEST(DataEntryRead, TruncatedHeaderMessages) {
  const Bytes full = Data("x");
  for (size_t keep : {3u, 7u}) {
    Bytes bytes(full.begin(), full.begin() + keep);
    Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
    DataEntry e;
    LogCapture capture;
    EXPECT_EQ(e.ReadTLVAndData(in, nullptr, false), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{keep == 3 ? "Error reading entryType\r\n"
                                                                       : "Error reading entrySize\r\n"});
  }
}

TEST(DataEntryInPlace, MemoryPayloadStaysInTheBuffer) {
  Bytes bytes = Data("in place");
  bytes.push_back(0x42);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr, true), 0u);
  EXPECT_FALSE(e.ownsData);
  EXPECT_EQ(e.source, &in);
  EXPECT_EQ(e.GetData(), bytes.data() + 8);
  EXPECT_EQ(e.length, 8u);
  EXPECT_EQ(in.bytesLeft, 1u);

  // An assigned copy owns its bytes and has no source.
  DataEntry copy(e);
  EXPECT_TRUE(copy.ownsData);
  EXPECT_EQ(copy.source, nullptr);
  EXPECT_NE(copy.GetData(), e.GetData());
  EXPECT_TRUE(copy == e);
}

TEST(DataEntryInPlace, PayloadPastTheStreamIsRefusedAndLeavesNoPayload) {
  // A reused entry: a good read first, then a corrupt length elsewhere.
  Bytes good = Data("abcdefgh");
  Extruder first(good.data(), static_cast<unsigned int>(good.size()));
  DataEntry e;
  ASSERT_EQ(e.ReadTLVAndData(first, nullptr, true), 0u);
  Bytes bytes = Data("abcd");
  bytes[7] = 9;
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  // The in-place skip fails, and so does the repositioning behind it.
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr, true), 0xA012u);
  EXPECT_EQ(e.length, 0u);
  EXPECT_EQ(e.GetData(), nullptr);
  DataEntry copy;
  copy = e;  // nothing to read past
  EXPECT_EQ(copy.length, 0u);
}

Bytes Pattern(size_t n) {
  Bytes bytes(n);
  for (size_t i = 0; i < n; ++i) bytes[i] = static_cast<unsigned char>(i * 7 + 3);
  return bytes;
}

TEST(DataEntryInPlace, CopiesOutInChunksOfOneKibibyte) {
  const Bytes payload = Pattern(2500);
  Bytes bytes;
  PutType(bytes, "DATA");
  PutU32(bytes, 2500);
  Append(bytes, payload);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  ASSERT_EQ(e.ReadTLVAndData(in, nullptr, true), 0u);

  Bytes all(2500);
  Intruder out(all.data(), 2500);
  EXPECT_TRUE(e.GetInPlaceData(&out));
  EXPECT_EQ(all, payload);

  // A chunk that does not fit is not written at all: the output stops at a
  // chunk boundary, 1024 then 2048 bytes.
  for (unsigned int room : {2047u, 2499u}) {
    Bytes part(room);
    Intruder small(part.data(), room);
    LogCapture capture;
    EXPECT_FALSE(e.GetInPlaceData(&small));
    EXPECT_EQ(static_cast<unsigned int>(small.pCurrent - small.pStart), room == 2047u ? 1024u : 2048u);
    EXPECT_EQ(RecordTexts(capture),
              std::vector<std::string>{"DataEntry::GetInPlaceData: unable to store data\r\n"});
  }
}

TEST(DataEntryInPlace, SourceEndingEarlyFailsWithReadMessage) {
  Bytes bytes = Pattern(10);
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  DataEntry e;
  ASSERT_EQ(e.ReadInPlace(in, 6), 0u);
  e.length = 20;  // claims more than the source holds
  Bytes sink(16);
  Intruder out(sink.data(), 16);
  LogCapture capture;
  EXPECT_FALSE(e.GetInPlaceData(&out));
  EXPECT_EQ(RecordTexts(capture),
            std::vector<std::string>{"DataEntry::GetInPlaceData: unable to read data\r\n"});
}

TEST(DataEntryInPlace, EntryWithoutPayloadOrSourceCopiesNothing) {
  DataEntry e;
  Bytes sink(4);
  Intruder out(sink.data(), 4);
  EXPECT_FALSE(e.GetInPlaceData(&out));
  e.CreateData(2);
  EXPECT_FALSE(e.GetInPlaceData(&out));
  EXPECT_EQ(out.pCurrent, out.pStart);
}

class TempFile {
 public:
  explicit TempFile(const Bytes& content) {
    std::snprintf(path_, sizeof path_, "/tmp/stbplat_data_entry_XXXXXX");
    int fd = mkstemp(path_);
    FILE* f = fdopen(fd, "wb");
    fwrite(content.data(), 1, content.size(), f);
    fclose(f);
  }
  ~TempFile() { std::remove(path_); }
  const char* path() const { return path_; }

 private:
  char path_[64];
};

TEST(DataEntryInPlace, FileSourceIsReachedThroughTheStream) {
  Bytes bytes = {0xEE};
  Append(bytes, Data("from a file"));
  bytes.push_back(0xEE);
  TempFile file(bytes);
  Extruder in(file.path(), true);
  ASSERT_TRUE(in.isInitedOK);
  in += 1;
  DataEntry e;
  ASSERT_EQ(e.ReadTLVAndData(in, nullptr, true), 0u);
  EXPECT_EQ(reinterpret_cast<unsigned long>(e.GetData()), 9u);  // a file offset
  unsigned char tail = 0;
  EXPECT_EQ(in.extrude(&tail, 1), 0u);
  EXPECT_EQ(tail, 0xEE);

  Bytes sink(11);
  Intruder out(sink.data(), 11);
  EXPECT_TRUE(e.GetInPlaceData(&out));
  EXPECT_EQ(std::string(sink.begin(), sink.end()), "from a file");

  DataEntry copy;
  copy = e;
  EXPECT_EQ(PayloadString(copy), "from a file");
  EXPECT_TRUE(copy == e);

  // Stored, the payload is taken through the file, which is put back.
  in.setP(reinterpret_cast<unsigned char*>(1));
  Bytes stored(8 + 11);
  Intruder entry(stored.data(), static_cast<unsigned int>(stored.size()));
  EXPECT_EQ(e.StoreTLVAndData(&entry), 0u);
  EXPECT_EQ(stored, Data("from a file"));
  EXPECT_EQ(in.getP(), reinterpret_cast<unsigned char*>(1));

  LogCapture capture;
  e.DisplayAsText();
  EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{"from a file\r\n"});
}

TEST(DataEntryStore, WritesTypeLengthAndBytes) {
  DataEntry e;
  e.CreateData(3, reinterpret_cast<const unsigned char*>("xyz"));
  unsigned char buffer[16];
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(e.StoreTLVAndData(&out), 0u);
  EXPECT_EQ(Written(out), Data("xyz"));
  // A length without a payload writes the header only.
  DataEntry header;
  header.length = 5;
  Intruder again(buffer, sizeof buffer);
  EXPECT_EQ(header.StoreTLVAndData(&again), 0u);
  EXPECT_EQ(Written(again), (Bytes{'D', 'A', 'T', 'A', 0, 0, 0, 5}));
}

TEST(DataEntryStore, WriteFailureMessages) {
  DataEntry e;
  e.CreateData(4);
  const struct {
    unsigned int room;
    const char* message;
  } cases[] = {{2, "Error writing DATA_ENTRY_TYPE\r\n"},
               {6, "Error writing length\r\n"},
               {10, "Error writing pPayload\r\n"}};
  for (const auto& c : cases) {
    unsigned char buffer[16];
    Intruder out(buffer, c.room);
    LogCapture capture;
    EXPECT_EQ(e.StoreTLVAndData(&out), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{c.message});
  }
}

TEST(DataEntryDisplay, TextWithAndWithoutTerminator) {
  const struct {
    Bytes payload;
    const char* shown;
  } cases[] = {{{'A', 'B', 'C', 'D', 'E'}, "ABCDE\r\n"},
               {{'A', 'B', 0, 'C'}, "AB\r\n"},
               {{'o', 'k', 0}, "ok\r\n"},
               {{0, 'x'}, " \r\n"}};
  for (const auto& c : cases) {
    DataEntry e;
    e.CreateData(static_cast<unsigned int>(c.payload.size()), c.payload.data());
    LogCapture capture;
    e.DisplayAsText();
    ASSERT_EQ(capture.messages().size(), 1u);
    EXPECT_EQ(capture.messages()[0].text, c.shown);
    EXPECT_EQ(capture.messages()[0].level, 4u);
    // The payload is left as it was.
    EXPECT_EQ(Bytes(e.GetData(), e.GetData() + e.length), c.payload);
  }
  DataEntry empty;
  LogCapture capture;
  empty.DisplayAsText();
  EXPECT_EQ(capture.texts(), std::vector<std::string>{"[none]\r\n"});
  capture.Clear();
  capture.SetLevel(eLogModuleRecords, 3);
  empty.DisplayAsText();
  EXPECT_TRUE(capture.messages().empty());
}

TEST(DataEntryCompare, NullLengthAndBytesAndCreate) {
  DataEntry a;
  DataEntry b;
  EXPECT_TRUE(a == b);
  a.CreateData(2, reinterpret_cast<const unsigned char*>("ab"));
  EXPECT_FALSE(a == b);
  EXPECT_FALSE(b == a);
  b.CreateData(3, reinterpret_cast<const unsigned char*>("abc"));
  EXPECT_FALSE(a == b);
  DataEntry c;
  c.CreateData(2, reinterpret_cast<const unsigned char*>("ac"));
  EXPECT_FALSE(a == c);
  DataEntry d(a);
  EXPECT_TRUE(a == d);
  DataEntry e;
  e.CreateData(4);
  EXPECT_EQ(Bytes(e.GetData(), e.GetData() + 4), Bytes(4, 0));
  DataEntry none;
  none.CreateData(0);
  EXPECT_EQ(none.GetData(), nullptr);
  EXPECT_EQ(none.length, 0u);
}

}  // namespace
