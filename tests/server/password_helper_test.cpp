#include "password_helper.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

using Kind = PasswordVerdict::Kind;

TEST(PasswordMessages, CarryARequest) {
  const auto request = ParseRequest(FormatRequest({"alice", "a b\nc", "192.0.2.7"}));
  ASSERT_TRUE(request);
  EXPECT_EQ(request->account, "alice");
  EXPECT_EQ(request->password, "a b\nc");
  EXPECT_EQ(request->address, "192.0.2.7");
}

TEST(PasswordMessages, AreWholeOrRefused) {
  EXPECT_FALSE(ParseRequest(""));
  EXPECT_FALSE(ParseRequest(std::string_view("alice\0", 6)));
}

TEST(PasswordMessages, CarryAVerdict) {
  for (const PasswordVerdict& sent :
       {PasswordVerdict{Kind::kGranted, Role::kReader, "bob"},
        PasswordVerdict{Kind::kGranted, Role::kAdministrator, "alice"}, PasswordVerdict{Kind::kRefused},
        PasswordVerdict{Kind::kNoRole}, PasswordVerdict{Kind::kUnavailable}}) {
    const PasswordVerdict got = ParseVerdict(FormatVerdict(sent));
    EXPECT_EQ(got.kind, sent.kind) << FormatVerdict(sent);
    EXPECT_EQ(got.role, sent.role);
    EXPECT_EQ(got.account, sent.account);
  }
}

TEST(PasswordMessages, GrantNothingWhenTheyAreBroken) {
  for (const char* message :
       {"", "administrator", "administrator\n", "root\nalice", "\nalice", "ADMINISTRATOR\nalice"}) {
    EXPECT_EQ(ParseVerdict(message).kind, Kind::kUnavailable) << message;
  }
}

}  // namespace
}  // namespace vorn::server
