// The API "VORN.Core.FileServ.NFS.History" against the fake platform.
#include "history_handler.h"

#include <gmock/gmock.h>

#include <string>
#include <utility>
#include <vector>

#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr char kAPI[] = "VORN.Core.FileServ.NFS.History";

Answer List(const std::string& params) { return Call(EntryOf(kAPI, "list"), params); }
Answer Show(const std::string& params) { return Call(EntryOf(kAPI, "show"), params); }
Answer Undo(const std::string& params) { return Call(EntryOf(kAPI, "undo"), params); }

class HistoryHandlerTest : public testing::Test {
 protected:
  HistoryHandlerTest() {
    platform.change = {"c0ffee", 1700000000, "change",         "alice",         "unix", "VORN.Core.FileServ.NFS/v1/set",
                       "{}",     "",         {"/etc/exports"}, {"reload: done"}};
  }

  // The calls of the platform without those of the framework.
  std::vector<std::string> Operations() const {
    std::vector<std::string> operations;
    for (const std::string& call : platform.calls) {
      for (const char* begin : {"ListHistory", "ShowHistory", "UndoChange", "KLIBService", "KLIBCExec", "VORNFw"}) {
        if (call.compare(0, std::string(begin).size(), begin) == 0) operations.push_back(call);
      }
    }
    return operations;
  }

  FakePlatform platform;
};

TEST_F(HistoryHandlerTest, ListsAPageOfTheChangesThatMatch) {
  const Answer answer = List(R"({"file": "/etc/exports", "method": "set", "caller": "alice", "since": 1, "until": 2,
                                 "offset": 3, "limit": 4})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data["total"], 1);
  const Json::Value& change = answer.data["changes"][0];
  EXPECT_EQ(change["id"], "c0ffee");
  EXPECT_EQ(change["time"], 1700000000);
  EXPECT_EQ(change["kind"], "change");
  EXPECT_EQ(change["caller"], "alice");
  EXPECT_EQ(change["parameters"], "{}");
  EXPECT_TRUE(change["undoes"].isNull());
  EXPECT_EQ(change["files"][0], "/etc/exports");
  EXPECT_EQ(change["actions"][0], "reload: done");
  EXPECT_THAT(Operations(), ElementsAre("ListHistory '/etc/exports' 'set' 'alice' 1 2 3 4"));
}

TEST_F(HistoryHandlerTest, ListsTheNewestFiftyByDefault) {
  EXPECT_EQ(List("{}").code, 0);
  EXPECT_THAT(Operations(), ElementsAre("ListHistory '' '' '' 0 0 0 50"));
}

TEST_F(HistoryHandlerTest, RefusesParametersOfAnotherKind) {
  for (const char* params : {R"({"file": 1})", R"({"method": []})", R"({"caller": "a\u0000b"})", R"({"since": "1"})",
                             R"({"until": -1})", R"({"offset": -1})", R"({"limit": 1001})", R"({"limit": 1.5})"}) {
    EXPECT_EQ(List(params).code, kBadParameter) << params;
  }
  for (const char* params : {"{}", R"({"id": ""})", R"({"id": 5})", R"({"id": null})"}) {
    EXPECT_EQ(Show(params).code, kBadParameter) << params;
    EXPECT_EQ(Undo(params).code, kBadParameter) << params;
  }
  EXPECT_THAT(Operations(), IsEmpty());
}

