#include "record_check.h"

#include <cctype>
#include <cstdio>

#include "output.h"
#include "stbplat/system_descriptor.h"

namespace stbtool {
namespace {

constexpr size_t kEntryHeader = 8;        // type, size
constexpr size_t kCommonHeader = 4;       // flags, major, minor
constexpr unsigned char kNewestMajor = 0; // every reader here takes major 0
constexpr size_t kSequenceControlBytes = 28;
constexpr size_t kSegmentBytes = 12;
constexpr size_t kControllerBytes = 14;       // six DDR fields, count
constexpr size_t kOldControllerBytes = 8;     // controller number, count
constexpr unsigned char kNewLayoutMinor = 6;
constexpr size_t kReloadErrorBytes = 8;
constexpr size_t kDeviceConfigBytes = 4;
constexpr size_t kBuildConfigFixed = 20;
constexpr size_t kNameBytes = 8;
constexpr size_t kTagBytes = 4;
constexpr size_t kComponentBytes = 36;
constexpr size_t kPackageFixed = 42;
constexpr unsigned kMaxComponents = 16;

// Thrown at the first error; caught in CheckRecord.
struct Stop {};

class Checker {
 public:
  Checker(const unsigned char* data, size_t size, unsigned long base, CheckResult* result)
      : data_(data), size_(size), base_(base), result_(result) {}

  void Record(RecordKind kind) {
    if (kind == RecordKind::kUnknown) {
      if (size_ < 4) Error(0, "", "a record needs at least 4 bytes, the input has " + std::to_string(size_));
      const RecordKindInfo* info = KindByCode(U32(0));
      if (info == nullptr) {
        // A package header has no type code: only its shape tells it.
        result_->kind = RecordKind::kPackageHeader;
        try {
          result_->end = PackageHeader(0, size_, "package");
        } catch (const Stop&) {
          result_->issues.back().message = "type code '" + Code(U32(0)) + "' (" + Hex(U32(0), 8) +
                                           ") is no known record, nor a package header: " +
                                           result_->issues.back().message;
          throw;
        }
        return;
      }
      kind = info->kind;
    }
    result_->kind = kind;
    if (kind == RecordKind::kPackageHeader) {
      result_->end = PackageHeader(0, size_, "package");
    } else {
      result_->end = Entry(0, size_, KindInfo(kind).code, "");
    }
  }

 private:
  unsigned int U32(size_t at) const {
    return static_cast<unsigned int>(data_[at]) << 24 | static_cast<unsigned int>(data_[at + 1]) << 16 |
           static_cast<unsigned int>(data_[at + 2]) << 8 | data_[at + 3];
  }
  unsigned int U16(size_t at) const { return static_cast<unsigned int>(data_[at]) << 8 | data_[at + 1]; }

  [[noreturn]] void Error(size_t at, const std::string& where, const std::string& message) {
    result_->issues.push_back({base_ + at, where, message, true});
    throw Stop();
  }
  void Warn(size_t at, const std::string& where, const std::string& message) {
    result_->issues.push_back({base_ + at, where, message, false});
  }

  void Need(size_t at, size_t end, size_t n, const std::string& where, const std::string& what) {
    if (at > end || end - at < n)
      Error(at, where, what + " needs " + std::to_string(n) + " bytes, only " +
                           std::to_string(at > end ? 0 : end - at) + " left in the entry");
  }

  static std::string Code(unsigned int code) { return TypeCodeText(code); }

  // A complete entry at `at` inside [.., limit). expected 0 takes any known
  // type. Returns the offset behind it.
  size_t Entry(size_t at, size_t limit, unsigned int expected, const std::string& parent,
               const std::string& label = "") {
    if (at > limit || limit - at < kEntryHeader)
      Error(at, parent, "an entry header needs 8 bytes, only " +
                            std::to_string(at > limit ? 0 : limit - at) + " left" +
                            (parent.empty() ? " in the input" : " in " + parent));
    unsigned int type = U32(at);
    std::string name = label.empty() ? Code(expected != 0 ? expected : type) : label;
    std::string where = parent.empty() ? name : parent + "/" + name;
    if (expected != 0 && type != expected)
      Error(at, where,
            "expected an entry of type " + Code(expected) + ", found '" + Code(type) + "' (" +
                Hex(type, 8) + ")");
    if (expected == 0 && KindByCode(type) == nullptr && type != kEntryTypePADD)
      Error(at, where, "unknown entry type '" + Code(type) + "' (" + Hex(type, 8) + ")");
    unsigned int size = U32(at + 4);
    size_t body = at + kEntryHeader;
    if (size > limit - body)
      Error(at + 4, where, "entry size " + Hex(size) + " runs " + std::to_string(size - (limit - body)) +
                               " bytes past the end of " + (parent.empty() ? "the input" : parent) +
                               " (at " + Hex(base_ + limit) + ")");
    size_t end = body + size;
    if (type == kEntryTypeDATA || type == kEntryTypePADD) return end;
    if (size < kCommonHeader)
      Error(at + 4, where, "entry size " + std::to_string(size) + " is smaller than the 4-byte common header");
    unsigned char major = data_[body + 2];
    unsigned char minor = data_[body + 3];
    if (major > kNewestMajor)
      Error(body + 2, where, "major version " + std::to_string(major) + " is newer than " +
                                 std::to_string(kNewestMajor) + ", the newest that reads");
    Payload(type, body + kCommonHeader, end, minor, where);
    return end;
  }

