// The findings on real files, each beside a box that has none.
#include "health.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/pem.h>
#include <openssl/x509.h>
#include <sys/stat.h>
#include <sys/timex.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "call.h"
#include "findings.h"
#include "kerberos_findings.h"
#include "keytab_maker.h"
#include "service_findings.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using testing::SizeIs;
using Severity = VORN::HealthFinding::Severity;

constexpr char kExports[] = "/etc/exports";

// A box whose service runs, with two shares and nothing to complain of.
class Health : public testing::Test {
 protected:
  Health() {
    root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nalice:x:2001:2001::/:/bin/sh\n");
    root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\nmedia = /srv/media\n");
    root_.Write("/srv/data/file", "");
    root_.Write("/srv/media/file", "");
    root_.Write("/var/lib/vorn/nfsd.state", "enabled\n");
    root_.Write("/proc/net/rpc/nfsd", "th 8 0\n");
    root_.Write("/proc/fs/nfsd/versions", "-2 +3 +4 +4.1 +4.2\n");
    Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw)\n");
  }

  // Writes the file, and the table that exportfs(8) would make of plain lines.
  void Export(const std::string& text) {
    root_.Write(kExports, text);
    root_.Write("/var/lib/nfs/etab", "/srv/data\t10.0.0.0/24(rw,sync)\n/srv/media\t10.0.0.0/24(rw,sync)\n");
  }

  // The findings of this kind.
  static std::vector<VORN::HealthFinding> Find(const std::string& kind) {
    std::vector<VORN::HealthFinding> found;
    for (const VORN::HealthFinding& finding : VORN::CheckHealth().findings) {
      EXPECT_THAT(finding.text, testing::EndsWith("."));
      EXPECT_THAT(finding.remedy, testing::EndsWith("."));
      EXPECT_THAT(VORN::HealthKinds(), Contains(finding.kind));
      if (finding.kind == kind) found.push_back(finding);
    }
    return found;
  }

  // The only finding of this kind.
  static VORN::HealthFinding FindOne(const std::string& kind) {
    const std::vector<VORN::HealthFinding> found = Find(kind);
    EXPECT_THAT(found, SizeIs(1)) << kind;
    return found.empty() ? VORN::HealthFinding() : found.front();
  }

  static std::string WhyNotChecked(const std::string& kind) {
    for (const VORN::HealthGap& gap : VORN::CheckHealth().not_checked) {
      if (gap.kind == kind) return gap.reason;
    }
    return "";
  }

  TemporaryRoot root_;
};

TEST_F(Health, HasNoFindingsOnAHealthyBox) {
  const VORN::HealthReport report = VORN::CheckHealth();
  for (const VORN::HealthFinding& finding : report.findings) ADD_FAILURE() << finding.kind << ": " << finding.text;
}

TEST_F(Health, FindsRulesThatAreNotInForce) {
  root_.Write(kExports, "/srv/data 10.0.0.0/24(ro)\n/srv/media 10.0.0.0/24(rw)\n");
  const VORN::HealthFinding finding = FindOne("exports_not_in_force");
  EXPECT_EQ(finding.severity, Severity::kError);
  EXPECT_EQ(finding.subject.share, "data");
  EXPECT_EQ(finding.subject.line, 1);
  root_.Write(kExports, "/srv/data 10.0.0.0/24(rw)\n");
  EXPECT_THAT(FindOne("exports_not_in_force").text, HasSubstr("/srv/media"));
}

TEST_F(Health, ComparesRulesOnlyWithAServiceThatRuns) {
  root_.Write(kExports, "/srv/data 10.0.0.0/24(ro)\n");
  root_.Write("/proc/net/rpc/nfsd", "th 0 0\n");
  EXPECT_THAT(Find("exports_not_in_force"), IsEmpty());
  EXPECT_EQ(WhyNotChecked("exports_not_in_force"), "");
  ASSERT_EQ(unlink(root_.At("/proc/net/rpc/nfsd").c_str()), 0);
  EXPECT_THAT(WhyNotChecked("exports_not_in_force"), HasSubstr("cannot be seen"));
}

