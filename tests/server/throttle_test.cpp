#include "throttle.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class ThrottleTest : public testing::Test {
 protected:
  milliseconds Try(const std::string& account, const std::string& address) {
    return throttle_.Begin(account, address, now_);
  }

  Throttle throttle_{Throttle::Limits{}};
  Throttle::Clock::time_point now_{};
};

TEST_F(ThrottleTest, DelaysMoreAndMoreUpToALimit) {
  const milliseconds expected[] = {seconds(0), seconds(0), seconds(0),  seconds(1),  seconds(2),
                                   seconds(4), seconds(8), seconds(16), seconds(30), seconds(30)};
  for (int i = 0; i < 10; ++i) EXPECT_EQ(Try("account " + std::to_string(i), "192.0.2.7"), expected[i]) << i;
}

TEST_F(ThrottleTest, NeverLocksAnAccount) {
  for (int i = 0; i < 1000; ++i) Try("alice", "192.0.2." + std::to_string(i));
  EXPECT_EQ(Try("alice", "198.51.100.1"), seconds(5));
  EXPECT_EQ(Try("bob", "198.51.100.2"), seconds(0)) << "another account";
}

TEST_F(ThrottleTest, DoesNotDelayTheOwnerWhereTheAccountHasSignedInBefore) {
  Try("alice", "198.51.100.1");
  throttle_.Succeed("alice", "198.51.100.1", now_);
  for (int i = 0; i < 100; ++i) Try("alice", "192.0.2." + std::to_string(i));
  EXPECT_EQ(Try("alice", "198.51.100.1"), seconds(0));
}

TEST_F(ThrottleTest, ASuccessDoesNotForgiveGuessesAtOtherAccounts) {
  for (int i = 0; i < 5; ++i) {
    Try("alice", "192.0.2.7");
    Try("mallory", "192.0.2.7");
    throttle_.Succeed("mallory", "192.0.2.7", now_);
  }
  EXPECT_GE(Try("bob", "192.0.2.7"), seconds(4));
}

TEST_F(ThrottleTest, ForgetsOneAttemptEachMinute) {
  for (int i = 0; i < 5; ++i) Try("alice", "192.0.2.7");
  now_ += std::chrono::minutes(2);
  EXPECT_EQ(Try("alice", "192.0.2.7"), seconds(1));
  now_ += std::chrono::hours(1);
  for (int i = 0; i < 3; ++i) EXPECT_EQ(Try("alice", "192.0.2.7"), seconds(0));
  EXPECT_EQ(Try("alice", "192.0.2.7"), seconds(1));
}

TEST_F(ThrottleTest, RemembersALimitedNumber) {
  Throttle::Limits limits;
  limits.entries = 3;
  Throttle throttle(limits);
  for (int i = 0; i < 100; ++i) {
    throttle.Begin("account " + std::to_string(i), "address " + std::to_string(i), now_);
    throttle.Succeed("account " + std::to_string(i), "address " + std::to_string(i), now_);
    now_ += milliseconds(1);
  }
  EXPECT_EQ(throttle.Begin("account 99", "address 99", now_), seconds(0));
}

}  // namespace
}  // namespace vorn::server
