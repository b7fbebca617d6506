#include "explain.h"

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "current_box.h"
#include "name_table.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using CheckResult = VORN::AccessCheck::Result;

class Explain : public testing::Test {
 protected:
  Explain() {
    EXPECT_EQ(chmod(root_.directory().c_str(), 0755), 0);
    root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nalice:x:2001:2001::/:/bin/sh\nbob:x:2002:2002::/:/bin/sh\n");
    root_.Write("/etc/group", "root:x:0:\nalice:x:2001:\nstaff:x:50:alice,bob\nbob:x:2002:bob\n");
    root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\ninner = /srv/data/inner\n");
    root_.Write("/srv/data/inner/file", "");
    root_.Write("/var/lib/vorn/nfsd.state", "enabled\n");
    Serve("");
  }

  // Makes the kernel's server run with these exports files, whose clients are the table's.
  void Serve(const std::string& exports) {
    root_.Write("/etc/exports", exports);
    root_.Write("/proc/net/rpc/nfsd", "th 8 0\n");
    root_.Write("/proc/fs/nfsd/versions", "-2 +3 +4 +4.1 +4.2\n");
    std::string table;
    for (const auto& [client, options] : table_) table += "/srv/data\t" + client + "(" + options + ")\n";
    root_.Write("/var/lib/nfs/etab", table);
  }

  // Exports /srv/data to these clients.
  void Export(const std::vector<std::pair<std::string, std::string>>& clients) {
    table_ = clients;
    std::string line = "# rules\n/srv/data";
    for (const auto& [client, options] : clients) line += " " + client + "(" + options + ")";
    Serve(line + "\n");
  }

  VORN::AccessAnswer Ask(VORN::AccessQuestion question) {
    if (question.share.empty()) question.share = "data";
    const auto answers = ExplainAccesses(CurrentBox(), names_.service(), question, {question.share});
    EXPECT_TRUE(answers.ok()) << answers.status().reason();
    return answers.ok() ? answers->front() : VORN::AccessAnswer();
  }

  VORN::AccessAnswer Ask(const std::string& client, const std::string& user = "") {
    VORN::AccessQuestion question;
    question.client = client;
    question.user = user;
    return Ask(question);
  }

  // The names of the checks with this result.
  static std::vector<std::string> With(CheckResult result, const VORN::AccessAnswer& answer) {
    std::vector<std::string> names;
    for (const VORN::AccessCheck& check : answer.checks) {
      if (check.result == result) names.push_back(check.check);
      EXPECT_EQ(check.remedy.empty(), check.result != CheckResult::kFailed) << check.check;
    }
    return names;
  }
  static std::vector<std::string> Failed(const VORN::AccessAnswer& answer) {
    return With(CheckResult::kFailed, answer);
  }

  static std::string TextOf(const VORN::AccessAnswer& answer, const std::string& name) {
    for (const VORN::AccessCheck& check : answer.checks) {
      if (check.check == name) return check.text;
    }
    return "";
  }

  // "2001:50 29 by" of an identity.
  static std::string IDs(const VORN::AccessAnswer& answer) {
    if (!answer.identity) return "";
    std::string text = std::to_string(answer.identity->user_id) + ":" + std::to_string(answer.identity->group_id);
    for (const std::uint32_t group : answer.identity->groups) text += " " + std::to_string(group);
    return text + " " + answer.identity->by;
  }

  TemporaryRoot root_;
  NameTable names_;
  std::vector<std::pair<std::string, std::string>> table_;
};

