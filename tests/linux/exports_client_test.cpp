#include "exports_client.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "exportfs_judge.h"

namespace vorn {
namespace {

using testing::HasSubstr;

const std::vector<std::string> kHosts = {
    "alpha",        "Beta.example", "under_score", "xn--bcher-kva.example",
    "9to5.example", "a.b.c.d.e",    "host1",       std::string(63, 'a') + ".example"};

const std::vector<std::string> kOthers = {"*",
                                          "*.example",
                                          "host?",
                                          "host[1-9]",
                                          "host[^1-9].example",
                                          "[^a]*",
                                          "10.0.0.*",
                                          "10.0.0.1",
                                          "0.0.0.0",
                                          "255.255.255.255",
                                          "10.0.0.0/8",
                                          "10.0.0.1/32",
                                          "10.1.2.3/24",
                                          "10.0.0.0/255.0.0.0",
                                          "10.1.0.0/255.255.128.0",
                                          "1.0.0.0/0.0.0.0",
                                          "::1",
                                          "::",
                                          "2001:db8::17",
                                          "2001:DB8:0:0::18",
                                          "::ffff:10.0.0.1",
                                          "2001:db8::/32",
                                          "::/::",
                                          "2001:db8::1/128",
                                          "2001:db8::/ffff:ffff::",
                                          "@admins",
                                          "@all.hosts_2-b"};

TEST(CheckExportClient, AcceptsEveryFormThatTheFileKnows) {
  for (const auto& list : {kHosts, kOthers}) {
    for (const std::string& client : list) EXPECT_TRUE(CheckExportClient(client).ok()) << client;
  }
}

TEST(CheckExportClient, AcceptsNothingThatExportfsRefuses) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  std::string file;
  for (const auto& list : {kHosts, kOthers}) {
    for (const std::string& client : list) file += "/usr " + client + "(rw,no_subtree_check)\n";
  }
  const ExportfsVerdict verdict = judge.Judge({file}, kHosts).front();
  EXPECT_EQ(verdict.status, 0) << verdict.messages;
  EXPECT_EQ(verdict.messages, "");
  const auto lines = std::count(verdict.table.begin(), verdict.table.end(), '\n');
  EXPECT_EQ(static_cast<std::size_t>(lines), kHosts.size() + kOthers.size()) << verdict.table;
}

struct RefusedClient {
  const char* client;
  const char* reason;
};

const RefusedClient kRefused[] = {{"", "everybody"},
                                  {" ", "host name"},
                                  {"a b", "host name"},
                                  {"a\tb", "host name"},
                                  {"a\n", "host name"},
                                  {"a\n/etc *(rw)", "no address"},
                                  {"a\r", "host name"},
                                  {"host\x01", "host name"},
                                  {"a#b", "host name"},
                                  {"#a", "host name"},
                                  {"a\\", "host name"},
                                  {"a\\040b", "host name"},
                                  {"\\", "host name"},
                                  {"a(rw)", "host name"},
                                  {"a)", "host name"},
                                  {"a\"b", "host name"},
                                  {"a,b", "host name"},
                                  {"a=b", "host name"},
                                  {"b\xc3\xbc"
                                   "cher",
                                   "host name"},
                                  {"-rw", "hyphen"},
                                  {"-*", "hyphen"},
                                  {"a-.example", "host name"},
                                  {"a..b", "host name"},
                                  {".example", "host name"},
                                  {".", "host name"},
                                  {"10", "whole address"},
                                  {"10.0.0", "whole address"},
                                  {"10.0.0.256", "whole address"},
                                  {"0x0a", "whole address"},
                                  {"host.1", "whole address"},
                                  {"fe80::1%lo", "host name"},
                                  {"[::1]:2049", "bracket"},
                                  {"10.0.0.0/33", "prefix"},
                                  {"0.0.0.0/0", "0.0.0.0/0.0.0.0"},
                                  {"10.0.0.1/0", "prefix of length 0"},
                                  {"::/0", "::/::"},
                                  {"10.0.0.0/00", "prefix"},
                                  {"10.0.0.0/210", "prefix"},
                                  {"10.0.0.0/-1", "prefix"},
                                  {"10.0.0.0/+8", "prefix"},
                                  {"10.0.0.0/08", "prefix"},
                                  {"10.0.0.0/", "prefix"},
                                  {"10.0.0.0/8/8", "prefix"},
                                  {"10.0.0.0/8 ", "prefix"},
                                  {"10.0.0.0/99999999999", "prefix"},
                                  {"10.0.0.0/255.0.255.0", "mask"},
                                  {"10.0.0.0/ffff::", "mask"},
                                  {"2001:db8::/129", "prefix"},
                                  {"2001:db8::/ffff:0:ffff::", "mask"},
                                  {"2001:db8::/255.0.0.0", "mask"},
                                  {"10/8", "no address"},
                                  {"host/24", "no address"},
                                  {"/24", "no address"},
                                  {"*/8", "no address"},
                                  {"10.0.0.*/24", "no address"},
                                  {"[a", "bracket"},
                                  {"host[!1-9]", "negates"},
                                  {"[]", "bracket"},
                                  {"[a-z", "bracket"},
                                  {"a[b]c[", "bracket"},
                                  {"a]", "host name"},
                                  {"a]*", "pattern"},
                                  {"* ", "pattern"},
                                  {"*#", "pattern"},
                                  {"@", "netgroup"},
                                  {"@a b", "netgroup"},
                                  {"@a(rw)", "netgroup"},
                                  {"@a/b", "netgroup"},
                                  {"@a\n", "netgroup"},
                                  {"gss/krb5", "obsolete"},
                                  {"gss/krb5i", "obsolete"},
                                  {"gss/anything", "obsolete"}};

TEST(CheckExportClient, RefusesTheRestWithAReason) {
  for (const RefusedClient& c : kRefused) {
    const Status status = CheckExportClient(c.client);
    EXPECT_EQ(status.code(), kRefusedText) << c.client;
    EXPECT_THAT(status.reason(), HasSubstr(c.reason)) << c.client;
  }
}

TEST(CheckExportClient, RefusesTextThatIsTooLong) {
  EXPECT_FALSE(CheckExportClient(std::string(64, 'a')).ok());
  EXPECT_TRUE(CheckExportClient(std::string(254, '*')).ok());
  EXPECT_FALSE(CheckExportClient(std::string(255, '*')).ok());
  EXPECT_FALSE(CheckExportClient("@" + std::string(254, 'a')).ok());
  std::string name = std::string(63, 'a') + "." + std::string(63, 'b') + "." + std::string(63, 'c') + ".";
  EXPECT_TRUE(CheckExportClient(name + std::string(61, 'd')).ok());
  EXPECT_FALSE(CheckExportClient(name + std::string(62, 'd')).ok());
}

TEST(CheckExportClient, RefusesANULByte) {
  using std::string_literals::operator""s;
  for (const auto& client : {"\0"s, "a\0b"s, "10.0.0.1\0"s, "10.0.0.0/8\0"s, "*\0"s, "@a\0"s}) {
    EXPECT_FALSE(CheckExportClient(client).ok()) << client.size();
  }
}

struct ClientPair {
  const char* first;
  const char* second;
  bool is_one;
};

const ClientPair kPairs[] = {{"Alpha", "alpha", true},
                             {"@Group", "@group", true},
                             {"*.EX", "*.ex", true},
                             {"2001:0DB8:0::1", "2001:db8::1", true},
                             {"0::1", "::0.0.0.1", true},
                             {"10.0.0.1", "10.1", true},
                             {"10.0.0.1", "012.0.0.1", true},
                             {"10.0.0.1", "0xa.0.0.1", true},
                             {"10.0.0.1", "167772161", true},
                             {"10.0.0.1", "::ffff:10.0.0.1", false},
                             {"fe80::1%lo", "fe80::1", false},
                             {"10.0.0.1", "10.0.0.1/32", false},
                             {"10.0.0.0/8", "10.1.0.0/8", false},
                             {"10.0.0.0/8", "10.0.0.0/255.0.0.0", false},
                             {"FE80::/16", "fe80::/16", true},
                             {"fe80:0::/16", "fe80::/16", false},
                             {"*", "**", false}};

TEST(ExportClientKey, IsOneForWhatExportfsTakesForOne) {
  for (const ClientPair& pair : kPairs) {
    EXPECT_EQ(ExportClientKey(pair.first) == ExportClientKey(pair.second), pair.is_one) << pair.first << pair.second;
  }
  EXPECT_EQ(ExportClientKey("host.example."), ExportClientKey("Host.Example"));
  EXPECT_NE(ExportClientKey("*.example."), ExportClientKey("*.example"));
}

TEST(ExportClientKey, AgreesWithExportfs) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  std::vector<std::string> files;
  for (const ClientPair& pair : kPairs) {
    files.push_back(std::string("/mnt/a ") + pair.first + "(rw) " + pair.second + "(ro)\n");
  }
  const auto verdicts = judge.Judge(files, {"alpha"});
  for (std::size_t i = 0; i < files.size(); ++i) {
    const auto clients = std::count(verdicts[i].table.begin(), verdicts[i].table.end(), '\n');
    EXPECT_EQ(clients, kPairs[i].is_one ? 1 : 2) << files[i] << verdicts[i].messages;
  }
}

