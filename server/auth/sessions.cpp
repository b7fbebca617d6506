#include "sessions.h"

#include <openssl/crypto.h>

#include <algorithm>
#include <ctime>
#include <iterator>
#include <tuple>
#include <utility>

#include "secret.h"

namespace vorn::server {

Sessions::Limits Sessions::limits() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return limits_;
}

void Sessions::SetLimits(const Limits& limits) {
  const std::lock_guard<std::mutex> lock(mutex_);
  limits_ = limits;
}

bool Sessions::IsOver(const Entry& entry, Clock::time_point now) const {
  return now - entry.used >= limits_.idle || now - entry.begun >= limits_.lifetime;
}

void Sessions::RemoveOver(Clock::time_point now) {
  for (auto entry = entries_.begin(); entry != entries_.end();) {
    entry = IsOver(entry->second, now) ? entries_.erase(entry) : std::next(entry);
  }
}

// Leaves fewer than `limit` sessions of the account, or of all accounts for nullptr.
void Sessions::RemoveLeastRecent(std::size_t limit, const std::string* account) {
  for (;;) {
    std::size_t count = 0;
    auto oldest = entries_.end();
    for (auto entry = entries_.begin(); entry != entries_.end(); ++entry) {
      if (account != nullptr && entry->second.session.account != *account) continue;
      ++count;
      if (oldest == entries_.end() || entry->second.used < oldest->second.used) oldest = entry;
    }
    if (count < limit) return;
    entries_.erase(oldest);
  }
}

std::string Sessions::Begin(const std::string& account, Role role, const std::string& address, Carrier carrier,
                            Clock::time_point now) {
  std::string secret = NewSecret(kSessionPrefix);
  Session session{NewId(), account, role, address, std::time(nullptr)};
  auto caller = std::make_shared<Caller>();
  caller->name = account.empty() ? "sign-in link" : "account " + account;
  caller->role = role;
  caller->session = session.id;
  const std::lock_guard<std::mutex> lock(mutex_);
  RemoveOver(now);
  RemoveLeastRecent(limits_.per_account, &account);
  RemoveLeastRecent(limits_.total, nullptr);
  entries_[DigestOf(secret)] = {std::move(session), std::move(caller), carrier, now, now};
  return secret;
}

CallerPtr Sessions::Use(std::string_view secret, Carrier carrier, Clock::time_point now) {
  if (!IsSecret(secret, kSessionPrefix)) return nullptr;
  const std::string digest = DigestOf(secret);
  const std::lock_guard<std::mutex> lock(mutex_);
  const auto found = entries_.find(digest);
  if (found == entries_.end() || found->second.carrier != carrier) return nullptr;
  if (IsOver(found->second, now)) {
    entries_.erase(found);
    return nullptr;
  }
  found->second.used = now;
  return found->second.caller;
}

std::vector<Sessions::Session> Sessions::List(Clock::time_point now) {
  const std::lock_guard<std::mutex> lock(mutex_);
  RemoveOver(now);
  std::vector<Session> sessions;
  for (const auto& [digest, entry] : entries_) {
    sessions.push_back(entry.session);
    sessions.back().idle = std::chrono::duration_cast<std::chrono::seconds>(now - entry.used);
  }
  std::sort(sessions.begin(), sessions.end(),
            [](const Session& a, const Session& b) { return std::tie(a.created, a.id) < std::tie(b.created, b.id); });
  return sessions;
}

bool Sessions::End(const std::string& id) {
  const std::lock_guard<std::mutex> lock(mutex_);
  const auto found =
      std::find_if(entries_.begin(), entries_.end(), [&id](const auto& each) { return each.second.session.id == id; });
  if (found == entries_.end()) return false;
  entries_.erase(found);
  return true;
}

std::string Sessions::NewCode(Clock::time_point now) {
  std::string code = NewSecret(kCodePrefix);
  const std::lock_guard<std::mutex> lock(mutex_);
  code_digest_ = DigestOf(code);
  code_end_ = now + limits_.code;
  return code;
}

bool Sessions::TakeCode(std::string_view code, Clock::time_point now) {
  const std::string digest = DigestOf(code);
  const std::lock_guard<std::mutex> lock(mutex_);
  if (code_digest_.size() != digest.size() || now >= code_end_) return false;
  if (CRYPTO_memcmp(code_digest_.data(), digest.data(), digest.size()) != 0) return false;
  code_digest_.clear();
  return true;
}

}  // namespace vorn::server
