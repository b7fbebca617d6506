// The list of the clients of a share, on a box that is made of files.
#include "share_clients.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <string>
#include <vector>

#include "current_box.h"
#include "name_table.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class ShareClientsOf : public testing::Test {
 protected:
  ShareClientsOf() {
    EXPECT_EQ(chmod(root_.directory().c_str(), 0755), 0);
    root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nalice:x:2001:2001::/:/bin/sh\n");
    root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\ninner = /srv/data/inner\n");
    root_.Write("/srv/data/inner/file", "");
    root_.Write("/var/lib/vorn/nfsd.state", "enabled\n");
    question_.access.share = "data";
    question_.access.version = "";
    question_.flavors = {"sys"};
    question_.limit = 100;
  }

  void Export(const std::string& exports) { root_.Write("/etc/exports", exports); }

  // Makes the kernel's server run with this table.
  void Serve(const std::string& table) {
    root_.Write("/proc/net/rpc/nfsd", "th 8 0\n");
    root_.Write("/proc/fs/nfsd/versions", "-2 +3 +4 +4.1 +4.2\n");
    root_.Write("/var/lib/nfs/etab", table);
  }

  ShareClients Ask() {
    Result<ShareClients> clients = ExplainClients(CurrentBox(), names_.service(), question_, known_);
    EXPECT_TRUE(clients.ok()) << clients.status().reason();
    return clients.ok() ? *clients : ShareClients();
  }

  int CodeOfFailure() { return ExplainClients(CurrentBox(), names_.service(), question_, known_).status().code(); }

  // "kind client state address version: flavor rights, ... by the rule that decides" of each row. "-": empty.
  std::vector<std::string> Rows() {
    std::vector<std::string> rows;
    for (const VORN::ClientAccess& access : Ask().clients) rows.push_back(RowText(access));
    return rows;
  }

  static std::string RowText(const VORN::ClientAccess& access) {
    std::string text;
    for (const std::string& word : {access.kind, access.client, access.state, access.address, access.version}) {
      text += (text.empty() ? "" : " ") + (word.empty() ? "-" : word);
    }
    text += ":";
    for (const VORN::FlavorAccess& flavor : access.flavors) {
      const char* rights = flavor.write ? "rw" : flavor.read ? "ro" : flavor.mountable ? "mount" : "none";
      text += " " + flavor.flavor + " " + rights + ",";
    }
    return text + " by " + (access.rule ? access.rule->client : "-");
  }

  std::vector<std::string> Texts() {
    std::vector<std::string> texts;
    for (const VORN::ClientAccess& access : Ask().clients) texts.push_back(access.text);
    return texts;
  }

  const TemporaryRoot root_;
  NameTable names_;
  VORN::ClientsQuestion question_;
  std::vector<KnownClient> known_;
};

TEST_F(ShareClientsOf, AreThoseOfItsRulesInTheirOrder) {
  Export("/srv/data 10.0.0.5(rw) 10.0.0.0/24(ro) *(ro,sec=krb5)\n");
  EXPECT_THAT(Rows(), ElementsAre("host 10.0.0.5 - 10.0.0.5 4.2: sys rw, by 10.0.0.5",
                                  "network 10.0.0.0/24 - 10.0.0.1 4.2: sys ro, by 10.0.0.0/24",
                                  "everybody * - 192.0.2.1 4.2: sys none, by *"));
  EXPECT_THAT(Texts(), ElementsAre("", "10.0.0.1 stands for the hosts of this network that no narrower rule names.",
                                   "192.0.2.1 stands for the hosts that no other rule names."));
}

TEST_F(ShareClientsOf, HaveRightsOfEachFlavor) {
  root_.Write("/etc/nfs/krb5.keytab", "");
  Export("/srv/data 10.0.0.5(sec=sys,ro,sec=krb5:krb5i,rw)\n");
  question_.flavors = {"sys", "krb5", "krb5i", "krb5p"};
  EXPECT_THAT(Rows(), ElementsAre("host 10.0.0.5 - 10.0.0.5 4.2: sys ro, krb5 rw, krb5i rw, krb5p none, by 10.0.0.5"));
}

TEST_F(ShareClientsOf, AreStoodForByAHostThatNoNarrowerRuleNames) {
  Export("/srv/data 10.0.0.1(rw) 10.0.0.2/31(rw) nas.example(rw) 10.0.0.0/24(ro) 192.0.2.0/24(ro) *(rw)\n");
  names_.hosts = {{"nas.example", "10.0.0.4"}};
  EXPECT_THAT(Rows(), ElementsAre("host 10.0.0.1 - 10.0.0.1 4.2: sys rw, by 10.0.0.1",
                                  "host nas.example - 10.0.0.4 4.2: sys rw, by nas.example",
                                  "network 10.0.0.2/31 - 10.0.0.2 4.2: sys rw, by 10.0.0.2/31",
                                  "network 10.0.0.0/24 - 10.0.0.5 4.2: sys ro, by 10.0.0.0/24",
                                  "network 192.0.2.0/24 - 192.0.2.1 4.2: sys ro, by 192.0.2.0/24",
                                  "everybody * - 192.0.3.0 4.2: sys rw, by *"));
}

