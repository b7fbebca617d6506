// JSON as strict as RFC 8259 has it, and stricter where two readers could differ.
#ifndef VORN_SERVER_JSON_INPUT_H
#define VORN_SERVER_JSON_INPUT_H

#include <json/value.h>

#include <optional>
#include <string>
#include <string_view>

namespace vorn::server {

constexpr int kMaxJsonDepth = 64;

// One JSON object, the whole of `text`, in UTF-8. None for anything else, also for a key given
// twice, U+0000, half a surrogate pair and deeper nesting than kMaxJsonDepth; `error` then says what
// is wrong and where: "Line 1, Column 7: ..." (columns are bytes, both count from 1).
std::optional<Json::Value> ParseJsonObject(std::string_view text, std::string* error);

// Whether `text` is UTF-8 without U+0000, and so fit to be a parameter.
bool IsPlainUtf8(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_JSON_INPUT_H