  // A DATA entry inside an entry.
  size_t Data(size_t at, size_t end, const std::string& where, bool wantTerminator) {
    size_t next = Entry(at, end, kEntryTypeDATA, where);
    unsigned int length = U32(at + 4);
    if (wantTerminator && (length == 0 || data_[at + kEntryHeader + length - 1] != 0))
      Warn(at + kEntryHeader, where, "text has no terminating zero");
    return next;
  }

  // count entries from at; the count field is at countAt.
  size_t Entries(size_t at, size_t end, unsigned long count, size_t countAt, unsigned int expected,
                 const std::string& where, const char* what) {
    for (unsigned long i = 0; i < count; ++i) {
      if (at >= end)
        Error(countAt, where, "count " + std::to_string(count) + ", but the entry holds only " +
                                  std::to_string(i) + " " + what);
      at = Entry(at, end, expected, where, Code(expected) + "[" + std::to_string(i) + "]");
    }
    return at;
  }

  void Trailing(size_t at, size_t end, const std::string& where) {
    if (at < end) Warn(at, where, std::to_string(end - at) + " bytes at the end of the entry are not read");
  }

  void Payload(unsigned int type, size_t at, size_t end, unsigned char minor, const std::string& where) {
    switch (type) {
      case kEntryTypeVERS: {
        Need(at, end, 6, where, "the version numbers");
        size_t p = Data(at + 6, end, where + "/description", false);
        if (p == end) return;
        Need(p, end, 2, where, "version letter and pad");
        p += 2;
        if (p == end) return;
        Need(p, end, kSequenceControlBytes, where, "the sequence control");
        Trailing(p + kSequenceControlBytes, end, where);
        return;
      }
      case kEntryTypeMCSD:
        Need(at, end, kSegmentBytes, where, "a memory segment");
        Trailing(at + kSegmentBytes, end, where);
        return;
      case kEntryTypeMCET: {
        bool current = minor >= kNewLayoutMinor;
        size_t fixed = current ? kControllerBytes : kOldControllerBytes;
        Need(at, end, fixed, where, "a memory controller");
        size_t countAt = current ? at + 12 : at + 4;
        unsigned long count = current ? U16(countAt) : U32(countAt);
        Trailing(Entries(at + fixed, end, count, countAt, kEntryTypeMCSD, where, "segments"), end, where);
        return;
      }
      case kEntryTypeMCFG: {
        Need(at, end, 2, where, "the controller count");
        Trailing(Entries(at + 2, end, data_[at], at, kEntryTypeMCET, where, "controllers"), end, where);
        return;
      }
      case kEntryTypeBSCK: {
        Need(at, end, 4, where, "executing type and count");
        unsigned int count = U16(at + 2);
        if (end - at - 4 < count * kReloadErrorBytes)
          Error(at + 2, where, "count " + std::to_string(count) + " reload errors need " +
                                   std::to_string(count * kReloadErrorBytes) + " bytes, only " +
                                   std::to_string(end - at - 4) + " left in the entry");
        Trailing(at + 4 + count * kReloadErrorBytes, end, where);
        return;
      }
      case kEntryTypeDEVC:
        Need(at, end, kDeviceConfigBytes, where, "the device configuration");
        Trailing(at + kDeviceConfigBytes, end, where);
        return;
      case kEntryTypeSEQC:
        Need(at, end, kSequenceControlBytes, where, "the sequence control");
        Trailing(at + kSequenceControlBytes, end, where);
        return;
      case kEntryTypeBCFG:
        Trailing(Data(at, end, where + "/text", false), end, where);
        return;
      case kEntryTypeAFPD:
        Trailing(Data(at, end, where + "/text", true), end, where);
        return;
      case kEntryTypeFSBL: {
        size_t p = Entry(at, end, kEntryTypeVERS, where);
        Need(p, end, 4, where, "the entry count");
        unsigned int count = U32(p);
        size_t countAt = p;
        p += 4;
        for (unsigned int i = 0; i < count; ++i) {
          if (p >= end)
            Error(countAt, where, "count " + std::to_string(count) + ", but the entry holds only " +
                                      std::to_string(i) + " entries");
          if (end - p >= kEntryHeader && KindByCode(U32(p)) == nullptr && U32(p) != kEntryTypePADD) {
            Warn(p, where, "unknown entry '" + Code(U32(p)) + "' is skipped");
            size_t size = U32(p + 4);
            if (size > end - p - kEntryHeader)
              Error(p + 4, where, "entry size " + Hex(size) + " runs past the end of " + where);
            p += kEntryHeader + size;
            continue;
          }
          p = Entry(p, end, 0, where);
        }
        Trailing(p, end, where);
        return;
      }
      case kEntryTypeBLDC: {
        Need(at, end, kBuildConfigFixed, where, "the component fields");
        unsigned int count = U32(at + 16);
        size_t p = at + kBuildConfigFixed;
        for (unsigned int i = 0; i < count; ++i) {
          if (p >= end)
            Error(at + 16, where, "count " + std::to_string(count) + ", but the entry holds only " +
                                      std::to_string(i) + " entries");
          unsigned int nested = end - p >= 4 ? U32(p) : 0;
          if (nested == kEntryTypeSEQC || nested == kEntryTypeBCFG) {
            p = Entry(p, end, nested, where);
          } else {
            if (end - p < kEntryHeader) Error(p, where, "an entry header needs 8 bytes");
            size_t size = U32(p + 4);
            if (size > end - p - kEntryHeader)
              Error(p + 4, where, "entry size " + Hex(size) + " runs past the end of " + where);
            p += kEntryHeader + size;
          }
        }
        Trailing(p, end, where);
        return;
      }
      default:
        return;
    }
  }