TEST_F(ShareClientsOf, HaveAnAddressOfANetworkWhoseMaskHasGaps) {
  Export("/srv/data 10.7.0.0/255.0.255.0(ro) 10.1.0.0/255.255.0.0(rw)\n");
  EXPECT_EQ(Rows().front(), "network 10.7.0.0/255.0.255.0 - 10.0.0.0 4.2: sys ro, by 10.7.0.0/255.0.255.0");
  EXPECT_EQ(Texts().front(), "10.0.0.0 is one of the hosts of this network; others may match further rules.");
}

TEST_F(ShareClientsOf, SayThatNarrowerRulesNameAllHosts) {
  Export("/srv/data 10.0.0.1(rw) 10.0.0.2(rw) 10.0.0.0/30(ro)\n");
  EXPECT_EQ(Texts().back(), "Narrower rules name every host of this network; 10.0.0.1 is one of them.");
  EXPECT_EQ(Rows().back(), "network 10.0.0.0/30 - 10.0.0.1 4.2: sys rw, by 10.0.0.1");
}

TEST_F(ShareClientsOf, LoseToTheRuleThatDecides) {
  Export("/srv/data 10.0.0.0/8(ro) 10.0.0.0/24(rw)\n");  // the first one of a kind decides
  EXPECT_EQ(Rows().back(), "network 10.0.0.0/24 - 10.0.0.1 4.2: sys ro, by 10.0.0.0/8");
}

TEST_F(ShareClientsOf, IncludeThoseOfOuterFoldersOnce) {
  Export("/srv 10.0.0.0/24(ro)\n/srv/data 10.0.0.0/24(rw) 10.0.0.5(rw)\n/srv/data/inner 10.0.0.9(rw)\n");
  question_.access.version = "3";  // in which the nearest folder decides
  EXPECT_THAT(Rows(), ElementsAre("network 10.0.0.0/24 - 10.0.0.1 3: sys rw, by 10.0.0.0/24",
                                  "host 10.0.0.5 - 10.0.0.5 3: sys rw, by 10.0.0.5"));
  question_.access.version = "4.2";  // in which the outermost folder does
  EXPECT_EQ(Ask().clients.back().rule->directory, "/srv");
}

TEST_F(ShareClientsOf, HaveARowForEachAddressOfAName) {
  names_.hosts = {{"nas.example", "10.0.0.4"}, {"nas.example", "fd00::4"}};
  Export("/srv/data Nas.example(rw) gone.example(rw)\n");
  EXPECT_THAT(Rows(), ElementsAre("host Nas.example - 10.0.0.4 4.2: sys rw, by Nas.example",
                                  "host Nas.example - fd00::4 4.2: sys rw, by Nas.example"));
}

TEST_F(ShareClientsOf, AreThoseOfAHostThatTheTableHasByItsName) {
  Serve("/srv/data\tnas.example(rw)\n/srv/data\tgone.example(rw)\n");
  Export("/srv/data nas(rw) gone.example(rw)\n");
  names_.hosts = {{"nas", "10.0.0.4"}, {"nas.example", "10.0.0.4"}};
  EXPECT_THAT(Rows(), ElementsAre("host nas.example - 10.0.0.4 4.2: sys rw, by nas.example",
                                  "host gone.example - - 4.2: by -"));
  EXPECT_THAT(Texts(), ElementsAre("", "The name service has no address for this host."));
}

TEST_F(ShareClientsOf, AreTheKnownOnesToo) {
  Export("/srv/data 10.0.0.5(rw) 10.0.0.0/24(ro)\n");
  names_.hosts = {{"old.example", "10.0.0.8"}};
  known_ = {{"old.example", "3", "mounted"},  {"fd00::1", "4.1", "confirmed"}, {"10.0.0.20", "", "connected"},
            {"10.0.0.5", "4.0", "confirmed"}, {"10.0.0.5", "3", "mounted"},    {"gone.example", "3", "mounted"}};
  EXPECT_THAT(Rows(), ElementsAre("host 10.0.0.5 confirmed 10.0.0.5 4.0: sys rw, by 10.0.0.5",
                                  "network 10.0.0.0/24 - 10.0.0.1 4.2: sys ro, by 10.0.0.0/24",
                                  "- 10.0.0.20 connected 10.0.0.20 4.2: sys ro, by 10.0.0.0/24",
                                  "- fd00::1 confirmed fd00::1 4.1: sys none, by -", "- gone.example mounted - 3: by -",
                                  "- old.example mounted 10.0.0.8 3: sys ro, by 10.0.0.0/24"));
  EXPECT_EQ(Texts()[4], "The name service has no address for this host.");
  question_.access.version = "4.2";
  EXPECT_EQ(Rows().back(), "- old.example mounted 10.0.0.8 4.2: sys ro, by 10.0.0.0/24");
}

