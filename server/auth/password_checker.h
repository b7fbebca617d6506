// Checks passwords in helper processes, at a pace that makes guessing slow.
#ifndef VORN_SERVER_PASSWORD_CHECKER_H
#define VORN_SERVER_PASSWORD_CHECKER_H

#include <chrono>
#include <cstddef>
#include <functional>
#include <list>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "helper_process.h"
#include "throttle.h"
#include "unique_fd.h"

namespace vorn::server {

// One thread watches all attempts: it never waits for PAM itself, so neither a hanging nor a crashing PAM module
// touches the server. All functions are thread-safe.
//
// Every wrong password is answered after a whole multiple of `step` since its request, however fast PAM was: the time
// tells nothing about the account.
class PasswordChecker {
 public:
  using Clock = std::chrono::steady_clock;

  struct Limits {
    std::chrono::milliseconds deadline{10000};  // of a helper process, which is then killed
    std::chrono::milliseconds step{1000};
    std::size_t helpers = 4;    // processes at the same time
    std::size_t attempts = 64;  // that wait for a process, for PAM or for the time of their answer
    std::size_t same = 4;       // attempts on the same account from the same address
    Throttle::Limits throttle{};
  };

  struct Result {
    PasswordVerdict verdict;
    bool too_many = false;  // the password was not checked
  };
  // Called exactly once for each attempt, on any thread. Must not throw.
  using Done = std::function<void(const Result&)>;

  // `command` is the helper program with its arguments.
  PasswordChecker(std::vector<std::string> command, Limits limits);

  ~PasswordChecker();  // closes it
  PasswordChecker(const PasswordChecker&) = delete;
  PasswordChecker& operator=(const PasswordChecker&) = delete;

  // Concerns the attempts whose process has not been started.
  void SetCommand(std::vector<std::string> command);

  // Ends the helper processes. Attempts that are not done, and all further ones, are answered with kUnavailable. Does
  // not wait.
  void Close();

  // Begins an attempt. `address_key` groups the clients that are slowed down together (Peer::ShareKey()).
  void Check(PasswordRequest request, const std::string& address_key, Done done);

 private:
  struct Attempt {
    PasswordRequest request;
    std::string account_key;
    std::string address_key;
    Done done;
    Clock::time_point begun;
    Clock::time_point due;  // the next time at which something is to be done
    bool admitted = false;  // false: it is new
    std::optional<HelperProcess> process{};
    std::optional<Result> result{};
  };
  using Attempts = std::list<Attempt>;

  std::vector<std::string> command();
  void Work();
  void Watch();
  static void AnswerAll(Attempts* attempts);
  void AdmitNew();
  static void Refuse(Attempt* attempt);
  bool MakeRoomFor(const Attempt& attempt);
  void Advance(Attempt* attempt, Clock::time_point now);
  void Begin(Attempt* attempt, Clock::time_point now);
  void Finish(Attempt* attempt, const Result& result, Clock::time_point now);
  void AnswerDue(Clock::time_point now);
  std::size_t Running() const;
  void Wait();

  const Limits limits_;
  UniqueFd wake_;  // eventfd(2)
  std::mutex mutex_;
  std::vector<std::string> command_;  // with mutex_
  Attempts arrived_;                  // with mutex_
  bool ending_ = false;
  Throttle throttle_;  // this and attempts_ are used by the thread alone
  Attempts attempts_;
  std::thread thread_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_PASSWORD_CHECKER_H