TEST_F(Explain, NamesTheRuleThatDecidesAndThoseThatLose) {
  Export({{"*", "ro,insecure"}, {"10.0.0.0/24", "rw,insecure"}, {"10.0.0.0/8", "ro,insecure"}});
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_TRUE(answer.mountable && answer.read && answer.write);
  ASSERT_TRUE(answer.rule);
  EXPECT_EQ(answer.rule->client, "10.0.0.0/24");
  EXPECT_EQ(answer.rule->kind, "network");
  EXPECT_EQ(answer.rule->file, "/etc/exports");
  EXPECT_EQ(answer.rule->line, 2);
  ASSERT_EQ(answer.others.size(), 2U);
  EXPECT_EQ(answer.others[0].client + " " + answer.others[0].reason, "10.0.0.0/8 order");
  EXPECT_EQ(answer.others[1].client + " " + answer.others[1].reason, "* kind");
  EXPECT_THAT(answer.others[1].text, HasSubstr("a rule for a network comes first"));
  EXPECT_EQ(answer.path, "/srv/data");
  EXPECT_THAT(Failed(answer), IsEmpty());
}

TEST_F(Explain, SaysThatNoRuleIsForAClient) {
  Export({{"10.0.0.1", "rw"}});
  const VORN::AccessAnswer answer = Ask("10.0.0.2");
  EXPECT_FALSE(answer.mountable || answer.read || answer.write || answer.rule || answer.identity);
  EXPECT_THAT(Failed(answer), ElementsAre("rule"));
}

TEST_F(Explain, FindsAClientByEachFormThatRulesHave) {
  names_.hosts = {{"c.example", "10.0.0.5"}, {"c.example", "10.9.0.5"}, {"short", "10.0.0.6"}};
  names_.members = {{"group", "c.example"}, {"short-group", "c"}, {"numbers", "10.0.0.5"}};
  const std::pair<const char*, bool> cases[] = {{"10.0.0.5", true},
                                                {"10.0.0.6", false},
                                                {"c.example", true},
                                                {"C.Example", true},
                                                {"short", false},
                                                {"10.0.0.0/24", true},
                                                {"10.0.0.0/255.255.255.0", true},
                                                {"10.0.1.0/24", false},
                                                {"fd00::/8", false},
                                                {"*.example", true},
                                                {"*.EXAMPLE", true},
                                                {"?.example", true},
                                                {"10.0.0.*", false},
                                                {"@group", true},
                                                {"@short-group", true},
                                                {"@numbers", true},
                                                {"@none", false},
                                                {"*", true}};
  for (const auto& [client, is_admitted] : cases) {
    Export({{client, "rw"}});
    EXPECT_EQ(Ask("10.0.0.5").mountable, is_admitted) << client;
    EXPECT_EQ(Ask("::ffff:10.0.0.5").mountable, is_admitted) << client;
  }
}

TEST_F(Explain, FindsAClientByEachFormOfIPv6) {
  names_.hosts = {{"c.example", "fd00:9::b"}, {"c.example", "10.0.0.5"}};
  const std::pair<const char*, bool> cases[] = {{"fd00:9::b", true},
                                                {"FD00:9:0::B", true},
                                                {"fd00:9::c", false},
                                                {"fd00:9::8/125", true},
                                                {"fd00:9::c/126", false},
                                                {"fd00:9::/ffff:ffff::", true},
                                                {"::/::", true},
                                                {"fd00:8::/0", false},  // mountd compares 32 bits
                                                {"fd00:9:1::/0", true},
                                                {"0.0.0.0/0.0.0.0", false},  // the host's other address does not count
                                                {"10.0.0.5", false},
                                                {"10.0.0.6", false},
                                                {"c.example", true},
                                                {"*.example", true},
                                                {"fd00:9::*", false},  // the client has a name
                                                {"*", true}};
  for (const auto& [client, is_admitted] : cases) {
    Export({{client, "rw"}, {"@none", "ro"}});  // the box asks for names because of the netgroup
    EXPECT_EQ(Ask("fd00:9::b").mountable, is_admitted) << client;
  }
}

// Returns the address fd00:9::b with one bit (from 1) changed.
std::string WithOtherBit(std::size_t bit) {
  std::array<unsigned char, 16> bytes{0xfd, 0, 0, 9, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xb};
  bytes.at((bit - 1) / 8) = static_cast<unsigned char>(bytes.at((bit - 1) / 8) ^ (0x80U >> ((bit - 1) % 8)));
  std::array<char, INET6_ADDRSTRLEN> text{};
  return inet_ntop(AF_INET6, bytes.data(), text.data(), text.size());
}

