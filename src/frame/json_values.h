// Values of answers.
#ifndef VORN_SRC_JSON_VALUES_H
#define VORN_SRC_JSON_VALUES_H

#include <json/value.h>

#include <string>
#include <vector>

// Returns an array of these values; an empty one if there are none.
template <typename T>
Json::Value ArrayOf(const std::vector<T>& values) {
  Json::Value array(Json::arrayValue);
  for (const T& value : values) array.append(value);
  return array;
}

// Returns an array with the conversion of each item; an empty one if there are none.
template <typename T>
Json::Value ArrayOf(const std::vector<T>& items, Json::Value (*convert)(const T&)) {
  Json::Value array(Json::arrayValue);
  for (const T& item : items) array.append(convert(item));
  return array;
}

// Returns the text, or null if it is empty.
inline Json::Value OrNull(const std::string& text) { return text.empty() ? Json::Value() : Json::Value(text); }

#endif  // VORN_SRC_JSON_VALUES_H
