// The contract's operations on export rules, each on a temporary root.
#include "share_rules.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "call.h"
#include "captured_log.h"
#include "core.h"
#include "current_box.h"
#include "exportfs_judge.h"
#include "nfsconf.h"
#include "status.h"
#include "temporary_root.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr const char* kFile = "/etc/exports";

struct FreeList {
  void operator()(ExportRuleList* list) const { VORNNFSRuleExtFree(list); }
};
using List = std::unique_ptr<ExportRuleList, FreeList>;

class Exports : public testing::Test {
 protected:
  Exports() {
    root.Write("/etc/passwd", "admin:x:1024:100::/:/bin/sh\nnobody:x:65534:65534:::\n");
    TakeLog();
  }

  std::string File() const { return root.Read(kFile).value_or("(none)"); }

  TemporaryRoot root;
};

// Makes a list of rules as the module does: each is allocated by malloc(3).
List MakeList(const std::vector<std::string>& clients) {
  List list(static_cast<ExportRuleList*>(std::calloc(1, sizeof(ExportRuleList))));
  ExportRule** last = &list->first;
  for (const std::string& client : clients) {
    *last = static_cast<ExportRule*>(std::calloc(1, sizeof(ExportRule)));
    client.copy((*last)->client, sizeof(*last)->client);
    (*last)->privilege = 1;
    (*last)->write_mode = VORNNFS_WRITE_SYNC;
    (*last)->squash = VORNNFS_SQUASH_ROOT;
    (*last)->sys = 1;
    last = &(*last)->next;
  }
  return list;
}

List Get(const char* path, int expected) {
  ExportRuleList* list = nullptr;
  EXPECT_EQ(VORNNFSRuleExtGet(kFile, path, &list), expected);
  return List(list);
}

std::vector<std::string> Clients(const List& list) {
  std::vector<std::string> clients;
  for (const ExportRule* rule = list ? list->first : nullptr; rule != nullptr; rule = rule->next) {
    clients.emplace_back(rule->client);
  }
  return clients;
}

TEST_F(Exports, OfAShareWithoutALineAreNone) {
  EXPECT_EQ(Get("/volume1/data", 0), nullptr);
  root.Write(kFile, "/volume1/other *(rw)\n");
  EXPECT_EQ(Get("/volume1/data", 0), nullptr);
}

TEST_F(Exports, AreReadFromAllLinesInOrder) {
  root.Write(kFile, "/volume1/data b(rw) \\\n a\n/volume1/other x\n\"/volume1/data/\" -async c(no_root_squash)\n");
  const List list = Get("/volume1/data", 3);
  EXPECT_THAT(Clients(list), ElementsAre("b", "a", "c"));
  EXPECT_STREQ(list->path, "/volume1/data");
  EXPECT_EQ(list->first->privilege, 1);
  EXPECT_EQ(list->first->next->privilege, 0);
  EXPECT_EQ(list->first->next->next->write_mode, VORNNFS_WRITE_ASYNC);
  EXPECT_EQ(list->first->next->next->squash, VORNNFS_SQUASH_ROOT);
}

TEST_F(Exports, AreReadAlsoAfterAFaultyLine) {
  root.Write(kFile, "/x y(foo)\n/volume1/data b\n");
  EXPECT_THAT(Clients(Get("/volume1/data", 1)), ElementsAre("b"));
}

TEST_F(Exports, CannotBeReadFromAFileThatIsNone) {
  ASSERT_EQ(mkdir(root.At("/etc/exports").c_str(), 0755), 0);
  Get("/volume1/data", -1);
  EXPECT_NE(KLIBCErrGet(), 0);
}

