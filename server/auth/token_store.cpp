#include "token_store.h"

#include <syslog.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <exception>
#include <tuple>
#include <utility>

#include "private_file.h"
#include "secret.h"
#include "token_file.h"

namespace vorn::server {
namespace {

constexpr std::chrono::seconds kWriteUsesAfter{60};

CallerPtr CallerOf(const Token& token) {
  auto caller = std::make_shared<Caller>();
  caller->name = "token " + token.name;
  caller->role = token.role;
  caller->apis = token.apis;
  caller->shares = token.shares;
  return caller;
}

}  // namespace

TokenStore::TokenStore(std::string path) : path_(std::move(path)) {
  if (!Load(&fault_)) syslog(LOG_ERR, "No token is valid. %s", fault_.c_str());
  writer_ = std::thread([this] { WriteUses(); });
}

TokenStore::~TokenStore() {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    ending_ = true;
  }
  wake_.notify_one();
  writer_.join();
}

bool TokenStore::Load(std::string* error) {
  const std::optional<std::string> text = ReadPrivateFile(path_, error);
  if (!text) return false;
  std::string fault;
  const std::optional<StoredTokens> tokens = ParseTokens(*text, &fault);
  if (!tokens) {
    *error = path_ + ": " + fault;
    return false;
  }
  for (const auto& [digest, token] : *tokens) entries_[digest] = {token, CallerOf(token)};
  return true;
}

bool TokenStore::Save(const Entries& entries, std::string* error) const {
  StoredTokens tokens;
  for (const auto& [digest, entry] : entries) tokens.emplace_back(digest, entry.token);
  return ReplacePrivateFile(path_, FormatTokens(tokens), error);
}

TokenStore::Entries TokenStore::Copy() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return entries_;
}

TokenStore::Outcome TokenStore::Create(Token* token, std::string* secret, std::string* error) {
  const std::lock_guard<std::mutex> writing(writing_);
  *error = fault_;
  if (!fault_.empty()) return Outcome::kFailed;
  Entries changed = Copy();
  if (changed.size() >= kMaxTokens) return Outcome::kFull;
  const bool taken = std::any_of(changed.begin(), changed.end(),
                                 [token](const auto& each) { return each.second.token.name == token->name; });
  if (taken) return Outcome::kNameTaken;
  *secret = NewSecret(kTokenPrefix);
  const std::string digest = DigestOf(*secret);
  token->id = NewId();
  token->created = std::time(nullptr);
  changed[digest] = {*token, CallerOf(*token)};
  if (!Save(changed, error)) return Outcome::kFailed;
  const std::lock_guard<std::mutex> lock(mutex_);
  entries_.insert(changed.extract(digest));
  return Outcome::kDone;
}

std::vector<Token> TokenStore::List() const {
  std::vector<Token> tokens;
  const std::lock_guard<std::mutex> lock(mutex_);
  for (const auto& [digest, entry] : entries_) tokens.push_back(entry.token);
  std::sort(tokens.begin(), tokens.end(),
            [](const Token& a, const Token& b) { return std::tie(a.created, a.name) < std::tie(b.created, b.name); });
  return tokens;
}

TokenStore::Outcome TokenStore::Revoke(const std::string& id, std::string* error) {
  const std::lock_guard<std::mutex> writing(writing_);
  *error = fault_;
  if (!fault_.empty()) return Outcome::kFailed;
  Entries changed = Copy();
  const auto found =
      std::find_if(changed.begin(), changed.end(), [&id](const auto& each) { return each.second.token.id == id; });
  if (found == changed.end()) return Outcome::kUnknown;
  const std::string digest = found->first;
  changed.erase(found);
  if (!Save(changed, error)) return Outcome::kFailed;
  const std::lock_guard<std::mutex> lock(mutex_);
  entries_.erase(digest);
  return Outcome::kDone;
}

CallerPtr TokenStore::Use(std::string_view secret, const std::string& address, std::int64_t now) {
  if (!IsSecret(secret, kTokenPrefix)) return nullptr;
  const std::string digest = DigestOf(secret);
  const std::lock_guard<std::mutex> lock(mutex_);
  const auto found = entries_.find(digest);
  if (found == entries_.end()) return nullptr;
  Token& token = found->second.token;
  if (token.expires != 0 && now >= token.expires) return nullptr;
  if (token.last_used != now || token.last_address != address) {
    token.last_used = now;
    token.last_address = address;
    if (!std::exchange(used_, true)) wake_.notify_one();
  }
  return found->second.caller;
}

// Waits after the first use, so that many uses are written once.
void TokenStore::WriteUses() {
  for (;;) {
    {
      std::unique_lock<std::mutex> lock(mutex_);
      wake_.wait(lock, [this] { return used_ || ending_; });
      if (!used_) return;
      wake_.wait_for(lock, kWriteUsesAfter, [this] { return ending_; });
      used_ = false;
    }
    std::string error;
    if (!TrySaveUses(&error)) syslog(LOG_ERR, "The last uses of tokens are not stored. %s", error.c_str());
  }
}

bool TokenStore::TrySaveUses(std::string* error) noexcept {
  try {
    const std::lock_guard<std::mutex> writing(writing_);
    return Save(Copy(), error);
  } catch (const std::exception&) {  // no memory
    return false;
  }
}

}  // namespace vorn::server
