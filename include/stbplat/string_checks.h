/* Checks for text handed in from outside (for example before it goes into a
 * shell command line). */
#ifndef STBPLAT_STRING_CHECKS_H
#define STBPLAT_STRING_CHECKS_H

#include "stbplat/export.h"

#ifndef __cplusplus
#include <stdbool.h>
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* First c among s[0] .. s[n] (n + 1 bytes; a 0 byte does not stop the
 * search), or null. A null s gives null. */
STBPLAT_EXPORT char* strnchr(const char* s, unsigned long n, char c);

/* True when each of the len bytes of s is a letter, digit, '.', '/', '=',
 * '_', space, '"', ':' or '-'. A 0 byte is accepted too. A null s with a
 * non-zero len is false. */
STBPLAT_EXPORT bool StrSecurityCheck(const char* s, unsigned int len);

/* True when inet_pton accepts s as an IPv4 address; false for null. */
STBPLAT_EXPORT bool IsValidIpAddress(const char* s);

/* True when s is digits with exactly three other characters, all '.'; the
 * numbers are not range-checked ("999.1.2.3", "..." pass) and the count of
 * non-digits is kept in 8 bits (259 dots count as 3). False for null. */
STBPLAT_EXPORT bool IsValidSubNet(const char* s);

#ifdef __cplusplus
}
#endif

#endif
