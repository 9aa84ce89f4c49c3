// The C-linkage checksum functions keep their types.
#include <type_traits>

#include "stbplat/crc.h"

static_assert(std::is_same<decltype(&CalcCRC16),
                           unsigned short (*)(const unsigned char*, unsigned short, unsigned short,
                                              bool, const unsigned char*, const unsigned char*)>::value,
              "CalcCRC16");
static_assert(std::is_same<decltype(&ComputeCRC16),
                           unsigned short (*)(const unsigned char*, unsigned short)>::value,
              "ComputeCRC16");
static_assert(std::is_same<decltype(&CRC32Enet),
                           unsigned int (*)(unsigned int, const unsigned char*, unsigned int)>::value,
              "CRC32Enet");
static_assert(std::is_same<decltype(&CRC32EnetFinal), unsigned int (*)(unsigned int)>::value,
              "CRC32EnetFinal");
static_assert(std::is_same<decltype(&ComputeCRC32),
                           unsigned int (*)(const unsigned char*, unsigned int)>::value,
              "ComputeCRC32");
