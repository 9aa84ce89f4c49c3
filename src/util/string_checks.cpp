#include "stbplat/string_checks.h"

#include <arpa/inet.h>
#include <cctype>
#include <cstring>
#include <netinet/in.h>

namespace {

// Characters allowed in text that reaches a shell command line.
constexpr char kAllowedCharacters[] =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789./=_ \":-";
constexpr unsigned long kAllowedCount = sizeof kAllowedCharacters - 1;
static_assert(kAllowedCount == 70, "allowed character set");

constexpr unsigned char kSubnetDots = 3;

}  // namespace

extern "C" {

char* strnchr(const char* s, unsigned long n, char c) {
  if (s == nullptr) return nullptr;
  for (unsigned long i = 0;; ++i) {
    if (s[i] == c) return const_cast<char*>(s + i);
    if (i == n) return nullptr;
  }
}

bool StrSecurityCheck(const char* s, unsigned int len) {
  if (s == nullptr) return len == 0;
  // The search also covers the set's terminator, so a 0 byte passes.
  for (unsigned int i = 0; i < len; ++i)
    if (strnchr(kAllowedCharacters, kAllowedCount, s[i]) == nullptr) return false;
  return true;
}

bool IsValidIpAddress(const char* s) {
  if (s == nullptr) return false;
  in_addr scratch;
  return inet_pton(AF_INET, s, &scratch) != 0;
}

bool IsValidSubNet(const char* s) {
  if (s == nullptr) return false;
  const size_t length = std::strlen(s);
  unsigned char nonDigits = 0;
  for (size_t i = 0; i < length; ++i) {
    if (std::isdigit(static_cast<unsigned char>(s[i])) != 0) continue;
    if (s[i] != '.') return false;
    ++nonDigits;
  }
  return nonDigits == kSubnetDots;
}

}  // extern "C"
