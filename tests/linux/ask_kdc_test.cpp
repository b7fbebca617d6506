// The program vorn-ask-kdc, and the findings that it leads to, with a KDC of the test's own.
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/stat.h>

#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "health.h"
#include "kerberos_findings.h"
#include "processes.h"
#include "requirements.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using Severity = VORN::HealthFinding::Severity;

[[maybe_unused]] const bool kRequired = RequirePrograms({"kadmin.local", "kdb5_util", "krb5kdc", "ktutil"});

constexpr char kKeytab[] = "/etc/nfs/krb5.keytab";
constexpr char kProgram[] = "/usr/libexec/vorn-ask-kdc";

std::string ContentOf(const char* path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

// A box in a realm, at a port of the loopback interface.
class AskKdc : public testing::Test {
 protected:
  AskKdc() {
    root_.Write(kProgram, ContentOf(VORN_ASK_KDC));
    EXPECT_EQ(chmod(root_.At(kProgram).c_str(), 0755), 0);
    root_.Write("/etc/krb5.conf",
                "[libdefaults]\n default_realm = LAB.TEST\n dns_lookup_kdc = false\n rdns = false\n"
                "[realms]\n LAB.TEST = {\n  kdc = 127.0.0.1:10088\n }\n");
    const std::string place = root_.At("/kdc");
    root_.Write("/kdc/kdc.conf",
                "[kdcdefaults]\n kdc_listen = 127.0.0.1:10088\n kdc_tcp_listen = \"\"\n[realms]\n"
                " LAB.TEST = {\n  database_name = " +
                    place + "/principal\n  key_stash_file = " + place + "/stash\n }\n");
    Run("kdb5_util create -s -P secret -r LAB.TEST");
    Admin("addprinc -randkey nfs/box.example");
  }
  ~AskKdc() override { StopKdc(); }

  void Run(const std::string& command) const {
    const ProgramResult result = RunProgram({"sh", "-ec",
                                             "export KRB5_CONFIG=" + root_.At("/etc/krb5.conf") +
                                                 " KRB5_KDC_PROFILE=" + root_.At("/kdc/kdc.conf") + "\n" + command});
    ASSERT_EQ(result.status, 0) << command << "\n" << result.output << result.errors;
  }
  void Admin(const std::string& query) const { Run("kadmin.local -q \"" + query + "\""); }

  // Gives the principals new keys, and uploads a keytab of them.
  void Export(const std::string& principals) const {
    const std::string file = root_.At("/new");
    Run("rm -f " + file + "\nkadmin.local -q \"ktadd -k " + file +
        " -e aes256-cts-hmac-sha1-96:normal,aes128-cts-hmac-sha1-96:normal " + principals + "\"");
    Install();
  }

  // Uploads the keytab that was made last. It is another file for the box, even with an equal content.
  void Install() const { root_.Write(kKeytab, *root_.Read("/new")); }

  void StartKdc(const std::string& preload = "") const {
    Run((preload.empty() ? "" : "LD_PRELOAD=" + preload + " ") + "krb5kdc -P " + root_.At("/kdc/pid"));
    EXPECT_TRUE(Eventually([&] { return root_.Read("/kdc/pid").has_value(); }));
  }
  void StopKdc() const {
    if (const auto id = root_.Read("/kdc/pid")) kill(std::stoi(*id), SIGKILL);
  }

  // The report when the KDC has answered, or is known not to answer.
  static VORN::HealthReport Check() {
    VORN::HealthReport report;
    EXPECT_TRUE(Eventually([&] {
      report = VORN::CheckHealth();
      return WhyNotChecked(report, "outdated_key").find("being asked") == std::string::npos;
    }));
    return report;
  }
  static std::vector<VORN::HealthFinding> Find(const VORN::HealthReport& report, const std::string& kind) {
    std::vector<VORN::HealthFinding> found;
    for (const VORN::HealthFinding& finding : report.findings) {
      if (finding.kind == kind) found.push_back(finding);
    }
    return found;
  }
  static std::string WhyNotChecked(const VORN::HealthReport& report, const std::string& kind) {
    for (const VORN::HealthGap& gap : report.not_checked) {
      if (gap.kind == kind) return gap.reason;
    }
    return "";
  }

  // Expects a finding of this severity, whose text contains this one.
  static void ExpectFinding(Severity severity, const std::string& text) {
    const VORN::HealthReport report = Check();
    const std::vector<VORN::HealthFinding> found = Find(report, "outdated_key");
    ASSERT_THAT(found, SizeIs(1)) << WhyNotChecked(report, "outdated_key");
    EXPECT_EQ(found.front().severity, severity);
    EXPECT_EQ(found.front().subject.file, kKeytab);
    EXPECT_THAT(found.front().text, HasSubstr(text));
  }
  static void ExpectNoFinding() {
    const VORN::HealthReport report = Check();
    for (const char* kind : {"outdated_key", "clock_skew"}) {
      EXPECT_THAT(Find(report, kind), IsEmpty());
      EXPECT_EQ(WhyNotChecked(report, kind), "");
    }
  }

  const TemporaryRoot root_;
};

TEST_F(AskKdc, FindsNothingWithTheKeysOfTheKdc) {
  StartKdc();
  Export("nfs/box.example");
  ExpectNoFinding();
  Admin("modprinc +requires_preauth nfs/box.example");
  Install();
  ExpectNoFinding();
}

TEST_F(AskKdc, FindsKeysThatTheKdcHasReplaced) {
  StartKdc();
  for (const char* flag : {"-requires_preauth", "+requires_preauth"}) {
    Admin(std::string("modprinc ") + flag + " nfs/box.example");
    Export("nfs/box.example");
    ExpectNoFinding();
    Admin("cpw -randkey nfs/box.example");
    Install();
    ExpectFinding(Severity::kError, "another key of nfs/box.example@LAB.TEST than the keytab");
  }
}

TEST_F(AskKdc, FindsThatTicketsAreSealedWithAKeyThatTheKeytabLacks) {
  StartKdc();
  Export("nfs/box.example");
  const std::string file = root_.At("/new");
  Run("printf 'rkt " + file + "\\ndelent 1\\nwkt " + file + ".short\\n' | ktutil; mv " + file + ".short " + file);
  Install();
  ExpectFinding(Severity::kError, "(version 2, aes256-cts-hmac-sha1-96)");
}

TEST_F(AskKdc, FindsPrincipalsThatTheKdcDoesNotKnow) {
  StartKdc();
  Admin("addprinc -randkey host/box.example");
  for (const char* principals : {"nfs/box.example", "nfs/box.example host/box.example"}) {
    Export(principals);
    Admin("delprinc -force nfs/box.example");
    Install();
    ExpectFinding(Severity::kWarning, "does not know nfs/box.example@LAB.TEST");
    Admin("addprinc -randkey nfs/box.example");
  }
}

TEST_F(AskKdc, FindsNothingIfTheKdcCannotBeAsked) {
  Export("nfs/box.example");
  VORN::HealthReport report = Check();
  EXPECT_THAT(Find(report, "outdated_key"), IsEmpty());
  EXPECT_THAT(Find(report, "clock_skew"), IsEmpty());
  EXPECT_THAT(WhyNotChecked(report, "outdated_key"), HasSubstr("Cannot contact any KDC"));
  EXPECT_NE(WhyNotChecked(report, "clock_skew"), "");
  root_.Write("/etc/krb5.conf", "[libdefaults]\n default_realm = ");
  report = Check();
  EXPECT_THAT(Find(report, "outdated_key"), IsEmpty());
  EXPECT_NE(WhyNotChecked(report, "outdated_key"), "");
  ASSERT_EQ(unlink(root_.At(kProgram).c_str()), 0);
  EXPECT_THAT(WhyNotChecked(Check(), "outdated_key"), HasSubstr("not installed"));
}

TEST_F(AskKdc, AsksNobodyWithoutAKeyOfTheService) {
  EXPECT_EQ(WhyNotChecked(Check(), "outdated_key"), "") << "no keytab";
  Admin("addprinc -randkey host/box.example");
  Export("host/box.example");
  EXPECT_EQ(WhyNotChecked(Check(), "outdated_key"), "") << "the KDC is away";
}

TEST_F(AskKdc, FindsAClockThatDiffersFromTheOneOfTheKdc) {
  StartKdc(VORN_FAST_CLOCK);
  Export("nfs/box.example");
  const VORN::HealthReport report = Check();
  EXPECT_THAT(Find(report, "outdated_key"), IsEmpty());
  const std::vector<VORN::HealthFinding> found = Find(report, "clock_skew");
  ASSERT_THAT(found, SizeIs(1)) << WhyNotChecked(report, "clock_skew");
  EXPECT_EQ(found.front().severity, Severity::kError);
  EXPECT_THAT(found.front().text, HasSubstr("seconds behind that of the KDC"));
}

}  // namespace
}  // namespace vorn