TEST_F(Explain, ComparesEveryBitOfAnIPv6NetworkAndNoneAfterIt) {
  for (std::size_t length = 1; length <= 128; ++length) {
    for (const std::size_t bit : {length, length + 1}) {
      if (bit > 128) continue;
      const std::string network = WithOtherBit(bit) + "/" + std::to_string(length);
      Export({{network, "rw"}});
      EXPECT_EQ(Ask("fd00:9::b").mountable, bit > length) << network;
    }
  }
}

TEST_F(Explain, AdmitsNoClientWithoutANameByAPatternOrANetgroup) {
  names_.members = {{"trusted", "10.0.0.5"}};
  Export({{"10.0.0.*", "rw"}, {"*", "ro"}, {"@trusted", "rw"}});
  EXPECT_EQ(Ask("10.0.0.5").rule->client, "*");
  names_.hosts = {{"c.example", "10.0.0.5"}};
  EXPECT_EQ(Ask("10.0.0.5").rule->client, "@trusted") << "of a client with a name, the address counts, too";
}

TEST_F(Explain, TakesANameThatDoesNotLeadBackToTheAddress) {
  Export({{"*.example", "rw"}, {"10.9.0.5", "ro"}});
  names_.hosts = {{"c.example", "10.0.0.5"}, {"c.example", "10.9.0.5"}};
  EXPECT_THAT(Ask("10.0.0.5").names, ElementsAre("c.example"));
  EXPECT_TRUE(Ask("10.0.0.5").write) << "the rule for another address of the host does not count";
  names_.aliens = {{"c.example", "192.0.2.1"}};
  const VORN::AccessAnswer answer = Ask("192.0.2.1");
  EXPECT_TRUE(answer.write);
  EXPECT_THAT(TextOf(answer, "name"), HasSubstr("does not lead back"));
  EXPECT_THAT(TextOf(Ask("10.0.0.5"), "name"), testing::Not(HasSubstr("lead")));
}

TEST_F(Explain, AsksForTheAddressesOfAName) {
  Export({{"10.0.0.0/24", "rw"}});
  names_.hosts = {{"c.example", "fd00::5"}, {"c.example", "10.0.0.5"}};
  EXPECT_THAT(Ask("c.example").addresses, ElementsAre("10.0.0.5", "fd00::5"));
  EXPECT_TRUE(Ask("c.example").mountable);
  EXPECT_THAT(Failed(Ask("unknown.example")), ElementsAre("name", "rule"));
}

TEST_F(Explain, SaysThatTheNameServiceIsAway) {
  Export({{"host.example", "rw"}, {"*.example", "rw"}, {"10.0.0.5", "ro"}});
  names_.is_away = true;
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_TRUE(answer.mountable);
  EXPECT_THAT(With(CheckResult::kUnknown, answer), testing::Contains("name"));
  EXPECT_THAT(With(CheckResult::kUnknown, Ask("c.example")), testing::Contains("name"));
  EXPECT_FALSE(Ask("c.example").mountable);
}

TEST_F(Explain, SquashesUsersAsTheRuleSays) {
  struct Case {
    const char* options;
    const char* user;
    const char* ids;
  };
  const Case cases[] = {
      {"rw", "root", "65534:65534 root_squash"},
      {"rw,anonuid=2002,anongid=2003", "root", "2002:2003 root_squash"},
      {"rw,anonuid=-2", "root", "4294967294:65534 root_squash"},
      {"rw,no_root_squash", "root", "0:0 client"},
      {"rw", "alice", "2001:2001 50 client"},
      {"rw", "2001", "2001:2001 50 client"},
      {"rw", "2999", "2999:65534 client"},
      {"rw,all_squash,anonuid=7", "alice", "7:65534 all_squash"},
  };
  for (const Case& c : cases) {
    Export({{"*", c.options}});
    const VORN::AccessAnswer answer = Ask("10.0.0.5", c.user);
    EXPECT_EQ(IDs(answer), c.ids) << c.options << " " << c.user;
    const bool is_by_rule = IDs(answer).find("squash") != std::string::npos;
    EXPECT_EQ(answer.identity->file, is_by_rule ? "/etc/exports" : "");
  }
}