TEST_F(Health, FindsFaultyLinesAndWhatTheyHide) {
  Export("# rules\n/srv/data 10.0.0.0/24(rw,foo)\n/srv/media 10.0.0.0/24(rw)\n/srv/other *(ro)\n");
  const VORN::HealthFinding finding = FindOne("exports_fault");
  EXPECT_EQ(finding.severity, Severity::kError);
  EXPECT_EQ(finding.subject.file, kExports);
  EXPECT_EQ(finding.subject.line, 2);
  EXPECT_EQ(finding.subject.share, "data");
  EXPECT_THAT(finding.text, HasSubstr("foo"));
  EXPECT_THAT(finding.text, HasSubstr("does not export /srv/media and 1 more"));
  Export("/srv/media 10.0.0.0/24(rw)\n/srv/data 10.0.0.0/24(rw,foo)\n");
  EXPECT_THAT(FindOne("exports_fault").text, Not(HasSubstr("does not export")));
}

TEST_F(Health, FindsExportsOfFormerShares) {
  root_.Write("/var/lib/vorn/exported-shares", "/srv/data\n/srv/media\n");
  EXPECT_THAT(Find("left_share"), IsEmpty());
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\n");
  const VORN::HealthFinding finding = FindOne("left_share");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.file, kExports);
  EXPECT_EQ(finding.subject.line, 2);
  EXPECT_THAT(finding.text, HasSubstr("/srv/media"));
}

TEST_F(Health, FindsSharesInForeignFiles) {
  root_.Write("/etc/exports.d/other.exports", "/somewhere *(ro)\n");
  EXPECT_THAT(Find("foreign_export"), IsEmpty());
  root_.Write("/etc/exports.d/other.exports", "# more\n\n/srv/data 10.9.0.0/24(ro)\n");
  const VORN::HealthFinding finding = FindOne("foreign_export");
  EXPECT_EQ(finding.severity, Severity::kNotice);
  EXPECT_EQ(finding.subject.share, "data");
  EXPECT_EQ(finding.subject.file, "/etc/exports.d/other.exports");
  EXPECT_EQ(finding.subject.line, 3);
}

TEST_F(Health, FindsSharesThatAreExportedByALink) {
  ASSERT_EQ(symlink("data", root_.At("/srv/link").c_str()), 0);
  Export("/srv/link 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw)\n");
  const VORN::HealthFinding finding = FindOne("linked_export");
  EXPECT_EQ(finding.subject.share, "data");
  EXPECT_THAT(finding.text, HasSubstr("/srv/link"));
  EXPECT_THAT(finding.remedy, HasSubstr("/srv/data"));
}

TEST_F(Health, FindsSharesWithoutAFolder) {
  root_.Write("/etc/vorn/shares.conf",
              "[shares]\ndata = /srv/data\nmedia = /srv/media\nfile = /srv/data/file\n"
              "gone = /srv/gone\n");
  const std::vector<VORN::HealthFinding> found = Find("missing_folder");
  ASSERT_THAT(found, SizeIs(2));
  EXPECT_EQ(found[0].subject.share, "file");
  EXPECT_EQ(found[1].subject.share, "gone");
  EXPECT_EQ(found[1].call.method, "delete");
  EXPECT_EQ(std::get<std::string>(found[1].call.parameters.at("name")), "gone");
}

TEST_F(Health, FindsSettingsThatNobodyCanRead) {
  root_.Write("/etc/nfs.conf", "[nfsd]\ninclude = nfs.conf\n");
  const VORN::HealthFinding finding = FindOne("settings_fault");
  EXPECT_EQ(finding.severity, Severity::kError);
  EXPECT_EQ(finding.subject.file, "/etc/nfs.conf");
  EXPECT_EQ(finding.subject.line, 2);
  EXPECT_THAT(WhyNotChecked("ignored_setting"), HasSubstr("includes itself"));
}

TEST_F(Health, FindsAnIDMapThatNobodyCanRead) {
  root_.Write("/etc/idmapd.conf", "[General]\nDomain = $a\n[environment]\na = $a\n");
  EXPECT_EQ(FindOne("settings_fault").subject.file, "/etc/idmapd.conf");
}

TEST_F(Health, FindsMissingPlugins) {
  root_.Write("/usr/lib/libnfsidmap/nsswitch.so", "");
  root_.Write("/etc/idmapd.conf", "[Translation]\nMethod = nsswitch\n");
  EXPECT_THAT(Find("settings_fault"), IsEmpty());
  root_.Write("/etc/idmapd.conf", "[Translation]\nMethod = umich_ldap\n");
  EXPECT_THAT(FindOne("settings_fault").text, HasSubstr("umich_ldap"));
}

TEST_F(Health, FindsValuesThatTheirDaemonsIgnore) {
  root_.Write("/etc/nfs.conf", "[mountd]\nmanage-gids = perhaps\n");
  const VORN::HealthFinding finding = FindOne("ignored_setting");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.file, "/etc/nfs.conf");
  EXPECT_EQ(finding.subject.line, 2);
  EXPECT_THAT(finding.text, HasSubstr("manage-gids"));
}

