// An immutable table of string pairs, shared by those who read it.
#ifndef VORN_LINUX_TEXT_TEXT_PAIRS_H
#define VORN_LINUX_TEXT_TEXT_PAIRS_H

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace vorn {

// Pairs of a key and a value, in the order in which they were given. The keys differ. Thread-safe.
class TextPairs {
 public:
  using Pair = std::pair<std::string, std::string>;

  TextPairs() = default;
  explicit TextPairs(std::vector<Pair> pairs);

  std::size_t size() const { return pairs_.size(); }
  const std::vector<Pair>& pairs() const { return pairs_; }

  // The index in pairs() of the key at `rank` when the keys are sorted by their bytes.
  std::size_t Ranked(std::size_t rank) const { return by_key_[rank]; }

  // The pair with the key, or nullptr. Takes time in proportion to log(size()).
  const Pair* Find(std::string_view key) const;

 private:
  std::vector<Pair> pairs_;
  std::vector<std::uint32_t> by_key_;
};

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_TEXT_PAIRS_H
