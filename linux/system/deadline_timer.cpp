#include "deadline_timer.h"

#include <pthread.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>

namespace vorn {
namespace {

// A signal that arrives just before the system call begins interrupts nothing, so it is repeated.
constexpr std::chrono::milliseconds kRepeat{20};

int SignalNumber() { return SIGRTMAX - 2; }

void DoNothing(int /*signal*/) {}

// Without SA_RESTART, so that the system call ends. Every timer installs the same handler.
Status InstallHandler() {
  struct sigaction action {};
  action.sa_handler = DoNothing;
  if (sigaction(SignalNumber(), &action, nullptr) != 0) return Status::System(errno, "sigaction");
  sigset_t unblocked;
  sigemptyset(&unblocked);
  sigaddset(&unblocked, SignalNumber());
  const int failure = pthread_sigmask(SIG_UNBLOCK, &unblocked, nullptr);
  return failure == 0 ? Status() : Status::System(failure, "pthread_sigmask");
}

timespec ToTimespec(std::chrono::milliseconds time) {
  return {static_cast<time_t>(time.count() / 1000), static_cast<long>(time.count() % 1000) * 1'000'000};
}

}  // namespace

DeadlineTimer::DeadlineTimer(std::chrono::milliseconds limit) : deadline_(std::chrono::steady_clock::now() + limit) {
  status_ = InstallHandler();
  if (!status_.ok()) return;
  sigevent event{};
  event.sigev_notify = SIGEV_THREAD_ID;
  event.sigev_signo = SignalNumber();
  event._sigev_un._tid = static_cast<pid_t>(syscall(SYS_gettid));  // glibc has no name for this member
  created_ = timer_create(CLOCK_MONOTONIC, &event, &timer_) == 0;
  // A limit of zero would disarm the timer.
  const itimerspec times{ToTimespec(kRepeat), ToTimespec(std::max(limit, std::chrono::milliseconds(1)))};
  if (!created_ || timer_settime(timer_, 0, &times, nullptr) != 0) status_ = Status::System(errno, "timer_create");
}

DeadlineTimer::~DeadlineTimer() {
  if (created_) timer_delete(timer_);
}

bool DeadlineTimer::has_expired() const { return std::chrono::steady_clock::now() >= deadline_; }

}  // namespace vorn
