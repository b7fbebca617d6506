#include "shares.h"

#include <gtest/gtest.h>

#include "peer.h"

namespace vorn::server {
namespace {

ConnectionUse Use(std::string_view key, Activity activity, int second) {
  return {key, activity, std::chrono::steady_clock::time_point(std::chrono::seconds(second))};
}

TEST(Shares, NoConnectionIsClosedBelowTheLimit) {
  EXPECT_EQ(SurplusOf({}, {1, 1}), kNoConnection);
  EXPECT_EQ(SurplusOf({Use("", Activity::kIdle, 1), Use("", Activity::kIdle, 2)}, {2, 1}), kNoConnection)
      << "connections without a share key have no share of an address";
}

TEST(Shares, TheOrderIsEndingThenIdleThenWaiting) {
  std::vector<ConnectionUse> uses = {Use("", Activity::kWorking, 1), Use("", Activity::kWaiting, 2),
                                     Use("", Activity::kIdle, 4),    Use("", Activity::kIdle, 3),
                                     Use("", Activity::kEnding, 5),  Use("", Activity::kIdle, 6)};
  for (const std::size_t expected : {4U, 3U, 2U, 5U, 1U}) {
    EXPECT_EQ(SurplusOf(uses, {1, 1}), expected);
    uses[expected].activity = Activity::kWorking;
  }
  EXPECT_EQ(SurplusOf(uses, {1, 1}), kNoConnection) << "work is never given up";
}

TEST(Shares, AnAddressBeyondItsShareLosesItsOwnConnections) {
  const std::vector<ConnectionUse> uses = {Use("b", Activity::kIdle, 1), Use("a", Activity::kWaiting, 2),
                                           Use("a", Activity::kWaiting, 3), Use("a", Activity::kIdle, 4)};
  EXPECT_EQ(SurplusOf(uses, {100, 3}), kNoConnection);
  EXPECT_EQ(SurplusOf(uses, {100, 2}), 3U) << "its newest, because the others are in a request";
  EXPECT_EQ(SurplusOf(uses, {3, 3}), 0U);
}

TEST(Shares, CallsCrowdOutIfMostOfTheListenersShareIsWorking) {
  std::vector<ConnectionUse> uses = {Use("", Activity::kWorking, 1), Use("", Activity::kWorking, 2),
                                     Use("", Activity::kWorking, 3), Use("", Activity::kWaiting, 4),
                                     Use("", Activity::kWaiting, 5)};
  EXPECT_TRUE(CallsCrowdOut(uses, {4, 4}));
  EXPECT_FALSE(CallsCrowdOut(uses, {5, 5})) << "there is room";
  uses[0].activity = Activity::kWaiting;
  EXPECT_FALSE(CallsCrowdOut(uses, {4, 4})) << "half of the share is not most of it";
}

TEST(Shares, CallsOfAnAddressBeyondItsShareCrowdOutNobody) {
  const std::vector<ConnectionUse> uses = {Use("a", Activity::kWorking, 1), Use("a", Activity::kWorking, 2),
                                           Use("a", Activity::kWaiting, 3)};
  EXPECT_TRUE(CallsCrowdOut(uses, {2, 3}));
  EXPECT_FALSE(CallsCrowdOut(uses, {2, 2}));
}

TEST(Peer, AddressesAreCountedTogetherByNetwork) {
  const auto key = [](const char* address, bool loopback = false) {
    Peer peer;
    peer.address = address;
    peer.loopback = loopback;
    return peer.ShareKey();
  };
  EXPECT_EQ(key("192.0.2.7"), "192.0.2.7");
  EXPECT_EQ(key("2001:db8:1:2:3:4:5:6"), "2001:db8:1:2::/64");
  EXPECT_EQ(key("127.0.0.1", true), "");
  EXPECT_EQ(key("unix"), "");
}

}  // namespace
}  // namespace vorn::server