TEST_F(Explain, TakesTheGroupsOfTheQuestionOrOfTheBox) {
  Export({{"*", "rw"}});
  VORN::AccessQuestion question;
  question.client = "10.0.0.5";
  question.user = "alice";
  question.groups = {"staff", "0", "77"};
  EXPECT_EQ(IDs(Ask(question)), "2001:50 65534 77 client");
  question.groups = {"root"};
  EXPECT_EQ(IDs(Ask(question)), "2001:65534 root_squash");
  question.groups = {"77"};
  root_.Write("/etc/nfs.conf", "[mountd]\nmanage-gids = y\n");
  EXPECT_EQ(IDs(Ask(question)), "2001:77 2001 50 client");
  EXPECT_EQ(Ask(question).identity->line, 2);
  question.user = "2999";
  question.groups = {"77", "78"};
  EXPECT_EQ(IDs(Ask(question)), "2999:77 client");
}

TEST_F(Explain, RefusesUsersGroupsAndSharesThatTheBoxDoesNotHave) {
  Export({{"*", "rw"}});
  const auto code = [&](const char* share, const char* user, std::vector<std::string> groups) {
    VORN::AccessQuestion question;
    question.client = "10.0.0.5";
    question.user = user;
    question.groups = std::move(groups);
    return ExplainAccesses(CurrentBox(), names_.service(), question, {share}).status().code();
  };
  EXPECT_EQ(code("none", "", {}), ENOENT);
  EXPECT_EQ(code("data", "carol", {}), kNoSuchUser);
  EXPECT_EQ(code("data", "4294967295", {}), kNoSuchUser);
  EXPECT_EQ(code("data", "alice", {"none"}), kNoSuchGroup);
}

TEST_F(Explain, MapsPrincipals) {
  root_.Write("/etc/nfs/krb5.keytab", "keys");
  root_.Write("/etc/idmapd.conf",
              "[General]\nDomain = box.example\n[Translation]\nGSS-Methods = static,nsswitch\n"
              "[Static]\nroot@BOX.EXAMPLE = alice\ngone@BOX.EXAMPLE = gone\n");
  Export({{"*", "rw,sec=krb5"}});
  VORN::AccessQuestion question;
  question.client = "10.0.0.5";
  question.flavor = "krb5";
  const std::pair<const char*, const char*> cases[] = {
      {"ROOT@box.example", "2001:2001 50 static"}, {"bob@BOX.EXAMPLE", "2002:2002 50 nsswitch"},
      {"bob@OTHER", "65534:65534 nobody"},         {"bob", "65534:65534 nobody"},
      {"gone@BOX.EXAMPLE", "65534:65534 nobody"},  {"carol@BOX.EXAMPLE", "65534:65534 nobody"}};
  for (const auto& [user, ids] : cases) {
    question.user = user;
    EXPECT_EQ(IDs(Ask(question)), ids) << user;
  }
  question.user = "root@BOX.EXAMPLE";
  EXPECT_EQ(Ask(question).identity->line, 6);
  root_.Write("/etc/idmapd.conf",
              "[General]\nLocal-Realms = A, OTHER\n[Translation]\nGSS-Methods = vorn\n"
              "[Static]\ngone@OTHER = gone\n");
  question.user = "gone@OTHER";
  EXPECT_THAT(Failed(Ask(question)), ElementsAre("read", "write"));
  root_.Write("/etc/idmapd.conf", "[General]\nLocal-Realms = A, OTHER\n");
  question.user = "bob@OTHER";
  EXPECT_EQ(IDs(Ask(question)), "2002:2002 50 nsswitch");
}

