#include "descriptor.h"

#include <json/value.h>

#include <charconv>

#include "json_input.h"

namespace vorn::server {
namespace {

// The code that a member of "x-error-codes" is named after; 0 when it is no code.
int ParseCode(const std::string& name) {
  int code = 0;
  const auto [end, failure] = std::from_chars(name.data(), name.data() + name.size(), code);
  return failure == std::errc() && end == name.data() + name.size() ? code : 0;
}

bool IsErrorCode(const Json::Value& entry) {
  if (!entry.isObject() || !entry["status"].isInt() || !entry["text"].isString()) return false;
  const int status = entry["status"].asInt();
  return status >= 400 && status <= 599;
}

}  // namespace

std::optional<Descriptor> Descriptor::Parse(std::string_view json, std::string* error) {
  const std::optional<Json::Value> document = ParseJsonObject(json, error);
  if (!document) return std::nullopt;
  const Json::Value& codes = (*document)["x-error-codes"];
  if (!codes.isNull() && !codes.isObject()) {
    *error = "x-error-codes is no object";
    return std::nullopt;
  }
  Descriptor descriptor;
  for (const std::string& name : codes.getMemberNames()) {
    const Json::Value& entry = codes[name];
    const int code = ParseCode(name);
    if (code == 0 || !IsErrorCode(entry)) {
      *error = "x-error-codes: \"" + name + "\" needs a number for its name, a status of 400 to 599 and a text";
      return std::nullopt;
    }
    descriptor.codes_[code] = {entry["status"].asInt(), entry["text"].asString()};
  }
  return descriptor;
}

Descriptor::ErrorCode Descriptor::Describe(int code) const {
  const auto found = codes_.find(code);
  if (found != codes_.end()) return found->second;
  return {500, "The operation failed with error code " + std::to_string(code) + "."};
}

}  // namespace vorn::server
