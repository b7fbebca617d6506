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

}  // namespace

bool GoesFirst(const ConnectionUse& left, const ConnectionUse& right) {
  if (left.activity != right.activity) return left.activity < right.activity;
  return left.since < right.since;
}

std::size_t MostExpendable(const std::vector<ConnectionUse>& uses) { return Choose(uses, nullptr); }

std::size_t SurplusOf(const std::vector<ConnectionUse>& uses, const ConnectionShare& share) {
  if (uses.empty()) return kNoConnection;
  const std::string_view address = uses.back().share_key;
  const auto same = std::count_if(uses.begin(), uses.end(),
                                  [&address](const ConnectionUse& use) { return use.share_key == address; });
  if (!address.empty() && static_cast<std::size_t>(same) > share.per_address) return Choose(uses, &address);
  return uses.size() > share.total ? Choose(uses, nullptr) : kNoConnection;
}

}  // namespace vorn::server
