// Parameters of attackers and of faulty programs.
#ifndef VORN_TESTS_SUPPORT_HOSTILE_VALUES_H
#define VORN_TESTS_SUPPORT_HOSTILE_VALUES_H

#include <json/value.h>

#include <string>
#include <vector>

struct HostileValue {
  std::string kind;
  std::string name;
  Json::Value value;
  bool never_stored;  // must change no file, for whichever parameter it is sent
};

// Returns the values of parameters, ordered by kind.
const std::vector<HostileValue>& HostileValues();

struct HostileJson {
  std::string kind;
  std::string text;  // one JSON value, or malformed text in its place
};

// Returns malformed texts to be placed where JSON has a value.
const std::vector<HostileJson>& HostileJsonTexts();

#endif  // VORN_TESTS_SUPPORT_HOSTILE_VALUES_H
