#include "sessions.h"

#include <gtest/gtest.h>

#include "secret.h"

namespace vorn::server {
namespace {

using Carrier = Sessions::Carrier;
using std::chrono::hours;
using std::chrono::minutes;
using std::chrono::seconds;

class SessionsTest : public testing::Test {
 protected:
  std::string Begin(const std::string& account = "alice", Carrier carrier = Carrier::kBearer) {
    return sessions_.Begin(account, Role::kReader, "127.0.0.1", carrier, now_);
  }
  CallerPtr Use(const std::string& secret, Carrier carrier = Carrier::kBearer) {
    return sessions_.Use(secret, carrier, now_);
  }

  Sessions sessions_{Sessions::Limits{}};
  Sessions::Clock::time_point now_{hours(1000)};
};

TEST_F(SessionsTest, NameTheirCaller) {
  const CallerPtr caller = Use(Begin());
  ASSERT_TRUE(caller);
  EXPECT_EQ(caller->name, "account alice");
  EXPECT_EQ(caller->role, Role::kReader);
  EXPECT_EQ(Use(NewSecret(kSessionPrefix)), nullptr);
}

TEST_F(SessionsTest, AreAcceptedInTheirOwnFormOnly) {
  EXPECT_EQ(Use(Begin("alice", Carrier::kCookie), Carrier::kBearer), nullptr);
  EXPECT_EQ(Use(Begin("alice", Carrier::kBearer), Carrier::kCookie), nullptr);
}

TEST_F(SessionsTest, EndWhenTheyAreIdle) {
  const std::string secret = Begin();
  now_ += minutes(29);
  EXPECT_TRUE(Use(secret));
  now_ += minutes(29);
  EXPECT_TRUE(Use(secret)) << "each use renews the time";
  now_ += minutes(30);
  EXPECT_FALSE(Use(secret));
  EXPECT_TRUE(sessions_.List(now_).empty());
}

TEST_F(SessionsTest, EndAfterTheirLifetimeHoweverBusy) {
  const std::string secret = Begin();
  for (int i = 0; i < 71; ++i) {
    now_ += minutes(10);
    ASSERT_TRUE(Use(secret)) << i;
  }
  now_ += minutes(10);
  EXPECT_FALSE(Use(secret));
}

TEST_F(SessionsTest, AreListedAndEndedById) {
  const std::string secret = Begin();
  now_ += seconds(7);
  const auto list = sessions_.List(now_);
  ASSERT_EQ(list.size(), 1U);
  EXPECT_EQ(list[0].account, "alice");
  EXPECT_EQ(list[0].address, "127.0.0.1");
  EXPECT_EQ(list[0].idle, seconds(7));
  EXPECT_EQ(secret.find(list[0].id), std::string::npos);
  EXPECT_TRUE(sessions_.End(list[0].id));
  EXPECT_FALSE(sessions_.End(list[0].id));
  EXPECT_FALSE(Use(secret));
}

TEST_F(SessionsTest, OfOneAccountPushOutOnlyEachOther) {
  const std::string bob = Begin("bob");
  const std::string first = Begin();
  now_ += seconds(1);
  const std::string second = Begin();
  for (int i = 0; i < 15; ++i) Begin();
  EXPECT_FALSE(Use(first));
  EXPECT_TRUE(Use(second));
  EXPECT_TRUE(Use(bob));
}

TEST_F(SessionsTest, AreLimitedInAll) {
  for (int i = 0; i < 400; ++i) Begin("account " + std::to_string(i));
  EXPECT_EQ(sessions_.List(now_).size(), 256U);
}

TEST_F(SessionsTest, CanBeginWithACodeOnce) {
  EXPECT_FALSE(sessions_.TakeCode("", now_)) << "there is no code";
  const std::string code = sessions_.NewCode(now_);
  EXPECT_FALSE(sessions_.TakeCode(NewSecret(kCodePrefix), now_));
  EXPECT_TRUE(sessions_.TakeCode(code, now_)) << "a wrong code takes nothing away";
  EXPECT_FALSE(sessions_.TakeCode(code, now_));
}

TEST_F(SessionsTest, CannotBeginWithAnOldCode) {
  const std::string code = sessions_.NewCode(now_);
  now_ += minutes(30);
  EXPECT_FALSE(sessions_.TakeCode(code, now_));
}

}  // namespace
}  // namespace vorn::server
