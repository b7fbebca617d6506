// What somebody may send who means harm, or whose program is broken.
#ifndef VORN_TESTS_SUPPORT_HOSTILE_VALUES_H
#define VORN_TESTS_SUPPORT_HOSTILE_VALUES_H

#include <json/value.h>

#include <string>
#include <vector>

struct HostileValue {
  std::string kind;
  std::string name;
  Json::Value value;
  bool never_stored;  // whatever parameter it is sent for, no file changes
};

// Values of parameters, by kind.
const std::vector<HostileValue>& HostileValues();

struct HostileJson {
  std::string kind;
  std::string text;  // one JSON value, or what somebody takes for one
};

// What stands where JSON has a value, and is none.
const std::vector<HostileJson>& HostileJsonTexts();

#endif  // VORN_TESTS_SUPPORT_HOSTILE_VALUES_H
