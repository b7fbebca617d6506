#include "ini_text.h"

#include <gtest/gtest.h>

#include "ini_judge.h"
#include "temporary_root.h"

namespace vorn {
namespace {

TEST(IniValue, RefusesWhatAFileCannotCarry) {
  const std::string_view refused[] = {"",  "a\nb", "a\rb", "a\tb", std::string_view("a\0b", 3), "\x7f", "\x1b[m", "$a",
                                      "$", "\"'",  " \"'", "a#\"'"};
  for (const std::string_view text : refused) EXPECT_FALSE(IniValue::From(text).has_value()) << text;
}

TEST(IniValue, ReadsBackAsItWasWritten) {
  const char* const values[] = {"v",     "a b",     " a",           "a ",    "a#b",   ";",      "\"a\"", "'a'",
                                "it's",  "a\"b'c",  "[a]",          "a=b",   "=",     "a\\",    "\\",    "a\\ ",
                                "a$b",   "\"#",     "'#",           "x\\\\", "[a]\\", "a#b\\'", "k\"#",  "\xc3",
                                "a@B.C", "nfs/h@R", "include = /x", "-",     "\xa0 "};
  for (const char* text : values) {
    const std::optional<IniValue> value = IniValue::From(text);
    ASSERT_TRUE(value.has_value()) << text;
    const TemporaryRoot root;
    root.Write("/file", "[a]\nk = " + Rendered(*value) + "\nj = 1\n");
    EXPECT_EQ(GetByNfsconf(root.At("/file"), "a", "k"), text);
    EXPECT_EQ(GetByNfsconf(root.At("/file"), "a", "j"), "1") << text;
  }
}

TEST(IniValue, IsMadeOfANumber) { EXPECT_EQ(Rendered(NumberValue(-5)), "-5"); }

TEST(IniKey, RefusesWhatAFileCannotCarry) {
  const char* const refused[] = {"", " a", "a ", "a\t", "a=b", "#a", ";a", "[a", "a\nb", "\x01", "include", "Include"};
  for (const char* text : refused) EXPECT_FALSE(IniKey::From(text).has_value()) << text;
}

TEST(IniKey, ReadsBackAsItWasWritten) {
  for (const char* text : {"k", "a b", "a#b", "a;b", "a[b]", "'a'", "a\\", "nfs/host@realm", "\xc3\xa9", "]", "$a"}) {
    const std::optional<IniKey> key = IniKey::From(text);
    ASSERT_TRUE(key.has_value()) << text;
    EXPECT_EQ(ReadByNfsconf("[a]\n" + key->text() + " = v\n")["a"][text], "v") << text;
  }
}

TEST(IniSection, TakesOnlyWhatAFileCanCarry) {
  for (const char* text : {"", " a", "a ", "a]", "a\"b", "a\nb"}) EXPECT_FALSE(IniSection::From(text)) << text;
  for (const char* text : {"a", "a b", "a#b", "[a", "a=b", "a'b'"}) {
    const std::optional<IniSection> section = IniSection::From(text);
    ASSERT_TRUE(section.has_value()) << text;
    EXPECT_EQ(ReadByNfsconf("[" + section->text() + "]\nk = v\n")[text]["k"], "v") << text;
  }
}

}  // namespace
}  // namespace vorn
