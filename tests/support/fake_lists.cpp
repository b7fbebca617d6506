// String lists and hashes of the fake platform. An operation that may move its object always does, so that the
// address sanitizer detects the use of an old pointer.
#include "fake_lists.h"

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "fake_platform.h"

FakeList* MakeList() {
  FakePlatform::Current().Born("KLIBSZLIST");
  return new FakeList{};
}

FakeHash* MakeHash() {
  FakePlatform::Current().Born("KLIBSZHASH");
  return new FakeHash{};
}

namespace {

FakeList* Real(KLIBSZLIST* list) { return static_cast<FakeList*>(list); }
const FakeList* Real(const KLIBSZLIST* list) { return static_cast<const FakeList*>(list); }

void Move(KLIBSZLIST** list) {
  FakeList* const old = Real(*list);
  *list = new FakeList(*old);
  delete old;
}

void Move(KLIBSZHASH** hash) {
  FakeHash* const old = Real(*hash);
  *hash = new FakeHash(*old);
  delete old;
}

// Returns whether `text` contains `part`, ignoring case.
bool Contains(const std::string& text, const char* part) { return strcasestr(text.c_str(), part) != nullptr; }

template <typename Pairs>
auto FindKey(Pairs& pairs, const std::string& key) {
  return std::find_if(pairs.begin(), pairs.end(), [&](const auto& pair) { return pair.first == key; });
}

}  // namespace

void Append(FakeList* list, const std::string& text) {
  list->items.push_back(text);
  list->count = static_cast<int32_t>(list->items.size());
}

void SetPair(FakeHash* hash, const std::string& key, const std::string& value) {
  const auto found = FindKey(hash->pairs, key);
  if (found == hash->pairs.end()) {
    hash->pairs.emplace_back(key, value);
  } else {
    found->second = value;
  }
}

