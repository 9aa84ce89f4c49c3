#include "stbplat/string_checks.h"

#include <gtest/gtest.h>

#include <initializer_list>
#include <string>

namespace {

TEST(Strnchr, BoundIsInclusiveAndIgnoresTerminators) {
  const char text[] = {'a', '\0', 'b', 'x'};
  EXPECT_EQ(strnchr(text, 3, 'x'), text + 3);
  EXPECT_EQ(strnchr(text, 2, 'x'), nullptr);
  EXPECT_EQ(strnchr(text, 0, 'a'), text);
  EXPECT_EQ(strnchr(text, 3, '\0'), text + 1);
  EXPECT_EQ(strnchr(nullptr, 5, 'a'), nullptr);
}

TEST(StrSecurityCheck, AllowedSetOnlyWithinLength) {
  const std::string everything =
      "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789./=_ \":-";
  EXPECT_TRUE(StrSecurityCheck(everything.c_str(), static_cast<unsigned int>(everything.size())));
  for (const char* bad : {";", "$", "`", "|", "&", ">", "<", "\n", "'", "\\", "*", "(", "\x80"})
    EXPECT_FALSE(StrSecurityCheck(bad, 1)) << static_cast<int>(static_cast<unsigned char>(*bad));
  EXPECT_TRUE(StrSecurityCheck("ab;", 2));
  EXPECT_TRUE(StrSecurityCheck("a\0b", 3));  // a 0 byte among the len bytes passes
  EXPECT_FALSE(StrSecurityCheck(nullptr, 1));
}

TEST(AddressChecks, IpIsADottedQuadSubnetIsThreeDotsAndDigits) {
  for (const char* ip : {"192.168.1.10", "0.0.0.0"}) EXPECT_TRUE(IsValidIpAddress(ip)) << ip;
  for (const char* ip : std::initializer_list<const char*>{"256.1.1.1", "1.2.3", "1.2.3.4 ", "::1", "", nullptr})
    EXPECT_FALSE(IsValidIpAddress(ip)) << (ip ? ip : "null");
  for (const char* net : {"255.255.255.0", "1.2.3.", "999.1.2.3", "1..2.3", "..."})
    EXPECT_TRUE(IsValidSubNet(net)) << net;
  for (const char* net : std::initializer_list<const char*>{"1.2.3", "a.b.c.d", "1.2.3.4.5", "1.2.3.-4", "", nullptr})
    EXPECT_FALSE(IsValidSubNet(net)) << (net ? net : "null");
  // The dot count wraps at eight bits.
  EXPECT_TRUE(IsValidSubNet(std::string(259, '.').c_str()));
  EXPECT_FALSE(IsValidSubNet(std::string(258, '.').c_str()));
}

}  // namespace
