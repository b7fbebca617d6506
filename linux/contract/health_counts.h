// The number of findings of each kind, for monitoring.
#ifndef VORN_LINUX_CONTRACT_HEALTH_COUNTS_H
#define VORN_LINUX_CONTRACT_HEALTH_COUNTS_H

#include <chrono>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <utility>

#include "health.h"

namespace vorn {

struct HealthCounts {
  std::map<std::pair<std::string, std::string>, int> findings;  // by kind and name of the severity
  std::map<std::string, int> not_checked;                       // by kind
};

// The counts of the last check, which is made again when it is too old. Thread-safe.
class RecentHealth {
 public:
  using Clock = std::chrono::steady_clock;

  // `check` makes a check. A result younger than `age` is used again.
  RecentHealth(std::function<VORN::HealthReport()> check, Clock::duration age) : check_(std::move(check)), age_(age) {}

  // Makes the check in this thread if it is due. While another thread makes it, the last counts are returned: a check
  // that waits for a file system that does not answer holds up one thread only. nullopt before the first check.
  std::optional<HealthCounts> Get();

 private:
  const std::function<VORN::HealthReport()> check_;
  const Clock::duration age_;
  std::mutex checking_;        // owned by the thread that makes the check
  std::mutex mutex_;           // of the members below
  Clock::time_point checked_;  // meaningful with counts_
  std::optional<HealthCounts> counts_;
};

}  // namespace vorn

#endif  // VORN_LINUX_CONTRACT_HEALTH_COUNTS_H
