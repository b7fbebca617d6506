#include "lines.h"

#include <gmock/gmock.h>

#include <sstream>
#include <string>

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(Lines, EndAtLineFeedsAndAtTheEndOfTheText) {
  EXPECT_THAT(LinesOf(""), IsEmpty());
  EXPECT_THAT(LinesOf("a"), ElementsAre("a"));
  EXPECT_THAT(LinesOf("a\n\nb \n"), ElementsAre("a", "", "b "));
  EXPECT_THAT(LinesOf("\n"), ElementsAre(""));
}

TEST(Words, AreSeparatedByAnyBlanks) {
  EXPECT_THAT(WordsOf(" \t"), IsEmpty());
  EXPECT_THAT(WordsOf("a"), ElementsAre("a"));
  EXPECT_THAT(WordsOf(" a\tb\r\n\v\fc "), ElementsAre("a", "b", "c"));
}

std::vector<std::string> Strings(const std::vector<std::string_view>& views) { return {views.begin(), views.end()}; }

// The reference is the standard library.
TEST(LinesAndWords, AreThoseOfStreams) {
  constexpr char kCharacters[] = "ab \t\n\r,";
  unsigned state = 1;
  for (int i = 0; i < 2000; ++i) {
    std::string text;
    for (int length = i % 12; length > 0; --length) {
      text += kCharacters[(state = state * 1103515245 + 12345) / 65536 % (sizeof kCharacters - 1)];
    }
    std::istringstream lines(text);
    std::vector<std::string> expected_lines;
    for (std::string line; std::getline(lines, line);) expected_lines.push_back(line);
    EXPECT_EQ(Strings(LinesOf(text)), expected_lines) << text;
    std::istringstream words(text);
    std::vector<std::string> expected_words;
    for (std::string word; words >> word;) expected_words.push_back(word);
    EXPECT_EQ(Strings(WordsOf(text)), expected_words) << text;
  }
}

}  // namespace
}  // namespace vorn
