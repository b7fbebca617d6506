#include "health_counts.h"

#include <gmock/gmock.h>

#include <atomic>
#include <future>
#include <map>
#include <new>

namespace vorn {
namespace {

using Severity = VORN::HealthFinding::Severity;

VORN::HealthReport Report() {
  VORN::HealthReport report;
  report.findings = {{"a", Severity::kError, {}, "", "", {}},
                     {"a", Severity::kNotice, {}, "", "", {}},
                     {"b", Severity::kWarning, {}, "", "", {}},
                     {"b", Severity::kWarning, {}, "", "", {}}};
  report.not_checked = {{"c", ""}};
  return report;
}

TEST(RecentHealth, CountsByKindAndSeverity) {
  RecentHealth health(Report, std::chrono::hours(1));
  const auto counts = health.Get();
  ASSERT_TRUE(counts);
  EXPECT_EQ(counts->findings,
            (decltype(counts->findings){{{"a", "error"}, 1}, {{"a", "notice"}, 1}, {{"b", "warning"}, 2}}));
  EXPECT_EQ(counts->not_checked, (std::map<std::string, int>{{"c", 1}}));
}

TEST(RecentHealth, ChecksAgainOnlyWhenTheResultIsOld) {
  int checks = 0;
  const auto check = [&] {
    ++checks;
    return Report();
  };
  RecentHealth young(check, std::chrono::hours(1));
  young.Get();
  young.Get();
  EXPECT_EQ(checks, 1);
  RecentHealth old(check, std::chrono::seconds(0));
  old.Get();
  old.Get();
  EXPECT_EQ(checks, 3);
}

// A check that waits holds up its own thread only.
TEST(RecentHealth, ReturnsTheLastCountsWhileACheckRuns) {
  std::promise<void> begun;
  std::promise<void> may_end;
  std::atomic<bool> is_second = false;
  const auto check = [&] {
    if (is_second.exchange(true)) return Report();
    begun.set_value();
    may_end.get_future().wait();
    return Report();
  };
  RecentHealth health(check, std::chrono::hours(1));
  auto first = std::async(std::launch::async, [&] { return health.Get(); });
  begun.get_future().wait();
  EXPECT_FALSE(health.Get());
  may_end.set_value();
  EXPECT_TRUE(first.get());
  EXPECT_TRUE(health.Get());
}

TEST(RecentHealth, ChecksAgainAfterACheckThatThrew) {
  bool throws = true;
  RecentHealth health(
      [&] {
        if (throws) throw std::bad_alloc();
        return Report();
      },
      std::chrono::hours(1));
  EXPECT_THROW(health.Get(), std::bad_alloc);
  throws = false;
  EXPECT_TRUE(health.Get());
}

}  // namespace
}  // namespace vorn
