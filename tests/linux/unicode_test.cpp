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

TEST(PlainText, IsWhatIsSeenAndLooksLikeNothingElse) {
  for (const char* text :
       {"", "alice@EXAMPLE.COM", "a b#c;d", "j\xc3\xb6rg", "\xd0\xb8\xd0\xb2\xd0\xb0\xd0\xbd",
        "\xe5\xb1\xb1\xe7\x94\xb0", "\xe5\xb1\xb1\xe3\x81\xae\xe3\x83\x8e@LAB", "\xd0\xb8\xd0\xb2@LAB-\xce\xbb"}) {
    EXPECT_TRUE(IsPlainText(text)) << text;
  }
  const struct {
    const char* what;
    std::string_view text;
  } cases[] = {{"NUL", {"a\0b", 3}},
               {"line feed", "a\nb"},
               {"tab", "a\tb"},
               {"delete", "a\x7f"},
               {"next line", "a\xc2\x85"},
               {"no-break space", "a\xc2\xa0"},
               {"soft hyphen", "a\xc2\xad"},
               {"line separator", "a\xe2\x80\xa8"},
               {"right-to-left override", "a\xe2\x80\xae"},
               {"isolate", "a\xe2\x81\xa6"},
               {"zero-width space", "a\xe2\x80\x8b"},
               {"byte order mark", "\xef\xbb\xbf"},
               {"Hangul filler", "a\xe3\x85\xa4"},
               {"full-width equals sign", "a\xef\xbc\x9d"},
               {"ligature", "\xef\xac\x81"},
               {"letter and accent apart", "o\xcc\x88"},
               {"a Cyrillic letter in a Latin word", "\xd0\xb0lice"},
               {"a Greek letter in a Latin word", "r\xce\xbf\xce\xbft"},
               {"a Cyrillic letter in a Greek word", "\xce\xbb\xd0\xb0"},
               {"private use", "\xee\x80\x80"},
               {"replacement character", "a\xef\xbf\xbd"},
               {"not assigned", "\xcd\xb8"},
               {"noncharacter", "\xef\xbf\xbf"},
               {"tag", "\xf3\xa0\x81\x81"},
               {"no UTF-8", "a\xff"},
               {"an overlong line feed", "\xc0\x8a"},
               {"half a surrogate pair", "\xed\xa0\x80"},
               {"cut off", "a\xc3"}};
  for (const auto& c : cases) EXPECT_FALSE(IsPlainText(c.text)) << c.what;
}

}  // namespace
}  // namespace vorn
