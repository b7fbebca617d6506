// The lists and hashes of the fake platform.
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

// Create an empty list or hash and count it as a live object.
FakeList* MakeList();
FakeHash* MakeHash();

void Append(FakeList* list, const std::string& text);
void SetPair(FakeHash* hash, const std::string& key, const std::string& value);

#endif  // VORN_TESTS_SUPPORT_FAKE_LISTS_H