  static bool NameChar(unsigned char c) {
    return (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_' || c == '-';
  }

  // Three names as the library stores them: 1 to 8 of A-Z, 0-9, '_' and
  // '-', padded to 8 with '.'.
  void Names(size_t at, const std::string& where) {
    static const char* const fields[] = {"deviceName", "partitionName", "slotName"};
    for (size_t n = 0; n < 3; ++n, at += kNameBytes) {
      size_t i = 0;
      while (i < kNameBytes && NameChar(data_[at + i])) ++i;
      size_t length = i;
      while (i < kNameBytes && data_[at + i] == '.') ++i;
      if (length == 0) i = 0;
      if (i < kNameBytes)
        Error(at + i, where + "/" + fields[n],
              std::string(fields[n]) + " holds the byte " + Hex(data_[at + i], 2) + " at " + std::to_string(i) +
                  ": a name is 1 to 8 of A-Z, 0-9, '_', '-', padded with '.'");
    }
  }

  // Up to 4 printable characters, padded with zero bytes.
  void Tag(size_t at, const std::string& where) {
    size_t i = 0;
    while (i < kTagBytes && std::isprint(data_[at + i])) ++i;
    while (i < kTagBytes && data_[at + i] == 0) ++i;
    if (i < kTagBytes)
      Error(at + i, where, "componentTag holds the byte " + Hex(data_[at + i], 2) + " at " + std::to_string(i) +
                               ": a tag is up to 4 printable characters, padded with zero bytes");
  }

  void Component(size_t at, const std::string& where) {
    Tag(at, where);
    Names(at + kTagBytes, where);
  }

  size_t PackageHeader(size_t at, size_t end, const std::string& where) {
    Need(at, end, kPackageFixed, where, "a package header");
    Component(at + 2, where + "/packageHeaderLocation");
    unsigned int count = U32(at + 38);
    if (count > kMaxComponents)
      Error(at + 38, where, "numComponents " + std::to_string(count) + " is more than " +
                                std::to_string(kMaxComponents));
    size_t need = kPackageFixed + count * kComponentBytes;
    if (end - at < need)
      Error(at + 38, where, "numComponents " + std::to_string(count) + " needs " + std::to_string(need) +
                                " bytes, only " + std::to_string(end - at) + " in the input");
    for (unsigned int i = 0; i < count; ++i)
      Component(at + kPackageFixed + i * kComponentBytes, where + "/componentLocations[" + std::to_string(i) + "]");
    return at + need;
  }

  const unsigned char* data_;
  size_t size_;
  unsigned long base_;
  CheckResult* result_;
};

}  // namespace

bool CheckResult::ok() const { return firstError() == nullptr; }

const CheckIssue* CheckResult::firstError() const {
  for (const CheckIssue& issue : issues)
    if (issue.error) return &issue;
  return nullptr;
}

CheckResult CheckRecord(const unsigned char* data, size_t size, unsigned long base, RecordKind kind) {
  CheckResult result;
  Checker checker(data, size, base, &result);
  try {
    checker.Record(kind);
  } catch (const Stop&) {
  }
  return result;
}

}  // namespace stbtool
