#include "exports_text.h"

#include <gtest/gtest.h>

#include <string>

namespace vorn {
namespace {

using Found = ExportsReader::Found;
using std::string_literals::operator""s;  // NOLINT(misc-unused-using-decls): it is used

struct WordCase {
  const char* name;
  std::string text;
  std::string word;
  std::string rest;
};

TEST(ExportsReader, ReadsAWordAsExportfsDoes) {
  const WordCase cases[] = {
      {"plain", "/a b", "/a", "b"},
      {"to a line break", "/a\nb", "/a", "\nb"},
      {"to the end", "/a", "/a", ""},
      {"to a carriage return", "/a\r\n", "/a", "\n"},
      {"to a NUL", "/a\0b"s, "/a", "b"},
      {"quoted blank", "\"/a b\" c", "/a b", "c"},
      {"quoted in the middle", "/a\" \"b c", "/a b", "c"},
      {"quoted line break", "\"/a\nb\" c", "/a\nb", "c"},
      {"quoted NUL ends the text", "\"/a\0b\" c"s, "/a", "c"},
      {"quotation without an end", "\"/a b", "/a b", ""},
      {"octal escape", "/a\\040b c", "/a b", "c"},
      {"escaped quotation mark", "/a\\042b", "/a\"b", ""},
      {"backslash that escapes nothing", "/a\\b\\09", "/a\\b\\09", ""},
      {"escape made by an escape", "/\\134101", "/A", ""},
      {"escaped digits stay", "/\\134\\061\\060\\061", "/\\101", ""},
      {"octal escape of a whole byte", "/a\\377b c", "/a\377b", "c"},
      {"octal number above a byte", "/a\\541\\401 c", "/a\\541\\401", "c"},
      {"number sign inside", "/a#b c", "/a#b", "c"},
      {"continued line ends it", "/a\\\n   b", "/a", "b"},
      {"continued line in quotation marks", "\"/a\\\n \tb\"", "/a b", ""},
  };
  for (const WordCase& c : cases) {
    ExportsReader reader(c.text);
    std::string word;
    EXPECT_EQ(reader.ReadWord(kLongestExportPath, &word), Found::kWord) << c.name;
    EXPECT_EQ(word, c.word) << c.name;
    EXPECT_EQ(c.text.substr(reader.position()), c.rest) << c.name;
  }
}

TEST(ExportsReader, TakesAWordOfTheGivenLengthAndNoLonger) {
  std::string word;
  EXPECT_EQ(ExportsReader("abc d").ReadWord(3, &word), Found::kWord);
  EXPECT_EQ(word, "abc");
  EXPECT_EQ(ExportsReader("abcd e").ReadWord(3, &word), Found::kTooLong);
  EXPECT_EQ(ExportsReader("\"a b c").ReadWord(3, &word), Found::kTooLong);
}

TEST(ExportsReader, FindsNoWordWhereNoneBegins) {
  for (const char* text : {"", "\nb", "\rb", "\fb", "\"\" b"}) {
    std::string word = "old";
    EXPECT_EQ(ExportsReader(text).ReadWord(10, &word), Found::kNothing) << text;
    EXPECT_EQ(word, "") << text;
  }
}

TEST(ExportsReader, SkipsCommentsAndEmptyLinesBeforeAPath) {
  const std::string text = "# a \\\n\n \t# b\n  /c";
  ExportsReader reader(text);
  EXPECT_EQ(reader.SkipToPath(), text.find("  /c"));
  EXPECT_EQ(reader.position(), text.find("/c"));
}

TEST(ExportsReader, FindsTheCommentBehindTheClients) {
  const std::string text = " \t# b\n/c";
  ExportsReader reader(text);
  EXPECT_EQ(reader.SkipToClient(), text.find('#'));
  EXPECT_EQ(reader.position(), text.find('\n'));
  EXPECT_EQ(ExportsReader(" c # d").SkipToClient(), std::string::npos);
}

TEST(EncodeExportsWord, ReadsBackAsTheSameText) {
  const std::string texts[] = {
      "/plain", "/a b", "/a\tb", "/a\nb",      "/a\"b",     "/a\\b",      "/a\\101b",      "/\\\\040",      "/\\0",
      "/#a",    "#a",   "/a#b",  "/b\xc3\xbc", "/\x7f\x01", "/\\1234567", "a(rw,sec=sys)", "/\\\"\\\"077\\"};
  for (const std::string& text : texts) {
    const std::string encoded = EncodeExportsWord(text);
    ExportsReader reader(encoded);
    std::string word;
    EXPECT_EQ(reader.ReadWord(kLongestExportPath, &word), Found::kWord) << encoded;
    EXPECT_EQ(word, text) << encoded;
    EXPECT_TRUE(reader.at_end()) << encoded;
  }
}

TEST(EncodeExportsWord, LeavesOrdinaryPathsAsTheyAre) {
  EXPECT_EQ(EncodeExportsWord("/volume1/b\xc3\xbc"
                              "cher-2_(old)"),
            "/volume1/b\xc3\xbc"
            "cher-2_(old)");
  EXPECT_EQ(EncodeExportsWord("/a b"), "/a\\040b");
}

TEST(NormalExportPath, DropsEmptyAndDotComponents) {
  const std::pair<const char*, const char*> cases[] = {
      {"/a/b", "/a/b"},   {"/a/b/", "/a/b"}, {"//a///b//", "/a/b"}, {"/a/./b/.", "/a/b"},
      {"/", "/"},         {"//", "/"},       {"/./", "/"},          {"/a/../b", "/a/../b"},
      {"/a/.b", "/a/.b"}, {"", ""},          {"a//b/", "a/b"}};
  for (const auto& [path, normal] : cases) EXPECT_EQ(NormalExportPath(path), normal) << path;
}

}  // namespace
}  // namespace vorn
