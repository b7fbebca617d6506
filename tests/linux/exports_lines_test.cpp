// Parsing a changed text with its previous version gives the same lines as parsing the text alone.
#include "exports_lines.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "exports_index.h"
#include "generated_case.h"

namespace vorn {

bool operator==(const ExportSpan& a, const ExportSpan& b) {
  return a.begin == b.begin && a.path == b.path && a.end == b.end && a.inherited == b.inherited;
}

namespace {

// Parts of lines, mostly whole ones. The rare parts continue a line, open a quotation, or have a second word of
// options.
std::string Text(Chance* chance, int parts) {
  static const char* const common[] = {"/a h(rw)\n", "/b/c h1 h2\n", "/d h", "\n",
                                       "# note\n",   "  /e h # x\n", "\t",   "\n\n"};
  static const char* const rare[] = {"\\\n", "\"", "/q\\040r h\n", "/s \"h (rw)\"\n", "\\", "/o -ro -rw\n", "/n\n"};
  const bool is_plain = !chance->OneIn(3);
  std::string text;
  for (int part = 0; part < parts; ++part) {
    text += !is_plain && chance->OneIn(6) ? chance->Of(rare) : chance->Of(common);
  }
  return text;
}

// Replaces a piece of the text, possibly nothing, and possibly by nothing.
std::string Edited(Chance* chance, const std::string& text) {
  const auto position = [&] { return static_cast<std::size_t>(chance->Below(static_cast<int>(text.size()) + 1)); };
  const std::size_t begin = position();
  const std::size_t size = chance->OneIn(2) ? 0 : position();
  const std::string piece = chance->OneIn(3) ? "" : Text(chance, 1 + chance->Below(2));
  return text.substr(0, begin) + piece + text.substr(std::min(text.size(), begin + size));
}

TEST(ExportsLines, AreTheSameWithAndWithoutThePreviousText) {
  const unsigned cases = NumberFromEnvironment("VORN_CASES", 20000);
  for (unsigned number = 0; number < cases; ++number) {
    Chance chance(number);
    const ExportsLines previous(Text(&chance, chance.Below(8)));
    const ExportsLines alone(Edited(&chance, previous.text()));
    const ExportsLines after(alone.text(), previous);
    ASSERT_EQ(after.spans(), alone.spans())
        << "case " << number << ": \"" << previous.text() << "\" became \"" << alone.text() << "\"";
    ASSERT_LE(after.shared_head() + after.shared_tail(), std::min(previous.spans().size(), after.spans().size()));
    for (std::size_t line = 0; line < after.shared_head(); ++line) {
      ASSERT_EQ(after.TextOf(after.spans()[line]), previous.TextOf(previous.spans()[line])) << "case " << number;
    }
    for (std::size_t left = 1; left <= after.shared_tail(); ++left) {
      ASSERT_EQ(after.TextOf(after.spans()[after.spans().size() - left]),
                previous.TextOf(previous.spans()[previous.spans().size() - left]))
          << "case " << number;
    }
  }
}

TEST(ExportsLines, SharesAllLinesButTheChangedOnes) {
  std::string lines;
  for (int share = 0; share < 1000; ++share) lines += "/volume1/share" + std::to_string(share) + " h(rw)\n";
  const ExportsLines previous("# head\n" + lines + "/changed h(rw)\n" + lines);
  const ExportsLines after("# head\n" + lines + "/changed h(ro) other(rw)\n/new h\n" + lines, previous);
  EXPECT_EQ(after.spans().size(), 2002U);
  EXPECT_EQ(after.shared_head(), 1000U);
  EXPECT_EQ(after.shared_tail(), 1000U);
}

TEST(ExportsLines, HaveTheSamePathsUntilOneChanges) {
  const ExportsLines previous("/a h\n/b h\n/c h\n");
  EXPECT_TRUE(HaveSamePaths(ExportsLines("/a h\n/b h(ro)\n/c h\n", previous), previous));
  EXPECT_FALSE(HaveSamePaths(ExportsLines("/a h\n/x h\n/c h\n", previous), previous));
  EXPECT_FALSE(HaveSamePaths(ExportsLines("/a h\n/c h\n", previous), previous));
  EXPECT_FALSE(HaveSamePaths(ExportsLines("/a h\n/b h\n\"/b\" h\n/c h\n", previous), previous));
}

}  // namespace
}  // namespace vorn
