// The C-linkage flash functions keep their types.
#include <type_traits>

#include "stbplat/flash_c.h"

static_assert(std::is_same<decltype(&WriteToNORFlashAtAddr),
                           bool (*)(unsigned long, const unsigned char*, unsigned long)>::value,
              "WriteToNORFlashAtAddr");
static_assert(std::is_same<decltype(&ReadFromNORFlashAtAddr),
                           bool (*)(unsigned long, unsigned char*, unsigned long)>::value,
              "ReadFromNORFlashAtAddr");
static_assert(std::is_same<decltype(&EraseNOR), bool (*)(unsigned long, unsigned long)>::value,
              "EraseNOR");
static_assert(std::is_same<decltype(&LookupMTDPartition),
                           const char* (*)(const char*, unsigned long*)>::value,
              "LookupMTDPartition");
static_assert(std::is_same<decltype(&LookupMTDPartitionLoc),
                           const char* (*)(const Location*, unsigned long*)>::value,
              "LookupMTDPartitionLoc");
static_assert(std::is_same<decltype(&NANDRead), bool (*)(unsigned char*, unsigned long,
                                                          const char*, unsigned long)>::value,
              "NANDRead");
static_assert(std::is_same<decltype(&NANDReadLoc), bool (*)(unsigned char*, unsigned long,
                                                             const Location*, unsigned long)>::value,
              "NANDReadLoc");
static_assert(std::is_same<decltype(&NANDWrite), bool (*)(const unsigned char*, unsigned long,
                                                           const char*, unsigned long)>::value,
              "NANDWrite");
static_assert(std::is_same<decltype(&NANDWriteLoc),
                           bool (*)(const unsigned char*, unsigned long, const Location*,
                                    unsigned long)>::value,
              "NANDWriteLoc");
static_assert(std::is_same<decltype(&GetNORSectorSize), unsigned long (*)()>::value,
              "GetNORSectorSize");
