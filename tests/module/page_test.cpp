#include "page.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace {

constexpr int kMin = std::numeric_limits<int>::min();
constexpr int kMax = std::numeric_limits<int>::max();

struct PageCase {
  const char* name;
  int count;
  int offset;
  int limit;
  int begin;
  int end;
};

TEST(Page, IsTheRequestedRange) {
  const PageCase cases[] = {
      {"everything", 5, 0, -1, 0, 5},
      {"everything from an offset on", 5, 3, -1, 3, 5},
      {"a page in the middle", 5, 1, 2, 1, 3},
      {"a last page that is not full", 5, 3, 10, 3, 5},
      {"the last item", 5, 4, 1, 4, 5},
      {"an offset equal to the count", 5, 5, 2, 0, 2},
      {"an offset beyond the count", 5, 6, 2, 0, 2},
      {"the largest offset", 5, kMax, 2, 0, 2},
      {"a negative offset", 5, -1, 2, 0, 2},
      {"the smallest offset", 5, kMin, 2, 0, 2},
      {"an offset outside, everything", 5, 9, -1, 0, 5},
      {"a limit of 0", 5, 2, 0, 2, 2},
      {"a limit of -2", 5, 2, -2, 2, 2},
      {"the smallest limit", 5, 2, kMin, 2, 2},
      {"the largest limit", 5, 2, kMax, 2, 5},
      {"the largest offset and limit", 5, kMax, kMax, 0, 5},
      {"the smallest offset and limit", 5, kMin, kMin, 0, 0},
      {"nothing there", 0, 0, -1, 0, 0},
      {"nothing there, an offset", 0, 3, 7, 0, 0},
      {"the longest listing", kMax, 0, -1, 0, kMax},
      {"the end of the longest listing", kMax, kMax - 1, kMax, kMax - 1, kMax},
      {"an offset equal to the longest listing's count", kMax, kMax, 1, 0, 1},
      {"nothing of the longest listing", kMax, kMax - 1, kMin, kMax - 1, kMax - 1},
  };
  for (const PageCase& c : cases) {
    const Page page = Page::Of(c.count, c.offset, c.limit);
    EXPECT_EQ(page.begin, c.begin) << c.name;
    EXPECT_EQ(page.end, c.end) << c.name;
  }
}

// The same rule in 64-bit numbers, which cannot overflow here: the first item and the number of items.
void ExpectRule(int count, int offset, int limit) {
  const std::int64_t first = 0 <= offset && offset < count ? offset : 0;
  const std::int64_t wanted = limit == -1 ? std::int64_t{count} : limit;
  const std::int64_t there = count - first;
  const std::int64_t items = wanted < 0 ? 0 : wanted < there ? wanted : there;
  const Page page = Page::Of(count, offset, limit);
  EXPECT_EQ(page.begin, first) << count << ' ' << offset << ' ' << limit;
  EXPECT_EQ(page.end, first + items) << count << ' ' << offset << ' ' << limit;
}

TEST(Page, StaysInTheListingForAnyOffsetAndLimit) {
  const int extremes[] = {kMin, kMin + 1, kMin / 2, -3,   -2,       -1,       0,        1,   2,
                          3,    1023,     1024,     1025, kMax / 2, kMax - 2, kMax - 1, kMax};
  for (const int count : {0, 1, 2, 3, 1024, kMax / 2, kMax - 1, kMax}) {
    for (const int offset : extremes) {
      for (const int limit : extremes) ExpectRule(count, offset, limit);
    }
  }
}

}  // namespace
