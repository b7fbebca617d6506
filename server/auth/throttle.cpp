#include "throttle.h"

#include <algorithm>

namespace vorn::server {
namespace {

// The attempts that are counted beyond the free ones; further ones neither wait longer nor are remembered longer.
constexpr unsigned kDoublings = 8;

}  // namespace

std::chrono::milliseconds Throttle::Begin(const std::string& account, const std::string& address,
                                          Clock::time_point now) {
  const auto of_address = DelayOf(Add(&addresses_, address, now), limits_.address_limit);
  const auto of_account = DelayOf(Add(&accounts_, account, now), limits_.account_limit);
  if (known_.count({account, address}) != 0) return of_address;
  return std::max(of_address, of_account);
}

// The other attempts of the address still count: an account of its own must not let an attacker guess those of others.
void Throttle::Succeed(const std::string& account, const std::string& address, Clock::time_point now) {
  accounts_.erase(account);
  if (const auto found = addresses_.find(address); found != addresses_.end()) {
    Forget(&found->second, now);
    if (found->second.attempts > 0) --found->second.attempts;
  }
  if (known_.size() >= limits_.entries) known_.erase(known_.begin());
  known_.emplace(account, address);
}

void Throttle::Forget(Count* count, Clock::time_point now) const {
  const auto forgotten = (now - count->since) / limits_.forget;
  if (forgotten <= 0) return;
  count->attempts = forgotten >= count->attempts ? 0 : count->attempts - static_cast<unsigned>(forgotten);
  count->since += forgotten * limits_.forget;
}

unsigned Throttle::Add(Counts* counts, const std::string& name, Clock::time_point now) const {
  if (counts->size() >= limits_.entries && counts->count(name) == 0) {
    counts->erase(std::min_element(counts->begin(), counts->end(),
                                   [](const auto& a, const auto& b) { return a.second.since < b.second.since; }));
  }
  Count& count = counts->try_emplace(name, Count{0, now}).first->second;
  Forget(&count, now);
  if (count.attempts == 0) count.since = now;
  if (count.attempts < limits_.free_attempts + kDoublings) ++count.attempts;
  return count.attempts;
}

std::chrono::milliseconds Throttle::DelayOf(unsigned attempts, std::chrono::milliseconds limit) const {
  if (attempts <= limits_.free_attempts) return std::chrono::milliseconds(0);
  return std::min(limits_.first_delay * (1 << (attempts - limits_.free_attempts - 1)), limit);
}

}  // namespace vorn::server
