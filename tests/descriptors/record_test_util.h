// Helpers for the record tests: golden files, hand-made entries, written
// bytes and the record messages.
#ifndef STBPLAT_TESTS_DESCRIPTORS_RECORD_TEST_UTIL_H
#define STBPLAT_TESTS_DESCRIPTORS_RECORD_TEST_UTIL_H

#include <algorithm>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "stbplat/extruder.h"
#include "stbplat/intruder.h"
#include "support/log_capture.h"
#include "support/scratch_dir.h"

namespace records_test {

using Bytes = std::vector<unsigned char>;
using Texts = std::vector<std::string>;

inline Bytes Golden(const std::string& name) {
  std::ifstream file(std::string(STBPLAT_TEST_DATA_DIR) + "/" + name, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

inline std::string Text(const unsigned char* p, size_t n) { return std::string(p, p + n); }

inline Bytes Written(const Intruder& out) {
  return Bytes(out.pStart, out.pStart + (out.pCurrent - out.pStart));
}

// Texts of the record messages (module 3) only, in order.
inline Texts RecordTexts(const stbplat::test::LogCapture& capture) {
  Texts texts;
  for (const auto& m : capture.messages())
    if (m.module == eLogModuleRecords) texts.push_back(m.text);
  return texts;
}

inline void Append(Bytes& bytes, const Bytes& more) { bytes.insert(bytes.end(), more.begin(), more.end()); }

inline void PutU32(Bytes& bytes, unsigned int v) {
  for (int shift = 24; shift >= 0; shift -= 8) bytes.push_back(static_cast<unsigned char>(v >> shift));
}

// type | size | flags | major | minor | payload
inline Bytes Entry(const char* type, const Bytes& payload, unsigned char major = 0, unsigned char minor = 0,
                   unsigned short flags = 0) {
  Bytes bytes(type, type + 4);
  PutU32(bytes, static_cast<unsigned int>(4 + payload.size()));
  Append(bytes, {static_cast<unsigned char>(flags >> 8), static_cast<unsigned char>(flags), major, minor});
  Append(bytes, payload);
  return bytes;
}

inline Bytes Data(const std::string& text) {
  Bytes bytes = {'D', 'A', 'T', 'A'};
  PutU32(bytes, static_cast<unsigned int>(text.size()));
  bytes.insert(bytes.end(), text.begin(), text.end());
  return bytes;
}

inline const unsigned char* U(const char* s) { return reinterpret_cast<const unsigned char*>(s); }

inline void Put(Bytes& out, const std::string& tag, const std::string& names, unsigned long offset) {
  out.insert(out.end(), tag.begin(), tag.end());
  out.insert(out.end(), names.begin(), names.end());
  for (int shift = 56; shift >= 0; shift -= 8) out.push_back(static_cast<unsigned char>(offset >> shift));
}

// A package header with two components, laid out by hand from the wire form.
inline Bytes PackageHeaderWire(unsigned char count) {
  Bytes out = {0x01, 0x02};
  Put(out, "PKGH", "NOR0....BOOT....A.......", 0x40);
  Append(out, {0, 0, 0, count});
  Put(out, "KRNL", "NAND0...KERNEL..A.......", 0x800);
  Put(out, "ROOT", "emmc....ROOTFS..B.......", 0x123456789ul);
  return out;
}

// A memory stream over bytes.
struct In : Extruder {
  explicit In(const Bytes& bytes, size_t keep = ~size_t{0})
      : Extruder(bytes.data(), static_cast<unsigned int>(std::min(keep, bytes.size()))) {}
  In(Bytes&&, size_t = 0) = delete;  // the stream would outlive its bytes
  unsigned long Offset() const { return static_cast<unsigned long>(pCurrent - pStart); }
};

}  // namespace records_test

#endif
