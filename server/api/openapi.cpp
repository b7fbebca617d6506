#include "openapi.h"

#include <syslog.h>

#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "json_input.h"
#include "resources.h"
#include "server_methods.h"

namespace vorn::server {
namespace {

constexpr char kJson[] = "application/json";

Json::Value Base() {
  std::string error;
  std::optional<Json::Value> base = ParseJsonObject(kOpenApiBase, &error);
  if (!base) syslog(LOG_ERR, "openapi.json: %s", error.c_str());
  return base ? *std::move(base) : Json::Value(Json::objectValue);
}

Json::Value Reference(const std::string& name) {
  Json::Value reference;
  reference["$ref"] = "#/components/" + name;
  return reference;
}

// Whether a call of the method can be rehearsed.
bool MayBeRehearsed(const Route& route) { return !route.method.reads_only && !route.own; }

// The schema of a whole answer of the route. `member` is "data" or "error".
Json::Value Envelope(const Route& route, bool success, const char* member, Json::Value schema) {
  Json::Value envelope;
  envelope["type"] = "object";
  envelope["required"].append("success");
  envelope["required"].append(member);
  envelope["properties"]["success"]["type"] = "boolean";
  envelope["properties"]["success"]["const"] = success;
  envelope["properties"][member] = std::move(schema);
  envelope["properties"]["warnings"] = Reference("schemas/Warnings");
  if (MayBeRehearsed(route)) envelope["properties"]["rehearsal"] = Reference("schemas/Rehearsal");
  return envelope;
}

// Adds the envelope to the description of a method's result.
void WrapResult(const Route& route, Json::Value* operation) {
  const bool has_tag = route.method.reads_only && !route.own;
  Json::Value& response = (*operation)["responses"]["200"];
  if (!response.isMember("description")) response["description"] = "The method succeeded.";
  if (has_tag) response["headers"]["ETag"] = Reference("headers/ETag");
  Json::Value& content = response["content"][kJson];
  Json::Value schema(Json::objectValue);
  if (content.isMember("schema")) schema.swap(content["schema"]);
  content["schema"] = Envelope(route, true, "data", std::move(schema));
  for (Json::Value& example : content["examples"]) {
    Json::Value answer;
    answer["success"] = true;
    answer["data"].swap(example["value"]);
    example["value"].swap(answer);
  }
  if (content["examples"].empty()) content.removeMember("examples");
}

// An error code with which a method may be answered.
struct Code {
  int code;
  std::string when;
  Json::Value details;  // a schema; null if the code has none
};

// A response with these codes.
Json::Value FailureResponse(const Route& route, const std::vector<Code>& codes) {
  Json::Value error;
  error["type"] = "object";
  error["required"].append("code");
  error["required"].append("text");
  error["properties"]["code"]["type"] = "integer";
  error["properties"]["text"] = Reference("schemas/ErrorText");
  error["properties"]["reasons"] = Reference("schemas/Reasons");
  std::string description;
  std::set<int> numbers;  // a method of the server may describe a status that all methods answer
  for (const Code& code : codes) {
    if (numbers.insert(code.code).second) error["properties"]["code"]["enum"].append(code.code);
    if (!code.details.isNull()) error["properties"]["details"] = code.details;
    description += (description.empty() ? "" : " ") + std::to_string(code.code) + ": " + code.when;
  }
  Json::Value response;
  response["description"] = description;
  response["content"][kJson]["schema"] = Envelope(route, false, "error", std::move(error));
  return response;
}

// Whether a response of the server itself is one to calls of this method; openapi.json says so in "x-methods".
bool Concerns(const Json::Value& response, const Route& route) {
  const std::string methods = response["x-methods"].asString();
  return methods == "all" || (methods == "changing" && route.shown_by != nullptr);
}

class Document {
 public:
  Document() : document_(Base()), responses_(document_["components"]["responses"]) {}

  // Adds the methods of a descriptor; `name` is for the log.
  void Add(const std::string& name, const Descriptor& descriptor, const Routes& routes) {
    const Json::Value& described = descriptor.document();
    if (described.isNull() || !AddSchemas(name, described["components"]["schemas"])) return;
    for (const Json::Value& tag : described["tags"]) document_["tags"].append(tag);
    for (const std::string& path : descriptor.Paths()) {
      std::string unknown;
      const Route* route = routes.Find(path, &unknown);
      if (route == nullptr || route->descriptor != &descriptor) continue;
      document_["paths"][path]["post"] = Operation(described["paths"][path]["post"], *route);
    }
  }

  Json::Value Take() { return std::move(document_); }

 private:
  // Adds all schemas of a descriptor, or none.
  bool AddSchemas(const std::string& descriptor, const Json::Value& schemas) {
    Json::Value& all = document_["components"]["schemas"];
    for (const std::string& name : schemas.getMemberNames()) {
      if (!all.isMember(name) || all[name] == schemas[name]) continue;
      syslog(LOG_ERR, "%s: left out of /openapi.json: there is another schema \"%s\"", descriptor.c_str(),
             name.c_str());
      return false;
    }
    for (const std::string& name : schemas.getMemberNames()) all[name] = schemas[name];
    return true;
  }

  Json::Value Operation(Json::Value operation, const Route& route) const {
    operation["operationId"] = route.Id();
    if (route.shown_by != nullptr) operation["parameters"].append(Reference("parameters/IfMatch"));
    if (MayBeRehearsed(route)) operation["parameters"].append(Reference("parameters/Rehearse"));
    WrapResult(route, &operation);
    AddFailures(route, &operation);
    return operation;
  }

  // Adds a response for each status: those of the method's error codes, and those of the server itself.
  void AddFailures(const Route& route, Json::Value* operation) const {
    std::map<int, std::vector<Code>> codes;
    const Json::Value& listed = (*operation)["x-error-codes"];
    for (const std::string& name : listed.getMemberNames()) {
      const int code = std::stoi(name);
      codes[route.descriptor->Describe(code).status].push_back(
          {code, listed[name]["when"].asString(), listed[name]["details"]});
    }
    Json::Value& responses = (*operation)["responses"];
    for (const std::string& name : responses_.getMemberNames()) {  // "Status400"
      if (!Concerns(responses_[name], route)) continue;
      const std::string status = name.substr(std::string("Status").size());
      const auto of_method = codes.find(std::stoi(status));
      if (of_method == codes.end()) {
        responses[status] = Reference("responses/" + name);
      } else if (!responses_[name].isMember("x-code")) {  // its code is among those of the method
        of_method->second.push_back({of_method->first, responses_[name]["description"].asString(), {}});
      }
    }
    for (const auto& [status, each] : codes) responses[std::to_string(status)] = FailureResponse(route, each);
  }

  Json::Value document_;
  const Json::Value responses_;  // of the server itself
};

}  // namespace

Json::Value OpenApiDocument(const Routes& routes) {
  Document document;
  document.Add("VORN.Server.json", ServerDescriptor(), routes);
  for (const Module& module : routes.modules()) document.Add(module.path, module.descriptor, routes);
  return document.Take();
}

}  // namespace vorn::server