TEST_F(Exports, BecomeOneLineAmongTheOthers) {
  root.Write(kFile, "# ours\n/volume1/a x(rw) # one\n/volume1/data y\n\n/volume1/b z(ro)\n/volume1/data w\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"10.0.0.1", "*.example", "@farm"}).get()), 0);
  EXPECT_EQ(File(),
            "# ours\n/volume1/a x(rw) # one\n"
            "/volume1/data 10.0.0.1(rw,sync,no_subtree_check,no_root_squash,sec=sys)"
            " *.example(rw,sync,no_subtree_check,no_root_squash,sec=sys)"
            " @farm(rw,sync,no_subtree_check,no_root_squash,sec=sys)\n"
            "\n/volume1/b z(ro)\n");
  EXPECT_THAT(Clients(Get("/volume1/data", 3)), ElementsAre("10.0.0.1", "*.example", "@farm"));
}

TEST_F(Exports, MakeAFileWhereThereIsNone) {
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/my data", MakeList({"*"}).get()), 0);
  EXPECT_EQ(File(), "/volume1/my\\040data *(rw,sync,no_subtree_check,no_root_squash,sec=sys)\n");
}

TEST_F(Exports, GoWithTheirLines) {
  root.Write(kFile, "/volume1/a x\n/volume1/data y\n/volume1/data z\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", nullptr), 0);
  EXPECT_EQ(File(), "/volume1/a x\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/a", MakeList({}).get()), 0);
  EXPECT_EQ(File(), "");
}

TEST_F(Exports, KeepWhatTheRecordCannotCarry) {
  root.Write(kFile, "/volume1/data a(ro,fsid=5,no_root_squash) \"b\"(rw,no_wdelay,no_root_squash)\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"b", "a"}).get()), 0);
  EXPECT_EQ(File(), "/volume1/data \"b\"(rw,no_wdelay,no_root_squash) a(rw,sync,fsid=5,no_root_squash,sec=sys)\n");
}

TEST_F(Exports, ThatDoNotChangeAreNotWritten) {
  root.Write(kFile, "/volume1/data -rw a(fsid=5) gss/krb5(sec=krb5,ro)\n# c\n/volume1/data b");
  const List list = Get("/volume1/data", 3);
  struct stat before {};
  struct stat after {};
  ASSERT_EQ(stat(root.At(kFile).c_str(), &before), 0);
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0);
  ASSERT_EQ(stat(root.At(kFile).c_str(), &after), 0);
  EXPECT_EQ(before.st_ino, after.st_ino);
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/none", nullptr), 0);
  ASSERT_EQ(stat(root.At(kFile).c_str(), &after), 0);
  EXPECT_EQ(before.st_ino, after.st_ino);
}

TEST_F(Exports, KeepAnInvalidClientThatTheFileHas) {
  root.Write(kFile, "/volume1/data gss/krb5(ro) 10.0.0.0/255.0.255.0(ro) 10.0.0.1 10.0.0.1/32\n");
  const List list = Get("/volume1/data", 4);
  list->first->privilege = 1;
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0);
  EXPECT_THAT(Clients(Get("/volume1/data", 4)),
              ElementsAre("gss/krb5", "10.0.0.0/255.0.255.0", "10.0.0.1", "10.0.0.1/32"));
}

TEST_F(Exports, AreRefusedWithAReasonAndNothingIsWritten) {
  const std::string before = "/volume1/data kept(rw)\n";
  const std::vector<std::string> refused[] = {{""},
                                              {"a", "b\n/etc *(rw)"},
                                              {"a\t"},
                                              {"#a"},
                                              {"a\\"},
                                              {"a\n"},
                                              {"10.0.0.0/210"},
                                              {"host["},
                                              {"gss/krb5"},
                                              {"a", "A"},
                                              {"10.0.0.1", "10.0.0.1/32"},
                                              {"10.0.0.0/8", "10.9.9.9/255.0.0.0"},
                                              {std::string(1024, 'x')},
                                              {std::string(600, '*')}};
  for (const auto& clients : refused) {
    root.Write(kFile, before);
    EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList(clients).get()), -1) << clients.back();
    EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText) << clients.back();
    EXPECT_EQ(File(), before) << clients.back();
    EXPECT_EQ(TakeLog().size(), 1U) << clients.back();
  }
}

TEST_F(Exports, OfAListWithoutAnEndAreRefused) {
  const List list = MakeList({"a", "b"});
  list->first->next->next = list->first;
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), -1);
  list->first->next->next = nullptr;
  EXPECT_EQ(File(), "(none)");
}

TEST_F(Exports, OfAPathThatIsNotAbsoluteAreRefused) {
  EXPECT_EQ(VORNNFSRuleExtSetAll("volume1", MakeList({"*"}).get()), -1);
  EXPECT_EQ(VORNNFSRuleExtSetAll(nullptr, nullptr), -1);
  EXPECT_EQ(VORNNFSRuleExtSetAll(("/" + std::string(2000, 'x')).c_str(), MakeList({"*"}).get()), -1);
  EXPECT_EQ(File(), "(none)");
}

