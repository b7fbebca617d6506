#include "authenticator.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "sandbox.h"
#include "secret.h"

namespace vorn::server {
namespace {

constexpr gid_t kAdministrators = 4001;
constexpr gid_t kReaders = 4002;
constexpr uid_t kUser = 40000;

class AuthenticatorTest : public testing::Test {
 protected:
  static Head AtSocket(uid_t uid, gid_t gid, std::vector<gid_t> groups = {}) {
    Head head;
    head.peer.credentials = Peer::Credentials{1, uid, gid, std::move(groups)};
    return head;
  }
  // Returns "none", or the caller's name and role.
  std::string Identify(const Head& head, bool secure = false) {
    const CallerPtr caller = authenticator_.Identify(head, secure);
    return caller ? caller->name + ", " + std::string(NameOf(caller->role)) : "none";
  }
  std::string NewToken() {
    Token token;
    token.name = "backup";
    std::string secret;
    std::string error;
    EXPECT_EQ(tokens_.Create(&token, &secret, &error), TokenStore::Outcome::kDone) << error;
    return secret;
  }
  std::string NewSession(Sessions::Carrier carrier) {
    return sessions_.Begin("alice", Role::kAdministrator, "unix", carrier, Sessions::Clock::now());
  }

  Sandbox sandbox_;
  TokenStore tokens_{sandbox_.File("tokens.json")};
  Sessions sessions_{Sessions::Limits{}};
  const Authenticator authenticator_{tokens_, sessions_, {kAdministrators, kReaders}};
};

TEST_F(AuthenticatorTest, KnowsLocalUsersByTheirGroups) {
  EXPECT_EQ(Identify(AtSocket(0, 0)), "uid 0, administrator");
  EXPECT_EQ(Identify(AtSocket(geteuid(), kUser)), "uid " + std::to_string(geteuid()) + ", administrator");
  EXPECT_EQ(Identify(AtSocket(kUser, kAdministrators)), "uid 40000, administrator");
  EXPECT_EQ(Identify(AtSocket(kUser, kUser, {1, kAdministrators})), "uid 40000, administrator");
  EXPECT_EQ(Identify(AtSocket(kUser, kUser, {kReaders, kAdministrators})), "uid 40000, administrator");
  EXPECT_EQ(Identify(AtSocket(kUser, kReaders)), "uid 40000, reader");
  EXPECT_EQ(Identify(AtSocket(kUser, kUser, {1, 2})), "none");
}

TEST_F(AuthenticatorTest, GivesNoRightsOfAGroupThatDoesNotExist) {
  const Authenticator authenticator(tokens_, sessions_, {});
  EXPECT_FALSE(authenticator.Identify(AtSocket(kUser, kAdministrators), false));
}

TEST_F(AuthenticatorTest, KnowsNobodyOverTcpWithoutCredentials) { EXPECT_EQ(Identify(Head{}), "none"); }

TEST_F(AuthenticatorTest, TakesABearerToken) {
  const std::string secret = NewToken();
  for (const char* scheme : {"Bearer ", "bearer ", "BEARER  "}) {
    const std::string value = scheme + secret;
    Head head;
    head.headers = {{"authorization", value}};
    EXPECT_EQ(Identify(head), "token backup, reader") << scheme;
  }
}

TEST_F(AuthenticatorTest, RefusesAWrongTokenWhoeverThePeerIs) {
  Head head = AtSocket(0, 0);
  for (const std::string& value :
       {"Bearer " + NewSecret(kTokenPrefix), std::string("Basic cm9vdDp4"), std::string(), std::string("Bearer")}) {
    head.headers = {{"Authorization", value}};
    EXPECT_EQ(Identify(head), "none") << value;
  }
}

TEST_F(AuthenticatorTest, RefusesTwoTokens) {
  const std::string value = "Bearer " + NewToken();
  Head head;
  head.headers = {{"Authorization", value}, {"Authorization", value}};
  EXPECT_EQ(Identify(head), "none");
}

TEST_F(AuthenticatorTest, TakesACookieOnASecureConnectionOnly) {
  const std::string session = NewSession(Sessions::Carrier::kCookie);
  const std::string values[] = {"__Host-vorn-session=" + session, "a=b; __Host-vorn-session=" + session + " ; c",
                                "__Host-vorn-sessio=x;__Host-vorn-session=" + session};
  for (const std::string& value : values) {
    Head head;
    head.headers = {{"Cookie", value}};
    EXPECT_EQ(Identify(head, true), "account alice, administrator") << value;
    EXPECT_EQ(Identify(head, false), "none") << value;
  }
}

TEST_F(AuthenticatorTest, TakesASessionAsItWasGiven) {
  const std::string cookie = "__Host-vorn-session=" + NewSession(Sessions::Carrier::kBearer);
  const std::string bearer = "Bearer " + NewSession(Sessions::Carrier::kCookie);
  const std::string right = "Bearer " + NewSession(Sessions::Carrier::kBearer);
  Head head;
  head.headers = {{"Cookie", cookie}};
  EXPECT_EQ(Identify(head, true), "none");
  head.headers = {{"Authorization", bearer}};
  EXPECT_EQ(Identify(head, true), "none");
  head.headers = {{"Authorization", right}};
  EXPECT_EQ(Identify(head, false), "account alice, administrator");
}

TEST_F(AuthenticatorTest, DoesNotGiveTheRightsOfAProxyToItsClients) {
  EXPECT_EQ(Identify(AtSocket(0, 0), true), "none");
}

TEST_F(AuthenticatorTest, SetsACookieThatOnlyThisServerGets) {
  EXPECT_EQ(SessionCookie("x"), "__Host-vorn-session=x; Path=/; Secure; HttpOnly; SameSite=Strict");
  EXPECT_EQ(SessionCookie(""), "__Host-vorn-session=; Path=/; Secure; HttpOnly; SameSite=Strict; Max-Age=0");
}

}  // namespace
}  // namespace vorn::server