TEST_F(Health, FindsSettingsThatAnotherFileOverrides) {
  root_.Write("/etc/nfs.conf", "[mountd]\nmanage-gids = y\n");
  root_.Write("/etc/nfs.conf.d/vorn.conf", "[mountd]\nmanage-gids = n\n");
  EXPECT_THAT(Find("overridden_setting"), IsEmpty());
  root_.Write("/etc/nfs.conf.d/zz.conf", "# later\n[mountd]\nmanage-gids = y\n");
  const VORN::HealthFinding finding = FindOne("overridden_setting");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.setting, "mountd manage-gids");
  EXPECT_EQ(finding.subject.file, "/etc/nfs.conf.d/zz.conf");
  EXPECT_EQ(finding.subject.line, 3);
}

TEST_F(Health, FindsAnOverriddenDomain) {
  root_.Write("/etc/idmapd.conf", "[General]\nDomain = a.example\n");
  root_.Write("/etc/idmapd.conf.d/x.conf", "[General]\nDomain = a.example\n");
  EXPECT_THAT(Find("overridden_setting"), IsEmpty());
  root_.Write("/etc/idmapd.conf.d/x.conf", "[General]\nDomain = b.example\n");
  EXPECT_EQ(FindOne("overridden_setting").subject.setting, "General Domain");
}

TEST_F(Health, FindsAServiceThatDoesNotServe) {
  root_.Write("/proc/net/rpc/nfsd", "th 0 0\n");
  EXPECT_THAT(FindOne("not_serving").text, HasSubstr("do not show why"));
  const std::pair<const char*, const char*> cases[] = {
      {"[nfsd]\nvers3 = n\nvers4 = n\n", "All versions"},
      {"[statd]\nport = 4000\n[lockd]\nport = 4000\n", "same port, 4000"},
      {"[nfsd]\ninclude = nfs.conf\n", "includes itself"},
  };
  for (const auto& [configuration, why] : cases) {
    root_.Write("/etc/nfs.conf", configuration);
    const VORN::HealthFinding finding = FindOne("not_serving");
    EXPECT_EQ(finding.severity, Severity::kError);
    EXPECT_THAT(finding.text, HasSubstr(why));
  }
  root_.Write("/var/lib/vorn/nfsd.state", "disabled\n");
  EXPECT_THAT(Find("not_serving"), IsEmpty());
}

TEST_F(Health, CannotTellWhetherAKernelServesThatIsNotThere) {
  ASSERT_EQ(unlink(root_.At("/proc/net/rpc/nfsd").c_str()), 0);
  EXPECT_THAT(Find("not_serving"), IsEmpty());
  EXPECT_THAT(WhyNotChecked("not_serving"), HasSubstr("cannot be seen"));
}

TEST_F(Health, FindsVersionsThatARestartChanges) {
  root_.Write("/etc/nfs.conf", "[nfsd]\nvers3 = n\n");
  const VORN::HealthFinding finding = FindOne("version_not_in_force");
  EXPECT_EQ(finding.subject.setting, "nfsd vers3");
  EXPECT_THAT(finding.text, HasSubstr("can still use"));
  root_.Write("/etc/nfs.conf", "");
  root_.Write("/proc/fs/nfsd/versions", "-2 +3 +4 +4.1 -4.2\n");
  EXPECT_THAT(FindOne("version_not_in_force").text, HasSubstr("cannot use NFS version 4.2"));
}

TEST_F(Health, CannotSeeThePacketFiltersOfATrialRoot) { EXPECT_NE(WhyNotChecked("closed_port"), ""); }

// A rule for "backup", which the table has by an address.
TEST_F(Health, FindsHostsWithoutAnAddress) {
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw) backup(ro)\n");
  const VORN::HealthFinding finding = FindOne("unknown_host");
  EXPECT_EQ(finding.severity, Severity::kError);
  EXPECT_EQ(finding.subject.client, "backup");
  EXPECT_EQ(finding.subject.share, "media");
  root_.Write("/var/lib/vorn/export-hosts", "backup 10.0.0.9\n");
  EXPECT_THAT(Find("unknown_host"), IsEmpty());
  root_.Write("/proc/net/rpc/nfsd", "th 0 0\n");
  EXPECT_THAT(WhyNotChecked("unknown_host"), HasSubstr("does not run"));
}

