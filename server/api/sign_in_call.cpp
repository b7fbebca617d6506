#include "sign_in_call.h"

#include <syslog.h>

#include <algorithm>
#include <exception>
#include <utility>

#include "answer.h"
#include "authenticator.h"
#include "json_input.h"
#include "log_quote.h"
#include "secret.h"

namespace vorn::server {
namespace {

using Kind = PasswordVerdict::Kind;

bool IsWanted(const Json::Value& value, std::size_t most_bytes) {
  return value.isString() && !value.asString().empty() && value.asString().size() <= most_bytes &&
         value.asString().find('\0') == std::string::npos;
}

// The answer is the same for an unknown account, a wrong password and an account that may not be used.
Response WrongPassword() { return Unauthenticated("The account or the password is wrong."); }

Response TooMany() {
  Response response = Refusal(429, "Too many people are signing in with this account or from this address.");
  response.headers.emplace_back("Retry-After", "5");
  return response;
}

}  // namespace

Response SignInCall::TooLarge() { return Refusal(413, "The parameters are larger than 4 KiB."); }

SignInCall::~SignInCall() { Wipe(&text_); }

std::optional<Response> SignInCall::Receive(std::string_view piece) {
  if (piece.size() > kMaxBytes - text_.size()) return TooLarge();
  text_ += piece;
  return std::nullopt;
}

// The parameters are small, so the network thread parses them itself.
void SignInCall::Run(Answer answer) {
  answer_.Await(std::move(answer));
  try {
    if (auto response = Begin()) answer_.Give(*std::move(response));
  } catch (const std::exception& exception) {
    syslog(LOG_ERR, "A sign-in has no answer: %s", exception.what());
    answer_.Give(InternalFailure());
  }
}

// Returns the answer, or std::nullopt if it is given later. A parameter that is null counts as absent.
std::optional<Response> SignInCall::Begin() {
  std::string error;
  const std::optional<Json::Value> parameters = ParseJsonObject(text_, &error);
  if (!parameters) return Refusal(400, "The parameters are not valid JSON. " + error + ".");
  const Json::Value& account = (*parameters)["account"];
  const Json::Value& password = (*parameters)["password"];
  const Json::Value& code = (*parameters)["code"];
  const auto given = std::count_if(parameters->begin(), parameters->end(),
                                   [](const Json::Value& parameter) { return !parameter.isNull(); });
  if (given == 1 && code.isString()) return SignInByCode(code.asString());
  if (given == 2 && IsWanted(account, kMaxAccountBytes) && IsWanted(password, kMaxPasswordBytes)) {
    SignInByPassword({account.asString(), password.asString(), peer_.address});
    return std::nullopt;
  }
  return Refusal(400, "Signing in takes an \"account\" and its \"password\", or a \"code\".");
}

Response SignInCall::SignInByCode(const std::string& code) {
  if (environment_.sessions.TakeCode(code, Sessions::Clock::now())) return NewSession("", Role::kAdministrator);
  return Unauthenticated("This code is not valid, no longer valid, or has been used.");
}

void SignInCall::SignInByPassword(PasswordRequest request) {
  environment_.passwords.Check(std::move(request), peer_.ShareKey(),
                               [self = shared_from_this()](const PasswordChecker::Result& result) {
                                 try {
                                   self->answer_.Give(self->AnswerTo(result));
                                 } catch (const std::exception&) {
                                   self->answer_.Give(InternalFailure());
                                 }
                               });
}

// People type passwords where the account belongs, so only the name of an account that PAM knows is logged.
Response SignInCall::AnswerTo(const PasswordChecker::Result& result) const {
  if (result.too_many) return TooMany();
  switch (result.verdict.kind) {
    case Kind::kGranted:
      return NewSession(result.verdict.account, result.verdict.role);
    case Kind::kNoRole:
      return Refusal(403, "This account belongs neither to the administrators' group nor to the readers' group.");
    case Kind::kRefused:
      syslog(LOG_NOTICE, "A sign-in from %s has failed", peer_.address.c_str());
      return WrongPassword();
    case Kind::kUnavailable:
      break;
  }
  return Busy("The system cannot check passwords at the moment.");
}

Response SignInCall::NewSession(const std::string& account, Role role) const {
  Sessions& sessions = environment_.sessions;
  const auto carrier = secure_ ? Sessions::Carrier::kCookie : Sessions::Carrier::kBearer;
  const std::string secret = sessions.Begin(account, role, peer_.address, carrier, Sessions::Clock::now());
  syslog(LOG_NOTICE, "%s has signed in from %s as %s",
         account.empty() ? "A sign-in link" : ("The account " + QuotedForLog(account)).c_str(), peer_.address.c_str(),
         std::string(NameOf(role)).c_str());
  Json::Value data;
  data["account"] = account;
  data["role"] = std::string(NameOf(role));
  data["idle_seconds"] = Json::Int64{sessions.limits().idle.count()};
  data["lifetime_seconds"] = Json::Int64{sessions.limits().lifetime.count()};
  if (!secure_) data["token"] = secret;
  Response response = Success(data);
  if (secure_) response.headers.emplace_back("Set-Cookie", SessionCookie(secret));
  return response;
}

}  // namespace vorn::server
