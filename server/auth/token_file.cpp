#include "token_file.h"

#include <json/reader.h>
#include <json/writer.h>

#include <array>
#include <memory>
#include <string_view>

namespace vorn::server {
namespace {

constexpr std::size_t kDigestDigits = 64;
constexpr std::array<std::string_view, 10> kMembers = {"id",     "digest",  "name",    "role",      "apis",
                                                       "shares", "created", "expires", "last_used", "last_address"};

Json::Value ToJson(const std::vector<std::string>& list) {
  Json::Value json(Json::arrayValue);
  for (const std::string& item : list) json.append(item);
  return json;
}

bool IsListOfStrings(const Json::Value& json) {
  if (!json.isArray()) return false;
  for (const Json::Value& item : json) {
    if (!item.isString()) return false;
  }
  return true;
}

std::vector<std::string> ToList(const Json::Value& json) {
  std::vector<std::string> list;
  for (const Json::Value& item : json) list.push_back(item.asString());
  return list;
}

bool HasMembersOfAToken(const Json::Value& json) {
  if (!json.isObject() || json.size() != kMembers.size()) return false;
  for (const std::string_view name : kMembers) {
    if (!json.isMember(std::string(name))) return false;
  }
  for (const char* name : {"id", "digest", "name", "role", "last_address"}) {
    if (!json[name].isString()) return false;
  }
  for (const char* name : {"created", "expires", "last_used"}) {
    if (!json[name].isInt64()) return false;
  }
  return IsListOfStrings(json["apis"]) && IsListOfStrings(json["shares"]);
}

Json::Value ToJson(const std::string& digest, const Token& token) {
  Json::Value json;
  json["id"] = token.id;
  json["digest"] = digest;
  json["name"] = token.name;
  json["role"] = std::string(NameOf(token.role));
  json["apis"] = ToJson(token.apis);
  json["shares"] = ToJson(token.shares);
  json["created"] = static_cast<Json::Int64>(token.created);
  json["expires"] = static_cast<Json::Int64>(token.expires);
  json["last_used"] = static_cast<Json::Int64>(token.last_used);
  json["last_address"] = token.last_address;
  return json;
}

std::optional<std::pair<std::string, Token>> ParseToken(const Json::Value& json) {
  if (!HasMembersOfAToken(json)) return std::nullopt;
  const std::optional<Role> role = ParseRole(json["role"].asString());
  const std::string digest = json["digest"].asString();
  if (!role || digest.size() != kDigestDigits) return std::nullopt;
  Token token;
  token.id = json["id"].asString();
  token.name = json["name"].asString();
  token.role = *role;
  token.apis = ToList(json["apis"]);
  token.shares = ToList(json["shares"]);
  token.created = json["created"].asInt64();
  token.expires = json["expires"].asInt64();
  token.last_used = json["last_used"].asInt64();
  token.last_address = json["last_address"].asString();
  return std::pair(digest, token);
}

}  // namespace

std::string FormatTokens(const StoredTokens& tokens) {
  Json::Value document;
  document["tokens"] = Json::Value(Json::arrayValue);
  for (const auto& [digest, token] : tokens) document["tokens"].append(ToJson(digest, token));
  return Json::writeString(Json::StreamWriterBuilder(), document) + "\n";
}

std::optional<StoredTokens> ParseTokens(const std::string& text, std::string* error) {
  StoredTokens tokens;
  if (text.empty()) return tokens;
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value document;
  if (!reader->parse(text.data(), text.data() + text.size(), &document, error)) return std::nullopt;
  if (!document.isObject() || document.size() != 1 || !document["tokens"].isArray()) {
    *error = "it is not an object with a list \"tokens\"";
    return std::nullopt;
  }
  for (const Json::Value& json : document["tokens"]) {
    auto token = ParseToken(json);
    if (!token) {
      *error = "token " + std::to_string(tokens.size() + 1) + " is incomplete or has a member that is not accepted";
      return std::nullopt;
    }
    tokens.push_back(*std::move(token));
  }
  return tokens;
}

}  // namespace vorn::server
