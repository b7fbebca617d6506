// The sessions of people who have signed in. They are in memory only and end with the process.
#ifndef VORN_SERVER_SESSIONS_H
#define VORN_SERVER_SESSIONS_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "caller.h"

namespace vorn::server {

// All functions are thread-safe. A secret is checked in the form in which it was given to its client: as a cookie, or
// as a bearer token of a page without TLS.
class Sessions {
 public:
  using Clock = std::chrono::steady_clock;
  enum class Carrier { kCookie, kBearer };

  struct Limits {
    std::chrono::seconds idle{std::chrono::minutes(30)};    // since the last request
    std::chrono::seconds lifetime{std::chrono::hours(12)};  // since the sign-in
    std::chrono::seconds code{std::chrono::minutes(30)};    // in which a one-time code can be used
    std::size_t per_account = 16;  // the one that was used least recently ends when there is one more
    std::size_t total = 256;
  };

  struct Session {
    std::string id;  // for lists and End(); not secret
    std::string account;
    Role role = Role::kReader;
    std::string address;
    std::int64_t created = 0;  // seconds since 1970
    std::chrono::seconds idle{0};
  };

  explicit Sessions(Limits limits) : limits_(limits) {}
  Limits limits() const;
  // Also concerns the sessions that have begun.
  void SetLimits(const Limits& limits);

  // Begins a session and returns its secret.
  std::string Begin(const std::string& account, Role role, const std::string& address, Carrier carrier,
                    Clock::time_point now);

  // Returns the caller of this secret and renews its idle time; nullptr if there is no such session.
  CallerPtr Use(std::string_view secret, Carrier carrier, Clock::time_point now);

  std::vector<Session> List(Clock::time_point now);

  // Returns whether there was such a session.
  bool End(const std::string& id);

  // Makes a code with which somebody can sign in once, as an administrator without an account.
  std::string NewCode(Clock::time_point now);

  // Returns whether the code is valid, which it is no longer then.
  bool TakeCode(std::string_view code, Clock::time_point now);

 private:
  struct Entry {
    Session session;
    CallerPtr caller;
    Carrier carrier;
    Clock::time_point begun;
    Clock::time_point used;
  };
  using Entries = std::map<std::string, Entry, std::less<>>;  // by digest

  bool IsOver(const Entry& entry, Clock::time_point now) const;
  void RemoveOver(Clock::time_point now);
  void RemoveLeastRecent(std::size_t limit, const std::string* account);

  mutable std::mutex mutex_;
  Limits limits_;
  Entries entries_;
  std::string code_digest_;  // empty: there is no code
  Clock::time_point code_end_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_SESSIONS_H
