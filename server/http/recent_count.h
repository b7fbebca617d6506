// Counts events, where each second halves the count.
#ifndef VORN_SERVER_RECENT_COUNT_H
#define VORN_SERVER_RECENT_COUNT_H

#include <algorithm>
#include <chrono>
#include <limits>

namespace vorn::server {

class RecentCount {
 public:
  using Clock = std::chrono::steady_clock;

  // Adds an event, and returns the count before it. `now` must not decrease from call to call.
  unsigned Add(Clock::time_point now) {
    using std::chrono::seconds;
    const auto passed = std::chrono::duration_cast<seconds>(now - halved_);
    count_ >>= std::min<seconds::rep>(passed.count(), std::numeric_limits<unsigned>::digits - 1);
    halved_ += passed;
    return count_++;
  }

 private:
  unsigned count_ = 0;
  Clock::time_point halved_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_RECENT_COUNT_H