TEST_F(Health, FindsHostsThatTheKernelKnows) {
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw) backup(ro)\n");
  root_.Write("/proc/net/rpc/auth.unix.ip/content", "#class IP domain\nnfsd 10.0.0.9 backup\n");
  EXPECT_THAT(Find("unknown_host"), IsEmpty());
}

TEST_F(Health, FindsHostsThatHaveMoved) {
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw) backup(ro)\n");
  root_.Write("/var/lib/vorn/export-hosts", "backup 10.0.0.9\n");
  EXPECT_THAT(WhyNotChecked("moved_host"), HasSubstr("not in /etc/hosts: 1."));
  root_.Write("/etc/hosts", "10.0.0.9 backup.example backup\n");
  EXPECT_THAT(Find("moved_host"), IsEmpty());
  EXPECT_EQ(WhyNotChecked("moved_host"), "");
  root_.Write("/etc/hosts", "10.0.0.8 Backup # since May\n");
  const VORN::HealthFinding finding = FindOne("moved_host");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.client, "backup");
  EXPECT_THAT(finding.text, HasSubstr("10.0.0.8"));
  EXPECT_THAT(finding.text, HasSubstr("10.0.0.9"));
}

TEST_F(Health, FindsNetworksWithAPrefixOfLengthZero) {
  for (const char* client : {"0.0.0.0/0", "10.0.0.1/00", "10.0.0.1/", "::/0"}) {
    Export("/srv/data 10.0.0.0/24(rw)\n/srv/media " + std::string(client) + "(ro)\n");
    const VORN::HealthFinding finding = FindOne("narrow_network");
    EXPECT_EQ(finding.severity, Severity::kWarning);
    EXPECT_EQ(finding.subject.client, client);
    EXPECT_THAT(finding.remedy, HasSubstr(finding.subject.client[0] == ':' ? "::/::" : "0.0.0.0/0.0.0.0"));
  }
  Export("/srv/media 0.0.0.0/0.0.0.0(ro) ::/::(ro) 10.0.0.0/8(ro) 10.0.0.10/30(ro) *(ro)\n");
  EXPECT_THAT(Find("narrow_network"), IsEmpty());
}

TEST_F(Health, FindsRulesThatEarlierOnesHide) {
  const std::pair<const char*, const char*> hidden[] = {
      {"10.0.0.0/8(ro) 10.0.1.0/24(rw)", "10.0.1.0/24"},
      {"10.0.0.0/8(ro) 10.1.0.0/255.0.0.0(rw)", "10.1.0.0/255.0.0.0"},
      {"fd00::/8(ro) 10.0.0.0/8(ro) fd00:1::/64(rw)", "fd00:1::/64"},
      {"10.0.0.0/0.0.0.0(ro) 10.0.0.0/8(rw)", "10.0.0.0/8"},
      {"10.0.0.0/255.0.255.0(ro) 10.1.0.0/24(rw)", "10.1.0.0/24"},
      {"backup(ro) Backup.(rw)", "Backup."},
      {"10.0.0.0/8(ro)\n/srv/media 10.0.0.0/8(rw)", "10.0.0.0/8"},
  };
  for (const auto& [rules, client] : hidden) {
    Export("/srv/data 10.0.0.0/24(rw)\n/srv/media " + std::string(rules) + "\n");
    EXPECT_EQ(FindOne("hidden_rule").subject.client, client) << rules;
  }
  for (const char* rules :
       {"10.0.1.0/24(rw) 10.0.0.0/8(ro)", "10.0.0.0/8(ro) 10.0.1.0/24(ro)", "10.0.0.0/8(ro) *(rw)",
        "10.0.0.0/8(ro) 10.0.0.1(rw)", "10.0.0.0/0(ro) 10.0.0.0/8(rw)", "10.0.0.0/8(ro) 11.0.0.0/24(rw)"}) {
    Export("/srv/data 10.0.0.0/24(rw)\n/srv/media " + std::string(rules) + "\n");
    EXPECT_THAT(Find("hidden_rule"), IsEmpty()) << rules;
  }
}

// The directories at which file systems are mounted.
std::string MountTable(const std::vector<std::string>& directories) {
  std::string table = "1 0 8:1 / / rw - ext4 /dev/a rw\n";
  for (std::size_t at = 0; at < directories.size(); ++at) {
    const std::string number = std::to_string(at + 2);
    table += number + " 1 8:" + number + " / " + directories[at] + " rw - ext4 /dev/b" + number + " rw\n";
  }
  return table;
}