TEST_F(HistoryHandlerTest, ShowsAChangeWithItsFiles) {
  const Answer answer = Show(R"({"id": "c0ffee"})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data["method"], "VORN.Core.FileServ.NFS/v1/set");
  EXPECT_EQ(answer.data["differences"][0]["path"], "/etc/exports");
  EXPECT_EQ(answer.data["differences"][0]["difference"], "-a\n+b\n");
}

TEST_F(HistoryHandlerTest, MakesTheServiceReadTheFilesOfAnUndo) {
  const struct {
    const char* name;
    std::vector<std::string> files;
    int enabled;
    std::vector<std::string> operations;
  } cases[] = {
      {"rules", {"/etc/exports"}, 1, {"KLIBServiceReload nfsd", "KLIBServiceIsEnabled nfsd"}},
      {"settings",
       {"/etc/nfs.conf.d/vorn.conf"},
       1,
       {"KLIBServiceIsEnabled nfsd", "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
      {"settings, disabled", {"/etc/nfs.conf.d/vorn.conf"}, 0, {"KLIBServiceIsEnabled nfsd", "VORNFwRuleHup"}},
      {"mappings",
       {"/etc/idmapd.conf"},
       1,
       {"KLIBServiceIsEnabled nfsd", "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -"}},
      {"mappings, disabled", {"/etc/idmapd.conf"}, 0, {"KLIBServiceIsEnabled nfsd"}},
      {"shares", {"/etc/vorn/shares.conf"}, 1, {"KLIBServiceIsEnabled nfsd"}},
  };
  for (const auto& c : cases) {
    platform.calls.clear();
    platform.change.files = c.files;
    platform.enabled = c.enabled;
    EXPECT_EQ(Undo(R"({"id": "c0ffee"})").code, 0) << c.name;
    std::vector<std::string> expected{"UndoChange c0ffee"};
    expected.insert(expected.end(), c.operations.begin(), c.operations.end());
    EXPECT_EQ(Operations(), expected) << c.name;
  }
}

TEST_F(HistoryHandlerTest, FailsIfTheServiceCannotReadTheFiles) {
  platform.enabled = 1;
  const std::pair<const char*, const char*> cases[] = {{"KLIBServiceRestart", "/etc/nfs.conf.d/vorn.conf"},
                                                       {"KLIBCExec", "/etc/idmapd.conf"}};
  for (const auto& [operation, file] : cases) {
    platform.change.files = {file};
    platform.Fail(operation);
    EXPECT_EQ(Undo(R"({"id": "c0ffee"})").code, kPlatformFailure) << operation;
  }
}

TEST_F(HistoryHandlerTest, DoesNotFailIfTheFirewallOrTheRulesCannotBeReloaded) {
  platform.change.files = {"/etc/nfs.conf.d/vorn.conf", "/etc/exports"};
  platform.Fail("VORNFwRuleHup");
  platform.Fail("KLIBServiceReload");
  EXPECT_EQ(Undo(R"({"id": "c0ffee"})").code, 0);
  EXPECT_THAT(platform.LogTexts(), Contains(HasSubstr("Failed to reload firewall rules")));
}

TEST_F(HistoryHandlerTest, SaysWhyAChangeIsNotTakenBack) {
  const std::pair<int, int> cases[] = {
      {VORN::kHistoryFailed, kPlatformFailure}, {VORN::kHistoryNoChange, kNoChange},
      {VORN::kHistoryConflict, kUndoConflict},  {VORN::kHistoryFaulty, kUndoFaulty},
      {VORN::kHistoryFixed, kUndoImpossible},   {VORN::kHistoryUndone, kUndoneAlready}};
  for (const auto& [result, code] : cases) {
    platform.Fail("UndoChange");
    platform.FailWith("UndoChange", result);
    EXPECT_EQ(Undo(R"({"id": "c0ffee"})").code, code);
  }
  platform.Fail("ShowHistory");
  platform.FailWith("ShowHistory", VORN::kHistoryNoChange);
  EXPECT_EQ(Show(R"({"id": "c0ffee"})").code, kNoChange);
  platform.FailWith("ShowHistory", VORN::kHistoryFailed);
  EXPECT_EQ(Show(R"({"id": "c0ffee"})").code, kPlatformFailure);
  platform.Fail("ListHistory");
  EXPECT_EQ(List("{}").code, kPlatformFailure);
}

}  // namespace
