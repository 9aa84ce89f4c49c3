#include "output.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <iterator>
#include <sstream>

#include "tool.h"

namespace stbtool {
namespace {

// Transfers smaller than this finish before a bar would be seen.
constexpr unsigned long kProgressThreshold = 256 * 1024;
constexpr int kProgressWidth = 40;
constexpr unsigned long kKiB = 1024;

std::string Escaped(unsigned char c) {
  char escaped[8];
  std::snprintf(escaped, sizeof escaped, "\\x%02X", c);
  return escaped;
}

// Length of the well-formed UTF-8 sequence at text[i], 0 if there is none.
size_t Utf8Length(const std::string& text, size_t i) {
  const auto c = static_cast<unsigned char>(text[i]);
  if (c < 0x80) return 1;
  size_t n = c >= 0xC2 && c <= 0xDF ? 2 : c >= 0xE0 && c <= 0xEF ? 3 : c >= 0xF0 && c <= 0xF4 ? 4 : 0;
  if (n == 0 || text.size() - i < n) return 0;
  // The second byte's range rules out overlong forms, surrogates and values
  // above U+10FFFF.
  const auto second = static_cast<unsigned char>(text[i + 1]);
  unsigned char low = c == 0xE0 ? 0xA0 : c == 0xF0 ? 0x90 : 0x80;
  unsigned char high = c == 0xED ? 0x9F : c == 0xF4 ? 0x8F : 0xBF;
  if (second < low || second > high) return 0;
  for (size_t k = 2; k < n; ++k)
    if ((static_cast<unsigned char>(text[i + k]) & 0xC0) != 0x80) return 0;
  return n;
}

std::string ValidUtf8(const std::string& text) {
  std::string out;
  for (size_t i = 0; i < text.size();) {
    size_t n = Utf8Length(text, i);
    if (n == 0) {
      out += Escaped(static_cast<unsigned char>(text[i++]));
    } else {
      out.append(text, i, n);
      i += n;
    }
  }
  return out;
}

Json WithValidUtf8(const Json& value) {
  if (value.is_string()) return ValidUtf8(value.get_ref<const std::string&>());
  if (value.is_array()) {
    Json out = Json::array();
    for (const Json& item : value) out.push_back(WithValidUtf8(item));
    return out;
  }
  if (value.is_object()) {
    Json out = Json::object();
    for (auto it = value.begin(); it != value.end(); ++it) out[ValidUtf8(it.key())] = WithValidUtf8(it.value());
    return out;
  }
  return value;
}

}  // namespace

void PrintJson(const Json& value) { std::cout << WithValidUtf8(value).dump(2) << "\n"; }

std::string Hex(unsigned long value, int digits) {
  char text[32];
  std::snprintf(text, sizeof text, "0x%0*lX", digits, value);
  return text;
}

std::string HumanSize(unsigned long bytes) {
  static const char* const units[] = {"B", "KiB", "MiB", "GiB", "TiB"};
  int unit = 0;
  double value = static_cast<double>(bytes);
  while (value >= kKiB && unit < 4) {
    value /= kKiB;
    ++unit;
  }
  char text[32];
  if (unit == 0 || value == static_cast<double>(static_cast<unsigned long>(value)))
    std::snprintf(text, sizeof text, "%lu %s", static_cast<unsigned long>(value), units[unit]);
  else
    std::snprintf(text, sizeof text, "%.1f %s", value, units[unit]);
  return text;
}

std::string TypeCodeText(unsigned int code) {
  std::string text;
  for (int shift = 24; shift >= 0; shift -= 8) {
    unsigned char c = static_cast<unsigned char>(code >> shift);
    text += std::isprint(c) ? static_cast<char>(c) : '?';
  }
  return text;
}

std::string PrintableText(const unsigned char* data, size_t length) {
  std::string text;
  for (size_t i = 0; i < length && data[i] != 0; ++i) {
    unsigned char c = data[i];
    text += std::isprint(c) ? std::string(1, static_cast<char>(c)) : Escaped(c);
  }
  return text;
}

std::string PrintableLines(const std::string& text) {
  std::string out;
  for (char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    out += std::isprint(byte) || c == '\n' ? std::string(1, c) : Escaped(byte);
  }
  return out;
}

std::vector<unsigned char> ReadWholeFile(const std::string& path) {
  if (path == "-") {
    std::vector<unsigned char> bytes;
    unsigned char buffer[4096];
    size_t got;
    while ((got = std::fread(buffer, 1, sizeof buffer, stdin)) > 0)
      bytes.insert(bytes.end(), buffer, buffer + got);
    return bytes;
  }
  // A directory opens, and then fails the first read.
  struct stat info;
  if (stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode)) throw Failure(path + ": " + std::strerror(EISDIR));
  std::ifstream in(path, std::ios::binary);
  if (!in) throw Failure(path + ": " + std::strerror(errno));
  return std::vector<unsigned char>(std::istreambuf_iterator<char>(in), {});
}

void WriteWholeFile(const std::string& path, const std::vector<unsigned char>& bytes) {
  if (path == "-") {
    std::fwrite(bytes.data(), 1, bytes.size(), stdout);
    std::fflush(stdout);
    return;
  }
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  if (!out) throw Failure(path + ": " + std::strerror(errno));
  out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
  if (!out) throw Failure(path + ": write failed");
}

std::string CaptureStandardOutput(const std::function<void()>& body) {
  std::fflush(stdout);
  std::cout.flush();
  FILE* sink = std::tmpfile();
  if (sink == nullptr) throw Failure(std::string("cannot capture output: ") + std::strerror(errno));
  int saved = dup(STDOUT_FILENO);
  dup2(fileno(sink), STDOUT_FILENO);
  try {
    body();
  } catch (...) {
    std::fflush(stdout);
    dup2(saved, STDOUT_FILENO);
    close(saved);
    std::fclose(sink);
    throw;
  }
  std::fflush(stdout);
  dup2(saved, STDOUT_FILENO);
  close(saved);
  std::string text;
  std::rewind(sink);
  char buffer[1024];
  size_t got;
  while ((got = std::fread(buffer, 1, sizeof buffer, sink)) > 0) text.append(buffer, got);
  std::fclose(sink);
  return text;
}

Progress::Progress(const std::string& label, unsigned long total)
    : label_(label),
      total_(total),
      shown_(total >= kProgressThreshold && isatty(STDERR_FILENO) && !Options().quiet),
      lastPercent_(-1) {}

Progress::~Progress() {
  if (shown_ && lastPercent_ >= 0) std::fprintf(stderr, "\r\033[K");
}

void Progress::Update(unsigned long done) {
  if (!shown_ || total_ == 0) return;
  int percent = static_cast<int>(done * 100 / total_);
  if (percent == lastPercent_) return;
  lastPercent_ = percent;
  int filled = percent * kProgressWidth / 100;
  std::string bar(static_cast<size_t>(filled), '#');
  bar.append(static_cast<size_t>(kProgressWidth - filled), '.');
  std::fprintf(stderr, "\r%s [%s] %3d%% %s", label_.c_str(), bar.c_str(), percent,
               HumanSize(done).c_str());
  std::fflush(stderr);
}

}  // namespace stbtool
