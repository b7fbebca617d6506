// Slows down attempts to guess passwords, without locking out the owner of an account.
#ifndef VORN_SERVER_THROTTLE_H
#define VORN_SERVER_THROTTLE_H

#include <chrono>
#include <cstddef>
#include <map>
#include <set>
#include <string>
#include <utility>

namespace vorn::server {

// Counts the attempts of each account and of each address that have not succeeded. The first few are not delayed; each
// further one waits twice as long as the one before, up to a limit. Every attempt is made in the end, so nobody can
// lock out an account: its owner waits for `account_limit` at most, and not at all at an address from which the
// account has signed in before. One attempt is forgotten each `forget`. An account that does not exist is counted like
// any other one.
//
// Not thread-safe.
class Throttle {
 public:
  using Clock = std::chrono::steady_clock;

  struct Limits {
    unsigned free_attempts = 3;
    std::chrono::milliseconds first_delay{1000};
    std::chrono::milliseconds account_limit{5000};
    std::chrono::milliseconds address_limit{30000};
    std::chrono::milliseconds forget{60000};
    std::size_t entries = 4096;  // of accounts, of addresses and of pairs; a further one replaces another one
  };

  explicit Throttle(Limits limits) : limits_(limits) {}

  // Counts an attempt and returns how long it must wait. It counts from now on, so that simultaneous attempts are
  // delayed like successive ones.
  std::chrono::milliseconds Begin(const std::string& account, const std::string& address, Clock::time_point now);

  // The attempt had the right password: it no longer counts, and nor do earlier attempts on this account.
  void Succeed(const std::string& account, const std::string& address, Clock::time_point now);

 private:
  struct Count {
    unsigned attempts = 0;
    Clock::time_point since;  // attempts are forgotten from here on
  };
  using Counts = std::map<std::string, Count>;

  void Forget(Count* count, Clock::time_point now) const;
  unsigned Add(Counts* counts, const std::string& name, Clock::time_point now) const;
  std::chrono::milliseconds DelayOf(unsigned attempts, std::chrono::milliseconds limit) const;

  const Limits limits_;
  Counts accounts_;
  Counts addresses_;
  std::set<std::pair<std::string, std::string>> known_;  // accounts, and addresses from which they have signed in
};

}  // namespace vorn::server

#endif  // VORN_SERVER_THROTTLE_H
