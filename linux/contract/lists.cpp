#include "lists.h"

#include <algorithm>
#include <cerrno>
#include <limits>

#include "error.h"

namespace vorn {
namespace {

const TextList& Inside(const KLIBSZLIST* list) { return static_cast<const TextList&>(*list); }
TextList& Inside(KLIBSZLIST* list) { return static_cast<TextList&>(*list); }

Status Insert(KLIBSZLIST** list, int index, const char* text) {
  if (list == nullptr || *list == nullptr || text == nullptr) return Status::Failure(EINVAL, "no list, or no text");
  if (index < 0 || index > (*list)->count) return Status::Failure(EINVAL, "no such place in the list");
  if ((*list)->count == std::numeric_limits<std::int32_t>::max()) return Status::System(EOVERFLOW, "list");
  Inside(*list).Insert(index, text);
  return {};
}

}  // namespace

void TextList::Insert(int index, const char* text) {
  if (index == count) {
    items_.emplace_back(text);
    if (has_index_) index_.try_emplace(items_.back(), front_ + count);
  } else if (index == 0) {
    items_.emplace_front(text);
    // The key may be another item's text: it must be this one's, whose place is now the first.
    if (has_index_) index_.erase(items_.front());
    if (has_index_) index_.emplace(items_.front(), --front_);
  } else {
    items_.insert(items_.begin() + index, text);
    has_index_ = false;
  }
  ++count;
}

int TextList::Find(std::string_view text) const {
  if (!has_index_) MakeIndex();
  const auto found = index_.find(text);
  return found == index_.end() ? -1 : static_cast<int>(found->second - front_);
}

void TextList::MakeIndex() const {
  index_.clear();
  index_.reserve(items_.size());
  front_ = 0;
  for (std::size_t i = 0; i < items_.size(); ++i) index_.try_emplace(items_[i], i);
  has_index_ = true;
}

void TextList::Sort() {
  has_index_ = false;
  std::stable_sort(items_.begin(), items_.end());
}

Status Append(KLIBSZLIST** list, const char* text) {
  const bool is_list = list != nullptr && *list != nullptr;
  return Insert(list, is_list ? (*list)->count : 0, text);
}

Status SetValue(KLIBSZHASH* hash, const char* key, const char* value) {
  if (hash == nullptr || key == nullptr || value == nullptr) return Status::Failure(EINVAL, "no hash, key or value");
  const auto found = hash->index.find(key);
  if (found != hash->index.end()) {
    found->second->second = value;
    return {};
  }
  hash->pairs.emplace_back(key, value);
  hash->index.emplace(hash->pairs.back().first, std::prev(hash->pairs.end()));
  return {};
}

namespace {

Status EnumerateKeys(const KLIBSZHASH* hash, KLIBSZLIST** keys) {
  if (hash == nullptr || keys == nullptr || *keys == nullptr) return Status::Failure(EINVAL, "no hash, or no list");
  for (const KLIBSZHASH::Pair& pair : hash->pairs) {
    if (Status status = Append(keys, pair.first.c_str()); !status.ok()) return status;
  }
  return {};
}

// The containers grow by themselves, so a capacity says nothing to them.
bool IsCapacity(int capacity) { return capacity >= 0 || ToResult(Status::Failure(EINVAL, "a negative capacity")) == 0; }

}  // namespace
}  // namespace vorn

using vorn::Inside;
using vorn::IsCapacity;
using vorn::Status;
using vorn::TextList;
using vorn::ToResult;
using vorn::ToSilentResult;

KLIBSZLIST* KLIBCSzListAlloc(int capacity) { return IsCapacity(capacity) ? new TextList : nullptr; }

void KLIBCSzListFree(KLIBSZLIST* list) { delete static_cast<TextList*>(list); }

const char* KLIBCSzListGet(const KLIBSZLIST* list, int index) {
  if (list != nullptr && index >= 0 && index < list->count) return Inside(list).at(index).c_str();
  ToSilentResult(Status::Failure(ENOENT, "no such item"));
  return nullptr;
}

int KLIBCSzListPush(KLIBSZLIST** list, const char* text) { return ToResult(vorn::Append(list, text)); }

int KLIBCSzListInsert(KLIBSZLIST** list, int index, const char* text) {
  return ToResult(vorn::Insert(list, index, text));
}

int KLIBCSzListFind(const KLIBSZLIST* list, const char* text) {
  if (list == nullptr || text == nullptr) return ToResult(Status::Failure(EINVAL, "no list, or no text"));
  const int index = Inside(list).Find(text);
  return index >= 0 ? index : ToSilentResult(Status::Failure(ENOENT, "not in the list"));
}

int KLIBCSzListSortItems(KLIBSZLIST* list, int option) {
  if (list == nullptr || option != KLIBSZLIST_SORT_TEXT) {
    return ToResult(Status::Failure(EINVAL, "no list, or no such way to sort"));
  }
  Inside(list).Sort();
  return 0;
}

KLIBSZHASH* KLIBCSzHashAlloc(int capacity) { return IsCapacity(capacity) ? new KLIBSZHASH : nullptr; }

void KLIBCSzHashFree(KLIBSZHASH* hash) { delete hash; }

int KLIBCSzHashEnumKey(const KLIBSZHASH* hash, KLIBSZLIST** keys) { return ToResult(vorn::EnumerateKeys(hash, keys)); }

const char* KLIBCSzHashGetValue(const KLIBSZHASH* hash, const char* key) {
  if (hash != nullptr && key != nullptr) {
    const auto found = hash->index.find(key);
    if (found != hash->index.end()) return found->second->second.c_str();
  }
  ToSilentResult(Status::Failure(ENOENT, "no such key"));
  return nullptr;
}

int KLIBCSzHashSetValue(KLIBSZHASH** hash, const char* key, const char* value) {
  return ToResult(vorn::SetValue(hash == nullptr ? nullptr : *hash, key, value));
}

int KLIBCSzHashRemoveKey(KLIBSZHASH* hash, const char* key) {
  if (hash == nullptr || key == nullptr) return ToResult(Status::Failure(EINVAL, "no hash, or no key"));
  const auto found = hash->index.find(key);
  if (found == hash->index.end()) return 0;
  const auto pair = found->second;
  hash->index.erase(found);  // before the text that its key is a view of
  hash->pairs.erase(pair);
  return 1;
}