struct Membership {
  const char* network;
  const char* client;
  bool is_in;
};

TEST(ReadExportNetwork, HasTheAddressesThatMountdTakes) {
  const Membership cases[] = {
      {"10.0.0.0/8", "10.1.2.3", true},
      {"10.0.0.0/8", "11.0.0.0", false},
      {"10.9.9.9/08", "10.1.2.3", true},
      {"10.0.0.0/0.0.0.0", "192.0.2.1", true},
      {"10.0.0.0/255.0.255.0", "10.7.0.8", true},
      {"10.0.0.0/255.0.255.0", "10.7.1.8", false},
      {"fd00::/8", "fdff::1", true},
      {"fd00::/64", "fd00:0:0:1::1", false},
      {"fd00::/::", "2001:db8::1", true},
      {"0.0.0.0/0.0.0.0", "::1", false},
      {"::/::", "10.0.0.1", false},
      {"10.0.0.1", "10.0.0.1", true},
      {"10.0.0.1", "10.0.0.2", false},
  };
  for (const Membership& one : cases) {
    const auto network = ReadExportNetwork(one.network);
    const auto client = ReadExportNetwork(one.client);
    ASSERT_TRUE(network && client) << one.network;
    EXPECT_EQ(Contains(*network, *client), one.is_in) << one.network << " " << one.client;
  }
  for (const char* text : {"", "host", "*", "@hosts", "10.0.0.0/33", "10.0.0.0/x", "10.0.0.0/8x",
                           "10.0.0.0/ffff::", "fd00::/129", "fd00::/255.0.0.0", "host/8"}) {
    EXPECT_FALSE(ReadExportNetwork(text)) << text;
  }
}

