#include "stbplat/string_checks.h"

#include <gtest/gtest.h>

#include <string>

namespace {

TEST(Strnchr, BoundIsInclusiveAndIgnoresTerminators) {
  EXPECT_EQ(strnchr("abc", 2, 'x'), nullptr);
  const char text[] = "abcx";
  EXPECT_EQ(strnchr(text, 3, 'x'), text + 3);
  EXPECT_EQ(strnchr(text, 2, 'x'), nullptr);
  EXPECT_EQ(strnchr(text, 0, 'a'), text);
  const char withZero[] = {'a', '\0', 'b', 'c'};
  EXPECT_EQ(strnchr(withZero, 3, 'c'), withZero + 3);
  EXPECT_EQ(strnchr(withZero, 3, '\0'), withZero + 1);
  EXPECT_EQ(strnchr(nullptr, 5, 'a'), nullptr);
}

TEST(StrSecurityCheck, AllowedSetOnly) {
  EXPECT_FALSE(StrSecurityCheck("a;b", 3));
  const std::string safe = "Key=\"Value 42\" ab=cd";
  EXPECT_TRUE(StrSecurityCheck(safe.c_str(), static_cast<unsigned int>(safe.size())));
  const std::string everything =
      "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789./=_ \":-";
  EXPECT_TRUE(StrSecurityCheck(everything.c_str(), static_cast<unsigned int>(everything.size())));
  for (const char* bad : {"$", "`", "|", "&", ">", "<", "\n", "'", "\\", "*", "(", "\x80"})
    EXPECT_FALSE(StrSecurityCheck(bad, 1)) << static_cast<int>(static_cast<unsigned char>(*bad));
  // Only len bytes are looked at, and a 0 byte among them passes.
  EXPECT_TRUE(StrSecurityCheck("ab;", 2));
  const char withZero[] = {'a', '\0', 'b'};
  EXPECT_TRUE(StrSecurityCheck(withZero, 3));
  EXPECT_TRUE(StrSecurityCheck("", 0));
  EXPECT_FALSE(StrSecurityCheck(nullptr, 1));
}

TEST(IsValidIpAddress, DottedQuadsOnly) {
  EXPECT_TRUE(IsValidIpAddress("192.168.1.10"));
  EXPECT_TRUE(IsValidIpAddress("0.0.0.0"));
  EXPECT_FALSE(IsValidIpAddress("256.1.1.1"));
  EXPECT_FALSE(IsValidIpAddress("1.2.3"));
  EXPECT_FALSE(IsValidIpAddress("1.2.3.4 "));
  EXPECT_FALSE(IsValidIpAddress("::1"));
  EXPECT_FALSE(IsValidIpAddress(""));
  EXPECT_FALSE(IsValidIpAddress(nullptr));
}

TEST(IsValidSubNet, ThreeDotsAndDigits) {
  EXPECT_TRUE(IsValidSubNet("255.255.255.0"));
  EXPECT_TRUE(IsValidSubNet("1.2.3."));
  EXPECT_TRUE(IsValidSubNet("999.1.2.3"));
  EXPECT_TRUE(IsValidSubNet("1..2.3"));
  EXPECT_TRUE(IsValidSubNet("..."));
  EXPECT_TRUE(IsValidSubNet("1234567890.1234567890.1234567890.1234567890"));
  EXPECT_FALSE(IsValidSubNet("1.2.3"));
  EXPECT_FALSE(IsValidSubNet("a.b.c.d"));
  EXPECT_FALSE(IsValidSubNet("1.2.3.4.5"));
  EXPECT_FALSE(IsValidSubNet("1.2.3.-4"));
  EXPECT_FALSE(IsValidSubNet(""));
  EXPECT_FALSE(IsValidSubNet(nullptr));
}

TEST(IsValidSubNet, DotCountWrapsAtEightBits) {
  EXPECT_TRUE(IsValidSubNet(std::string(259, '.').c_str()));
  EXPECT_FALSE(IsValidSubNet(std::string(258, '.').c_str()));
}

}  // namespace
