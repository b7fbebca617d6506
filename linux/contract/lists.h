// The implementation of the contract's string list and string hash.
#ifndef VORN_LINUX_CONTRACT_LISTS_H
#define VORN_LINUX_CONTRACT_LISTS_H

#include <cstdint>
#include <deque>
#include <list>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>

#include "core.h"
#include "status.h"

namespace vorn {

// The object behind a KLIBSZLIST. The first Find builds an index; insertions at either end keep it, so that a list
// can be built and searched in turn.
class TextList : public KLIBSZLIST {
 public:
  TextList() : KLIBSZLIST{0} {}

  const std::string& at(int index) const { return items_[static_cast<std::size_t>(index)]; }
  void Insert(int index, const char* text);
  int Find(std::string_view text) const;  // negative: none
  void Sort();

 private:
  void MakeIndex() const;

  std::deque<std::string> items_;  // never moved by growth at the ends: the index points into them
  // The first place of each text, counted from where the list's front was when the index was made.
  mutable std::unordered_map<std::string_view, std::int64_t> index_;
  mutable std::int64_t front_ = 0;
  mutable bool has_index_ = false;
};

}  // namespace vorn

struct KLIBSZHASH {
  using Pair = std::pair<const std::string, std::string>;

  std::list<Pair> pairs;  // in the order in which the keys came
  std::unordered_map<std::string_view, std::list<Pair>::iterator> index;
};

namespace vorn {

// Appends a copy of `text`, and sets the value of a key, as KLIBCSzListPush and KLIBCSzHashSetValue do; failures are
// returned and not logged.
Status Append(KLIBSZLIST** list, const char* text);
Status SetValue(KLIBSZHASH* hash, const char* key, const char* value);

}  // namespace vorn

#endif  // VORN_LINUX_CONTRACT_LISTS_H
