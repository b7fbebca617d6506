#include "unicode.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>

#include "core.h"

namespace vorn {
namespace {

TEST(UpperCase, IsUnicodes) {
  const struct {
    const char* text;
    const char* upper;
  } cases[] = {{"", ""},
               {"example.com", "EXAMPLE.COM"},
               {"stra\xc3\x9f"
                "e",
                "STRASSE"},
               {"\xc3\xa4\xc3\xb6", "\xc3\x84\xc3\x96"},
               {"A1-_", "A1-_"},
               {"\xef\xac\x81", "FI"}};
  for (const auto& c : cases) {
    char buffer[492];
    std::memset(buffer, 'x', sizeof buffer);
    EXPECT_EQ(KLIBCUnicodeUTF8StrUpper(c.text, buffer, sizeof buffer), static_cast<int>(std::strlen(c.upper)));
    EXPECT_STREQ(buffer, c.upper);
  }
}

TEST(UpperCase, IsNeverCutAndTakesUtf8Only) {
  char buffer[4] = "old";
  EXPECT_EQ(KLIBCUnicodeUTF8StrUpper("abc", buffer, 4), 3);
  EXPECT_LT(KLIBCUnicodeUTF8StrUpper("abcd", buffer, 4), 0);
  EXPECT_EQ(KLIBCErrGet(), ERANGE);
  EXPECT_LT(KLIBCUnicodeUTF8StrUpper("\xc3\x9f\xc3\x9f", buffer, 4), 0);  // four letters in upper case
  EXPECT_LT(KLIBCUnicodeUTF8StrUpper("a", buffer, 0), 0);
  EXPECT_LT(KLIBCUnicodeUTF8StrUpper("a", buffer, -1), 0);
  EXPECT_LT(KLIBCUnicodeUTF8StrUpper("\xff", buffer, 4), 0);
  EXPECT_EQ(KLIBCErrGet(), EILSEQ);
  EXPECT_LT(KLIBCUnicodeUTF8StrUpper(nullptr, buffer, 4), 0);
  EXPECT_STREQ(buffer, "ABC");
}

TEST(CaselessSubstring, IsFoundInAnyCase) {
  EXPECT_TRUE(CaselessSubstring("LIC").IsIn("alice"));
  EXPECT_TRUE(CaselessSubstring("\xc3\xa4").IsIn("B\xc3\x84R"));
  EXPECT_TRUE(CaselessSubstring("").IsIn("alice"));
  EXPECT_FALSE(CaselessSubstring("x").IsIn("alice"));
  EXPECT_TRUE(CaselessSubstring("\xff").IsIn("a\xff"));
  EXPECT_FALSE(CaselessSubstring("A\xff").IsIn("a\xff"));
}

}  // namespace
}  // namespace vorn
