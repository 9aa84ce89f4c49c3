// Uses the installed headers and both libraries: a checksum from libstbplat,
// a log level from the platform library.
#include <stbplat/stbplat.h>

#include <cstdio>

int main() {
  static const unsigned char kCheck[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  unsigned int crc = ComputeCRC32(kCheck, sizeof kCheck);
  std::printf("crc32=%08X level=%u\n", crc, subSystemLogLevel[eLogModuleRecords]);
  return crc == 0xCBF43926u ? 0 : 1;
}
