// Output helpers shared by the commands: JSON printing, hexadecimal and size
// formatting, capture of text that library functions print on standard
// output, and a progress bar for long transfers on a terminal.
#ifndef STBPLAT_TOOL_OUTPUT_H
#define STBPLAT_TOOL_OUTPUT_H

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include <nlohmann/json.hpp>

namespace stbtool {

using Json = nlohmann::ordered_json;

// Prints the value; text in it that is not UTF-8 (file names, names read
// from records) is first escaped byte by byte as "\xNN".
void PrintJson(const Json& value);

// "0x1A2B" with at least `digits` hexadecimal digits.
std::string Hex(unsigned long value, int digits = 0);
// "256 KiB", "1 MiB", "1.5 MiB", "300 B".
std::string HumanSize(unsigned long bytes);
// Four-character type code as text ("VERS"); unprintable bytes as '?'.
std::string TypeCodeText(unsigned int code);
// Bytes as text, stopping at the first zero; unprintable bytes escaped.
std::string PrintableText(const unsigned char* data, size_t length);
// Lines of text with every unprintable byte but the line end escaped.
std::string PrintableLines(const std::string& text);

// Reads a whole file ("-" reads standard input). Throws Failure.
std::vector<unsigned char> ReadWholeFile(const std::string& path);
void WriteWholeFile(const std::string& path, const std::vector<unsigned char>& bytes);

// Runs `body` with the process's standard output going to a buffer and
// returns what it printed (the library's disk and ini functions print there).
std::string CaptureStandardOutput(const std::function<void()>& body);

// A progress bar on standard error, drawn only when it is a terminal and
// the transfer is large; finished (line cleared) by the destructor.
class Progress {
 public:
  Progress(const std::string& label, unsigned long total);
  ~Progress();
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  void Update(unsigned long done);

 private:
  std::string label_;
  unsigned long total_;
  bool shown_;
  int lastPercent_;
};

}  // namespace stbtool

#endif