TEST_F(ShareClientsOf, StandForPatternsAndNetgroups) {
  Export("/srv/data a.example(rw) *.example(ro) @lab(ro,sec=krb5) *.elsewhere(rw)\n");
  names_.hosts = {{"a.example", "10.0.0.4"}, {"b.example", "10.0.0.5"}, {"c.lab", "10.0.0.6"}};
  names_.members = {{"lab", "c.lab"}};
  known_ = {{"10.0.0.5", "4.2", "confirmed"}, {"10.0.0.6", "4.2", "confirmed"}};
  EXPECT_THAT(Rows(),
              ElementsAre("host a.example - 10.0.0.4 4.2: sys rw, by a.example",
                          "pattern *.example - 10.0.0.5 4.2: sys ro, by *.example", "pattern *.elsewhere - - 4.2: by -",
                          "netgroup @lab - 10.0.0.6 4.2: sys none, by @lab",
                          "- 10.0.0.5 confirmed 10.0.0.5 4.2: sys ro, by *.example",
                          "- 10.0.0.6 confirmed 10.0.0.6 4.2: sys none, by @lab"));
  EXPECT_THAT(Texts()[1], HasSubstr("10.0.0.5 is one of these clients"));
  EXPECT_THAT(Texts()[2], HasSubstr("none can be explained"));
  known_.clear();
  EXPECT_EQ(Rows()[1], "pattern *.example - 10.0.0.4 4.2: sys rw, by a.example");  // the only one that is known
}

TEST_F(ShareClientsOf, AreNotFoundWithoutANameService) {
  Export("/srv/data 10.0.0.0/24(ro) *.example(ro) @lab(ro)\n");
  known_ = {{"10.0.0.5", "3", "mounted"}, {"old.example", "3", "mounted"}};
  names_.is_away = true;
  const std::vector<std::string> texts = Texts();
  ASSERT_EQ(texts.size(), 5U);
  EXPECT_THAT(texts[0], HasSubstr("10.0.0.1 stands for"));
  EXPECT_THAT(texts[0], HasSubstr("rules for names may be missing"));
  EXPECT_EQ(texts[1], "The name service did not answer.");
  EXPECT_EQ(texts[2], "The name service did not answer.");
  EXPECT_EQ(texts[3], "The name service did not answer, so that rules for names may be missing.");
  EXPECT_EQ(texts[4], "The name service did not answer.");
}

TEST_F(ShareClientsOf, ArePaged) {
  Export("/srv/data 10.0.0.1(rw) 10.0.0.2(rw) 10.0.0.3(rw)\n");
  question_.offset = 1;
  question_.limit = 1;
  const ShareClients page = Ask();
  EXPECT_EQ(page.total, 3U);
  ASSERT_EQ(page.clients.size(), 1U);
  EXPECT_EQ(page.clients[0].client, "10.0.0.2");
  question_.offset = 3;
  EXPECT_EQ(Ask().clients[0].client, "10.0.0.1");
  question_.limit = 0;
  EXPECT_THAT(Ask().clients, IsEmpty());
}

TEST_F(ShareClientsOf, AreNoneWithoutRulesAndClients) {
  Export("/srv/other *(rw)\n");
  const ShareClients none = Ask();
  EXPECT_EQ(none.total, 0U);
  EXPECT_THAT(none.clients, IsEmpty());
}

TEST_F(ShareClientsOf, AreNotExplainedForUsersGroupsAndSharesThatTheBoxDoesNotHave) {
  Export("/srv/data *(rw)\n");
  question_.access.user = "nobody-of-this-name";
  EXPECT_EQ(CodeOfFailure(), kNoSuchUser);
  Export("/srv/data *.example(rw)\n");
  names_.hosts = {{"b.example", "10.0.0.5"}};
  known_ = {{"10.0.0.5", "4.2", "confirmed"}};
  EXPECT_EQ(CodeOfFailure(), kNoSuchUser);
  question_.access.user = "alice";
  question_.access.groups = {"no-group-of-this-name"};
  EXPECT_EQ(CodeOfFailure(), kNoSuchGroup);
  question_.access.share = "none";
  EXPECT_EQ(CodeOfFailure(), ENOENT);
}

TEST_F(ShareClientsOf, AreNotExplainedIfTheTableCannotBeRead) {
  Serve("/srv/data *(\n");
  EXPECT_NE(CodeOfFailure(), 0);
}

TEST_F(ShareClientsOf, AreNotExplainedForANetworkThatIsNone) {
  Serve("/srv/data\t10.0.0.0/99(rw)\n");
  EXPECT_THAT(Texts(), ElementsAre("The server cannot read this network."));
}

}  // namespace
}  // namespace vorn
