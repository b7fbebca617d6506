#include "authenticator.h"

#include <unistd.h>

#include <algorithm>
#include <ctime>

#include "header_value.h"
#include "secret.h"

namespace vorn::server {
namespace {

constexpr std::string_view kCookieName = "__Host-vorn-session";
constexpr std::string_view kBearer = "bearer ";

// The token of an Authorization header (RFC 6750, 2.1); std::nullopt for another scheme.
std::optional<std::string_view> BearerToken(std::string_view authorization) {
  if (!EqualsIgnoringCase(authorization.substr(0, kBearer.size()), kBearer)) return std::nullopt;
  return TrimBlanks(authorization.substr(kBearer.size()));
}

// The value of the session's cookie in a Cookie header (RFC 6265, 4.2.1).
std::optional<std::string_view> CookieIn(std::string_view header) {
  while (!header.empty()) {
    const std::size_t end = std::min(header.find(';'), header.size());
    const std::string_view pair = TrimBlanks(header.substr(0, end));
    header.remove_prefix(std::min(end + 1, header.size()));
    const std::size_t sign = pair.find('=');
    if (sign != std::string_view::npos && pair.substr(0, sign) == kCookieName) return pair.substr(sign + 1);
  }
  return std::nullopt;
}

std::optional<std::string_view> SessionCookieOf(const Head& head) {
  for (const auto& [name, value] : head.headers) {
    if (!EqualsIgnoringCase(name, "Cookie")) continue;
    if (const auto cookie = CookieIn(value)) return cookie;
  }
  return std::nullopt;
}

bool BelongsTo(const Peer::Credentials& peer, std::optional<gid_t> group) {
  if (!group) return false;
  return peer.gid == *group || std::find(peer.groups.begin(), peer.groups.end(), *group) != peer.groups.end();
}

}  // namespace

CallerPtr Authenticator::Identify(const Head& head, bool secure) const {
  if (head.Count("Authorization") > 1) return nullptr;
  if (const auto authorization = head.Header("Authorization")) {
    const auto token = BearerToken(*authorization);
    return token ? CallerOfToken(head, *token) : nullptr;
  }
  if (secure) {
    const auto cookie = SessionCookieOf(head);
    return cookie ? sessions_.Use(*cookie, Sessions::Carrier::kCookie, Sessions::Clock::now()) : nullptr;
  }
  return head.peer.credentials ? CallerAtSocket(*head.peer.credentials) : nullptr;
}

CallerPtr Authenticator::CallerOfToken(const Head& head, std::string_view secret) const {
  if (IsSecret(secret, kSessionPrefix)) {
    return sessions_.Use(secret, Sessions::Carrier::kBearer, Sessions::Clock::now());
  }
  return tokens_.Use(secret, head.peer.address, std::time(nullptr));
}

void Authenticator::SetGroups(LocalGroups groups) {
  const std::lock_guard<std::mutex> lock(mutex_);
  groups_ = groups;
}

LocalGroups Authenticator::groups() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return groups_;
}

CallerPtr Authenticator::CallerAtSocket(const Peer::Credentials& peer) const {
  const LocalGroups groups = this->groups();
  const bool own = peer.uid == 0 || peer.uid == geteuid();
  const bool administrator = own || BelongsTo(peer, groups.administrators);
  if (!administrator && !BelongsTo(peer, groups.readers)) return nullptr;
  auto caller = std::make_shared<Caller>();
  caller->name = "uid " + std::to_string(peer.uid);
  caller->role = administrator ? Role::kAdministrator : Role::kReader;
  return caller;
}

std::string SessionCookie(std::string_view secret) {
  std::string cookie(kCookieName);
  cookie.append("=").append(secret).append("; Path=/; Secure; HttpOnly; SameSite=Strict");
  if (secret.empty()) cookie += "; Max-Age=0";
  return cookie;
}

}  // namespace vorn::server
