// Strings of JSON values without a copy.
#ifndef VORN_SRC_JSON_TEXT_H
#define VORN_SRC_JSON_TEXT_H

#include <json/value.h>

#include <optional>
#include <string_view>

// Returns the content of a JSON string, which may contain NUL bytes, or std::nullopt for every other
// value. The content belongs to the value and is valid until the value changes. Throws nothing.
inline std::optional<std::string_view> TextOf(const Json::Value& value) {
  const char* begin = nullptr;
  const char* end = nullptr;
  if (!value.getString(&begin, &end)) return std::nullopt;
  return std::string_view(begin, static_cast<size_t>(end - begin));
}

#endif  // VORN_SRC_JSON_TEXT_H
