#include <type_traits>

#include "stbplat/display_utils.h"
#include "stbplat/string_checks.h"
#include "stbplat/subsystem_init.h"

static_assert(std::is_same<decltype(strnchr), char*(const char*, unsigned long, char)>::value,
              "strnchr");
static_assert(std::is_same<decltype(StrSecurityCheck), bool(const char*, unsigned int)>::value,
              "StrSecurityCheck");
static_assert(std::is_same<decltype(IsValidIpAddress), bool(const char*)>::value,
              "IsValidIpAddress");
static_assert(std::is_same<decltype(IsValidSubNet), bool(const char*)>::value, "IsValidSubNet");
static_assert(std::is_same<decltype(DumpBuffer), void(etLogUtilModuleId, unsigned char,
                                                      const unsigned char*, unsigned int)>::value,
              "DumpBuffer");
static_assert(std::is_same<decltype(ZanSubSystemInit), int()>::value, "ZanSubSystemInit");
static_assert(std::is_same<decltype(HWSpecificInit), int()>::value, "HWSpecificInit");