TEST_F(Health, FindsVolumesThatCrossmntOpens) {
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\nmedia = /srv/data/media\n");
  root_.Write("/srv/data/media/file", "");
  root_.Write("/proc/self/mountinfo", MountTable({"/srv/data", "/srv/data/media"}));
  Export("/srv/data 10.0.0.0/24(rw,crossmnt) 10.9.0.0/24(ro,crossmnt)\n/srv/data/media 10.0.0.0/24(rw)\n");
  const VORN::HealthFinding finding = FindOne("crossed_volume");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.client, "10.9.0.0/24");
  EXPECT_THAT(finding.text, HasSubstr("/srv/data/media"));
  EXPECT_THAT(Find("nested_share"), IsEmpty());
  Export("/srv/data 10.0.0.0/24(rw,crossmnt) 10.9.0.0/24(ro)\n/srv/data/media 10.0.0.0/24(rw)\n");
  EXPECT_THAT(Find("crossed_volume"), IsEmpty());
}

TEST_F(Health, FindsSharesInsideOthers) {
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\ninner = /srv/data/in/ner\n");
  root_.Write("/srv/data/in/ner/file", "");
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/data/in/ner 10.0.0.0/24(ro)\n");
  const VORN::HealthFinding finding = FindOne("nested_share");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.share, "inner");
  EXPECT_THAT(finding.text, HasSubstr("10.0.0.0/24 reaches it with the rights of /srv/data"));
  Export("/srv/data a(rw) b(rw) c(rw) d(rw) e(rw)\n/srv/data/in/ner 10.0.0.0/24(ro)\n");
  EXPECT_THAT(FindOne("nested_share").text, HasSubstr("a, b, c, 2 others"));
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/data/in/ner 10.0.0.0/24(rw) *(ro)\n");
  EXPECT_THAT(Find("nested_share"), IsEmpty());
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/data/in/ner 10.0.0.0/24(ro)\n");
  root_.Write("/proc/self/mountinfo", MountTable({"/srv/data/in"}));
  EXPECT_THAT(Find("nested_share"), IsEmpty());
}

TEST_F(Health, FindsSharesOfOneFileSystemOnce) {
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\nmedia = /srv/media\nother = /srv/other\n");
  root_.Write("/srv/other/file", "");
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.1.0.0/24(rw)\n/srv/other 10.2.0.0/24(rw)\n");
  const VORN::HealthFinding finding = FindOne("shared_file_system");
  EXPECT_EQ(finding.severity, Severity::kNotice);
  EXPECT_THAT(finding.text, HasSubstr("\"data\" and \"media\""));
  Export("/srv/data 10.0.0.0/24(rw,subtree_check)\n/srv/media 10.1.0.0/24(rw,subtree_check)\n");
  EXPECT_THAT(Find("shared_file_system"), IsEmpty());
}

TEST_F(Health, FindsMappingsToUsersWhoAreGone) {
  root_.Write("/etc/idmapd.conf", "[Translation]\nMethod = static\n[Static]\na@X = alice\nb@X = bob\n");
  const VORN::HealthFinding finding = FindOne("mapping_to_nobody");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.mapping, "b@X");
  EXPECT_EQ(finding.subject.file, "/etc/idmapd.conf");
  EXPECT_EQ(finding.subject.line, 5);
  EXPECT_EQ(finding.call.api, "VORN.Core.FileServ.NFS.IDMap");
  EXPECT_THAT(std::get<std::vector<std::string>>(finding.call.parameters.at("id")), ElementsAre("b@X"));
  root_.Write("/etc/nsswitch.conf", "group: files ldap\npasswd: files [NOTFOUND=continue] systemd # sss\n");
  EXPECT_THAT(Find("mapping_to_nobody"), SizeIs(1));
  root_.Write("/etc/nsswitch.conf", "passwd: files sss\n");
  EXPECT_THAT(Find("mapping_to_nobody"), IsEmpty());
  EXPECT_THAT(WhyNotChecked("mapping_to_nobody"), HasSubstr("\"sss\""));
}

TEST_F(Health, FindsMappingsToRoot) {
  root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nalice:x:2001:2001::/:/bin/sh\ntoor:x:0:0::/:/bin/sh\n");
  root_.Write("/etc/idmapd.conf", "[Translation]\nMethod = static\n[Static]\na@X = alice\nb@X = toor\n");
  const VORN::HealthFinding finding = FindOne("mapping_to_root");
  EXPECT_EQ(finding.subject.mapping, "b@X");
  EXPECT_EQ(finding.call.method, "delete");
}