TEST_F(Explain, ComparesFlavorsPortsAndKeytab) {
  struct Case {
    const char* options;
    const char* flavor;
    const char* version;
    int port;
    std::vector<std::string> failed;
  };
  const Case cases[] = {{"rw", "sys", "4.2", 40000, {"port"}},
                        {"rw,insecure", "sys", "3", 40000, {}},
                        {"rw", "sys", "3", 1023, {}},
                        {"rw,sec=krb5", "sys", "4.2", 0, {"flavor"}},
                        {"rw,sec=krb5:sys", "krb5", "4.2", 40000, {"keytab"}},
                        {"rw,sec=krb5", "krb5", "3", 40000, {"port", "keytab"}},
                        {"rw", "krb5p", "4.2", 0, {"flavor", "keytab"}}};
  for (const Case& c : cases) {
    Export({{"*", c.options}});
    VORN::AccessQuestion question;
    question.client = "10.0.0.5";
    question.flavor = c.flavor;
    question.version = c.version;
    question.port = c.port;
    EXPECT_EQ(Failed(Ask(question)), c.failed) << c.options << " " << c.flavor << " " << c.port;
    EXPECT_EQ(Ask(question).mountable, c.failed.empty());
  }
}

TEST_F(Explain, ComparesThePermissionsOfTheFolder) {
  Export({{"*", "rw"}});
  const std::string folder = root_.At("/srv/data");
  struct Case {
    unsigned mode;
    unsigned group;
    const char* user;
    const char* can;
  };
  const Case cases[] = {{0777, 0, "alice", "rw"},  {0755, 0, "alice", "r"},  {0700, 0, "alice", ""},
                        {0770, 50, "alice", "rw"}, {0750, 50, "alice", "r"}, {0707, 50, "alice", ""},
                        {0773, 0, "alice", "w"},   {0700, 0, "root", ""},    {0707, 0, "root", "rw"}};
  if (geteuid() != 0) GTEST_SKIP() << "only root can give a folder away";
  for (const Case& c : cases) {
    ASSERT_EQ(chmod(folder.c_str(), c.mode), 0);
    ASSERT_EQ(chown(folder.c_str(), 0, c.group), 0);
    const VORN::AccessAnswer answer = Ask("10.0.0.5", c.user);
    EXPECT_EQ(std::string(answer.read ? "r" : "") + (answer.write ? "w" : ""), c.can) << std::oct << c.mode << c.user;
    EXPECT_TRUE(answer.mountable);
  }
  ASSERT_EQ(chown(folder.c_str(), 2001, 0), 0);
  ASSERT_EQ(chmod(folder.c_str(), 0077), 0);
  EXPECT_FALSE(Ask("10.0.0.5", "alice").read) << "the owner has the owner's bits only";
}

TEST_F(Explain, SaysThatARuleIsReadOnly) {
  Export({{"*", "ro"}});
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_TRUE(answer.read);
  EXPECT_FALSE(answer.write);
  EXPECT_EQ(TextOf(answer, "write"), "The rule is read-only.");
}

TEST_F(Explain, SaysThatAFileSystemIsReadOnlyWhateverTheFlagsOfItsMount) {
  Export({{"*", "rw"}});
  const std::string root = "1 0 0:1 / / ro shared:1 - ext4 source rw\n";  // as systemd's ProtectSystem shows it
  root_.Write("/proc/self/mountinfo", root);
  EXPECT_TRUE(Ask("10.0.0.5").write);
  root_.Write("/proc/self/mountinfo", root + "2 1 0:2 / /srv rw shared:1 - ext4 source ro,errors=continue\n");
  EXPECT_FALSE(Ask("10.0.0.5").write);
  EXPECT_EQ(TextOf(Ask("10.0.0.5"), "write"), "The file system of /srv/data is mounted read-only.");
}

