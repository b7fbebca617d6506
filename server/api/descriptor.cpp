#include "descriptor.h"

#include <charconv>
#include <utility>

#include "json_input.h"

namespace vorn::server {
namespace {

// Returns the error code that a member name of "x-error-codes" denotes; 0 if the name is not a number.
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

bool Fault(std::string* error, std::string text) {
  *error = std::move(text);
  return false;
}

// Returns whether the operation has a request body that is a form (OpenAPI 3.1, "Request Body Object").
bool TakesForm(const Json::Value& operation) {
  const Json::Value& body = operation["requestBody"];
  return body.isObject() && body["content"].isObject() && body["content"].isMember("multipart/form-data");
}

}  // namespace

std::optional<Descriptor> Descriptor::Parse(std::string_view json, std::string* error) {
  const std::optional<Json::Value> document = ParseJsonObject(json, error);
  if (!document) return std::nullopt;
  Descriptor descriptor;
  if (!descriptor.ReadErrorCodes((*document)["x-error-codes"], error)) return std::nullopt;
  if (!descriptor.ReadPaths((*document)["paths"], error)) return std::nullopt;
  return descriptor;
}

bool Descriptor::ReadErrorCodes(const Json::Value& codes, std::string* error) {
  if (!codes.isNull() && !codes.isObject()) return Fault(error, "x-error-codes is not an object");
  for (const std::string& name : codes.getMemberNames()) {
    const Json::Value& entry = codes[name];
    const int code = ParseCode(name);
    if (code == 0 || !IsErrorCode(entry)) {
      return Fault(error,
                   "x-error-codes: \"" + name + "\" needs a number for its name, a status of 400 to 599 and a text");
    }
    codes_[code] = {entry["status"].asInt(), entry["text"].asString()};
  }
  return true;
}

bool Descriptor::ReadPaths(const Json::Value& paths, std::string* error) {
  if (!paths.isNull() && !paths.isObject()) return Fault(error, "paths is not an object");
  for (const std::string& path : paths.getMemberNames()) {
    const Json::Value& item = paths[path];
    const Json::Value operation = item.isObject() ? item["post"] : Json::Value();
    if (!operation.isObject()) return Fault(error, "paths: \"" + path + "\" needs an operation \"post\"");
    const Json::Value& reads_only = operation["x-read-only"];
    if (!reads_only.isNull() && !reads_only.isBool()) {
      return Fault(error, "paths: \"" + path + "\": x-read-only is neither true nor false");
    }
    methods_[path] = {reads_only.isBool() && reads_only.asBool(), TakesForm(operation)};
  }
  return true;
}

Descriptor::ErrorCode Descriptor::Describe(int code) const {
  const auto found = codes_.find(code);
  if (found != codes_.end()) return found->second;
  return {500, "The operation failed with error code " + std::to_string(code) + "."};
}

Descriptor::Method Descriptor::MethodAt(const std::string& path) const {
  const auto found = methods_.find(path);
  return found == methods_.end() ? Method{} : found->second;
}

std::vector<std::string> Descriptor::Paths() const {
  std::vector<std::string> paths;
  for (const auto& [path, method] : methods_) paths.push_back(path);
  return paths;
}

}  // namespace vorn::server
