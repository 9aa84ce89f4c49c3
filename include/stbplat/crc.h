// CRC-16 (KERMIT parameters, optional ring-buffer wrap) and the IEEE 802.3
// (Ethernet) CRC-32.
#ifndef STBPLAT_CRC_H
#define STBPLAT_CRC_H

#include "stbplat/export.h"

#ifndef __cplusplus
#include <stdbool.h>
#endif

#ifdef __cplusplus
extern "C" {
#endif

STBPLAT_EXPORT unsigned short CalcCRC16(const unsigned char* data, unsigned short count,
                                        unsigned short initial, bool wrap,
                                        const unsigned char* ringStart,
                                        const unsigned char* ringEnd);
STBPLAT_EXPORT unsigned short ComputeCRC16(const unsigned char* data, unsigned short count);
STBPLAT_EXPORT unsigned int CRC32Enet(unsigned int crc, const unsigned char* data,
                                      unsigned int count);
STBPLAT_EXPORT unsigned int CRC32EnetFinal(unsigned int crc);
STBPLAT_EXPORT unsigned int ComputeCRC32(const unsigned char* data, unsigned int count);

#ifdef __cplusplus
}
#endif

#endif