#if defined(__x86_64__) || defined(__aarch64__)
TEST(ReadExportNetwork, TakesAPrefixOfLength0ForOneOf32) {
  EXPECT_EQ(ExportNetworkKey("10.0.0.1/0"), "10.0.0.1/32");
  EXPECT_EQ(ExportNetworkKey("10.0.0.1/"), "10.0.0.1/32");
  EXPECT_EQ(ExportNetworkKey("2001:db8::1/0"), "2001:db8::/32");
}
#endif

TEST(ExportNetworkKey, IsOneForTheSameAddresses) {
  EXPECT_EQ(ExportNetworkKey("10.0.0.1"), ExportNetworkKey("10.0.0.1/32"));
  EXPECT_EQ(ExportNetworkKey("10.0.0.0/8"), ExportNetworkKey("10.1.2.3/255.0.0.0"));
  EXPECT_EQ(ExportNetworkKey("2001:db8::/32"), ExportNetworkKey("2001:DB8::1/ffff:ffff::"));
  EXPECT_NE(ExportNetworkKey("10.0.0.0/8"), ExportNetworkKey("10.0.0.0/9"));
  EXPECT_NE(ExportNetworkKey("::/::"), ExportNetworkKey("0.0.0.0/0.0.0.0"));
  EXPECT_EQ(ExportNetworkKey("10.0.0.0/255.0.255.0"), ExportNetworkKey("10.1.0.2/255.0.255.0"));
  EXPECT_EQ(ExportNetworkKey("*.Example"), ExportNetworkKey("*.example"));
}

TEST(IsExportHostName, HoldsForWhatTheResolverIsAsked) {
  for (const char* name : {"alpha", "alpha.example"}) EXPECT_TRUE(IsExportHostName(name)) << name;
  for (const char* other : {"", "*", "a?", "[a]", "@a", "10.0.0.1", "::1", "10.0.0.0/8"}) {
    EXPECT_FALSE(IsExportHostName(other)) << other;
  }
}

}  // namespace
}  // namespace vorn