TEST_F(Explain, NeedsAWayThatTheClientsRootMayEnterInVersion4) {
  ASSERT_EQ(chmod(root_.At("/srv").c_str(), 0700), 0);
  ASSERT_EQ(chmod(root_.At("/srv/data").c_str(), 0700), 0);
  VORN::AccessQuestion question;
  question.client = "10.0.0.5";
  Export({{"*", "rw"}});
  EXPECT_THAT(Failed(Ask(question)), IsEmpty()) << "root is not squashed above the folder of the rule";
  question.share = "inner";
  EXPECT_THAT(Failed(Ask(question)), ElementsAre("way"));
  question.version = "3";
  EXPECT_THAT(Failed(Ask(question)), IsEmpty());
  question.version = "4.2";
  Export({{"*", "rw,no_root_squash,sec=sys:krb5"}});
  EXPECT_THAT(Failed(Ask(question)), IsEmpty());
  question.flavor = "krb5";
  EXPECT_THAT(Failed(Ask(question)), ElementsAre("keytab", "way")) << "Kerberos makes root nobody";
}

TEST_F(Explain, SaysThatAnOuterRuleDecides) {
  Export({{"*", "ro"}});
  VORN::AccessQuestion question;
  question.share = "inner";
  question.client = "10.0.0.5";
  const VORN::AccessAnswer answer = Ask(question);
  EXPECT_TRUE(answer.mountable);
  EXPECT_EQ(answer.rule->directory, "/srv/data");
  root_.Write("/etc/vorn/shares.conf", "[shares]\nouter = /srv\n");
  question.share = "outer";
  EXPECT_TRUE(Ask(question).mountable) << "the way to an export";
  EXPECT_FALSE(Ask(question).read);
  EXPECT_THAT(Failed(Ask(question)), ElementsAre("rule"));
}

