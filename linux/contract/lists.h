// The implementation of the contract's string list and string hash.
#ifndef VORN_LINUX_CONTRACT_LISTS_H
#define VORN_LINUX_CONTRACT_LISTS_H

#include <cstdint>
#include <deque>
#include <list>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>

#include "core.h"
#include "status.h"
#include "text_pairs.h"

namespace vorn {

// The object behind a KLIBSZLIST. The first Find builds an index; insertions at either end keep it, so that a list
// can be built and searched in turn.
//
// A list of the keys of a shared table refers to the table until the first insertion copies them. Such a list costs
// nothing to make and to sort.
class TextList : public KLIBSZLIST {
 public:
  TextList() : KLIBSZLIST{0} {}

  const std::string& at(int index) const;
  void Insert(int index, const char* text);
  int Find(std::string_view text) const;  // negative: the list has no such item
  void Sort();

  // Makes an empty list the list of the table's keys.
  void ReferTo(std::shared_ptr<const TextPairs> table);

 private:
  void Own();
  void MakeIndex() const;

  std::shared_ptr<const TextPairs> table_;  // nullptr once the list has items of its own
  bool is_sorted_ = false;                  // the order in which the table's keys are listed
  std::deque<std::string> items_;           // insertions at the ends do not move items: the index refers to them
  // The first index of each text, relative to the front of the list when the index was made.
  mutable std::unordered_map<std::string_view, std::int64_t> index_;
  mutable std::int64_t front_ = 0;
  mutable bool has_index_ = false;
};

}  // namespace vorn

// The object behind a KLIBSZHASH: a copy of a shared table is made only when it is changed.
struct KLIBSZHASH {
  using Pair = std::pair<const std::string, std::string>;

  // nullptr if the hash has pairs of its own.
  std::shared_ptr<const vorn::TextPairs> table;

  std::list<Pair> pairs;  // in the order in which the keys were added
  std::unordered_map<std::string_view, std::list<Pair>::iterator> index;
};

namespace vorn {

// Appends a copy of `text`, and sets the value of a key, as KLIBCSzListPush and KLIBCSzHashSetValue do; failures are
// returned and not logged.
Status Append(KLIBSZLIST** list, const char* text);
Status SetValue(KLIBSZHASH* hash, const char* key, const char* value);

// Adds the pairs of a table to a hash. An empty hash refers to the table from then on.
Status AddAll(const std::shared_ptr<const TextPairs>& table, KLIBSZHASH* hash);

// The pairs of a hash.
std::shared_ptr<const TextPairs> TableOf(const KLIBSZHASH& hash);

}  // namespace vorn

#endif  // VORN_LINUX_CONTRACT_LISTS_H
