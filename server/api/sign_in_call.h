// Signing in: VORN.Server.Session v1 sign_in, with the account and password of a person, or with a one-time code.
#ifndef VORN_SERVER_SIGN_IN_CALL_H
#define VORN_SERVER_SIGN_IN_CALL_H

#include <json/value.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "http.h"
#include "password_checker.h"
#include "pending_answer.h"
#include "sessions.h"

namespace vorn::server {

constexpr std::string_view kSignInPath = "/api/VORN.Server.Session/v1/sign_in";

// The parameters are {"account": ..., "password": ...} or {"code": ...}. The answer has the account, its role and the
// lifetimes of the session, whose secret is a cookie for a secure connection, and the member "token" otherwise.
class SignInCall : public Exchange, public std::enable_shared_from_this<SignInCall> {
 public:
  static constexpr std::size_t kMaxBytes = 4096;
  static Response TooLarge();

  // The objects that all calls share. They must outlive the calls.
  struct Environment {
    Sessions& sessions;
    PasswordChecker& passwords;
  };

  // `secure`: the client reached the server over TLS.
  SignInCall(Environment environment, Peer peer, bool secure)
      : environment_(environment), peer_(std::move(peer)), secure_(secure) {}
  ~SignInCall() override;

  std::optional<Response> Receive(std::string_view piece) override;
  void Run(Answer answer) override;

 private:
  std::optional<Response> Begin();
  Response SignInByCode(const std::string& code);
  void SignInByPassword(PasswordRequest request);
  Response AnswerTo(const PasswordChecker::Result& result) const;
  Response NewSession(const std::string& account, Role role) const;

  const Environment environment_;
  const Peer peer_;
  const bool secure_;
  std::string text_;
  PendingAnswer answer_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_SIGN_IN_CALL_H
