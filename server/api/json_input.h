// Strict JSON (RFC 8259). Also refuses constructs that two readers could interpret differently.
#ifndef VORN_SERVER_JSON_INPUT_H
#define VORN_SERVER_JSON_INPUT_H

#include <json/value.h>

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace vorn::server {

constexpr int kMaxJsonDepth = 64;
constexpr std::size_t kMaxJsonValues = 100000;  // every object, array, string, number and literal counts

// Upper bounds of the memory, in bytes, that JsonCpp allocates: for a value (the node of the map that holds it, with
// the Json::Value), in addition for an array or object (its map), and for a key or string (its copy, beside the bytes).
constexpr std::size_t kJsonValueCost = 128;
constexpr std::size_t kJsonContainerCost = 64;
constexpr std::size_t kJsonTextCost = 32;

// The largest JsonText::cost() of a text of `bytes` bytes: all values are arrays or objects that have a key.
constexpr std::size_t LargestJsonCost(std::size_t bytes) {
  return kMaxJsonValues * (kJsonValueCost + kJsonContainerCost + kJsonTextCost) + bytes;
}

// The reason why a text was refused: "Line 1, Column 7: ..." (columns are bytes, and both count from 1).
struct JsonFault {
  std::string text;
  bool too_large = false;  // more than kMaxJsonValues values
};

// A text whose characters, tokens, depth and number of values have been checked, before any memory is spent on it.
// Refers to the text, which must outlive it.
class JsonText {
 public:
  // Returns std::nullopt, with the reason in `fault`, for a text that is not UTF-8, that has a token which RFC 8259
  // does not know, U+0000, half a surrogate pair, a number beyond the range of a double, a deeper nesting than
  // kMaxJsonDepth or more than kMaxJsonValues values.
  static std::optional<JsonText> Check(std::string_view text, JsonFault* fault);

  // An upper bound of the memory, in bytes, that the value of ParseObject() takes.
  std::size_t cost() const { return cost_; }

  // Returns std::nullopt, with the reason in `error`, unless the text is one JSON object without duplicate keys.
  std::optional<Json::Value> ParseObject(std::string* error) const;

 private:
  JsonText(std::string_view text, std::size_t cost) : text_(text), cost_(cost) {}

  std::string_view text_;
  std::size_t cost_;
};

// Checks and parses in one step.
std::optional<Json::Value> ParseJsonObject(std::string_view text, std::string* error);

// Returns whether `text` is UTF-8 without U+0000; only such text can be a parameter.
bool IsPlainUtf8(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_JSON_INPUT_H
