#include "mount_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::Pair;

// "address path reason", or "" for another message.
std::string Read(const std::string& message) {
  const auto request = ParseMountMessage(message);
  return request ? request->address + " " + request->path + " " + request->reason : "";
}

// The messages of mountd of Debian 12.
TEST(MountMessage, SaysWhoWasRefusedAndWhy) {
  EXPECT_EQ(Read("refused mount request from 10.9.0.12 for /srv/data (/srv/data): unmatched host"),
            "10.9.0.12 /srv/data no_rule");
  EXPECT_EQ(Read("refused mount request from 10.9.0.12 for /srv/data (/srv/data): no export entry"),
            "10.9.0.12 /srv/data no_rule");
  EXPECT_EQ(Read("refused mount request from fd00:9:0::b for /srv/more (/): not exported"),
            "fd00:9::b /srv/more not_exported");
  EXPECT_EQ(Read("refused mount request from 10.9.0.11 for /srv/data (/srv/data): illegal port 42132"),
            "10.9.0.11 /srv/data port");
  EXPECT_EQ(Read("bad path in mount request from 10.9.0.11: \"/srv/none\""), "10.9.0.11 /srv/none path");
}

TEST(MountMessage, SaysWhoWasAdmitted) {
  EXPECT_EQ(Read("authenticated mount request from 10.9.0.11:719 for /srv/more (/srv/more)"), "10.9.0.11 /srv/more ");
  EXPECT_EQ(Read("authenticated mount request from fd00:9::b:719 for /srv/a b (/srv/a b)"), "fd00:9::b /srv/a b ");
}

// The client chooses the path.
TEST(MountMessage, IsNotForgedByAPath) {
  EXPECT_EQ(Read("refused mount request from 10.9.0.12 for /a (/a): unmatched host (/): not exported"),
            "10.9.0.12 /a (/a): unmatched host not_exported");
  EXPECT_EQ(
      Read("refused mount request from 10.9.0.12 for /a\nrefused mount request from 10.9.0.9 for /b (/): not exported"),
      "10.9.0.12 /a\nrefused mount request from 10.9.0.9 for /b not_exported");
  EXPECT_EQ(Read("refused mount request from 10.9.0.12 for  (/): not exported"), "10.9.0.12  not_exported");
}

TEST(MountMessage, OfAnotherKindIsIgnored) {
  for (const char* message :
       {"", "Version 2.6.2 starting", "v4.2 client attached: 0x1 from \"10.9.7.13:689\"",
        "refused unmount request from 10.9.0.1 for /srv/more (/srv/more): unmatched host",
        "refused mount request from ", "refused mount request from 10.9.0.12",
        "refused mount request from 10.9.0.12 for ", "refused mount request from 10.9.0.12 for /srv",
        "refused mount request from 10.9.0.12 for /srv (/srv): because",
        "refused mount request from host for /srv (/srv): unmatched host",
        "authenticated mount request from 10.9.0.11:1", "authenticated mount request from :1 for /srv (/srv)",
        "bad path in mount request from 10.9.0.11: ", "bad path in mount request from : \"/srv\""}) {
    EXPECT_EQ(Read(message), "") << message;
  }
}

TEST(MountLog, KeepsTheLastTimeOfEachRequest) {
  MountLog log;
  for (const std::int64_t time : {50, 70, 60}) log.Add({"10.9.0.11", "/srv", ""}, time);
  for (const std::int64_t time : {5, 7, 6}) log.Add({"10.9.0.12", "/srv", "no_rule"}, time);
  EXPECT_THAT(log.admitted, ElementsAre(Pair("10.9.0.11", 70)));
  const MountLog::Refused refused = log.refused.at("10.9.0.12").at({"/srv", "no_rule"});
  EXPECT_EQ(refused.count, 3);
  EXPECT_EQ(refused.last, 7);
}

TEST(MountLog, IsBoundedWhateverAClientAsksFor) {
  MountLog log;
  for (int i = 0; i < 1000; ++i) log.Add({"10.9.0.12", "/" + std::to_string(i), "not_exported"}, 1);
  log.Add({"10.9.0.12", "/0", "not_exported"}, 2);
  EXPECT_EQ(log.refused.at("10.9.0.12").size(), kMostRefusals);
  EXPECT_EQ(log.refused.at("10.9.0.12").at({"/0", "not_exported"}).count, 2);
}

// This machine may have a journal or none.
TEST(MountLog, IsReadFromTheJournalWithoutHarm) {
  for (const auto& [address, requests] : ReadMountLog().refused) EXPECT_LE(requests.size(), kMostRefusals) << address;
}

}  // namespace
}  // namespace vorn