TEST_F(Exports, NeedTheAccountOfTheirSquashMode) {
  root.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\n");
  const List list = MakeList({"*"});
  list->first->squash = VORNNFS_SQUASH_ADMIN;
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), -1);
  EXPECT_EQ(File(), "(none)");
}

TEST_F(Exports, AreWrittenWhateverIsWrongWithOtherLines) {
  root.Write(kFile, "/x y(foo)\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"a"}).get()), 0);
  EXPECT_THAT(File(), HasSubstr("/x y(foo)\n/volume1/data a("));
}

std::string Reason() { return LastText(TakeLog()); }

TEST_F(Exports, ShowAClientThatIsNotUtf8AndRefuseToStoreIt) {
  const std::string file = "/volume1/data b\xe4r(rw) other(ro)\n";
  root.Write(kFile, file);
  const List list = Get("/volume1/data", 2);
  EXPECT_THAT(Clients(list), ElementsAre("b\xef\xbf\xbdr", "other"));
  list->first->next->privilege = 1;
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), -1);
  EXPECT_THAT(Reason(), HasSubstr("neither a host name nor an address"));
  EXPECT_EQ(File(), file);
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"other"}).get()), 0) << "it can be removed";
}

// One file of /etc/exports.d has a rule for the share, and one that its file overrides.
class ForeignExports : public Exports {
 protected:
  ForeignExports() {
    root.Write("/etc/exports.d/b.exports", "# zfs\n/volume1/data zebra(ro) own(rw)\n/volume1/zfs *(rw)\n");
    root.Write("/etc/exports.d/c.exports", "/volume1/data zebra(rw)\n");
    root.Write("/etc/exports.d/ignored", "/volume1/data x(rw)\n");
    root.Write("/etc/exports.d/.hidden.exports", "/volume1/data x(rw)\n");
    root.Write(kFile, "/volume1/data own(ro)\n");
  }
};

TEST_F(ForeignExports, AreLoadedAfterThoseOfTheFile) {
  EXPECT_THAT(Clients(Get("/volume1/data", 2)), ElementsAre("own", "zebra"));
  EXPECT_THAT(Clients(Get("/volume1/zfs", 1)), ElementsAre("*"));
}

TEST_F(ForeignExports, StayWhereTheyAreIfTheyDoNotChange) {
  const List list = Get("/volume1/data", 2);
  list->first->privilege = 1;
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0);
  EXPECT_EQ(File(), "/volume1/data own(rw,sync,root_squash,sec=sys)\n");
  EXPECT_THAT(Clients(Get("/volume1/data", 2)), ElementsAre("own", "zebra"));
  const List zfs = Get("/volume1/zfs", 1);
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/zfs", zfs.get()), 0);
  EXPECT_EQ(File(), "/volume1/data own(rw,sync,root_squash,sec=sys)\n");
}

TEST_F(ForeignExports, AreKeptByASaveThatLeavesAFaultyLineAlone) {
  const std::string faulty = "/volume1/zfs x(foo) hidden(rw)\n";
  root.Write(kFile, faulty);
  const List list = Get("/volume1/zfs", 1);
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/zfs", list.get()), 0) << "nothing changes";
  EXPECT_EQ(File(), faulty);
  root.Write(kFile, "/volume1/zfs own(ro) x(foo) hidden(rw)\n");
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/zfs", list.get()), -1) << "hidden would be lost";
  EXPECT_THAT(Reason(), HasSubstr("/etc/exports:1:"));
}

TEST_F(ForeignExports, CannotBeChangedOrRemoved) {
  const List list = Get("/volume1/data", 2);
  list->first->next->privilege = 1;
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), -1);
  EXPECT_THAT(Reason(), HasSubstr("/etc/exports.d/b.exports:2:1"));
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"zebra"}).get()), -1);
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/zfs", nullptr), -1);
  EXPECT_THAT(Reason(), HasSubstr("/etc/exports.d/b.exports:3:1"));
  EXPECT_EQ(File(), "/volume1/data own(ro)\n");
}

TEST_F(ForeignExports, AreNotUncoveredByRemovingTheRuleThatOverridesThem) {
  const List list = Get("/volume1/data", 2);
  const std::unique_ptr<ExportRule, decltype(&std::free)> own(list->first, std::free);
  list->first = own->next;
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), -1);
  EXPECT_THAT(Reason(), HasSubstr("\"own\""));
  EXPECT_EQ(File(), "/volume1/data own(ro)\n");
}

