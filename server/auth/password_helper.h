// The messages between vornd and its helper program, which asks PAM. They travel over a socket of type SOCK_SEQPACKET,
// one request and one answer for each process.
#ifndef VORN_SERVER_PASSWORD_HELPER_H
#define VORN_SERVER_PASSWORD_HELPER_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "caller.h"

namespace vorn::server {

// Longer strings are refused before they reach the helper. No message is larger than kMaxMessage.
constexpr std::size_t kMaxAccountBytes = 256;
constexpr std::size_t kMaxPasswordBytes = 1024;
constexpr std::size_t kMaxMessage = 2048;

struct PasswordRequest {
  std::string account;
  std::string password;
  std::string address;  // of the client, for PAM's own log (PAM_RHOST)
};

struct PasswordVerdict {
  enum class Kind {
    kGranted,
    kRefused,      // unknown account, wrong password, or an account that may not be used
    kNoRole,       // the password is right, and the account is in none of the groups
    kUnavailable,  // PAM cannot tell
  };
  Kind kind = Kind::kUnavailable;
  Role role = Role::kReader;  // with kGranted
  std::string account{};      // PAM's name of the account, with kGranted
};

// No string of a request has a zero byte.
std::string FormatRequest(const PasswordRequest& request);
std::optional<PasswordRequest> ParseRequest(std::string_view message);

std::string FormatVerdict(const PasswordVerdict& verdict);
// Any other message is the verdict kUnavailable.
PasswordVerdict ParseVerdict(std::string_view message);

}  // namespace vorn::server

#endif  // VORN_SERVER_PASSWORD_HELPER_H
