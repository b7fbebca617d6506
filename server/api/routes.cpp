#include "routes.h"

#include <syslog.h>

#include <array>
#include <charconv>
#include <cstddef>
#include <optional>
#include <utility>

namespace vorn::server {
namespace {

constexpr std::string_view kPrefix = "/api/";

struct Path {
  std::string_view api;
  std::string_view version;
  std::string_view method;
};

std::optional<Path> SplitPath(std::string_view path) {
  if (path.substr(0, kPrefix.size()) != kPrefix) return std::nullopt;
  path.remove_prefix(kPrefix.size());
  const std::size_t first = path.find('/');
  const std::size_t second = first == std::string_view::npos ? first : path.find('/', first + 1);
  if (second == std::string_view::npos) return std::nullopt;
  return Path{path.substr(0, first), path.substr(first + 1, second - first - 1), path.substr(second + 1)};
}

// Parses "v2" as 2. Returns std::nullopt for anything else, including leading zeros and signs.
std::optional<int> ParseVersion(std::string_view text) {
  if (text.substr(0, 1) != "v") return std::nullopt;
  int version = 0;
  std::from_chars(text.data() + 1, text.data() + text.size(), version);
  if ("v" + std::to_string(version) != text) return std::nullopt;
  return version;
}

std::string Quoted(std::string_view text) { return '"' + std::string(text) + '"'; }

}  // namespace

std::string Route::Name() const { return std::string(row.api) + " v" + std::to_string(row.version) + " " + row.method; }

std::string Route::Id() const { return std::string(row.api) + "/v" + std::to_string(row.version) + "/" + row.method; }

Routes::Routes(const std::vector<Module>& modules) : modules_(modules) {
  for (const Module& module : modules) {
    for (const APIRow& row : module.rows) AddRow(row, module);
    for (const std::string& path : module.descriptor.Paths()) {
      std::string unknown;
      if (Find(path, &unknown) == nullptr) syslog(LOG_ERR, "%s: descriptor: %s", module.path.c_str(), unknown.c_str());
    }
  }
  for (auto& [api, versions] : apis_) {
    for (auto& [version, methods] : versions) {
      for (auto& [method, route] : methods) PairWithReader(&route);
    }
  }
}

void Routes::AddRow(const APIRow& row, const Module& module) {
  Route route{row, &module.descriptor, {}};
  route.method = module.descriptor.MethodAt(std::string(kPrefix) + route.Id());
  route.for_readers = route.method.reads_only;
  const auto [place, added] = apis_[row.api][row.version].try_emplace(row.method, route);
  if (!added) syslog(LOG_ERR, "%s: %s is there already", module.path.c_str(), place->second.Name().c_str());
}

void Routes::PairWithReader(Route* route) const {
  if (route->method.shown_by.empty()) return;
  std::string unknown;
  const Route* reader = Find(std::string(kPrefix) + route->method.shown_by, &unknown);
  if (reader != nullptr && !reader->method.reads_only) unknown = "\"" + reader->Id() + "\" may change something.";
  if (unknown.empty()) {
    route->shown_by = reader;
  } else {
    syslog(LOG_ERR, "%s: x-shown-by: %s", route->Name().c_str(), unknown.c_str());
  }
}

// The x-shown-by of such a method is for the reader of the description: the server's own methods accept no If-Match.
void Routes::Add(const Route& route) {
  const auto [place, added] = apis_[route.row.api][route.row.version].try_emplace(route.row.method, route);
  if (!added) syslog(LOG_ERR, "A module has a method of the server itself: %s", place->second.Name().c_str());
}

const Route* Routes::Find(std::string_view path, std::string* unknown) const {
  const std::optional<Path> parts = SplitPath(path);
  if (!parts) {
    *unknown = "There is nothing at " + Quoted(path) + ".";
    return nullptr;
  }
  const auto api = apis_.find(parts->api);
  if (api == apis_.end()) {
    *unknown = "There is no API " + Quoted(parts->api) + ".";
    return nullptr;
  }
  const std::optional<int> number = ParseVersion(parts->version);
  const auto version = number ? api->second.find(*number) : api->second.end();
  if (version == api->second.end()) {
    *unknown = "The API " + Quoted(parts->api) + " has no version " + Quoted(parts->version) + ".";
    return nullptr;
  }
  const auto method = version->second.find(parts->method);
  if (method != version->second.end()) return &method->second;
  *unknown = "Version " + std::to_string(*number) + " of the API " + Quoted(parts->api) + " has no method " +
             Quoted(parts->method) + ".";
  return nullptr;
}

Json::Value Routes::List() const {
  Json::Value list(Json::arrayValue);
  for (const auto& [api, versions] : apis_) {
    for (const auto& [version, methods] : versions) {
      for (const auto& [method, route] : methods) {
        Json::Value& row = list.append(Json::Value(Json::objectValue));
        row["api"] = api;
        row["version"] = version;
        row["method"] = method;
      }
    }
  }
  return list;
}

}  // namespace vorn::server