TEST_F(Health, FindsMappingsWithoutEffect) {
  constexpr char kMapping[] = "[Static]\na@X = alice\n";
  root_.Write("/etc/idmapd.conf", kMapping);
  EXPECT_THAT(FindOne("mapping_without_effect").text, HasSubstr("do not come first"));
  EXPECT_THAT(WhyNotChecked("mapping_without_effect"), HasSubstr("gssproxy"));
  root_.Write("/etc/idmapd.conf", std::string("[Translation]\nGSS-Methods = static,nsswitch\n") + kMapping);
  EXPECT_THAT(Find("mapping_without_effect"), IsEmpty());
  root_.Write("/proc/net/rpc/use-gss-proxy", "1\n");
  EXPECT_THAT(FindOne("mapping_without_effect").text, HasSubstr("gssproxy serves"));
  root_.Write("/proc/net/rpc/use-gss-proxy", "0\n");
  EXPECT_THAT(Find("mapping_without_effect"), IsEmpty());
  EXPECT_EQ(WhyNotChecked("mapping_without_effect"), "");
}

constexpr char kKeytab[] = "/etc/nfs/krb5.keytab";

TEST_F(Health, FindsRulesThatNeedAKeytab) {
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw,sec=sys:krb5p)\n");
  EXPECT_THAT(FindOne("missing_keytab").text, HasSubstr("has no key"));
  EXPECT_EQ(FindOne("missing_keytab").subject.line, 2);
  root_.Write(kKeytab, "no keytab");
  EXPECT_THAT(FindOne("missing_keytab").text, HasSubstr("is no keytab"));
  EXPECT_NE(WhyNotChecked("weak_key"), "");
  root_.Write(kKeytab, MakeKeytab({{"nfs/box.example@X", 1, "aes256-cts"}}));
  EXPECT_THAT(Find("missing_keytab"), IsEmpty());
}

TEST_F(Health, FindsAKeytabOfAnotherHost) {
  root_.Write("/etc/hostname", "box\n");
  root_.Write("/etc/hosts", "127.0.1.1 Box.example box\n");
  root_.Write(kKeytab, MakeKeytab({{"nfs/box.example@X", 1, "aes256-cts"}}));
  EXPECT_THAT(Find("missing_host_key"), IsEmpty());
  root_.Write(kKeytab,
              MakeKeytab({{"nfs/box.example.org@X", 1, "aes256-cts"}, {"host/box.example@X", 1, "aes256-cts"}}));
  const VORN::HealthFinding finding = FindOne("missing_host_key");
  EXPECT_EQ(finding.severity, Severity::kError);
  EXPECT_THAT(finding.text, HasSubstr("nfs/box.example,"));
  root_.Write("/etc/hosts", "");
  EXPECT_THAT(WhyNotChecked("missing_host_key"), HasSubstr("full name"));
}

TEST_F(Health, FindsDeprecatedKeys) {
  root_.Write(kKeytab, MakeKeytab({{"nfs/box.example@X", 1, "aes256-cts"},
                                   {"nfs/box.example@X", 1, "arcfour-hmac"},
                                   {"nfs/box.example@X", 2, "arcfour-hmac"},
                                   {"nfs/box.example@X", 2, "des3-cbc-sha1"}}));
  EXPECT_THAT(Find("weak_key"), SizeIs(2));
  root_.Write(kKeytab, MakeKeytab({{"nfs/box.example@X", 1, "aes256-cts"}, {"nfs/box.example@X", 1, "aes128-sha2"}}));
  EXPECT_THAT(Find("weak_key"), IsEmpty());
}

TEST_F(Health, DoesNotTakeTheClockForThatOfATrialRoot) {
  EXPECT_EQ(WhyNotChecked("unsynchronised_clock"), "");
  root_.Write(kKeytab, MakeKeytab({{"nfs/box.example@X", 1, "aes256-cts"}}));
  EXPECT_NE(WhyNotChecked("unsynchronised_clock"), "");
}

TEST(Clock, IsJudgedByTheKernelOrByTheTimeService) {
  Findings findings("unsynchronised_clock");
  EXPECT_TRUE(JudgeClock(TIME_OK, false, &findings).ok());
  errno = EPERM;
  EXPECT_TRUE(JudgeClock(-1, true, &findings).ok());
  EXPECT_EQ(JudgeClock(-1, false, &findings).code(), EPERM);
  EXPECT_THAT(findings.Take(), IsEmpty());
  EXPECT_TRUE(JudgeClock(TIME_ERROR, true, &findings).ok());
  const std::vector<VORN::HealthFinding> found = findings.Take();
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_EQ(found[0].severity, Severity::kWarning);
  EXPECT_THAT(found[0].text, HasSubstr("more than five minutes"));
}

