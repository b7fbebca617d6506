#include "termination.h"

#include <semaphore.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>

namespace vorn::server {
namespace {

sem_t arrived;  // sem_post(3) is async-signal-safe
std::atomic<bool> terminated{false};
std::atomic<bool> reload_wanted{false};
static_assert(std::atomic<bool>::is_always_lock_free, "only lock-free atomics may be used in a signal handler");

void OnTermination(int number) {
  const int saved = errno;
  if (terminated.exchange(true)) _exit(128 + number);
  sem_post(&arrived);
  errno = saved;
}

void OnHangup(int /*number*/) {
  const int saved = errno;
  reload_wanted = true;
  sem_post(&arrived);
  errno = saved;
}

bool Handle(int number, void (*handler)(int)) {
  struct sigaction action {};
  action.sa_handler = handler;
  action.sa_flags = SA_RESTART;
  return sigaction(number, &action, nullptr) == 0;
}

}  // namespace

bool CatchSignals(std::string* error) {
  if (sem_init(&arrived, 0, 0) == 0 && Handle(SIGTERM, OnTermination) && Handle(SIGINT, OnTermination) &&
      Handle(SIGHUP, OnHangup) && Handle(SIGPIPE, SIG_IGN)) {
    return true;
  }
  *error = std::string("signals: ") + std::strerror(errno);
  return false;
}

Awaited AwaitSignal(std::chrono::seconds limit) {
  timespec end{};
  clock_gettime(CLOCK_MONOTONIC, &end);
  end.tv_sec += limit.count();
  for (;;) {
    const bool timed_out = sem_clockwait(&arrived, CLOCK_MONOTONIC, &end) != 0 && errno == ETIMEDOUT;
    if (terminated) return Awaited::kTermination;
    if (reload_wanted.exchange(false)) return Awaited::kReload;
    if (timed_out) return Awaited::kTime;
  }
}

}  // namespace vorn::server
