// A rehearsed operation answers as the real one, reports what that does, and changes nothing.
#include "rehearsal.h"

#include <gmock/gmock.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "call.h"
#include "captured_log.h"
#include "configuration_lock.h"
#include "current_box.h"
#include "engines.h"
#include "firewall.h"
#include "foretold.h"
#include "injected_failures.h"
#include "nfsconf.h"
#include "processes.h"
#include "writes.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::Field;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using VORN::CallContext;
using VORN::CallDescription;
using VORN::Draft;

constexpr char kScript[] = "/usr/vorn/etc/rc.sysv/S83nfsd.sh";

CallDescription On(Draft& draft, const TemporaryRoot& root) {
  CallDescription description;
  description.method = "a rehearsal";
  description.uploads = {root.At("/upload")};
  description.draft = &draft;
  return description;
}

std::vector<std::string> ActionsOf(const Draft& draft) {
  std::vector<std::string> actions;
  for (const auto& action : draft.Report().actions) actions.push_back(action.action);
  return actions;
}

// The system calls by which a process changes something outside of itself. Opening a file to write is not among them,
// but it can only be followed by one of these, or shows in the state of the tree.
constexpr long kChangingCalls[] = {
    SYS_rename,    SYS_renameat,  SYS_renameat2, SYS_unlink,  SYS_unlinkat,       SYS_mkdir,    SYS_mkdirat,
    SYS_chmod,     SYS_fchmod,    SYS_fchmodat,  SYS_chown,   SYS_fchown,         SYS_fchownat, SYS_setxattr,
    SYS_fsetxattr, SYS_link,      SYS_linkat,    SYS_symlink, SYS_flock,          SYS_fsync,    SYS_fdatasync,
    SYS_ftruncate, SYS_connect,   SYS_sendto,    SYS_sendmsg, SYS_execve,         SYS_vfork,    SYS_clone,
    SYS_clone3,    SYS_utimensat, SYS_truncate,  SYS_rmdir,   SYS_copy_file_range};

class Rehearsals : public Writes {
 protected:
  Rehearsals() {
    WriteAllFiles(root_);
    root_.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\nfirewall = no\n");
    root_.Write(kScript, "#!/bin/sh\n");
    std::filesystem::permissions(root_.At(kScript), std::filesystem::perms::owner_all);
  }

  const TemporaryRoot root_;
};

// The files that both have, as the report shows them. The paper engine keeps the enabled state in a file of its own.
std::map<std::string, std::string> DifferencesOf(const Draft& draft) {
  std::map<std::string, std::string> differences;
  for (const auto& file : draft.Report().files) differences[file.path] = file.difference;
  return differences;
}

class EachChange : public Rehearsals, public testing::WithParamInterface<std::size_t> {
 protected:
  Change change_ = AllChanges(root_)[GetParam()];
};

TEST_P(EachChange, IsForetoldAndLeavesEverythingAsItWas) {
  EXPECT_GE(ExpectForetold(root_, change_.make, {root_.At("/upload")}), 0) << change_.name;
}

TEST_P(EachChange, IsForetoldWhereItFails) {
  // Each change then finds something that is not a regular file.
  for (const char* path : change_.files) {
    std::filesystem::remove(root_.At(path));
    std::filesystem::create_directory(root_.At(path));
  }
  ExpectForetold(root_, change_.make, {root_.At("/upload")});
}

TEST_P(EachChange, MakesNoSystemCallThatChangesAnything) {
  ChildProcess child([this] {
    for (const long call : kChangingCalls) {
      if (!FailSystemCall(call, EPERM)) return 77;
    }
    Draft draft;
    const CallContext context(On(draft, root_));
    return change_.make() >= 0 ? 0 : 1;
  });
  const int status = child.Wait();
  if (status == 77) GTEST_SKIP() << "this system has no seccomp";
  EXPECT_EQ(status, 0) << change_.name;
}

