#include "lists.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "captured_log.h"

namespace {

using testing::ElementsAre;

class List {
 public:
  List() : list_(KLIBCSzListAlloc(1024)) {}
  ~List() { KLIBCSzListFree(list_); }
  List(const List&) = delete;
  List& operator=(const List&) = delete;

  KLIBSZLIST** slot() { return &list_; }
  KLIBSZLIST* get() const { return list_; }
  void Push(const std::string& text) { EXPECT_GE(KLIBCSzListPush(&list_, text.c_str()), 0); }
  void Insert(int index, const char* text) { EXPECT_GE(KLIBCSzListInsert(&list_, index, text), 0); }
  int Find(const std::string& text) const { return KLIBCSzListFind(list_, text.c_str()); }

  std::vector<std::string> Items() const {
    std::vector<std::string> items;
    items.reserve(static_cast<std::size_t>(list_->count));
    for (int i = 0; i < list_->count; ++i) items.emplace_back(KLIBCSzListGet(list_, i));
    return items;
  }

 private:
  KLIBSZLIST* list_;
};

class Hash {
 public:
  Hash() : hash_(KLIBCSzHashAlloc(1024)) {}
  ~Hash() { KLIBCSzHashFree(hash_); }
  Hash(const Hash&) = delete;
  Hash& operator=(const Hash&) = delete;

  KLIBSZHASH* get() const { return hash_; }
  void Set(const std::string& key, const char* value) { EXPECT_GE(KLIBCSzHashSetValue(&hash_, key.c_str(), value), 0); }
  std::vector<std::string> Keys() const {
    List keys;
    EXPECT_GE(KLIBCSzHashEnumKey(hash_, keys.slot()), 0);
    return keys.Items();
  }

