#include "password_checker.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <exception>
#include <system_error>
#include <utility>

#include "header_value.h"
#include "secret.h"

namespace vorn::server {
namespace {

using Kind = PasswordVerdict::Kind;

}  // namespace

PasswordChecker::PasswordChecker(std::vector<std::string> command, Limits limits)
    : limits_(limits),
      wake_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      command_(std::move(command)),
      throttle_(limits.throttle) {
  if (!wake_) throw std::system_error(errno, std::generic_category(), "eventfd");
  thread_ = std::thread([this] { Work(); });
}

PasswordChecker::~PasswordChecker() {
  Close();
  thread_.join();
}

void PasswordChecker::SetCommand(std::vector<std::string> command) {
  const std::lock_guard<std::mutex> lock(mutex_);
  command_ = std::move(command);
}

std::vector<std::string> PasswordChecker::command() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return command_;
}

void PasswordChecker::Close() {
  const std::lock_guard<std::mutex> lock(mutex_);
  ending_ = true;
  eventfd_write(wake_.get(), 1);
}

// PAM may treat names of different case as the same account.
void PasswordChecker::Check(PasswordRequest request, const std::string& address_key, Done done) {
  std::string account_key = LowerAscii(request.account);
  Attempts one;
  const auto now = Clock::now();
  one.push_back({std::move(request), std::move(account_key), address_key, std::move(done), now, now});
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (!ending_) arrived_.splice(arrived_.end(), one);
    eventfd_write(wake_.get(), 1);
  }
  AnswerAll(&one);
}

void PasswordChecker::Work() {
  for (;;) {
    try {
      Watch();
      return AnswerAll(&attempts_);
    } catch (const std::exception& exception) {
      syslog(LOG_ERR, "Password checks go on after an exception: %s", exception.what());
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
  }
}

void PasswordChecker::AnswerAll(Attempts* attempts) {
  for (Attempt& attempt : *attempts) {
    Wipe(&attempt.request.password);
    attempt.done({});
  }
  attempts->clear();
}

// Returns after Close(). An exception loses no attempt: each is in a list at any time.
void PasswordChecker::Watch() {
  for (;;) {
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      attempts_.splice(attempts_.end(), arrived_);
      if (ending_) return;
    }
    AdmitNew();
    const auto now = Clock::now();
    for (Attempt& attempt : attempts_) Advance(&attempt, now);
    AnswerDue(now);
    Wait();
  }
}

void PasswordChecker::AdmitNew() {
  for (Attempt& attempt : attempts_) {
    if (attempt.admitted) continue;
    if (MakeRoomFor(attempt)) {
      attempt.due = attempt.begun + throttle_.Begin(attempt.account_key, attempt.address_key, attempt.begun);
    } else {
      Refuse(&attempt);
    }
    attempt.admitted = true;
  }
}

void PasswordChecker::Refuse(Attempt* attempt) {
  Wipe(&attempt->request.password);
  attempt->result = Result{{}, true};
  attempt->due = attempt->begun;
}

// If there are too many attempts, the one that has to wait longest is refused: it has the most failures before it.
bool PasswordChecker::MakeRoomFor(const Attempt& attempt) {
  std::size_t same = 0;
  std::size_t all = 0;
  Attempt* last = nullptr;
  for (Attempt& other : attempts_) {
    if (!other.admitted || (other.result && other.result->too_many)) continue;
    ++all;
    if (other.account_key == attempt.account_key && other.address_key == attempt.address_key) ++same;
    const bool waits = !other.process && !other.result;
    if (waits && (last == nullptr || other.due > last->due)) last = &other;
  }
  if (same >= limits_.same) return false;
  if (all < limits_.attempts) return true;
  if (last == nullptr) return false;
  Refuse(last);
  return true;
}

std::size_t PasswordChecker::Running() const {
  return static_cast<std::size_t>(
      std::count_if(attempts_.begin(), attempts_.end(), [](const Attempt& each) { return each.process.has_value(); }));
}

void PasswordChecker::Advance(Attempt* attempt, Clock::time_point now) {
  if (attempt->process) {
    if (const std::optional<PasswordVerdict> verdict = attempt->process->Verdict()) {
      Finish(attempt, {*verdict, false}, now);
    } else if (now >= attempt->due) {
      syslog(LOG_ERR, "PAM has not checked a password for %lld ms; its process is killed",
             static_cast<long long>(limits_.deadline.count()));
      Finish(attempt, {}, now);
    }
  } else if (!attempt->result && now >= attempt->due && Running() < limits_.helpers) {
    Begin(attempt, now);
  }
}

void PasswordChecker::Begin(Attempt* attempt, Clock::time_point now) {
  std::string error;
  std::optional<HelperProcess> process = HelperProcess::Start(command(), attempt->request, &error);
  Wipe(&attempt->request.password);
  if (process) {
    attempt->process.emplace(*std::move(process));
    attempt->due = now + limits_.deadline;
  } else {
    syslog(LOG_ERR, "A password cannot be checked. %s", error.c_str());
    Finish(attempt, {}, now);
  }
}

void PasswordChecker::Finish(Attempt* attempt, const Result& result, Clock::time_point now) {
  attempt->process.reset();
  attempt->result = result;
  attempt->due = now;
  if (result.verdict.kind == Kind::kGranted || result.verdict.kind == Kind::kNoRole) {
    throttle_.Succeed(attempt->account_key, attempt->address_key, now);
  } else {
    const auto taken = std::chrono::duration_cast<std::chrono::milliseconds>(now - attempt->begun);
    attempt->due = attempt->begun + (taken / limits_.step + 1) * limits_.step;
  }
}

void PasswordChecker::AnswerDue(Clock::time_point now) {
  for (auto attempt = attempts_.begin(); attempt != attempts_.end();) {
    if (attempt->result && now >= attempt->due) {
      attempt->done(*attempt->result);
      attempt = attempts_.erase(attempt);
    } else {
      ++attempt;
    }
  }
}

// Waits for a verdict, a new attempt, or the next time at which something is due.
void PasswordChecker::Wait() {
  std::vector<pollfd> events{{wake_.get(), POLLIN, 0}};
  auto next = Clock::time_point::max();
  const bool may_begin = Running() < limits_.helpers;
  for (const Attempt& attempt : attempts_) {
    if (attempt.process) events.push_back({attempt.process->descriptor(), POLLIN, 0});
    if (attempt.process || attempt.result || may_begin) next = std::min(next, attempt.due);
  }
  int timeout = -1;
  if (next != Clock::time_point::max()) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(next - Clock::now()).count();
    timeout = static_cast<int>(std::clamp<std::int64_t>(left, 0, 60000));
  }
  poll(events.data(), events.size(), timeout);
  eventfd_t count = 0;
  eventfd_read(wake_.get(), &count);
}

}  // namespace vorn::server