// A call that took the lock would fail after its time limit.
TEST_P(EachChange, DoesNotWaitForTheConfigurationLock) {
  ChildProcess other([this] {
    const vorn::ConfigurationLock lock(vorn::RealBox());
    root_.Write("/locked", lock.status().ok() ? "yes" : "no");
    pause();
    return 0;
  });
  ASSERT_TRUE(Eventually([this] { return root_.Read("/locked") == "yes"; }));
  Draft draft;
  const CallContext context(On(draft, root_));
  EXPECT_GE(change_.make(), 0) << change_.name;
}

INSTANTIATE_TEST_SUITE_P(Writes, EachChange, testing::Range<std::size_t>(0, 11));

TEST_F(Rehearsals, CoverEachKindOfChange) { EXPECT_EQ(AllChanges(root_).size(), 11U); }

TEST_F(Rehearsals, ShowNoKey) {
  Draft draft;
  {
    const CallContext context(On(draft, root_));
    EXPECT_EQ(VORNNFSKeytabImport(root_.At("/upload").c_str()), 0);
    EXPECT_EQ(KLIBCFileExist("/etc/nfs/krb5.keytab"), 1);
  }
  EXPECT_EQ(DifferencesOf(draft)["/etc/nfs/krb5.keytab"],
            "--- /etc/nfs/krb5.keytab\n+++ /etc/nfs/krb5.keytab\n@@ -1 +1 @@\n"
            "-   1 old@LAB.TEST (aes128-cts-hmac-sha1-96) \n+   1 new@LAB.TEST (aes128-cts-hmac-sha1-96) \n");
}

TEST_F(Rehearsals, RecordWhatIsNotDone) {
  root_.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\nfirewall = yes\n");
  Draft draft;
  const CallContext context(On(draft, root_));
  EXPECT_EQ(KLIBServiceStart("nfsd", 0), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 1);
  EXPECT_EQ(KLIBServiceReload("nfsd"), 0);
  EXPECT_EQ(KLIBServiceRestart("nfsd"), 0);
  EXPECT_EQ(VORNNFSUDPPrefSizeSet(4096, 4096), 0);
  EXPECT_EQ(VORNNFSUNIXPriEnableSet(1), 0);
  EXPECT_EQ(KLIBCExec(kScript, "reloadidmap", nullptr, nullptr, nullptr), 0);
  EXPECT_EQ(VORNFwRuleHup(), 0);
  EXPECT_EQ(KLIBServiceStop("nfsd", 0), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 0);
  EXPECT_THAT(ActionsOf(draft), ElementsAre("start", "reload", "restart", "transfer_sizes", "unix_permissions",
                                            "reload_identities", "firewall", "stop"));
  for (const auto& action : draft.Report().actions) EXPECT_THAT(action.effect, HasSubstr(" ")) << action.action;
}

TEST_F(Rehearsals, TellTheGracePeriodOfARestart) {
  const auto grace = [this] {
    Draft draft;
    const CallContext context(On(draft, root_));
    EXPECT_EQ(KLIBServiceRestart("nfsd"), 0);
    return draft.Report().actions.at(0).grace_seconds;
  };
  EXPECT_EQ(grace(), 90);
  root_.Write("/proc/fs/nfsd/nfsv4gracetime", "45\n");
  EXPECT_EQ(grace(), 45);
  root_.Write("/etc/nfs.conf", "[nfsd]\ngrace-time = 10\n");
  EXPECT_EQ(grace(), 10);
}

TEST_F(Rehearsals, RunNoProgram) {
  root_.Write("/bin/other", "#!/bin/sh\ntouch $VORN_ROOT/run-it\n");
  std::filesystem::permissions(root_.At("/bin/other"), std::filesystem::perms::owner_all);
  Draft draft;
  const CallContext context(On(draft, root_));
  EXPECT_LT(KLIBCExec("/bin/other", nullptr, nullptr, nullptr, nullptr), 0);
  EXPECT_EQ(KLIBCErrGet(), EROFS);
  EXPECT_LT(KLIBCExec(kScript, "idmapstart", "x", nullptr, nullptr), 0);
  std::filesystem::remove(root_.At(kScript));
  EXPECT_LT(KLIBCExec(kScript, "reloadidmap", nullptr, nullptr, nullptr), 0);
  EXPECT_EQ(KLIBCErrGet(), ENOENT) << "the real call fails, too";
  EXPECT_THAT(ActionsOf(draft), IsEmpty());
}

