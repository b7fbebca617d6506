#include "shares.h"

#include <algorithm>

namespace vorn::server {
namespace {

// Returns the most expendable connection of this address, or of all for nullptr.
std::size_t Choose(const std::vector<ConnectionUse>& uses, const std::string_view* address) {
  std::size_t chosen = kNoConnection;
  for (std::size_t i = 0; i < uses.size(); ++i) {
    if (uses[i].activity == Activity::kWorking || (address != nullptr && uses[i].share_key != *address)) continue;
    if (chosen == kNoConnection || GoesFirst(uses[i], uses[chosen])) chosen = i;
  }
  return chosen;
}

// Whether the address of the newest connection has more than its share.
bool AddressExceedsShare(const std::vector<ConnectionUse>& uses, const ConnectionShare& share) {
  const std::string_view address = uses.back().share_key;
  const auto same = std::count_if(uses.begin(), uses.end(),
                                  [&address](const ConnectionUse& use) { return use.share_key == address; });
  return !address.empty() && static_cast<std::size_t>(same) > share.per_address;
}

}  // namespace

bool GoesFirst(const ConnectionUse& left, const ConnectionUse& right) {
  if (left.activity != right.activity) return left.activity < right.activity;
  return left.since < right.since;
}

std::size_t MostExpendable(const std::vector<ConnectionUse>& uses) { return Choose(uses, nullptr); }

std::size_t SurplusOf(const std::vector<ConnectionUse>& uses, const ConnectionShare& share) {
  if (uses.empty()) return kNoConnection;
  if (AddressExceedsShare(uses, share)) return Choose(uses, &uses.back().share_key);
  return uses.size() > share.total ? Choose(uses, nullptr) : kNoConnection;
}

bool CallsCrowdOut(const std::vector<ConnectionUse>& uses, const ConnectionShare& share) {
  if (uses.size() <= share.total || AddressExceedsShare(uses, share)) return false;
  const auto working = std::count_if(uses.begin(), uses.end(),
                                     [](const ConnectionUse& use) { return use.activity == Activity::kWorking; });
  return static_cast<std::size_t>(working) > share.total / 2;
}

}  // namespace vorn::server
