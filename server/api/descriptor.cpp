#include "descriptor.h"

#include <algorithm>
#include <charconv>
#include <initializer_list>
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
  if (!entry["parameters"].isNull() && !entry["parameters"].isBool()) return false;
  const int status = entry["status"].asInt();
  return status >= 400 && status <= 599;
}

bool Fault(std::string* error, std::string text) {
  *error = std::move(text);
  return false;
}

// Returns the value at the path of these members, or nullptr if there is none.
const Json::Value* Find(const Json::Value& value, std::initializer_list<std::string_view> path) {
  const Json::Value* found = &value;
  for (const std::string_view name : path) {
    if (!found->isObject()) return nullptr;
    found = found->find(name.data(), name.data() + name.size());
    if (found == nullptr) return nullptr;
  }
  return found;
}

// Returns whether the operation has a request body that is a form (OpenAPI 3.1, "Request Body Object").
bool TakesForm(const Json::Value& operation) {
  const Json::Value& body = operation["requestBody"];
  return body.isObject() && body["content"].isObject() && body["content"].isMember("multipart/form-data");
}

// Returns whether no log may have the value of this property.
bool IsSecret(const Json::Value& property) {
  const Json::Value* write_only = Find(property, {"writeOnly"});
  return write_only != nullptr && write_only->asBool();
}

bool IsListOfTexts(const Json::Value& list) {
  return list.isArray() &&
         std::all_of(list.begin(), list.end(), [](const Json::Value& item) { return item.isString(); });
}

// Reads "x-shown-by". Returns false if it is not as descriptor.h says.
bool ReadShownBy(const Json::Value& shown_by, Descriptor::Method* method) {
  if (shown_by.isNull()) return true;
  if (!shown_by.isObject() || !shown_by["method"].isString()) return false;
  const Json::Value& same = shown_by["same"];
  if (!same.isNull() && !IsListOfTexts(same)) return false;
  method->shown_by = shown_by["method"].asString();
  for (const Json::Value& name : same) method->same.push_back(name.asString());
  return true;
}

}  // namespace

std::optional<Descriptor> Descriptor::Parse(std::string_view json, std::string* error) {
  std::optional<Json::Value> document = ParseJsonObject(json, error);
  if (!document) return std::nullopt;
  Descriptor descriptor;
  descriptor.document_ = *std::move(document);
  const Json::Value& read = descriptor.document_;
  const Json::Value* schemas = Find(read, {"components", "schemas"});
  if (!descriptor.ReadErrorCodes(read["x-error-codes"], error) ||
      !descriptor.ReadSchemas(schemas == nullptr ? Json::Value::nullSingleton() : *schemas, error) ||
      !descriptor.ReadPaths(read["paths"], error)) {
    return std::nullopt;
  }
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
    codes_[code] = {entry["status"].asInt(), entry["text"].asString(), entry["parameters"].asBool()};
  }
  return true;
}

bool Descriptor::ReadPaths(const Json::Value& paths, std::string* error) {
  if (!paths.isNull() && !paths.isObject()) return Fault(error, "paths is not an object");
  for (const std::string& path : paths.getMemberNames()) {
    const Json::Value& item = paths[path];
    const Json::Value* post = Find(item, {"post"});
    if (post == nullptr || !post->isObject()) {
      return Fault(error, "paths: \"" + path + "\" needs an operation \"post\"");
    }
    const Json::Value& operation = *post;
    const Json::Value& reads_only = operation["x-read-only"];
    if (!reads_only.isNull() && !reads_only.isBool()) {
      return Fault(error, "paths: \"" + path + "\": x-read-only is neither true nor false");
    }
    if (!CheckContent(Find(operation, {"requestBody", "content"}), error) ||
        !CheckContent(Find(operation, {"responses", "200", "content"}), error) ||
        !CheckCodes(operation["x-error-codes"], error)) {
      return Fault(error, "paths: \"" + path + "\": " + *error);
    }
    Method method;
    method.reads_only = reads_only.isBool() && reads_only.asBool();
    method.takes_file = TakesForm(operation);
    if (!ReadShownBy(operation["x-shown-by"], &method)) {
      return Fault(error, "paths: \"" + path + "\": x-shown-by needs a method, and may have a list of parameters");
    }
    const Json::Value& share = operation["x-share-parameter"];
    if (!share.isNull() && (!share.isString() || share.asString().empty())) {
      return Fault(error, "paths: \"" + path + "\": x-share-parameter is no name of a parameter");
    }
    method.share_parameter = share.asString();
    methods_[path] = std::move(method);
  }
  return true;
}

bool Descriptor::ReadSchemas(const Json::Value& schemas, std::string* error) {
  if (!schemas.isNull() && !schemas.isObject()) return Fault(error, "components: schemas is not an object");
  schemas_ = Schemas(schemas);
  for (const std::string& name : schemas.getMemberNames()) {
    if (!schemas_.Support(schemas[name], error)) return Fault(error, "schema \"" + name + "\": " + *error);
  }
  return true;
}

bool Descriptor::CheckContent(const Json::Value* content, std::string* error) const {
  if (content == nullptr) return true;
  if (!content->isObject()) return Fault(error, "a content is not an object");
  return std::all_of(content->begin(), content->end(), [&](const Json::Value& media_type) {
    const Json::Value* schema = Find(media_type, {"schema"});
    return schema == nullptr || schemas_.Support(*schema, error);
  });
}

bool Descriptor::CheckCodes(const Json::Value& codes, std::string* error) const {
  if (codes.isNull()) return true;
  if (!codes.isObject()) return Fault(error, "x-error-codes is not an object");
  for (const std::string& name : codes.getMemberNames()) {
    const Json::Value& entry = codes[name];
    if (codes_.count(ParseCode(name)) == 0) return Fault(error, "the error code \"" + name + "\" is not described");
    if (!entry.isObject() || !entry["when"].isString()) {
      return Fault(error, "the error code \"" + name + "\" needs a text \"when\"");
    }
    if (entry.isMember("details") && !schemas_.Support(entry["details"], error)) return false;
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

const Json::Value* Descriptor::ParameterSchema(const std::string& path) const {
  const Json::Value* schema =
      Find(document_, {"paths", path, "post", "requestBody", "content", "application/json", "schema"});
  while (schema != nullptr && schema->isMember("$ref")) schema = schemas_.Target((*schema)["$ref"]);
  return schema;
}

std::vector<std::string> Descriptor::Unlogged(const std::string& path, const Json::Value& parameters) const {
  const Json::Value* schema = ParameterSchema(path);
  const Json::Value* properties = schema == nullptr ? nullptr : Find(*schema, {"properties"});
  std::vector<std::string> names;
  if (properties == nullptr || !parameters.isObject()) return names;
  for (auto member = parameters.begin(); member != parameters.end(); ++member) {
    const Json::Value* property = Find(*properties, {member.name()});
    if (property == nullptr || IsSecret(*property)) names.push_back(member.name());
  }
  return names;
}

std::vector<std::string> Descriptor::ParameterFaults(const std::string& path, const Json::Value& parameters) const {
  const Json::Value* schema = ParameterSchema(path);
  return schema == nullptr ? std::vector<std::string>() : schemas_.Faults(parameters, *schema);
}

std::vector<std::string> Descriptor::Paths() const {
  std::vector<std::string> paths;
  for (const auto& [path, method] : methods_) paths.push_back(path);
  return paths;
}

}  // namespace vorn::server