TEST_F(ForeignExports, AreNotReadFromWhatIsNoRegularFile) {
  ASSERT_EQ(mkdir(root.At("/etc/exports.d/d.exports").c_str(), 0755), 0);
  ASSERT_EQ(mkfifo(root.At("/etc/exports.d/f.exports").c_str(), 0600), 0);
  ASSERT_EQ(symlink("nowhere", root.At("/etc/exports.d/g.exports").c_str()), 0);
  EXPECT_THAT(Clients(Get("/volume1/data", 2)), ElementsAre("own", "zebra"));
}

TEST_F(Exports, OfALinkToTheShareAreTheShares) {
  root.Write("/volume1/data/file", "");
  ASSERT_EQ(symlink("/volume1/data", root.At("/link").c_str()), 0);
  root.Write(kFile, "/link everybody(rw)\n/volume1/other x\n//volume1/./data/ b(ro)\n");
  EXPECT_THAT(Clients(Get("/volume1/data", 2)), ElementsAre("everybody", "b"));
  EXPECT_THAT(Clients(Get("/link", 2)), ElementsAre("everybody", "b"));
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"a"}).get()), 0);
  EXPECT_EQ(File(), "//volume1/./data/ a(rw,sync,no_subtree_check,no_root_squash,sec=sys)\n/volume1/other x\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", nullptr), 0);
  EXPECT_EQ(File(), "/volume1/other x\n");
}

TEST_F(Exports, NoticeANewLinkWithoutANewFile) {
  root.Write("/volume1/data/file", "");
  root.Write("/volume1/other/file", "");
  root.Write(kFile, "/volume1/link x\n");
  Get("/volume1/data", 0);
  ASSERT_EQ(symlink("data", root.At("/volume1/link").c_str()), 0);
  EXPECT_THAT(Clients(Get("/volume1/data", 1)), ElementsAre("x"));
  ASSERT_EQ(unlink(root.At("/volume1/link").c_str()), 0);
  ASSERT_EQ(symlink("other", root.At("/volume1/link").c_str()), 0);
  Get("/volume1/data", 0);
}

TEST_F(Exports, OfAPathThatTheListWouldCutAreRefused) {
  const std::string cut = "/" + std::string(250, 'a') + "/" + std::string(255, 'b');
  root.Write(kFile, cut + " x(ro)\n" + cut + "c y(rw)\n");
  EXPECT_THAT(Clients(Get(cut.c_str(), 1)), ElementsAre("x"));
  Get((cut + "c").c_str(), -1);
  EXPECT_EQ(KLIBCErrGet(), ENAMETOOLONG);
  EXPECT_EQ(VORNNFSRuleExtSetAll((cut + "c").c_str(), nullptr), -1);
  EXPECT_EQ(File(), cut + " x(ro)\n" + cut + "c y(rw)\n");
}

TEST_F(Exports, WithAFaultAreNotRewrittenButRemoved) {
  const std::string faulty = "/volume1/a x\n/volume1/data h1(rw) h2(rw, sync) h3(ro)\n/volume1/b y\n";
  root.Write(kFile, faulty);
  const List list = Get("/volume1/data", 1);
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0) << "unchanged";
  list->first->privilege = 0;
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), -1);
  EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText);
  EXPECT_THAT(Reason(), HasSubstr("/etc/exports:2:22: "));
  EXPECT_EQ(File(), faulty);
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", nullptr), 0);
  EXPECT_EQ(File(), "/volume1/a x\n/volume1/b y\n");
}

TEST_F(Exports, AreRemovedEvenIfNothingOfTheLineIsUnderstood) {
  root.Write(kFile, "/volume1/data x(foo)\n/volume1/b y\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", nullptr), 0);
  EXPECT_EQ(File(), "/volume1/b y\n");
}

