#include "recent_count.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

using std::chrono::milliseconds;

TEST(RecentCount, IsHalvedEachSecond) {
  RecentCount count;
  const RecentCount::Clock::time_point begin{std::chrono::hours(1)};
  EXPECT_EQ(count.Add(begin), 0U);
  for (unsigned i = 1; i < 16; ++i) EXPECT_EQ(count.Add(begin + milliseconds(i)), i);
  EXPECT_EQ(count.Add(begin + milliseconds(1100)), 8U);
  EXPECT_EQ(count.Add(begin + milliseconds(1200)), 9U);
  EXPECT_EQ(count.Add(begin + milliseconds(3100)), 2U);
}

TEST(RecentCount, EndsAtZero) {
  RecentCount count;
  const RecentCount::Clock::time_point begin{std::chrono::hours(1)};
  count.Add(begin);
  EXPECT_EQ(count.Add(begin + std::chrono::hours(24 * 365)), 0U);
}

}  // namespace
}  // namespace vorn::server
