#include "client_info.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

namespace vorn {
namespace {

// The description of a client of NFSv4.2 by Linux 6.1.
constexpr char kText[] =
    "clientid: 0x6d077c99675dd2b3\n"
    "address: \"10.9.0.11:871\"\n"
    "status: confirmed\n"
    "seconds from last renew: 3\n"
    "name: \"Linux NFSv4.2 client.lab.test\"\n"
    "minor version: 2\n"
    "Implementation domain: \"kernel.org\"\n"
    "Implementation name: \"Linux 6.1.0\"\n"
    "Implementation time: [0, 0]\n"
    "callback state: UP\n"
    "callback address: 10.9.0.11:871\n";

TEST(ClientInfo, HasWhatTheKernelShows) {
  const ClientInfo info = ParseClientInfo(kText);
  EXPECT_EQ(info.client_id, "0x6d077c99675dd2b3");
  EXPECT_EQ(info.address, "10.9.0.11");
  EXPECT_EQ(info.port, 871);
  EXPECT_EQ(info.status, "confirmed");
  EXPECT_EQ(info.name, "Linux NFSv4.2 client.lab.test");
  EXPECT_EQ(info.minor_version, 2);
  EXPECT_EQ(info.seconds_from_renewal, 3);
  EXPECT_EQ(info.implementation, "Linux 6.1.0");
}

TEST(ClientInfo, LacksWhatTheKernelDoesNotShow) {
  const ClientInfo info = ParseClientInfo("");
  EXPECT_EQ(info.client_id + info.address + info.status + info.name + info.implementation, "");
  EXPECT_FALSE(info.minor_version);
  EXPECT_FALSE(info.seconds_from_renewal);
}

TEST(ClientInfo, ReadsBothFamiliesOfAddresses) {
  const std::pair<const char*, const char*> cases[] = {{"\"[fd00:9::b]:1001\"", "fd00:9::b"},
                                                       {"\"[::ffff:10.9.0.11]:1001\"", "10.9.0.11"},
                                                       {"\"10.9.0.11:1001\"", "10.9.0.11"},
                                                       {"\"host:1001\"", ""},
                                                       {"\"10.9.0.11\"", ""},
                                                       {"10.9.0.11:1001", ""}};
  for (const auto& [address, expected] : cases) {
    EXPECT_EQ(ParseClientInfo("address: " + std::string(address) + "\n").address, expected) << address;
  }
}

// The kernel escapes what a client chooses: a quotation mark, a backslash, and all bytes that are not printable ASCII.
TEST(ClientInfo, TakesBackTheEscapesOfANameThatTheClientChose) {
  const std::pair<const char*, std::string> cases[] = {{R"("a\x0astatus: expirable")", "a\nstatus: expirable"},
                                                       {R"("\x22\x5c\xc3\xa4")", "\"\\\xc3\xa4"},
                                                       {R"("\x00b")", std::string("\0b", 2)},
                                                       {R"("\xg0 \x1")", R"(\xg0 \x1)"},
                                                       {R"("\)", ""},
                                                       {R"(")", ""},
                                                       {R"(plain)", ""},
                                                       {R"("")", ""}};
  for (const auto& [name, expected] : cases) {
    const ClientInfo info = ParseClientInfo("status: confirmed\nname: " + std::string(name) + "\n");
    EXPECT_EQ(info.name, expected) << name;
    EXPECT_EQ(info.status, "confirmed") << name;
  }
}

TEST(ClientInfo, IgnoresWhatItDoesNotUnderstandAndTheSecondLineOfAKind) {
  const ClientInfo info = ParseClientInfo(
      "noise\n: \nclientid: 0x1\nclientid: 0x2\nminor version: two\n"
      "seconds from last renew: 9999999999999999999999\nstatus: courtesy");
  EXPECT_EQ(info.client_id, "0x1");
  EXPECT_FALSE(info.minor_version);
  EXPECT_FALSE(info.seconds_from_renewal);
  EXPECT_EQ(info.status, "courtesy");
}

}  // namespace
}  // namespace vorn