TEST_F(Explain, NeedsAFolder) {
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/none\n");
  root_.Write("/etc/exports", "/srv/none *(rw)\n");
  root_.Write("/var/lib/nfs/etab", "/srv/none\t*(rw)\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), ElementsAre("folder"));
}

TEST_F(Explain, ChecksTheServiceAndItsVersions) {
  Export({{"*", "rw"}});
  VORN::AccessQuestion question;
  question.client = "10.0.0.5";
  question.version = "4.0";
  EXPECT_THAT(Failed(Ask(question)), IsEmpty());
  root_.Write("/proc/fs/nfsd/versions", "-2 +3 +4 -4.0 +4.1 +4.2\n");
  EXPECT_THAT(Failed(Ask(question)), ElementsAre("version"));
  root_.Write("/proc/fs/nfsd/versions", "-2 +3 -4 -4.0 -4.1 -4.2\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), ElementsAre("version"));
  root_.Write("/proc/net/rpc/nfsd", "th 0 0\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")).front(), "service");
  root_.Write("/etc/nfs.conf", "[nfsd]\nvers4 = n\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), testing::Contains("version"));
  root_.Write("/etc/nfs.conf", "[nfsd]\nvers4 = n\nvers4.2 = y\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), testing::Not(testing::Contains("version")));
}

TEST_F(Explain, SaysWhatItCannotTell) {
  Export({{"10.0.0.0/24", "rw,sec=krb5:sys"}});
  root_.Write("/etc/nfs/krb5.keytab", "");
  EXPECT_THAT(With(CheckResult::kUnknown, Ask("10.0.0.5")), ElementsAre("firewall"));
  VORN::AccessQuestion question;
  question.client = "10.0.0.5";
  question.flavor = "krb5";
  EXPECT_THAT(With(CheckResult::kUnknown, Ask(question)), ElementsAre("firewall", "ticket"));
  root_.Write("/proc/self/mountinfo",
              "1 0 8:1 / / rw - ext4 /dev/sda1 rw\n2 1 8:2 / /srv/data/inner rw - ext4 /dev/b rw\n");
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_THAT(With(CheckResult::kUnknown, answer), ElementsAre("firewall", "volume"));
  EXPECT_THAT(TextOf(answer, "volume"), HasSubstr("/srv/data/inner"));
}

TEST_F(Explain, DoesNotFollowTheRootOfVersion4) {
  Export({{"10.0.0.0/24", "rw,fsid=0"}});
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_THAT(With(CheckResult::kUnknown, answer), ElementsAre("firewall", "root"));
  EXPECT_THAT(TextOf(answer, "root"), HasSubstr("/srv/data is the root of version 4 for \"10.0.0.0/24\""));
  VORN::AccessQuestion question;
  question.client = "10.0.0.5";
  question.version = "3";
  EXPECT_THAT(With(CheckResult::kUnknown, Ask(question)), ElementsAre("firewall"));
}

TEST_F(Explain, UsesTheTableInForceAndSaysThatTheFilesDiffer) {
  Export({{"10.0.0.5", "rw"}});
  root_.Write("/etc/exports", "/srv/data 10.0.0.6(rw)\n");
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_TRUE(answer.mountable);
  EXPECT_EQ(answer.rule->file, "");
  EXPECT_THAT(Failed(answer), ElementsAre("reload"));
  root_.Write("/proc/net/rpc/nfsd", "th 0 0\n");
  EXPECT_FALSE(Ask("10.0.0.5").rule) << "the files are what a start would put into force";
}

TEST_F(Explain, SaysThatTheFilesDifferOnlyIfTheHostsAddressHasOtherRules) {
  names_.hosts = {{"c.example", "10.0.0.5"}};
  Export({{"10.0.0.0/24", "ro"}, {"c.example", "rw"}});
  EXPECT_THAT(Failed(Ask("10.0.0.5")), IsEmpty()) << "as this platform orders the table";
  table_ = {{"c.example", "rw"}, {"10.0.0.0/24", "ro"}};
  Serve("/srv/data 10.0.0.0/24(ro) c.example(rw)\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), IsEmpty()) << "as exportfs orders the table";
  table_ = {{"10.0.0.5", "rw"}, {"10.0.0.0/24", "ro"}};
  Serve("/srv/data 10.0.0.0/24(ro) 10.0.0.5(rw)\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), IsEmpty()) << "by the address";
  Serve("/srv/data 10.0.0.0/24(ro) c.example(ro)\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), ElementsAre("reload"));
}

// The tables are those that exportfs(8) makes of rules for the name and for an address of a host with two addresses.
TEST_F(Explain, SaysThatTheFilesDifferOnlyIfAnAddressOfTheHostHasOtherRules) {
  names_.hosts = {{"c.example", "10.0.0.5"}, {"c.example", "fd00:9::5"}};
  table_ = {{"c.example", "rw"}, {"fd00:9::5", "ro"}};
  Serve("/srv/data c.example(rw) fd00:9::5(ro)\n");
  EXPECT_THAT(Failed(Ask("fd00:9::5")), IsEmpty()) << "the first rule of the address counts";
  table_ = {{"c.example", "rw"}};
  Serve("/srv/data 10.0.0.5(rw)\n/srv/data/inner c.example(ro)\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), IsEmpty()) << "the table has the name of the host for its address";
  Serve("/srv/data 10.0.0.5(ro)\n/srv/data/inner c.example(ro)\n");
  EXPECT_THAT(Failed(Ask("10.0.0.5")), ElementsAre("reload"));
  table_ = {{"10.0.0.5", "rw"}};
  Serve("/srv/data c.example(rw)\n");
  EXPECT_THAT(Failed(Ask("fd00:9::5")), ElementsAre("rule", "reload")) << "the other address got lost";
}

TEST_F(Explain, FindsTheLineOfAHostThatTheTableHasByItsAddress) {
  names_.hosts = {{"c.example", "10.0.0.5"}};
  root_.Write("/etc/exports", "\n\n/srv/data c.example(rw)\n");
  root_.Write("/var/lib/nfs/etab", "/srv/data\t10.0.0.5(rw)\n");
  const VORN::AccessAnswer answer = Ask("10.0.0.5");
  EXPECT_EQ(answer.rule->client, "c.example");
  EXPECT_EQ(answer.rule->line, 3);
}

}  // namespace
}  // namespace vorn
