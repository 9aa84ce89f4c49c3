#include <cstddef>

#include "stbplat/ini_reader.h"

#pragma GCC diagnostic ignored "-Winvalid-offsetof"

// The virtual destructor puts the table pointer first.
static_assert(offsetof(INIReader, fileName) == 8, "INIReader::fileName");
static_assert(offsetof(INIReader, valueHandler) == 16, "INIReader::valueHandler");
static_assert(offsetof(INIReader, directiveHandler) == 24, "INIReader::directiveHandler");
static_assert(offsetof(INIReader, user) == 32, "INIReader::user");
static_assert(offsetof(INIReader, lineBuffer) == 40, "INIReader::lineBuffer");
static_assert(sizeof(INIReader) == 48, "INIReader size");
