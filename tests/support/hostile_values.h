// Parameters that an attacker or a faulty program may send.
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

// Texts that are no valid JSON values.
const std::vector<HostileJson>& HostileJsonTexts();

#endif  // VORN_TESTS_SUPPORT_HOSTILE_VALUES_H
