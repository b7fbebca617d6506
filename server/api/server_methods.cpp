#include "server_methods.h"

#include <syslog.h>

#include <algorithm>
#include <ctime>
#include <initializer_list>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "answer.h"
#include "authenticator.h"
#include "log_quote.h"
#include "resources.h"

namespace vorn::server {
namespace {

constexpr const char* kTokenApi = "VORN.Server.Token";
constexpr const char* kSessionApi = "VORN.Server.Session";
constexpr std::size_t kMaxNameBytes = 64;
constexpr std::size_t kMaxListItems = 100;
constexpr std::size_t kMaxItemBytes = 255;

// Parameters that are not accepted; the text is a sentence for the caller.
struct Rejected {
  std::string text;
};

void CheckNames(const Json::Value& parameters, std::initializer_list<std::string_view> known) {
  for (const std::string& name : parameters.getMemberNames()) {
    if (std::find(known.begin(), known.end(), name) == known.end()) {
      throw Rejected{"There is no parameter \"" + name + "\"."};
    }
  }
}

std::string TakeString(const Json::Value& parameters, const char* name) {
  const Json::Value& value = parameters[name];
  if (!value.isString()) throw Rejected{std::string("The parameter \"") + name + "\" must be a string."};
  return value.asString();
}

bool IsNameCharacter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
         std::string_view(" ._@-").find(c) != std::string_view::npos;
}

std::string TakeName(const Json::Value& parameters) {
  std::string name = TakeString(parameters, "name");
  if (name.empty() || name.size() > kMaxNameBytes || !std::all_of(name.begin(), name.end(), IsNameCharacter)) {
    throw Rejected{"The name of a token has 1 to 64 letters, digits, blanks, or one of . _ @ -"};
  }
  return name;
}

Role TakeRole(const Json::Value& parameters) {
  const std::optional<Role> role = ParseRole(TakeString(parameters, "role"));
  if (!role) throw Rejected{"The role is \"reader\" or \"administrator\"."};
  return *role;
}

// An empty list would be no restriction, which nobody who writes it can mean.
std::vector<std::string> TakeList(const Json::Value& parameters, const char* name) {
  std::vector<std::string> list;
  const Json::Value& values = parameters[name];
  if (values.isNull()) return list;
  const bool is_list = values.isArray() && !values.empty() && values.size() <= kMaxListItems;
  if (!is_list) throw Rejected{std::string("The parameter \"") + name + "\" must be a list of 1 to 100 names."};
  for (const Json::Value& value : values) {
    const std::string item = value.isString() ? value.asString() : "";
    if (item.empty() || item.size() > kMaxItemBytes) {
      throw Rejected{std::string("The parameter \"") + name + "\" has an item that is no name."};
    }
    list.push_back(item);
  }
  return list;
}

// Returns the time at which a token expires; 0 for never.
std::int64_t TakeExpiry(const Json::Value& parameters) {
  const Json::Value& seconds = parameters["expires_in"];
  if (seconds.isNull()) return 0;
  constexpr std::int64_t kMost = std::int64_t{100} * 365 * 24 * 3600;
  if (!seconds.isInt64() || seconds.asInt64() < 1 || seconds.asInt64() > kMost) {
    throw Rejected{"The parameter \"expires_in\" must be a number of seconds, 1 or more."};
  }
  return std::time(nullptr) + seconds.asInt64();
}

Json::Value ToJson(const std::vector<std::string>& list) {
  Json::Value json(Json::arrayValue);
  for (const std::string& item : list) json.append(item);
  return json;
}

// Times are seconds since 1970; one that has not come, or never will, is null.
Json::Value TimeOrNull(std::int64_t time) { return time == 0 ? Json::Value() : Json::Value(Json::Int64{time}); }

Json::Value ToJson(const Token& token) {
  Json::Value json;
  json["id"] = token.id;
  json["name"] = token.name;
  json["role"] = std::string(NameOf(token.role));
  json["apis"] = ToJson(token.apis);
  json["shares"] = ToJson(token.shares);
  json["created"] = Json::Int64{token.created};
  json["expires"] = TimeOrNull(token.expires);
  json["last_used"] = TimeOrNull(token.last_used);
  json["last_address"] = token.last_address;
  return json;
}

Response AnswerOf(TokenStore::Outcome outcome, const Json::Value& data, const std::string& error) {
  switch (outcome) {
    case TokenStore::Outcome::kDone:
      return Success(data);
    case TokenStore::Outcome::kUnknown:
      return Refusal(404, "There is no token with this id.");
    case TokenStore::Outcome::kNameTaken:
      return Refusal(409, "There is a token with this name.");
    case TokenStore::Outcome::kFull:
      return Refusal(409, "There are " + std::to_string(TokenStore::kMaxTokens) + " tokens. Revoke one first.");
    case TokenStore::Outcome::kFailed:
      break;
  }
  syslog(LOG_ERR, "The tokens were not changed. %s", QuotedForLog(error).c_str());
  return Failure(500, kInternalFailure, "The tokens could not be stored.", {}, {{error}, {}});
}

class TokenMethods {
 public:
  TokenMethods(TokenStore& tokens, std::set<std::string> apis) : tokens_(tokens), apis_(std::move(apis)) {}

