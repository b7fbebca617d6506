// The fake platform's own view of its lists and hashes.
#ifndef VORN_TESTS_SUPPORT_FAKE_LISTS_H
#define VORN_TESTS_SUPPORT_FAKE_LISTS_H

#include <string>
#include <vector>

#include "fake_platform.h"

struct FakeList : KLIBSZLIST {
  std::vector<std::string> items;
};

struct KLIBSZHASH {
  Pairs pairs;
};

using FakeHash = KLIBSZHASH;

inline FakeHash* Real(KLIBSZHASH* hash) { return hash; }
inline const FakeHash* Real(const KLIBSZHASH* hash) { return hash; }

// Counted among the live objects.
FakeList* MakeList();
FakeHash* MakeHash();

void Append(FakeList* list, const std::string& text);
void SetPair(FakeHash* hash, const std::string& key, const std::string& value);

#endif  // VORN_TESTS_SUPPORT_FAKE_LISTS_H
