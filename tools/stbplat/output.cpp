#include "output.h"

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

}  // namespace

void PrintJson(const Json& value) { std::cout << value.dump(2) << "\n"; }

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
    if (std::isprint(c)) {
      text += static_cast<char>(c);
    } else {
      char escaped[8];
      std::snprintf(escaped, sizeof escaped, "\\x%02X", c);
      text += escaped;
    }
  }
  return text;
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
  std::ifstream in(path, std::ios::binary);
  if (!in) throw Failure(path + ": " + std::strerror(errno));
  return std::vector<unsigned char>(std::istreambuf_iterator<char>(in),
                                    std::istreambuf_iterator<char>());
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
