#include "rehearsal_answer.h"

#include <cstddef>

namespace vorn::server {
namespace {

Json::Value ToJson(const VORN::Rehearsal::File& file) {
  Json::Value object;
  object["path"] = file.path;
  object["difference"] = file.difference;
  return object;
}

Json::Value ToJson(const VORN::Rehearsal::Action& action) {
  Json::Value object;
  object["action"] = action.action;
  object["clients"] = action.clients;
  if (action.grace_seconds) object["grace_seconds"] = *action.grace_seconds;
  object["effect"] = action.effect;
  return object;
}

Json::Value ToJson(const VORN::Rehearsal::Rule::Change& change) {
  Json::Value object;
  object["change"] = change.change;
  object["access"] = change.access;
  if (!change.flavor.empty()) object["flavor"] = change.flavor;
  object["text"] = change.text;
  return object;
}

Json::Value ToJson(const VORN::HealthFinding& finding) {
  constexpr const char* kSeverities[] = {"error", "warning", "notice"};
  Json::Value object;
  object["kind"] = finding.kind;
  object["severity"] = kSeverities[static_cast<std::size_t>(finding.severity)];
  object["text"] = finding.text;
  object["remedy"] = finding.remedy;
  return object;
}

template <typename Item>
Json::Value ListOf(const std::vector<Item>& items);

Json::Value ToJson(const VORN::Rehearsal::Rule& rule) {
  Json::Value object;
  object["directory"] = rule.directory;
  object["client"] = rule.client;
  object["changes"] = ListOf(rule.changes);
  return object;
}

Json::Value ToJson(const VORN::Rehearsal::Client& client) {
  Json::Value object;
  object["address"] = client.address;
  object["name"] = client.name;
  object["version"] = client.version;
  object["path"] = client.path;
  object["changes"] = ListOf(client.changes);
  object["certain"] = client.is_certain;
  return object;
}

template <typename Item>
Json::Value ListOf(const std::vector<Item>& items) {
  Json::Value list(Json::arrayValue);
  for (const Item& item : items) list.append(ToJson(item));
  return list;
}

}  // namespace

Json::Value RehearsalJson(const VORN::Rehearsal& rehearsal) {
  Json::Value object;
  object["files"] = ListOf(rehearsal.files);
  object["actions"] = ListOf(rehearsal.actions);
  object["rules"] = ListOf(rehearsal.rules);
  object["clients"] = ListOf(rehearsal.clients);
  object["all_clients"] = rehearsal.has_all_clients;
  return object;
}

Json::Value FindingsJson(const VORN::Rehearsal::Findings& findings) {
  Json::Value object;
  object["added"] = ListOf(findings.added);
  object["removed"] = ListOf(findings.removed);
  return object;
}

}  // namespace vorn::server