 private:
  KLIBSZHASH* hash_;
};

TEST(List, BeginsWithItsCount) {
  List list;
  std::int32_t count = -1;
  std::memcpy(&count, list.get(), sizeof count);
  EXPECT_EQ(count, 0);
  list.Push("a");
  std::memcpy(&count, list.get(), sizeof count);
  EXPECT_EQ(count, 1);
}

TEST(List, KeepsItemsWhereTheyArePut) {
  List list;
  list.Push("b");
  list.Insert(0, "a");
  list.Insert(2, "d");
  list.Insert(2, "c");
  EXPECT_THAT(list.Items(), ElementsAre("a", "b", "c", "d"));
}

TEST(List, CopiesTheText) {
  List list;
  std::string text = "abc";
  list.Push(text);
  text[0] = 'x';
  EXPECT_STREQ(KLIBCSzListGet(list.get(), 0), "abc");
}

TEST(List, FindsTheFirstOfEqualsAfterEveryChange) {
  List list;
  EXPECT_LT(list.Find("a"), 0);
  list.Push("x");
  list.Push("a");
  list.Push("a");
  EXPECT_EQ(list.Find("a"), 1);
  list.Insert(0, "root");
  EXPECT_EQ(list.Find("a"), 2);
  EXPECT_EQ(list.Find("root"), 0);
  list.Insert(0, "a");
  EXPECT_EQ(list.Find("a"), 0);
  EXPECT_EQ(list.Find("x"), 2);
  list.Insert(1, "x");
  EXPECT_EQ(list.Find("x"), 1);
  list.Push("z");
  EXPECT_EQ(list.Find("z"), 6);
  KLIBCSzListSortItems(list.get(), 16);
  EXPECT_THAT(list.Items(), ElementsAre("a", "a", "a", "root", "x", "x", "z"));
  EXPECT_EQ(list.Find("x"), 4);
  EXPECT_LT(list.Find("X"), 0);
}

TEST(List, SortsByBytes) {
  List list;
  for (const char* text : {"b", "a", "B", "\xc3\xa4", "", "ab"}) list.Push(text);
  EXPECT_EQ(KLIBCSzListSortItems(list.get(), 16), 0);
  EXPECT_THAT(list.Items(), ElementsAre("", "B", "a", "ab", "b", "\xc3\xa4"));
}

TEST(List, RefusesWhatItCannotDo) {
  List list;
  list.Push("a");
  EXPECT_EQ(KLIBCSzListGet(list.get(), 1), nullptr);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
  EXPECT_EQ(KLIBCSzListGet(list.get(), -1), nullptr);
  EXPECT_LT(KLIBCSzListInsert(list.slot(), 2, "x"), 0);
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
  EXPECT_LT(KLIBCSzListInsert(list.slot(), -1, "x"), 0);
  EXPECT_LT(KLIBCSzListPush(list.slot(), nullptr), 0);
  EXPECT_LT(KLIBCSzListSortItems(list.get(), 1), 0);
  EXPECT_EQ(KLIBCSzListAlloc(-1), nullptr);
  EXPECT_THAT(list.Items(), ElementsAre("a"));
  KLIBCSzListFree(nullptr);
}

TEST(List, DoesNotLogWhatItDoesNotFind) {
  List list;
  TakeLog();
  EXPECT_LT(list.Find("a"), 0);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
  EXPECT_TRUE(TakeLog().empty());
}

// With a linear scan per lookup this test would take most of an hour.
TEST(List, IsBuiltAndSearchedInTurnWithoutScans) {
  List list;
  constexpr int kCount = 200'000;
  for (int i = 0; i < kCount; ++i) {
    const std::string text = "user" + std::to_string(i);
    ASSERT_LT(list.Find(text), 0);
    if (i % 2 == 0) {
      list.Push(text);
    } else {
      list.Insert(0, text.c_str());
    }
  }
  EXPECT_EQ(list.Find("user0"), kCount / 2);
  EXPECT_EQ(list.Find("user" + std::to_string(kCount - 1)), 0);
}

TEST(Hash, KeepsTheOrderOfItsKeysAndReplacesValues) {
  Hash hash;
  hash.Set("b", "1");
  hash.Set("a", "2");
  hash.Set("b", "3");
  EXPECT_THAT(hash.Keys(), ElementsAre("b", "a"));
  EXPECT_STREQ(KLIBCSzHashGetValue(hash.get(), "b"), "3");
  EXPECT_EQ(KLIBCSzHashGetValue(hash.get(), "B"), nullptr);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
}

TEST(Hash, CountsWhatItRemoves) {
  Hash hash;
  for (const char* key : {"a", "b", "c"}) hash.Set(key, "1");
  EXPECT_EQ(KLIBCSzHashRemoveKey(hash.get(), "b"), 1);
  EXPECT_EQ(KLIBCSzHashRemoveKey(hash.get(), "b"), 0);
  EXPECT_THAT(hash.Keys(), ElementsAre("a", "c"));
  hash.Set("b", "2");
  EXPECT_THAT(hash.Keys(), ElementsAre("a", "c", "b"));
}

TEST(Hash, StaysFastWithManyKeys) {
  Hash hash;
  for (int i = 0; i < 200'000; ++i) hash.Set("key" + std::to_string(i), "1");
  for (int i = 0; i < 200'000; ++i) ASSERT_EQ(KLIBCSzHashRemoveKey(hash.get(), ("key" + std::to_string(i)).c_str()), 1);
  EXPECT_TRUE(hash.Keys().empty());
}

TEST(Hash, RefusesWhatIsMissing) {
  Hash hash;
  KLIBSZHASH* none = nullptr;
  EXPECT_LT(KLIBCSzHashSetValue(&none, "a", "b"), 0);
  EXPECT_LT(KLIBCSzHashRemoveKey(hash.get(), nullptr), 0);
  EXPECT_LT(KLIBCSzHashEnumKey(hash.get(), nullptr), 0);
  EXPECT_EQ(KLIBCSzHashAlloc(-1), nullptr);
  KLIBCSzHashFree(nullptr);
}

}  // namespace
