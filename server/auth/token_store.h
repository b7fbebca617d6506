// The tokens of programs, in a file of which only their digests are part.
#ifndef VORN_SERVER_TOKEN_STORE_H
#define VORN_SERVER_TOKEN_STORE_H

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "caller.h"

namespace vorn::server {

// Times are seconds since 1970 (time(2)).
struct Token {
  std::string id;  // for lists and Revoke(); not secret
  std::string name;
  Role role = Role::kReader;
  std::vector<std::string> apis;    // as in Caller
  std::vector<std::string> shares;  // as in Caller
  std::int64_t created = 0;
  std::int64_t expires = 0;    // 0: never
  std::int64_t last_used = 0;  // 0: never
  std::string last_address;
};

// All functions are thread-safe.
class TokenStore {
 public:
  static constexpr std::size_t kMaxTokens = 1000;

  // Reads the file. If it cannot be read, this is logged, no token is valid, and Create() and Revoke() fail, so that
  // its content is not lost.
  explicit TokenStore(std::string path);

  // Writes the last uses.
  ~TokenStore();
  TokenStore(const TokenStore&) = delete;
  TokenStore& operator=(const TokenStore&) = delete;

  enum class Outcome { kDone, kUnknown, kNameTaken, kFull, kFailed };

  // Stores a token with a new id, also in `token`, and sets `secret`, which is not stored and cannot be returned again.
  // Names are unique. With kFailed, `error` has the reason.
  Outcome Create(Token* token, std::string* secret, std::string* error);

  // In the order of their creation.
  std::vector<Token> List() const;

  // The token is refused from now on. With kFailed it is as before, and `error` has the reason.
  Outcome Revoke(const std::string& id, std::string* error);

  // Returns the caller of this secret and notes the use; nullptr for an unknown, revoked or expired token. Does not
  // wait for the file: uses are written within a minute.
  CallerPtr Use(std::string_view secret, const std::string& address, std::int64_t now);

 private:
  struct Entry {
    Token token;
    CallerPtr caller;
  };
  using Entries = std::map<std::string, Entry, std::less<>>;  // by digest

  bool Load(std::string* error);
  Entries Copy() const;
  bool Save(const Entries& entries, std::string* error) const;
  void WriteUses();
  bool TrySaveUses(std::string* error) noexcept;

  const std::string path_;
  std::string fault_;         // why the file could not be read; empty if it was read
  std::mutex writing_;        // one thread at a time changes the file; taken before mutex_
  mutable std::mutex mutex_;  // of the members below
  std::condition_variable wake_;
  Entries entries_;
  bool used_ = false;  // uses have not been written
  bool ending_ = false;
  std::thread writer_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_TOKEN_STORE_H