TEST_F(Rehearsals, KeepTheEnabledStateThatTheyFoundFirst) {
  Draft draft;
  const auto is_enabled = [&] {
    const CallContext context(On(draft, root_));
    return KLIBServiceIsEnabled("nfsd");
  };
  EXPECT_EQ(is_enabled(), 0);
  EXPECT_EQ(KLIBServiceStart("nfsd", 0), 0);
  EXPECT_EQ(is_enabled(), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 1) << "outside of the rehearsal";
}

TEST_F(Rehearsals, FailWhereTheEngineOfTheBoxIsUnknown) {
  root_.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = magic\n");
  Draft draft;
  const CallContext context(On(draft, root_));
  EXPECT_LT(KLIBServiceIsEnabled("nfsd"), 0);
  EXPECT_LT(KLIBServiceStart("nfsd", 0), 0);
}

TEST_F(Rehearsals, LogNothingAsDone) {
  TakeLog();
  Draft draft;
  {
    const CallContext context(On(draft, root_));
    EXPECT_EQ(VORNNFSUDPPrefSizeSet(4096, 4096), 0);
    EXPECT_EQ(KLIBServiceStart("nfsd", 0), 0);
    EXPECT_EQ(VORNNFSKeytabImport(root_.At("/upload").c_str()), 0);
    EXPECT_THAT(context.warnings(), Contains(HasSubstr("the new keytab has no key")));
  }
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(Rehearsals, DoNotKeepARemarkFromTheLog) {
  root_.Write("/etc/nfs.conf", "[nfsd]\nvers4 = perhaps\n");
  root_.Write("/etc/nfs.conf.d/vorn.conf", "");
  const auto read = [] {
    NFSConfRecord record{};
    EXPECT_EQ(VORNNFSConfGet(&record), 0);
  };
  TakeLog();
  Draft draft;
  {
    const CallContext context(On(draft, root_));
    read();
    EXPECT_THAT(context.warnings(), Contains(HasSubstr("vers4")));
  }
  EXPECT_THAT(TakeLog(), IsEmpty());
  read();
  EXPECT_THAT(TakeLog(), Contains(Field(&LogLine::text, HasSubstr("vers4"))));
}

TEST_F(Rehearsals, SeeTheChangesOfEarlierCallsOnTheDraft) {
  Draft draft;
  {
    const CallContext context(On(draft, root_));
    EXPECT_EQ(AllChanges(root_)[0].make(), 0);
  }
  root_.Write("/etc/exports", "# by hand\n");
  CallDescription reading = On(draft, root_);
  reading.may_write = false;
  const CallContext context(reading);
  ExportRuleList* list = nullptr;
  EXPECT_EQ(VORNNFSRuleExtGet("/etc/exports", "/volume1/data", &list), 1);
  EXPECT_STREQ(list->first->client, "10.0.0.0/24");
  VORNNFSRuleExtFree(list);
  EXPECT_LT(AllChanges(root_)[1].make(), 0) << "a reading call writes nothing, in a draft either";
}

TEST_F(Rehearsals, NameTheRulesThatChange) {
  Draft draft;
  {
    const CallContext context(On(draft, root_));
    EXPECT_EQ(AllChanges(root_)[0].make(), 0);
  }
  const VORN::Rehearsal report = draft.Report();
  ASSERT_EQ(report.rules.size(), 2U);
  EXPECT_EQ(report.rules[0].directory, "/volume1/data");
  EXPECT_EQ(report.rules[0].client, "10.9.9.9");
  EXPECT_EQ(report.rules[0].changes[0].change, "removed");
  EXPECT_EQ(report.rules[0].changes[0].access, "less");
  EXPECT_EQ(report.rules[1].client, "10.0.0.0/24");
  EXPECT_EQ(report.rules[1].changes[0].change, "added");
}

std::vector<std::string> KindsOf(const std::vector<VORN::HealthFinding>& findings) {
  std::vector<std::string> kinds;
  for (const VORN::HealthFinding& finding : findings) kinds.push_back(finding.kind);
  return kinds;
}

TEST_F(Rehearsals, NameTheFindingsThatTheyAddAndRemove) {
  root_.Write("/etc/idmapd.conf", "[Static]\na@X = nobody-of-this-name\nb@X = root\n");
  Draft draft;
  EXPECT_THAT(KindsOf(draft.CompareFindings().added), IsEmpty());
  EXPECT_THAT(KindsOf(draft.CompareFindings().removed), IsEmpty());
  {
    const CallContext context(On(draft, root_));
    const vorn::ConfigurationLock lock(vorn::CurrentBox());
    const auto before = vorn::CurrentBox().Read("/etc/idmapd.conf");
    ASSERT_TRUE(before.ok());
    const char* const text = "# more\n[Static]\na@X = nobody-of-this-name\nc@X = nobody-else\n";
    EXPECT_TRUE(vorn::CurrentBox().Replace("/etc/idmapd.conf", text, before->version).ok());
  }
  const VORN::Rehearsal::Findings findings = draft.CompareFindings();
  ASSERT_THAT(KindsOf(findings.added), ElementsAre("mapping_to_nobody"));
  EXPECT_EQ(findings.added[0].subject.mapping, "c@X");
  EXPECT_THAT(KindsOf(findings.removed), ElementsAre("mapping_to_root"));
}

// The effect of a change on the running service is told by the actions of the rehearsal.
TEST_F(Rehearsals, CompareNothingWithTheRunningService) {
  root_.Write("/proc/net/rpc/nfsd", "th 8 0\n");
  Draft draft;
  const CallContext context(On(draft, root_));
  EXPECT_EQ(AllChanges(root_)[0].make(), 0);
  EXPECT_THAT(KindsOf(draft.CompareFindings().added), Not(Contains("exports_not_in_force")));
  EXPECT_THAT(KindsOf(VORN::CheckHealth().findings), Not(Contains("exports_not_in_force")));
}

TEST_F(Rehearsals, ShowOnlyChangedLinesWithoutContext) {
  Draft draft;
  {
    const CallContext context(On(draft, root_));
    EXPECT_EQ(AllChanges(root_)[0].make(), 0);
  }
  EXPECT_THAT(draft.Report().files.at(0).difference, HasSubstr("/volume1/media"));
  EXPECT_THAT(draft.Report(0).files.at(0).difference, Not(HasSubstr("/volume1/media")));
}

// The engine of a box whose kernel serves: applying the rules also withdraws left shares.
TEST_F(Rehearsals, WithdrawLeftSharesAsTheServiceWould) {
  root_.Write("/etc/vorn/platform.conf",
              "[platform]\nservice_engine = systemd\nfirewall = no\nwithdraw_left_shares = yes\n");
  root_.Write("/etc/vorn/shares.conf", "[shares]\nmedia = /volume1/media\n");
  root_.Write("/var/lib/vorn/exported-shares", "/volume1/data\n");
  vorn::Box& box = vorn::RealBox();
  const auto engine = vorn::MakeSystemdEngine(box);
  Draft draft;
  const CallContext context(On(draft, root_));
  vorn::Box& drafted = vorn::CurrentBox();
  ASSERT_TRUE(drafted.is_draft());
  EXPECT_TRUE(engine->RehearseRules(drafted, true).ok());
  EXPECT_THAT(DifferencesOf(draft)["/etc/exports"], HasSubstr("-/volume1/data 10.9.9.9(rw)\n"));
  EXPECT_TRUE(
      vorn::MakeDraftEngine(drafted, [&] { return vorn::Result<vorn::Engine*>(engine.get()); })->Restart().ok());
}

TEST_F(Rehearsals, RefreshNamesInTheRecordOnly) {
  Draft draft;
  const CallContext context(On(draft, root_));
  vorn::Box& drafted = vorn::CurrentBox();
  EXPECT_TRUE((*drafted.engine())->RefreshNames().ok());
  EXPECT_THAT(ActionsOf(draft), ElementsAre("refresh_names"));
}

}  // namespace
