// Checksums of files: the library's CRC-16 (KERMIT) and Ethernet CRC-32.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

#include "actions.h"
#include "output.h"
#include "stbplat/crc.h"
#include "tool.h"

namespace stbtool {
namespace {

// The CRC-16 count is 16 bits wide: longer data goes in pieces.
constexpr size_t kCrc16Piece = 0xFFFF;
constexpr unsigned int kCrc32Initial = 0xFFFFFFFF;
constexpr size_t kCrc32Piece = 1u << 20;

unsigned short Crc16Of(const std::vector<unsigned char>& bytes) {
  unsigned short crc = 0;
  for (size_t at = 0; at < bytes.size(); at += kCrc16Piece) {
    size_t n = std::min(kCrc16Piece, bytes.size() - at);
    crc = CalcCRC16(bytes.data() + at, static_cast<unsigned short>(n), crc, false, nullptr, nullptr);
  }
  return crc;
}

unsigned int Crc32Of(const std::vector<unsigned char>& bytes) {
  unsigned int crc = kCrc32Initial;
  for (size_t at = 0; at < bytes.size(); at += kCrc32Piece) {
    size_t n = std::min(kCrc32Piece, bytes.size() - at);
    crc = CRC32Enet(crc, bytes.data() + at, static_cast<unsigned int>(n));
  }
  return CRC32EnetFinal(crc);
}

void RunChecksum(const std::vector<std::string>& files, bool wide) {
  Json list = Json::array();
  for (const std::string& file : files) {
    std::vector<unsigned char> bytes = ReadWholeFile(file);
    unsigned long value = wide ? Crc32Of(bytes) : Crc16Of(bytes);
    std::string hex = Hex(value, wide ? 8 : 4);
    if (Options().json)
      list.push_back({{"file", file}, {"size", bytes.size()}, {wide ? "crc32" : "crc16", hex}});
    else
      std::cout << hex << "  " << file << "\n";
  }
  if (Options().json) PrintJson(list);
}

}  // namespace

void RegisterChecksumCommands(CLI::App& app) {
  static std::vector<std::string> crcFiles;
  CLI::App* crc16 = app.add_subcommand("crc16", "CRC-16 (KERMIT) of files; - reads standard input");
  crc16->add_option("FILE", crcFiles, "Files to checksum")->required();
  SetAction(crc16, []() { RunChecksum(crcFiles, false); });

  CLI::App* crc32 = app.add_subcommand("crc32", "CRC-32 (IEEE 802.3) of files; - reads standard input");
  crc32->add_option("FILE", crcFiles, "Files to checksum")->required();
  SetAction(crc32, []() { RunChecksum(crcFiles, true); });

}

}  // namespace stbtool