  Response Create(const Json::Value& parameters, const Caller& caller) const {
    CheckNames(parameters, {"name", "role", "apis", "shares", "expires_in"});
    Token token;
    token.name = TakeName(parameters);
    token.role = TakeRole(parameters);
    token.apis = TakeList(parameters, "apis");
    token.shares = TakeList(parameters, "shares");
    token.expires = TakeExpiry(parameters);
    for (const std::string& api : token.apis) {
      if (apis_.count(api) == 0) throw Rejected{"There is no API \"" + api + "\"."};
    }
    std::string secret;
    std::string error;
    const TokenStore::Outcome outcome = tokens_.Create(&token, &secret, &error);
    Json::Value data = ToJson(token);
    data["token"] = secret;
    if (outcome == TokenStore::Outcome::kDone) Log(caller, "created", token.name);
    return AnswerOf(outcome, data, error);
  }

  Response List(const Json::Value& parameters) const {
    CheckNames(parameters, {});
    Json::Value list(Json::arrayValue);
    for (const Token& token : tokens_.List()) list.append(ToJson(token));
    return Success(list);
  }

  Response Revoke(const Json::Value& parameters, const Caller& caller) const {
    CheckNames(parameters, {"id"});
    const std::string id = TakeString(parameters, "id");
    std::string error;
    const TokenStore::Outcome outcome = tokens_.Revoke(id, &error);
    if (outcome == TokenStore::Outcome::kDone) Log(caller, "revoked", id);
    return AnswerOf(outcome, {}, error);
  }

 private:
  static void Log(const Caller& caller, const char* action, const std::string& token) {
    syslog(LOG_NOTICE, "%s %s the token %s", QuotedForLog(caller.name).c_str(), action, QuotedForLog(token).c_str());
  }

  TokenStore& tokens_;
  const std::set<std::string> apis_;
};

class SessionMethods {
 public:
  explicit SessionMethods(Sessions& sessions) : sessions_(sessions) {}

  static Response Get(const Json::Value& parameters, const Caller& caller) {
    CheckNames(parameters, {});
    Json::Value data;
    data["caller"] = caller.name;
    data["role"] = std::string(NameOf(caller.role));
    data["apis"] = ToJson(caller.apis);
    data["shares"] = ToJson(caller.shares);
    data["session"] = caller.session.empty() ? Json::Value() : Json::Value(caller.session);
    return Success(data);
  }

  Response SignOut(const Json::Value& parameters, const Caller& caller) const {
    CheckNames(parameters, {});
    if (caller.session.empty()) return Refusal(409, "This caller has not signed in, so there is no session to end.");
    sessions_.End(caller.session);
    Response response = Success({});
    response.headers.emplace_back("Set-Cookie", SessionCookie(""));
    return response;
  }

