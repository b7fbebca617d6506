// The history: who changed which file. git(1) is the reference implementation of the repository's format.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

#include "call.h"
#include "captured_log.h"
#include "change_history.h"
#include "configuration_lock.h"
#include "core.h"
#include "current_box.h"
#include "history_support.h"
#include "processes.h"
#include "recovery.h"
#include "rehearsal.h"
#include "writes.h"

namespace vorn {
namespace {

using testing::AllOf;
using testing::Contains;
using testing::ElementsAre;
using testing::Field;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using testing::StartsWith;

constexpr char kSettings[] = "[platform]\nhistory = yes\n";
constexpr char kPlatformFile[] = "/etc/vorn/platform.conf";
constexpr char kFile[] = "/etc/exports";
constexpr char kDropIn[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";
constexpr char kOther[] = "/etc/nfs.conf.d/vorn.conf";

std::string Git(const TemporaryRoot& root, std::vector<std::string> arguments) {
  const std::vector<std::string> begin = {"git", "--git-dir", root.At(kHistoryFolder)};
  arguments.insert(arguments.begin(), begin.begin(), begin.end());
  const ProgramResult result = RunProgram(arguments);
  EXPECT_EQ(result.status, 0) << result.errors;
  return result.output;
}

std::vector<std::string> Kinds() {
  std::vector<std::string> kinds;
  for (const History::Change& change : AllRecorded()) kinds.push_back(change.message.kind);
  return kinds;
}

VORN::CallDescription CallOf(const char* caller) {
  VORN::CallDescription call;
  call.caller = caller;
  call.origin = "192.0.2.7";
  call.method = "VORN.Core.FileServ.NFS/v1/set";
  call.parameters = R"({"enable_nfs":true})";
  return call;
}

// The content of every object of the repository, and the journal.
std::string EverythingOf(const TemporaryRoot& root) {
  std::string all = Git(root, {"cat-file", "--batch-all-objects", "--batch"});
  return all + root.Read(kHistoryJournal).value_or("");
}

class HistoryTest : public Writes {
 protected:
  HistoryTest() { root.Write(kPlatformFile, kSettings); }

  const TemporaryRoot root;
};

TEST_F(HistoryTest, IsOffOnATrialRootUnlessItIsSwitchedOn) {
  root.Write(kPlatformFile, "");
  ASSERT_TRUE(SaveFile(kFile, "a\n").ok());
  EXPECT_FALSE(std::filesystem::exists(root.At(kHistoryFolder)));
  EXPECT_FALSE(std::filesystem::exists(root.At(kHistoryJournal)));
  EXPECT_THAT(AllRecorded(), IsEmpty());
}

TEST_F(HistoryTest, SaysWhoChangedWhichFilesInWhichCall) {
  {
    const VORN::CallContext call(CallOf("alice"));
    const ConfigurationLock lock(RealBox());
    ASSERT_TRUE(SaveFile(kFile, "/a *(ro)\n").ok());
    ASSERT_TRUE(SaveFile(kOther, "[nfsd]\n").ok());
    EXPECT_EQ(KLIBServiceRestart("nfsd"), 0);
  }
  const std::vector<History::Change> changes = AllRecorded();
  ASSERT_THAT(changes, SizeIs(1));
  const ChangeMessage& message = changes[0].message;
  EXPECT_EQ(message.kind, kByCall);
  EXPECT_EQ(message.caller, "alice");
  EXPECT_EQ(message.origin, "192.0.2.7");
  EXPECT_EQ(message.method, "VORN.Core.FileServ.NFS/v1/set");
  EXPECT_EQ(message.parameters, R"({"enable_nfs":true})");
  EXPECT_THAT(message.files, ElementsAre(kFile, kOther, kDropIn));
  EXPECT_THAT(message.actions, ElementsAre("restart: done"));
  EXPECT_THAT(Git(root, {"log"}), AllOf(HasSubstr("Author: alice <192.0.2.7>"), HasSubstr("Service: restart: done")));
  EXPECT_EQ(Git(root, {"show", "main:etc/exports"}), "/a *(ro)\n");
  ExpectValidHistory(root);
}

TEST_F(HistoryTest, HasAllStepsOfACallAsOneChange) {
  {
    VORN::CallContext call(CallOf("alice"));
    ASSERT_TRUE(SaveFile(kFile, "/a *(ro)\n").ok());
    ASSERT_TRUE(SaveFile(kOther, "[nfsd]\n").ok());
    EXPECT_EQ(KLIBServiceReload("nfsd"), 0);
    EXPECT_THAT(AllRecorded(), IsEmpty());
    call.End();
    EXPECT_THAT(AllRecorded(), SizeIs(1));
  }
  const std::vector<History::Change> changes = AllRecorded();
  ASSERT_THAT(changes, SizeIs(1));
  EXPECT_THAT(changes[0].message.files, ElementsAre(kFile, kOther));
  EXPECT_THAT(changes[0].message.actions, ElementsAre("reload: done"));
}

TEST_F(HistoryTest, HasNoChangeForASaveThatChangedNothing) {
  VORN::CallContext call(CallOf("alice"));
  EXPECT_EQ(KLIBServiceReload("nfsd"), 0);
  call.End();
  EXPECT_THAT(AllRecorded(), IsEmpty());
}

TEST_F(HistoryTest, HasAChangeBeforeThoseOfTheNextWriter) {
  VORN::CallContext call(CallOf("alice"));
  ASSERT_TRUE(SaveFile(kFile, "a\n").ok());
  std::thread([] { EXPECT_TRUE(SaveFile(kOther, "[nfsd]\n").ok()); }).join();
  EXPECT_EQ(KLIBServiceReload("nfsd"), 0);
  call.End();
  const std::vector<History::Change> changes = AllRecorded();
  ASSERT_THAT(changes, SizeIs(3));
  EXPECT_THAT(changes[0].message.actions, ElementsAre("reload: done"));
  EXPECT_THAT(changes[1].message.files, ElementsAre(kOther));
  EXPECT_THAT(changes[2].message.files, ElementsAre(kFile));
  EXPECT_EQ(changes[2].message.caller, "alice");
}

TEST_F(HistoryTest, LeavesAChangeThatCannotEndToTheNextWriter) {
  VORN::CallContext call(CallOf("alice"));
  ASSERT_TRUE(SaveFile(kFile, "a\n").ok());
  const std::string lock = root.At(kConfigurationLockFile);
  std::filesystem::remove(lock);
  std::filesystem::create_directory(lock);
  call.End();
  EXPECT_THAT(call.warnings(), ElementsAre(StartsWith("A change is not in the history yet: ")));
  EXPECT_THAT(AllRecorded(), IsEmpty());
  std::filesystem::remove(lock);
  const VORN::CallContext next(CallOf("bob"));
  std::thread([] { EXPECT_TRUE(SaveFile(kOther, "[nfsd]\n").ok()); }).join();
  EXPECT_THAT(Kinds(), ElementsAre(kByCall, kByCall));
  EXPECT_EQ(AllRecorded()[1].message.caller, "alice");
  TakeLog();
}

TEST_F(HistoryTest, GoesOnInAFolderThatReplacedItsOwn) {
  ASSERT_TRUE(SaveFile(kFile, "a\n").ok());
  std::filesystem::remove_all(root.At(kHistoryFolder));
  std::filesystem::remove(root.At(kHistoryJournal));
  ASSERT_TRUE(SaveFile(kFile, "b\n").ok());
  EXPECT_THAT(Kinds(), ElementsAre(kByCall, kFound));
  ExpectValidHistory(root);
}

TEST_F(HistoryTest, NamesTheProgramOfAChangeWithoutACall) {
  ASSERT_TRUE(SaveFile(kFile, "a\n").ok());
  EXPECT_EQ(AllRecorded()[0].message.caller, program_invocation_short_name);
  EXPECT_EQ(AllRecorded()[0].message.origin, "local");
}

TEST_F(HistoryTest, HasAnEditByHandAsAChangeOfItsOwn) {
  root.Write(kFile, "first\n");
  ASSERT_TRUE(SaveFile(kOther, "[nfsd]\n").ok());
  ASSERT_TRUE(SaveFile(kFile, "second\n").ok());
  root.Write(kFile, "by an editor\n");
  ASSERT_TRUE(SaveFile(kOther, "[nfsd]\nvers4=y\n").ok());
  EXPECT_THAT(Kinds(), ElementsAre(kByCall, kByHand, kByCall, kFound, kByCall));
  EXPECT_EQ(Git(root, {"show", "main~1:etc/exports"}), "by an editor\n");
  const auto files = RealHistory().FilesOf(AllRecorded()[1]);
  ASSERT_TRUE(files.ok());
  EXPECT_EQ((*files)[0].before, "second\n");
  EXPECT_EQ((*files)[0].after, "by an editor\n");
}

TEST_F(HistoryTest, HasAFileThatWasRemovedByHand) {
  ASSERT_TRUE(SaveFile(kFile, "a\n").ok());
  std::filesystem::remove(root.At(kFile));
  ASSERT_TRUE(SaveFile(kOther, "[nfsd]\n").ok());
  EXPECT_THAT(Kinds(), ElementsAre(kByCall, kByHand, kByCall));
  ExpectValidHistory(root);
}

TEST_F(HistoryTest, FindsEditsWhenTheServerStarts) {
  WriteAllFiles(root);
  EXPECT_EQ(VORN::RemoveLeftovers(), 0);
  EXPECT_THAT(Kinds(), testing::Each(std::string(kFound)));
  root.Write(kFile, "by an editor\n");
  EXPECT_EQ(VORN::RemoveLeftovers(), 0);
  EXPECT_EQ(Kinds().front(), kByHand);
}

TEST_F(HistoryTest, HasNoTraceOfARehearsal) {
  const VORN::Draft draft;
  VORN::CallDescription description = CallOf("alice");
  description.draft = &draft;
  const VORN::CallContext call(description);
  Box& box = CurrentBox();
  EXPECT_TRUE(box.Replace(kFile, "a\n", Version()).ok());
  EXPECT_EQ(KLIBServiceRestart("nfsd"), 0);
  EXPECT_FALSE(std::filesystem::exists(root.At(kHistoryFolder)));
}

TEST_F(HistoryTest, HasNoChangeThatFailed) {
  root.Write(kFile, "a\n");
  Box& box = RealBox();
  {
    const ConfigurationLock lock(box);
    EXPECT_FALSE(box.Replace(kFile, "b\n", Version()).ok());
  }
  EXPECT_THAT(Kinds(), ElementsAre(kFound));
}

TEST_F(HistoryTest, HasAServiceOperationWithoutAChangeOfAFile) {
  EXPECT_EQ(KLIBServiceStop("nfsd", 0), 0);
  ASSERT_THAT(AllRecorded(), SizeIs(1));
  EXPECT_THAT(AllRecorded()[0].message.files, IsEmpty());
  EXPECT_THAT(AllRecorded()[0].message.actions, ElementsAre("stop: done"));
  ExpectValidHistory(root);
}

TEST_F(HistoryTest, HasEveryKindOfChangeOfThePlatform) {
  WriteAllFiles(root);
  for (const ::Change& change : AllChanges(root)) {
    const std::size_t before = AllRecorded().size();
    WriteAllFiles(root);
    ASSERT_GE(change.make(), 0) << change.name;
    for (const char* file : change.files) {
      if (std::string(file).rfind("/etc/", 0) != 0 || std::string(file).find("keytab") != std::string::npos) continue;
      EXPECT_EQ(Git(root, {"show", std::string("main:") + (file + 1)}), root.Read(file)) << change.name;
    }
    EXPECT_GT(AllRecorded().size(), before) << change.name;
    EXPECT_EQ(Kinds().front(), kByCall) << change.name;
  }
  ExpectValidHistory(root);
}

TEST_F(HistoryTest, HasTheNamesInAKeytabAndNoKey) {
  WriteAllFiles(root);
  const std::string old = root.Read("/etc/nfs/krb5.keytab").value();
  const std::string imported = root.Read("/upload").value();
  for (const ::Change& change : AllChanges(root)) EXPECT_GE(change.make(), 0);
  const std::string all = EverythingOf(root);
  EXPECT_THAT(all, HasSubstr("new@LAB.TEST"));
  for (const std::string& keytab : {old, imported}) {
    const std::string key = keytab.substr(keytab.size() - 8);  // the end of the file is in the key
    EXPECT_THAT(all, Not(HasSubstr(key)));
  }
}

TEST_F(HistoryTest, SurvivesALossOfWhatWasNotSynced) {
  for (int i = 0; i < 5; ++i) ASSERT_TRUE(SaveFile(kFile, std::to_string(i) + "\n").ok());
  const std::string log = Git(root, {"log"});
  TemporaryRoot after;
  std::filesystem::copy(root.At("/etc"), after.At("/etc"), std::filesystem::copy_options::recursive);
  // The disk has the repository as it was at the last checkpoint: empty.
  const Result<HistoryRepository> repository = HistoryRepository::Open(after.At(kHistoryFolder), true);
  ASSERT_TRUE(repository.ok()) << repository.status().reason();
  std::ofstream(after.At("/var/lib/vorn/history.git/refs/heads/main")) << "";
  HistoryJournal old(root.At(kHistoryJournal));
  bool is_new = false;
  auto records = old.ReadNew(&is_new);
  ASSERT_TRUE(records.ok());
  HistoryJournal other(after.At(kHistoryJournal));
  records->front().fields[0] = "an earlier boot";
  ASSERT_TRUE(other.Restart(records->front()).ok());
  for (std::size_t i = 1; i < records->size(); ++i) ASSERT_TRUE(other.Append((*records)[i], false).ok());
  ASSERT_TRUE(SaveFile(kOther, "[nfsd]\n").ok());
  EXPECT_EQ(Git(after, {"log", "main~1"}), log);
  ExpectValidHistory(after);
}

TEST_F(HistoryTest, IsBoundedAndStaysValid) {
  root.Write(kPlatformFile, std::string(kSettings) + "history_changes = 1000\n");
  for (int i = 0; i < 4800; ++i) {
    ASSERT_TRUE(SaveFile(kFile, "/volume1/data 10.0.0." + std::to_string(i) + "\n").ok());
    if (i == 300) ExpectValidHistory(root);
  }
  const std::size_t kept = AllRecorded().size();
  EXPECT_GE(kept, 1000U);
  EXPECT_LE(kept, 1000U + 17 * 256);
  ExpectValidHistory(root);
  EXPECT_EQ(std::stoul(Git(root, {"rev-list", "--count", "main"})), kept);
  EXPECT_EQ(RealHistory().FilesOf(AllRecorded().back()).status().code(), kUnsupported);
  EXPECT_EQ(Git(root, {"show", "main:etc/exports"}), root.Read(kFile));
  EXPECT_THAT(TakeLog(), Not(Contains(Field(&LogLine::text, HasSubstr("history")))));
}

TEST_F(HistoryTest, ThatCannotBeWrittenIsAWarningAndFailsNoChange) {
  root.Write("/var/lib/vorn", "no folder");
  VORN::CallContext call(CallOf("alice"));
  TakeLog();
  EXPECT_TRUE(SaveFile(kFile, "a\n").ok());
  EXPECT_EQ(root.Read(kFile), "a\n");
  EXPECT_THAT(call.warnings(), Contains(StartsWith("The history has no record of a change of /etc/exports: ")));
  EXPECT_THAT(TakeLog(), Contains(Field(&LogLine::text, HasSubstr("The history has no record"))));
  std::filesystem::remove(root.At("/var/lib/vorn"));
  EXPECT_TRUE(SaveFile(kFile, "b\n").ok());
  call.End();
  EXPECT_THAT(Kinds(), ElementsAre(kByCall, kUnrecorded)) << "it was not edited by hand";
}

TEST_F(HistoryTest, AttributesTheChangesOfConcurrentProcesses) {
  constexpr int kChanges = 40;
  const auto write = [](const char* file, const char* caller) {
    for (int i = 0; i < kChanges; ++i) {
      const VORN::CallContext call(CallOf(caller));
      const ConfigurationLock lock(RealBox());
      if (!SaveFile(file, std::string(caller) + std::to_string(i) + "\n").ok()) return 1;
      if (KLIBServiceReload("nfsd") != 0) return 2;  // others may write meanwhile
    }
    return 0;
  };
  ChildProcess alice([&] { return write(kFile, "alice"); });
  ChildProcess bob([&] { return write(kOther, "bob"); });
  EXPECT_EQ(alice.Wait(), 0);
  EXPECT_EQ(bob.Wait(), 0);
  std::map<std::string, int> files;
  int actions = 0;
  for (const History::Change& change : AllRecorded()) {
    EXPECT_EQ(change.message.kind, kByCall);
    for (const std::string& file : change.message.files) {
      EXPECT_EQ(change.message.caller, file == kFile ? "alice" : "bob");
      ++files[file];
    }
    actions += static_cast<int>(change.message.actions.size());
  }
  EXPECT_EQ(files[kFile], kChanges);
  EXPECT_EQ(files[kOther], kChanges);
  EXPECT_EQ(actions, 2 * kChanges);
  ExpectValidHistory(root);
}

TEST(ChangeMessage, IsReadBackAndKeepsEachValueOnItsLine) {
  ChangeMessage message;
  message.caller = "alice\nMethod: forged";
  message.method = "m";
  message.parameters = "{}";
  message.files = {"/etc/exports", "/etc/a\nFile: /etc/b"};
  const ChangeMessage read = ParseMessage(FormatMessage(message));
  EXPECT_EQ(read.caller, "alice Method: forged");
  EXPECT_EQ(read.method, "m");
  EXPECT_THAT(read.files, ElementsAre("/etc/exports", "/etc/a File: /etc/b"));
  EXPECT_THAT(ParseMessage("no message of ours").files, IsEmpty());
}

}  // namespace
}  // namespace vorn
