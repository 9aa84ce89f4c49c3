/* C entry points to the flash singleton. Each forwards its arguments to the
 * FlashInterface member of the same purpose and returns its result. */
#ifndef STBPLAT_FLASH_C_H
#define STBPLAT_FLASH_C_H

#include "stbplat/export.h"

#ifdef __cplusplus
class Location;
extern "C" {
#else
#include <stdbool.h>
typedef struct Location Location;
#endif

STBPLAT_EXPORT bool WriteToNORFlashAtAddr(unsigned long address, const unsigned char* buffer,
                                          unsigned long length);
STBPLAT_EXPORT bool ReadFromNORFlashAtAddr(unsigned long address, unsigned char* buffer,
                                           unsigned long length);
STBPLAT_EXPORT bool EraseNOR(unsigned long address, unsigned long numBytes);
STBPLAT_EXPORT const char* LookupMTDPartition(const char* name, unsigned long* offset);
STBPLAT_EXPORT const char* LookupMTDPartitionLoc(const Location* location, unsigned long* offset);
STBPLAT_EXPORT bool NANDRead(unsigned char* buffer, unsigned long length, const char* name,
                             unsigned long offset);
STBPLAT_EXPORT bool NANDReadLoc(unsigned char* buffer, unsigned long length,
                                const Location* location, unsigned long offset);
STBPLAT_EXPORT bool NANDWrite(const unsigned char* buffer, unsigned long length,
                              const char* name, unsigned long offset);
STBPLAT_EXPORT bool NANDWriteLoc(const unsigned char* buffer, unsigned long length,
                                 const Location* location, unsigned long offset);
STBPLAT_EXPORT unsigned long GetNORSectorSize(void);

#ifdef __cplusplus
}
#endif

#endif