  Response List(const Json::Value& parameters) const {
    CheckNames(parameters, {});
    Json::Value list(Json::arrayValue);
    for (const Sessions::Session& session : sessions_.List(Sessions::Clock::now())) {
      Json::Value& json = list.append(Json::Value());
      json["id"] = session.id;
      json["account"] = session.account;
      json["role"] = std::string(NameOf(session.role));
      json["address"] = session.address;
      json["created"] = Json::Int64{session.created};
      json["idle_seconds"] = Json::Int64{session.idle.count()};
    }
    return Success(list);
  }

  Response End(const Json::Value& parameters, const Caller& caller) const {
    CheckNames(parameters, {"id"});
    const std::string id = TakeString(parameters, "id");
    if (!sessions_.End(id)) return Refusal(404, "There is no session with this id.");
    syslog(LOG_NOTICE, "%s ended the session %s", QuotedForLog(caller.name).c_str(), QuotedForLog(id).c_str());
    return Success({});
  }

 private:
  Sessions& sessions_;
};

ServerMethod Checked(ServerMethod method) {
  return [method = std::move(method)](const Json::Value& parameters, const Caller& caller) {
    try {
      return method(parameters, caller);
    } catch (const Rejected& rejected) {
      return Refusal(400, rejected.text);
    }
  };
}

enum class Access { kReaders, kAdministrators };

Route Row(const char* api, const char* name, Access access, ServerMethod method) {
  Route route{{api, 1, name, nullptr}, &ServerDescriptor(), {}, access == Access::kReaders, Checked(std::move(method))};
  route.method = route.descriptor->MethodAt("/api/" + route.Id());
  return route;
}

// Never called, because WebApi passes each call of this path to a SignInCall.
Response SignIn(const Json::Value& /*parameters*/, const Caller& /*caller*/) {
  throw std::logic_error("a sign-in was passed to a worker");
}

}  // namespace

const Descriptor& ServerDescriptor() {
  static const Descriptor descriptor = [] {
    std::string error;
    std::optional<Descriptor> parsed = Descriptor::Parse(kServerDescriptor, &error);
    if (!parsed) syslog(LOG_ERR, "VORN.Server.json: %s", error.c_str());
    return parsed.value_or(Descriptor());
  }();
  return descriptor;
}

void AddServerMethods(TokenStore& tokens, Sessions& sessions, Routes* routes) {
  std::set<std::string> apis;
  for (const Json::Value& row : routes->List()) apis.insert(row["api"].asString());
  using Values = Json::Value;
  const TokenMethods token(tokens, std::move(apis));
  const SessionMethods session(sessions);
  routes->Add(Row(kTokenApi, "create", Access::kAdministrators,
                  [token](const Values& values, const Caller& caller) { return token.Create(values, caller); }));
  routes->Add(Row(kTokenApi, "list", Access::kAdministrators,
                  [token](const Values& values, const Caller& /*caller*/) { return token.List(values); }));
  routes->Add(Row(kTokenApi, "revoke", Access::kAdministrators,
                  [token](const Values& values, const Caller& caller) { return token.Revoke(values, caller); }));
  routes->Add(Row(kSessionApi, "sign_in", Access::kReaders, SignIn));
  routes->Add(Row(kSessionApi, "get", Access::kReaders, SessionMethods::Get));
  routes->Add(Row(kSessionApi, "sign_out", Access::kReaders,
                  [session](const Values& values, const Caller& caller) { return session.SignOut(values, caller); }));
  routes->Add(Row(kSessionApi, "list", Access::kAdministrators,
                  [session](const Values& values, const Caller& /*caller*/) { return session.List(values); }));
  routes->Add(Row(kSessionApi, "end", Access::kAdministrators,
                  [session](const Values& values, const Caller& caller) { return session.End(values, caller); }));
}

}  // namespace vorn::server
