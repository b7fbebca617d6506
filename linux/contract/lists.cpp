#include "lists.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <vector>

#include "error.h"

namespace vorn {
namespace {

const TextList& Inside(const KLIBSZLIST* list) { return static_cast<const TextList&>(*list); }
TextList& Inside(KLIBSZLIST* list) { return static_cast<TextList&>(*list); }

Status Insert(KLIBSZLIST** list, int index, const char* text) {
  if (list == nullptr || *list == nullptr || text == nullptr) return Status::Failure(EINVAL, "no list, or no text");
  if (index < 0 || index > (*list)->count) return Status::Failure(EINVAL, "the index is outside of the list");
  if ((*list)->count == std::numeric_limits<std::int32_t>::max()) return Status::System(EOVERFLOW, "list");
  Inside(*list).Insert(index, text);
  return {};
}

}  // namespace

const std::string& TextList::at(int index) const {
  const auto at = static_cast<std::size_t>(index);
  if (table_ == nullptr) return items_[at];
  return table_->pairs()[is_sorted_ ? table_->Ranked(at) : at].first;
}

void TextList::ReferTo(std::shared_ptr<const TextPairs> table) {
  count = static_cast<std::int32_t>(table->size());
  table_ = std::move(table);
}

// Copies the keys of the table.
void TextList::Own() {
  if (table_ == nullptr) return;
  for (int i = 0; i < count; ++i) items_.push_back(at(i));
  table_ = nullptr;
}

void TextList::Insert(int index, const char* text) {
  Own();
  if (index == count) {
    items_.emplace_back(text);
    if (has_index_) index_.try_emplace(items_.back(), front_ + count);
  } else if (index == 0) {
    items_.emplace_front(text);
    // The index may refer to another item with this text; the first one counts.
    if (has_index_) index_.erase(items_.front());
    if (has_index_) index_.emplace(items_.front(), --front_);
  } else {
    items_.insert(items_.begin() + index, text);
    has_index_ = false;
  }
  ++count;
}

int TextList::Find(std::string_view text) const {
  if (table_ != nullptr && table_->Find(text) == nullptr) return -1;
  if (!has_index_) MakeIndex();
  const auto found = index_.find(text);
  return found == index_.end() ? -1 : static_cast<int>(found->second - front_);
}

void TextList::MakeIndex() const {
  index_.clear();
  index_.reserve(static_cast<std::size_t>(count));
  front_ = 0;
  for (int i = 0; i < count; ++i) index_.try_emplace(at(i), i);
  has_index_ = true;
}

void TextList::Sort() {
  has_index_ = false;
  is_sorted_ = true;
  std::stable_sort(items_.begin(), items_.end());
}

Status Append(KLIBSZLIST** list, const char* text) {
  const bool is_list = list != nullptr && *list != nullptr;
  return Insert(list, is_list ? (*list)->count : 0, text);
}

namespace {

void Add(KLIBSZHASH* hash, const std::string& key, const std::string& value) {
  hash->pairs.emplace_back(key, value);
  hash->index.emplace(hash->pairs.back().first, std::prev(hash->pairs.end()));
}

// Gives a hash that refers to a table pairs of its own.
void Own(KLIBSZHASH* hash) {
  if (hash->table == nullptr) return;
  hash->index.reserve(hash->table->size());
  for (const auto& [key, value] : hash->table->pairs()) Add(hash, key, value);
  hash->table = nullptr;
}

}  // namespace

Status SetValue(KLIBSZHASH* hash, const char* key, const char* value) {
  if (hash == nullptr || key == nullptr || value == nullptr) return Status::Failure(EINVAL, "no hash, key or value");
  Own(hash);
  const auto found = hash->index.find(key);
  if (found != hash->index.end()) {
    found->second->second = value;
    return {};
  }
  Add(hash, key, value);
  return {};
}

Status AddAll(const std::shared_ptr<const TextPairs>& table, KLIBSZHASH* hash) {
  if (hash->table == nullptr && hash->pairs.empty()) {
    hash->table = table;
    return {};
  }
  for (const auto& [key, value] : table->pairs()) {
    if (Status status = SetValue(hash, key.c_str(), value.c_str()); !status.ok()) return status;
  }
  return {};
}

std::shared_ptr<const TextPairs> TableOf(const KLIBSZHASH& hash) {
  if (hash.table != nullptr) return hash.table;
  return std::make_shared<const TextPairs>(std::vector<TextPairs::Pair>(hash.pairs.begin(), hash.pairs.end()));
}

namespace {

Status EnumerateKeys(const KLIBSZHASH* hash, KLIBSZLIST** keys) {
  if (hash == nullptr || keys == nullptr || *keys == nullptr) return Status::Failure(EINVAL, "no hash, or no list");
  if (hash->table != nullptr && (*keys)->count == 0) {
    Inside(*keys).ReferTo(hash->table);
    return {};
  }
  const std::shared_ptr<const TextPairs> table = TableOf(*hash);
  for (const TextPairs::Pair& pair : table->pairs()) {
    if (Status status = Append(keys, pair.first.c_str()); !status.ok()) return status;
  }
  return {};
}

const std::string* FindValue(const KLIBSZHASH& hash, const char* key) {
  if (hash.table != nullptr) {
    const TextPairs::Pair* pair = hash.table->Find(key);
    return pair == nullptr ? nullptr : &pair->second;
  }
  const auto found = hash.index.find(key);
  return found == hash.index.end() ? nullptr : &found->second->second;
}

// The capacity is only validated: the containers grow by themselves.
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
    const std::string* value = vorn::FindValue(*hash, key);
    if (value != nullptr) return value->c_str();
  }
  ToSilentResult(Status::Failure(ENOENT, "no such key"));
  return nullptr;
}

int KLIBCSzHashSetValue(KLIBSZHASH** hash, const char* key, const char* value) {
  return ToResult(vorn::SetValue(hash == nullptr ? nullptr : *hash, key, value));
}

int KLIBCSzHashRemoveKey(KLIBSZHASH* hash, const char* key) {
  if (hash == nullptr || key == nullptr) return ToResult(Status::Failure(EINVAL, "no hash, or no key"));
  if (vorn::FindValue(*hash, key) == nullptr) return 0;
  vorn::Own(hash);
  const auto found = hash->index.find(key);
  const auto pair = found->second;
  hash->index.erase(found);  // before the pair, because its key is a view of the pair's text
  hash->pairs.erase(pair);
  return 1;
}