TEST_F(Exports, KeepOptionsOfNewerVersions) {
  root.Write(kFile, "/volume1/data a(ro,no_root_squash,xprtsec=none:tls,reexport=auto-fsidnum)\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"a"}).get()), 0);
  EXPECT_EQ(File(), "/volume1/data a(rw,sync,xprtsec=none:tls,reexport=auto-fsidnum,no_root_squash,sec=sys)\n");
}

TEST_F(Exports, OfAHostWithAndWithoutTheFinalDotAreOne) {
  root.Write(kFile, "/volume1/data host.example(ro,fsid=5) 10.1(ro)\n");
  EXPECT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"host.example", "host.example."}).get()), -1);
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", MakeList({"HOST.example.", "10.0.0.1"}).get()), 0);
  EXPECT_THAT(File(), HasSubstr(" HOST.example.(rw,sync,fsid=5,"));
}

TEST_F(Exports, HaveFaultsThatNameFileLineAndColumn) {
  root.Write(kFile, "# c\n/volume1/a x(rw)\n/volume1/b y(foo)\n/volume1/c \\\n/volume1/d z(rw)\n");
  root.Write("/etc/exports.d/a.exports", "/volume1/e z(rw\n");
  const auto files = vorn::OpenAllExports(vorn::CurrentBox());
  ASSERT_TRUE(files.ok());
  const auto faults = vorn::FindExportFaults(*files);
  ASSERT_EQ(faults.size(), 3U);
  EXPECT_THAT(faults[0].sentence, HasSubstr("/etc/exports:3:12: "));
  EXPECT_EQ(faults[0].path, "/volume1/b");
  EXPECT_TRUE(faults[0].ends_file);
  EXPECT_THAT(faults[1].sentence, HasSubstr("/etc/exports:5:1: a path among the clients"));
  EXPECT_FALSE(faults[1].ends_file);
  EXPECT_EQ(File().substr(faults[1].begin, faults[1].end - faults[1].begin), "/volume1/c \\\n/volume1/d z(rw)\n");
  EXPECT_EQ(faults[2].file, root.At("/etc/exports.d/a.exports"));
}

TEST_F(Exports, AreReadByExportfsAsTheyWereMeant) {
  const vorn::ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const List list = MakeList({"10.0.0.1", "*.example", "10.1.0.0/16"});
  list->first->squash = VORNNFS_SQUASH_ALL_ADMIN;
  list->first->next->privilege = 0;
  list->first->next->krb5p = 1;
  list->first->next->next->insecure = 1;
  ASSERT_EQ(VORNNFSRuleExtSetAll("/mnt/a b", list.get()), 0);
  const auto verdict = judge.Judge({File()}).front();
  EXPECT_EQ(verdict.status, 0);
  EXPECT_EQ(verdict.messages, "");
  EXPECT_THAT(verdict.table, HasSubstr("10.0.0.1(rw,sync,wdelay,hide,nocrossmnt,secure,root_squash,all_squash,"));
  EXPECT_THAT(verdict.table, HasSubstr("anonuid=1024,anongid=100"));
  EXPECT_THAT(verdict.table, HasSubstr("sec=sys:krb5p,ro,secure,no_root_squash"));
}

TEST_F(Exports, WarnOfAVolumeThatCrossmntOpensToAnotherClient) {
  root.Write("/proc/self/mountinfo", "100 1 0:100 / /volume1/data/inner rw shared:1 - ext4 source rw\n");
  root.Write(kFile, "/volume1/data/inner 10.0.0.9(rw)\n");
  const List list = MakeList({"10.0.0.1", "10.0.0.2"});
  list->first->crossmnt = 1;
  VORN::CallContext call({});
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0);
  EXPECT_THAT(call.warnings(),
              testing::ElementsAre("the option crossmnt of /volume1/data also opens /volume1/data/inner to 10.0.0.1, "
                                   "which the rules of /volume1/data/inner do not name"));
}

TEST_F(Exports, DoNotWarnOfAVolumeWhoseRulesNameTheClientOrThatHasNone) {
  root.Write("/proc/self/mountinfo", "100 1 0:100 / /volume1/data/inner rw shared:1 - ext4 source rw\n");
  const List list = MakeList({"10.0.0.1"});
  list->first->crossmnt = 1;
  VORN::CallContext call({});
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0);
  root.Write(kFile, "/volume1/data/inner 10.0.0.1(ro)\n");
  ASSERT_EQ(VORNNFSRuleExtSetAll("/volume1/data", list.get()), 0);
  EXPECT_THAT(call.warnings(), testing::IsEmpty());
}

TEST(VORNNFSRuleExtFree, TakesNull) { VORNNFSRuleExtFree(nullptr); }

}  // namespace
