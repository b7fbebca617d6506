#include "text_pairs.h"

#include <algorithm>
#include <numeric>

namespace vorn {

TextPairs::TextPairs(std::vector<Pair> pairs) : pairs_(std::move(pairs)), by_key_(pairs_.size()) {
  std::iota(by_key_.begin(), by_key_.end(), 0U);
  std::sort(by_key_.begin(), by_key_.end(),
            [this](std::uint32_t a, std::uint32_t b) { return pairs_[a].first < pairs_[b].first; });
}

const TextPairs::Pair* TextPairs::Find(std::string_view key) const {
  const auto found = std::lower_bound(by_key_.begin(), by_key_.end(), key,
                                      [this](std::uint32_t at, std::string_view k) { return pairs_[at].first < k; });
  return found != by_key_.end() && pairs_[*found].first == key ? &pairs_[*found] : nullptr;
}

}  // namespace vorn