TEST(ClosedPorts, AreFindings) {
  Findings findings("closed_port");
  EXPECT_TRUE(JudgePorts(std::vector<std::string>(), &findings).ok());
  EXPECT_FALSE(JudgePorts(std::nullopt, &findings).ok());
  EXPECT_THAT(findings.Take(), IsEmpty());
  EXPECT_TRUE(JudgePorts(std::vector<std::string>{"table inet filter drops the port 2049"}, &findings).ok());
  const std::vector<VORN::HealthFinding> found = findings.Take();
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_EQ(found[0].kind, "closed_port");
  EXPECT_EQ(found[0].severity, Severity::kError);
  EXPECT_EQ(found[0].text, "Clients may not reach the service: table inet filter drops the port 2049.");
}

TEST_F(Health, DoesNotTakeTheJournalForThatOfATrialRoot) {
  EXPECT_EQ(WhyNotChecked("refused_ticket"), "");
  root_.Write(kKeytab, MakeKeytab({{"nfs/box.example@X", 1, "aes256-cts"}}));
  EXPECT_THAT(WhyNotChecked("refused_ticket"), HasSubstr("not that of this root"));
}

TEST(RefusedTickets, AreFindingsByReason) {
  const std::string begin = "ERROR: GSS-API: error in handle_nullreq: gss_accept_sec_context(): GSS_S_FAILURE (x) - ";
  TicketLog log;
  for (const char* reason : {"Clock skew too great", "Wrong principal in request", "Wrong principal in request"}) {
    log.Add(begin + reason, 1);
  }
  Findings findings("refused_ticket");
  JudgeTickets(log, &findings);
  const std::vector<VORN::HealthFinding> found = findings.Take();
  ASSERT_THAT(found, SizeIs(2));
  EXPECT_EQ(found[0].severity, Severity::kWarning);
  EXPECT_THAT(found[0].text, HasSubstr("a ticket was refused: Clock skew too great."));
  EXPECT_THAT(found[1].text, HasSubstr("2 tickets were refused: Wrong principal in request."));
}

TEST_F(Health, FindsClientsOfOtherDomains) {
  const auto add = [&](int number, const std::string& name) {
    root_.Write("/proc/fs/nfsd/clients/" + std::to_string(number) + "/info",
                "clientid: 0x1\naddress: \"10.0.0." + std::to_string(number) + ":871\"\nname: \"" + name + "\"\n");
  };
  add(1, "Linux NFSv4.2 a.Example.net");
  add(2, "Linux NFSv4.0 b.other.example/10.0.0.9");
  add(3, "Linux NFSv4.1 c.other.example");
  add(4, "Linux NFSv4.2 short");
  add(5, "Linux NFSv4.0 10.0.0.5/10.0.0.9 tcp");
  add(6, "Linux NFSv4.2");
  add(7, "another.system.example");
  root_.Write("/etc/idmapd.conf", "[General]\nDomain = example.net\n");
  EXPECT_THAT(Find("foreign_domain"), IsEmpty()) << "without Kerberos a client sends numbers";
  Export("/srv/data 10.0.0.0/24(rw,sec=krb5)\n/srv/media 10.0.0.0/24(rw)\n");
  const VORN::HealthFinding finding = FindOne("foreign_domain");
  EXPECT_EQ(finding.severity, Severity::kNotice);
  EXPECT_EQ(finding.subject.client, "10.0.0.2");
  EXPECT_THAT(finding.text, HasSubstr("other.example, and the NFSv4 domain of the box is example.net"));
  root_.Write("/etc/idmapd.conf", "");
  EXPECT_THAT(WhyNotChecked("foreign_domain"), HasSubstr("full name"));
  root_.Write("/etc/hostname", "box\n");
  root_.Write("/etc/hosts", "10.0.0.9 box.other.example box\n");
  EXPECT_EQ(FindOne("foreign_domain").subject.client, "10.0.0.1");
}

