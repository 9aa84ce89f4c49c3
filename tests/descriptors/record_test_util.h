// Helpers for the record tests: golden files, written bytes, record
// messages, and a memory stream that answers as a 64-bit device stream.
#ifndef STBPLAT_TESTS_DESCRIPTORS_RECORD_TEST_UTIL_H
#define STBPLAT_TESTS_DESCRIPTORS_RECORD_TEST_UTIL_H

#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "stbplat/extruder.h"
#include "stbplat/intruder.h"
#include "support/log_capture.h"

namespace records_test {

using Bytes = std::vector<unsigned char>;

inline Bytes Golden(const std::string& name) {
  std::ifstream file(std::string(STBPLAT_TEST_DATA_DIR) + "/" + name, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

inline Bytes Written(const Intruder& out) {
  return Bytes(out.pStart, out.pStart + (out.pCurrent - out.pStart));
}

// What `record` stores into a buffer of `size` bytes.
template <class Record>
Bytes Stored(const Record& record, size_t size) {
  Bytes buffer(size);
  Intruder out(buffer.data(), static_cast<unsigned int>(size));
  EXPECT_EQ(record.StoreTLVAndData(&out), 0u);
  return Written(out);
}

inline unsigned long Offset(const Extruder& in) {
  return static_cast<unsigned long>(in.pCurrent - in.pStart);
}

// Texts of the record messages (module 3) only, in order.
inline std::vector<std::string> RecordTexts(const stbplat::test::LogCapture& capture) {
  std::vector<std::string> texts;
  for (const auto& m : capture.messages())
    if (m.module == eLogModuleRecords) texts.push_back(m.text);
  return texts;
}

inline void Append(Bytes& bytes, const Bytes& more) {
  bytes.insert(bytes.end(), more.begin(), more.end());
}

inline void PutU32(Bytes& bytes, unsigned int v) {
  for (int shift = 24; shift >= 0; shift -= 8) bytes.push_back(static_cast<unsigned char>(v >> shift));
}

inline void PutU16(Bytes& bytes, unsigned int v) {
  bytes.push_back(static_cast<unsigned char>(v >> 8));
  bytes.push_back(static_cast<unsigned char>(v));
}

inline void PutType(Bytes& bytes, const char* four) {
  for (int i = 0; i < 4; ++i) bytes.push_back(static_cast<unsigned char>(four[i]));
}

// type | size | flags | major | minor | payload
inline Bytes Entry(const char* type, const Bytes& payload, unsigned char major = 0,
                   unsigned char minor = 0, unsigned short flags = 0) {
  Bytes bytes;
  PutType(bytes, type);
  PutU32(bytes, static_cast<unsigned int>(4 + payload.size()));
  PutU16(bytes, flags);
  bytes.push_back(major);
  bytes.push_back(minor);
  Append(bytes, payload);
  return bytes;
}

inline Bytes Data(const std::string& text) {
  Bytes bytes;
  PutType(bytes, "DATA");
  PutU32(bytes, static_cast<unsigned int>(text.size()));
  bytes.insert(bytes.end(), text.begin(), text.end());
  return bytes;
}

}  // namespace records_test

#endif