extern "C" {

KLIBSZLIST* KLIBCSzListAlloc(int capacity) {
  const bool fails = FakePlatform::Current().Fails("KLIBCSzListAlloc", std::to_string(capacity));
  return fails ? nullptr : MakeList();
}

void KLIBCSzListFree(KLIBSZLIST* list) {
  FakePlatform::Current().Record("KLIBCSzListFree");
  if (list == nullptr) return;
  FakePlatform::Current().Died("KLIBSZLIST");
  delete Real(list);
}

const char* KLIBCSzListGet(const KLIBSZLIST* list, int index) {
  if (FakePlatform::Current().Fails("KLIBCSzListGet", std::to_string(index))) return nullptr;
  if (index < 0 || index >= list->count) return nullptr;
  return Real(list)->items[static_cast<size_t>(index)].c_str();
}

int KLIBCSzListPush(KLIBSZLIST** list, const char* text) {
  if (FakePlatform::Current().Fails("KLIBCSzListPush", text)) return -1;
  Move(list);
  Append(Real(*list), text);
  return FakePlatform::Current().done;
}

int KLIBCSzListInsert(KLIBSZLIST** list, int index, const char* text) {
  const std::string arguments = std::to_string(index) + " " + text;
  if (FakePlatform::Current().Fails("KLIBCSzListInsert", arguments)) return -1;
  Move(list);
  FakeList* const moved = Real(*list);
  moved->items.insert(moved->items.begin() + index, text);
  moved->count = static_cast<int32_t>(moved->items.size());
  return FakePlatform::Current().done;
}

int KLIBCSzListFind(const KLIBSZLIST* list, const char* text) {
  FakePlatform::Current().Record("KLIBCSzListFind", text);
  const auto& items = Real(list)->items;
  const auto found = std::find(items.begin(), items.end(), text);
  return found == items.end() ? -1 : static_cast<int>(found - items.begin());
}

int KLIBCSzListSortItems(KLIBSZLIST* list, int option) {
  FakePlatform::Current().Record("KLIBCSzListSortItems", std::to_string(option));
  std::sort(Real(list)->items.begin(), Real(list)->items.end());
  return FakePlatform::Current().done;
}

KLIBSZHASH* KLIBCSzHashAlloc(int capacity) {
  const bool fails = FakePlatform::Current().Fails("KLIBCSzHashAlloc", std::to_string(capacity));
  return fails ? nullptr : MakeHash();
}

void KLIBCSzHashFree(KLIBSZHASH* hash) {
  FakePlatform::Current().Record("KLIBCSzHashFree");
  if (hash == nullptr) return;
  FakePlatform::Current().Died("KLIBSZHASH");
  delete Real(hash);
}

int KLIBCSzHashEnumKey(const KLIBSZHASH* hash, KLIBSZLIST** keys) {
  if (FakePlatform::Current().Fails("KLIBCSzHashEnumKey")) return -1;
  Move(keys);
  for (const auto& pair : Real(hash)->pairs) Append(Real(*keys), pair.first);
  return FakePlatform::Current().done;
}

const char* KLIBCSzHashGetValue(const KLIBSZHASH* hash, const char* key) {
  if (FakePlatform::Current().Fails("KLIBCSzHashGetValue", key)) return nullptr;
  const auto found = FindKey(Real(hash)->pairs, key);
  return found == Real(hash)->pairs.end() ? nullptr : found->second.c_str();
}

int KLIBCSzHashSetValue(KLIBSZHASH** hash, const char* key, const char* value) {
  const std::string arguments = std::string(key) + " " + value;
  if (FakePlatform::Current().Fails("KLIBCSzHashSetValue", arguments)) return -1;
  Move(hash);
  SetPair(Real(*hash), key, value);
  return FakePlatform::Current().done;
}

int KLIBCSzHashRemoveKey(KLIBSZHASH* hash, const char* key) {
  if (FakePlatform::Current().Fails("KLIBCSzHashRemoveKey", key)) return 0;
  const auto found = FindKey(Real(hash)->pairs, key);
  if (found == Real(hash)->pairs.end()) return 0;
  Real(hash)->pairs.erase(found);
  return 1;
}

int VORNNFSStaticMapGet(KLIBSZHASH** hash, const char* filter) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNNFSStaticMapGet", filter == nullptr ? "(null)" : filter)) return -1;
  Move(hash);
  for (const auto& [principal, name] : platform.mappings) {
    if (filter == nullptr || Contains(principal, filter) || Contains(name, filter))
      SetPair(Real(*hash), principal, name);
  }
  return platform.done;
}

int VORNNFSStaticMapAppend(KLIBSZHASH** table, const KLIBSZHASH* pairs) {
  if (FakePlatform::Current().Fails("VORNNFSStaticMapAppend")) return -1;
  Move(table);
  for (const auto& [principal, name] : Real(pairs)->pairs) SetPair(Real(*table), principal, name);
  return FakePlatform::Current().done;
}

int VORNNFSStaticMapRemove(KLIBSZHASH* table, const KLIBSZLIST* principals) {
  if (FakePlatform::Current().Fails("VORNNFSStaticMapRemove")) return -1;
  if (table == nullptr) return FakePlatform::Current().done;
  for (const std::string& principal : Real(principals)->items) {
    const auto found = FindKey(Real(table)->pairs, principal);
    if (found != Real(table)->pairs.end()) Real(table)->pairs.erase(found);
  }
  return FakePlatform::Current().done;
}

int VORNUserEnum(KLIBSZLIST** list, int type) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNUserEnum", std::to_string(type))) return -1;
  Move(list);
  for (const std::string& user : platform.users) Append(Real(*list), user);
  return platform.done;
}

int VORNUserEnumBySubstr(KLIBSZLIST** list, int type, const char* substring, int flags) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string arguments = std::to_string(type) + " " + substring + " " + std::to_string(flags);
  if (platform.Fails("VORNUserEnumBySubstr", arguments)) return -1;
  Move(list);
  for (const std::string& user : platform.users) {
    if (Contains(user, substring)) Append(Real(*list), user);
  }
  return platform.done;
}
}