// A self-signed certificate that ends after this time, in seconds.
std::string CertificateFor(long seconds) {
  const std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)> key(EVP_EC_gen("P-256"), EVP_PKEY_free);
  const std::unique_ptr<X509, decltype(&X509_free)> certificate(X509_new(), X509_free);
  X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -86400L * 400);
  X509_gmtime_adj(X509_getm_notAfter(certificate.get()), seconds);
  X509_set_pubkey(certificate.get(), key.get());
  X509_sign(certificate.get(), key.get(), EVP_sha256());
  const std::unique_ptr<BIO, decltype(&BIO_free_all)> output(BIO_new(BIO_s_mem()), BIO_free_all);
  PEM_write_bio_X509(output.get(), certificate.get());
  std::string text(4096, '\0');
  text.resize(
      static_cast<std::size_t>(std::max(0, BIO_read(output.get(), text.data(), static_cast<int>(text.size())))));
  return text;
}

TEST_F(Health, FindsACertificateThatExpires) {
  constexpr long kDay = 86400;
  constexpr char kSettings[] = "/etc/vorn/vornd.conf";
  constexpr char kFile[] = "/etc/ssl/box.pem";
  root_.Write(kSettings, std::string("[tls]\ncertificate = ") + kFile + "\nkey = /etc/ssl/box.key\n");
  EXPECT_THAT(WhyNotChecked("expiring_certificate"), HasSubstr("has no certificate"));
  root_.Write(kFile, CertificateFor(40 * kDay));
  EXPECT_THAT(Find("expiring_certificate"), IsEmpty());
  root_.Write(kFile, CertificateFor(20 * kDay + 100) + CertificateFor(-kDay));
  VORN::HealthFinding finding = FindOne("expiring_certificate");
  EXPECT_EQ(finding.severity, Severity::kWarning);
  EXPECT_EQ(finding.subject.file, kFile);
  EXPECT_THAT(finding.text, HasSubstr("expires in 20 days"));
  EXPECT_THAT(finding.remedy, HasSubstr("systemctl reload vornd"));
  root_.Write(kFile, CertificateFor(kDay + 100));
  EXPECT_THAT(FindOne("expiring_certificate").text, HasSubstr("expires in 1 day:"));
  root_.Write(kFile, CertificateFor(-60));
  finding = FindOne("expiring_certificate");
  EXPECT_EQ(finding.severity, Severity::kError);
  EXPECT_THAT(finding.text, HasSubstr("has expired"));
}

TEST_F(Health, FindsASelfSignedCertificateThatIsNotMadeAnew) {
  constexpr char kFile[] = "/var/lib/vorn/self-signed.pem";
  root_.Write(kFile, CertificateFor(-60));
  EXPECT_THAT(Find("expiring_certificate"), IsEmpty()) << "nobody listens with TLS";
  root_.Write("/etc/vorn/vornd.conf", "[server]\nlisten = unix:/run/vorn/vornd.sock tls:0.0.0.0:443\n");
  EXPECT_THAT(FindOne("expiring_certificate").remedy, HasSubstr("Restart vornd"));
  root_.Write(kFile, CertificateFor(20 * 86400));
  EXPECT_THAT(Find("expiring_certificate"), IsEmpty());
}

TEST_F(Health, TellsWhichFilesCannotBeRead) {
  ASSERT_EQ(unlink(root_.At(kExports).c_str()), 0);
  ASSERT_EQ(mkdir(root_.At(kExports).c_str(), 0755), 0);
  for (const char* kind : {"exports_fault", "left_share", "linked_export", "foreign_export", "nested_share"}) {
    EXPECT_NE(WhyNotChecked(kind), "") << kind;
  }
  EXPECT_EQ(WhyNotChecked("missing_folder"), "");
}

TEST_F(Health, PutsErrorsFirstAndTextsInUtf8) {
  Export("/srv/data 10.0.0.0/24(rw)\n/srv/media 10.0.0.0/24(rw,\xff)\n");
  root_.Write("/etc/exports.d/other.exports", "/srv/data 10.9.0.0/24(ro)\n");
  const std::vector<VORN::HealthFinding> findings = VORN::CheckHealth().findings;
  ASSERT_FALSE(findings.empty());
  EXPECT_TRUE(std::is_sorted(findings.begin(), findings.end(),
                             [](const auto& a, const auto& b) { return a.severity < b.severity; }));
  for (const VORN::HealthFinding& finding : findings) EXPECT_THAT(finding.text, Not(HasSubstr("\xff")));
}

TEST_F(Health, LeavesTheWarningsOfTheCallAlone) {
  root_.Write("/etc/nfs.conf", "[mountd]\nmanage-gids = perhaps\n");
  const VORN::CallContext call({"alice", "unix", "check", "", false, {}, nullptr});
  EXPECT_THAT(Find("ignored_setting"), SizeIs(1));
  EXPECT_THAT(call.warnings(), IsEmpty());
}

}  // namespace
}  // namespace vorn
