#include "firewall.h"

#include <gmock/gmock.h>
#include <sched.h>
#include <unistd.h>

#include <fstream>
#include <string>

#include "nfsconf.h"
#include "processes.h"
#include "temporary_root.h"

namespace {

using testing::HasSubstr;
using testing::Not;

// A network of this process's own, in which it may do as it likes; false where the system has none to give.
bool EnterOwnNetwork() {
  const uid_t user = getuid();
  if (user == 0) return unshare(CLONE_NEWNET) == 0;
  if (unshare(CLONE_NEWUSER | CLONE_NEWNET) != 0) return false;
  std::ofstream("/proc/self/setgroups") << "deny";
  std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
  return true;
}

std::string Nft(const std::string& command) {
  const ProgramResult result = RunProgram({"sh", "-c", "nft " + command});
  return result.output + result.errors;
}

class Firewall : public testing::Test {
 protected:
  void SetUp() override {
    root_.Write("/etc/vorn/platform.conf", "[platform]\nfirewall = yes\n");
    if (!EnterOwnNetwork()) GTEST_SKIP() << "no network namespaces here";
    if (Nft("add table inet probe") != "") GTEST_SKIP() << "no nftables here: " << Nft("add table inet probe");
    Nft("delete table inet probe");
  }

  static void UsePorts(int statd_port, int nlm_port, int custom) {
    NFSConfRecord record;
    ASSERT_EQ(VORNNFSConfGet(&record), 0);
    record.statd_port = statd_port;
    record.nlm_port = nlm_port;
    record.custom_port_enable = custom;
    ASSERT_EQ(VORNNFSConfSet(&record), 0);
  }

  TemporaryRoot root_;
};

TEST_F(Firewall, AcceptsTheConfiguredPortsAndForgetsTheOldOnes) {
  UsePorts(4000, 4001, 1);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  EXPECT_THAT(Nft("list table inet vorn"), testing::AllOf(HasSubstr("2049"), HasSubstr("111"), HasSubstr("4000"),
                                                          HasSubstr("4001"), HasSubstr("udp")));
  UsePorts(5000, 4001, 1);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  EXPECT_THAT(Nft("list table inet vorn"), testing::AllOf(HasSubstr("5000"), Not(HasSubstr("4000"))));
  UsePorts(5000, 4001, 0);
  ASSERT_EQ(VORNFwRuleHup(), 0);
  EXPECT_THAT(Nft("list table inet vorn"), testing::AllOf(HasSubstr("2049"), Not(HasSubstr("5000"))));
}

TEST_F(Firewall, LeavesForeignTablesAlone) {
  Nft("add table inet administrator");
  Nft("add chain inet administrator input '{ type filter hook input priority 0 ; policy drop ; }'");
  const std::string before = Nft("list table inet administrator");
  ASSERT_THAT(before, HasSubstr("policy drop"));
  ASSERT_EQ(VORNFwRuleHup(), 0);
  EXPECT_EQ(Nft("list table inet administrator"), before);
}

TEST_F(Firewall, DoesNothingWhereItIsSwitchedOff) {
  root_.Write("/etc/vorn/platform.conf", "[platform]\nfirewall = no\n");
  EXPECT_EQ(VORNFwRuleHup(), 0);
  EXPECT_EQ(Nft("list tables"), "");
}

TEST_F(Firewall, KeepsTheOldRulesWhenTheSettingsCannotBeRead) {
  ASSERT_EQ(VORNFwRuleHup(), 0);
  const std::string before = Nft("list table inet vorn");
  root_.Write("/etc/nfs.conf.d/vorn.conf", "[vorn]\nstatd-port = many\n");
  EXPECT_LT(VORNFwRuleHup(), 0);
  EXPECT_EQ(Nft("list table inet vorn"), before);
}

}  // namespace
