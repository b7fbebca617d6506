// The firewall's table, in a network namespace of the test. nft(8) is the reference.
#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>

#include "captured_log.h"
#include "core.h"
#include "firewall.h"
#include "injected_failures.h"
#include "nfsconf.h"
#include "processes.h"
#include "status.h"
#include "temporary_root.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

std::string Ruleset() {
  const ProgramResult result = RunProgram({"nft", "list", "ruleset"});
  EXPECT_EQ(result.status, 0) << result.errors;
  return result.output;
}

class Firewall : public testing::Test {
 protected:
  Firewall() {
    EXPECT_EQ(RunProgram({"nft", "flush", "ruleset"}).status, 0);
    Switch("yes");
  }

  void Switch(const std::string& state) const {
    root_.Write("/etc/vorn/platform.conf", "[platform]\nfirewall = " + state + "\n");
  }

  static void SetPorts(int statd, int nlm) {
    NFSConfRecord record{};
    record.statd_port = statd;
    record.nlm_port = nlm;
    record.custom_port_enable = 1;
    ASSERT_EQ(VORNNFSConfSet(&record), 0);
  }

  const TemporaryRoot root_;
};

TEST_F(Firewall, MarksWhatComesForTheConfiguredPortsInATableOfItsOwn) {
  SetPorts(4000, 4001);
  root_.Write("/etc/nfs.conf", "[mountd]\nport = 20048\n");
  ASSERT_EQ(VORNFwRuleHup(), 0);
  const auto mark = [](const std::string& port, const std::string& service) {
    return "\t\tmeta l4proto { tcp, udp } th dport " + port + " meta mark set meta mark | 0x01000000 comment \"" +
           service + "\"\n";
  };
  EXPECT_EQ(Ruleset(),
            "table inet vorn {\n\tchain nfs {\n"
            "\t\ttype filter hook input priority filter - 1; policy accept;\n" +
                mark("111", "rpcbind") + mark("2049", "nfs") + mark("20048", "nfs_mountd") + mark("4000", "nfs_statd") +
                mark("4001", "nfs_nlm") + "\t}\n}\n");
}

TEST_F(Firewall, SaysOnceThatAnotherFirewallKeepsThePortsClosed) {
  const struct {
    const char* name;
    const char* rules;
    const char* remedy;  // "": the ports are open
  } cases[] = {
      {"drop policy", "table inet a { chain x { type filter hook input priority 0; policy drop; }; }",
       "meta mark & 0x01000000 != 0 accept"},
      {"the mark is accepted",
       "table inet b { chain x { type filter hook input priority 0; policy drop; "
       "meta mark & 0x01000000 != 0 accept; }; }",
       ""},
      {"the ports are accepted",
       "table inet c { chain x { type filter hook input priority 0; policy drop; tcp dport { 111, 2049 } accept; }; }",
       ""},
      {"another port is accepted",
       "table ip d { chain x { type filter hook input priority 0; policy drop; tcp dport { 1111, 2049 } accept; }; }",
       "meta mark"},
      {"the last rule rejects",
       "table inet firewalld { chain x { type filter hook input priority 0; tcp dport 22 accept; counter; reject; }; }",
       "firewall-cmd"},
      {"ufw",
       "table ip filter { chain ufw-before { }; chain INPUT { type filter hook input priority 0; policy drop; "
       "jump ufw-before; }; }",
       "ufw allow"},
      {"one address is dropped",
       "table inet e { chain x { type filter hook input priority 0; ip saddr 10.0.0.1 drop; }; }", ""},
      {"only routed packets are dropped",
       "table inet f { chain fw { type filter hook forward priority 0; policy drop; }; }", ""},
  };
  for (const auto& c : cases) {
    ASSERT_EQ(RunProgram({"nft", "flush", "ruleset"}).status, 0);
    ASSERT_EQ(RunProgram({"nft", c.rules}).status, 0) << c.name;
    TakeLog();
    EXPECT_EQ(VORNFwRuleHup(), 0) << c.name;
    EXPECT_EQ(VORNFwRuleHup(), 0) << c.name;
    const std::vector<LogLine> log = TakeLog();
    ASSERT_EQ(log.size(), *c.remedy == '\0' ? 0U : 1U) << c.name;
    if (log.empty()) continue;
    EXPECT_THAT(log[0].text, AllOf(HasSubstr("111, 2049 of NFS are not open"), HasSubstr(c.remedy))) << c.name;
  }
}

TEST_F(Firewall, IsKeptInAFileThatBringsItBack) {
  SetPorts(4000, 4001);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  const std::string before = Ruleset();
  ASSERT_EQ(RunProgram({"nft", "flush", "ruleset"}).status, 0);
  for (const char* time : {"the first time", "over itself"}) {
    EXPECT_EQ(RunProgram({"nft", "-f", root_.At("/var/lib/vorn/firewall.nft")}).status, 0) << time;
    EXPECT_EQ(Ruleset(), before) << time;
  }
}

TEST_F(Firewall, FollowsAChangeWithoutATraceOfTheOldPorts) {
  SetPorts(4000, 4001);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  SetPorts(5000, 5001);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  EXPECT_THAT(Ruleset(), AllOf(HasSubstr("dport 5000"), HasSubstr("dport 5001"), Not(HasSubstr("dport 400"))));
}

TEST_F(Firewall, LeavesOtherTablesAlone) {
  const std::string theirs = "table inet site { chain input { type filter hook input priority 0; policy drop; }; }";
  ASSERT_EQ(RunProgram({"nft", theirs}).status, 0);
  const std::string before = Ruleset();
  ASSERT_EQ(VORNFwRuleHup(), 0);
  EXPECT_THAT(Ruleset(), HasSubstr(before));
}

TEST_F(Firewall, IsLeftAloneWhileItIsSwitchedOff) {
  SetPorts(4000, 4001);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  const std::string before = Ruleset();
  Switch("no");
  SetPorts(5000, 5001);
  EXPECT_EQ(VORNFwRuleHup(), 0);
  EXPECT_EQ(Ruleset(), before);
}

TEST_F(Firewall, KeepsTheOldRulesWhereThePortsCannotBeRead) {
  SetPorts(4000, 4001);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  const std::string before = Ruleset();
  std::filesystem::remove(root_.At("/etc/nfs.conf"));
  std::filesystem::create_directory(root_.At("/etc/nfs.conf"));
  EXPECT_LT(VORNFwRuleHup(), 0);
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
  EXPECT_EQ(Ruleset(), before);
}

TEST_F(Firewall, FailsWithTheReasonWhereTheKernelCannotBeAsked) {
  ChildProcess child([] {
    if (!FailSystemCall(SYS_sendmsg, EPERM)) return 1;
    return VORNFwRuleHup() < 0 && KLIBCErrGet() == vorn::kServiceFailed ? 0 : 2;
  });
  EXPECT_EQ(child.Wait(), 0);
  EXPECT_EQ(Ruleset(), "");
}

}  // namespace
