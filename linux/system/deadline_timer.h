// A time limit for a system call that has none.
#ifndef VORN_LINUX_SYSTEM_DEADLINE_TIMER_H
#define VORN_LINUX_SYSTEM_DEADLINE_TIMER_H

#include <chrono>
#include <ctime>

#include "status.h"

namespace vorn {

// From `limit` after its construction on, interrupts system calls of the constructing thread with EINTR,
// again and again until it is destroyed: a timer_create(2) that signals this thread. It uses the signal
// SIGRTMAX - 2, whose handler does nothing, and leaves the process's other signals alone.
class DeadlineTimer {
 public:
  explicit DeadlineTimer(std::chrono::milliseconds limit);
  ~DeadlineTimer();
  DeadlineTimer(const DeadlineTimer&) = delete;
  DeadlineTimer& operator=(const DeadlineTimer&) = delete;

  // Whether the timer could be started.
  const Status& status() const { return status_; }

  bool has_expired() const;

 private:
  timer_t timer_{};
  bool created_ = false;
  std::chrono::steady_clock::time_point deadline_;
  Status status_;
};

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_DEADLINE_TIMER_H
