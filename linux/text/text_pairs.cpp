#include "text_pairs.h"

#include <endian.h>

#include <algorithm>
#include <cstring>

namespace vorn {
namespace {

// The first bytes in which keys differ, as a number. Mostly they decide, and a sort need not follow pointers.
struct SortKey {
  std::uint64_t word;
  std::uint32_t index;
};

// The number of bytes with which all keys begin.
std::size_t CommonPrefix(const std::vector<TextPairs::Pair>& pairs) {
  if (pairs.empty()) return 0;
  std::string_view common = pairs.front().first;
  for (const TextPairs::Pair& pair : pairs) {
    const auto [end, other] = std::mismatch(common.begin(), common.end(), pair.first.begin(), pair.first.end());
    common = common.substr(0, static_cast<std::size_t>(end - common.begin()));
  }
  return common.size();
}

// The eight bytes at `begin`, the first one as the most significant one; bytes behind the end count as 0.
std::uint64_t WordAt(std::string_view key, std::size_t begin) {
  std::uint64_t word = 0;
  if (begin + sizeof word <= key.size()) {
    std::memcpy(&word, key.data() + begin, sizeof word);
    return be64toh(word);
  }
  for (std::size_t at = begin; at < begin + sizeof word; ++at) {
    word = word << 8U | (at < key.size() ? static_cast<unsigned char>(key[at]) : 0U);
  }
  return word;
}

}  // namespace

TextPairs::TextPairs(std::vector<Pair> pairs) : pairs_(std::move(pairs)) {
  std::vector<SortKey> keys;
  keys.reserve(pairs_.size());
  const std::size_t common = CommonPrefix(pairs_);
  for (const Pair& pair : pairs_) {
    keys.push_back({WordAt(pair.first, common), static_cast<std::uint32_t>(keys.size())});
  }
  std::stable_sort(keys.begin(), keys.end(), [this](const SortKey& a, const SortKey& b) {
    return a.word != b.word ? a.word < b.word : pairs_[a.index].first < pairs_[b.index].first;
  });
  by_key_.reserve(keys.size());
  for (const SortKey& key : keys) by_key_.push_back(key.index);
}

const TextPairs::Pair* TextPairs::Find(std::string_view key) const {
  const auto found = std::lower_bound(by_key_.begin(), by_key_.end(), key,
                                      [this](std::uint32_t at, std::string_view k) { return pairs_[at].first < k; });
  return found != by_key_.end() && pairs_[*found].first == key ? &pairs_[*found] : nullptr;
}

}  // namespace vorn
