// The module of shared folders against the fake platform.
#include "share_handler.h"

#include <gmock/gmock.h>

#include <string>

#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

constexpr char kAPI[] = "VORN.Core.Share";

Answer List(const std::string& params) { return Call(EntryOf(kAPI, "list"), params); }
Answer Get(const std::string& params) { return Call(EntryOf(kAPI, "get"), params); }
Answer Create(const std::string& params) { return Call(EntryOf(kAPI, "create"), params); }
Answer Delete(const std::string& params) { return Call(EntryOf(kAPI, "delete"), params); }

// The names of the page, or the error code.
std::string NamesOf(const Answer& answer) {
  if (answer.code != 0) return std::to_string(answer.code);
  std::string names;
  for (const Json::Value& share : answer.data["shares"]) names += share["name"].asString() + " ";
  return names + "of " + answer.data["total"].asString();
}

class ShareTest : public testing::Test {
 protected:
  void TearDown() override { EXPECT_THAT(platform.live_objects, IsEmpty()); }

  FakePlatform platform;
};

class ThreeShares : public ShareTest {
 protected:
  ThreeShares() {
    platform.shares = {{"music", "/volume2/sounds"}, {"data", "/volume1/data"}, {"Data2", "/volume1/d2"}};
  }
};

TEST_F(ThreeShares, AreListedByName) {
  EXPECT_EQ(NamesOf(List("{}")), "Data2 data music of 3");
  EXPECT_EQ(NamesOf(List(R"({"offset": 1, "limit": 1})")), "data of 3");
  EXPECT_EQ(NamesOf(List(R"({"offset": 7, "limit": -1})")), "Data2 data music of 3");
  EXPECT_EQ(NamesOf(List(R"({"limit": 0})")), "of 3");
}

TEST_F(ThreeShares, AreFilteredByNameAndPathInAnyCase) {
  EXPECT_EQ(NamesOf(List(R"({"filter": "DATA"})")), "Data2 data of 2");
  EXPECT_EQ(NamesOf(List(R"({"filter": "volume2"})")), "music of 1");
  EXPECT_EQ(NamesOf(List(R"({"filter": ""})")), "Data2 data music of 3");
  EXPECT_EQ(NamesOf(List(R"({"filter": "none"})")), "of 0");
}

TEST_F(ThreeShares, AreNotListedForParametersOfAnotherType) {
  for (const char* params : {R"({"offset": "1"})", R"({"limit": 1.5})", R"({"filter": 1})"}) {
    EXPECT_EQ(List(params).code, kBadParameter) << params;
  }
  EXPECT_THAT(platform.LogTexts(), Contains("variable 'filter' is missing or not accepted."));
  EXPECT_THAT(platform.calls, Not(Contains(StartsWith("VORNShareEnum"))));
}

TEST_F(ShareTest, HasItsPathAndTheNumberOfItsRules) {
  platform.rules.resize(2);
  const Answer answer = Get(R"({"name": "data"})");
  EXPECT_EQ(answer.data, Parse(R"({"name": "data", "path": "/volume1/data", "rules": 2})"));
  platform.rules.clear();
  EXPECT_EQ(Get(R"({"name": "data"})").data["rules"], 0);
}

TEST_F(ShareTest, WithoutAnAbsolutePathHasNoRules) {
  platform.shares = {{"odd", "volume1"}};
  EXPECT_EQ(Get(R"({"name": "odd"})").data["rules"], 0);
  EXPECT_THAT(platform.calls, Not(Contains(StartsWith("VORNNFSRuleExtGet"))));
}

TEST_F(ShareTest, IsNotFoundUnderAnotherName) {
  EXPECT_EQ(Get(R"({"name": "Data"})").code, kNoShare);
  EXPECT_EQ(Delete(R"({"name": "Data"})").code, kNoShare);
}

TEST_F(ShareTest, NeedsANameOfOneCharacterOrMore) {
  for (const char* params : {"{}", R"({"name": ""})", R"({"name": 1})", R"({"name": "a\u0000b"})"}) {
    EXPECT_EQ(Get(params).code, kBadParameter) << params;
    EXPECT_EQ(Delete(params).code, kBadParameter) << params;
    EXPECT_EQ(Create(params).code, kBadParameter) << params;
  }
  EXPECT_THAT(platform.LogTexts(), Contains("variable 'name' is missing or not accepted."));
}

TEST_F(ShareTest, NeedsAPath) {
  EXPECT_EQ(Create(R"({"name": "a"})").code, kBadParameter);
  EXPECT_EQ(Create(R"({"name": "a", "path": "/a\u0000b"})").code, kBadParameter);
  EXPECT_THAT(platform.LogTexts(), Contains("variable 'path' is missing or not accepted."));
}

TEST_F(ShareTest, IsCreatedByThePlatform) {
  const Answer answer = Create(R"({"name": "media", "path": "/volume1/media"})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.count, 1);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_EQ(platform.shares["media"], "/volume1/media");
}

TEST_F(ShareTest, TellsWhyItWasNotCreated) {
  platform.Fail("VORNShareCreate");
  const std::pair<int, int> cases[] = {{-1, kPlatformFailure}, {-2, kShareExists}, {-3, kNoFolder}};
  for (const auto& [result, code] : cases) {
    platform.FailWith("VORNShareCreate", result);
    EXPECT_EQ(Create(R"({"name": "a", "path": "/a"})").code, code) << result;
  }
  EXPECT_THAT(platform.LogTexts(), Contains("Failed to VORNShareCreate, vornerr=[0x00AB]"));
}

TEST_F(ShareTest, IsDeletedWhileTheConfigurationIsLocked) {
  EXPECT_EQ(Delete(R"({"name": "data"})").code, 0);
  EXPECT_THAT(platform.shares, IsEmpty());
  std::string order;
  for (const std::string& call : platform.calls) {
    for (const char* name : {"VornConf", "~VornConf", "VORNNFSRuleExtGet", "VORNShareDelete"}) {
      if (call.substr(0, call.find(' ')) == name) order += std::string(name) + " ";
    }
  }
  EXPECT_EQ(order, "VornConf VORNNFSRuleExtGet VORNShareDelete ~VornConf ");
}

TEST_F(ShareTest, StaysWhileItHasRules) {
  platform.rules.resize(1);
  EXPECT_EQ(Delete(R"({"name": "data"})").code, kShareHasRules);
  EXPECT_THAT(platform.LogTexts(), Contains("The shared folder has export rules."));
  EXPECT_THAT(platform.calls, Not(Contains(StartsWith("VORNShareDelete"))));
}

TEST_F(ShareTest, TellsWhyItWasNotDeleted) {
  platform.Fail("VORNShareDelete");
  platform.FailWith("VORNShareDelete", -4);
  EXPECT_EQ(Delete(R"({"name": "data"})").code, kNoShare);
  platform.FailWith("VORNShareDelete", -1);
  EXPECT_EQ(Delete(R"({"name": "data"})").code, kPlatformFailure);
}

TEST_F(ShareTest, FailsWithThePlatform) {
  for (const char* operation :
       {"KLIBCSzHashAlloc", "KLIBCSzListAlloc", "VORNShareEnum", "KLIBCSzHashEnumKey", "VORNNFSRuleExtGet"}) {
    FakePlatform failing;
    failing.Fail(operation);
    EXPECT_EQ(List("{}").code, kPlatformFailure) << operation;
    EXPECT_EQ(Get(R"({"name": "data"})").code, kPlatformFailure) << operation;
    EXPECT_EQ(Delete(R"({"name": "data"})").code, kPlatformFailure) << operation;
    EXPECT_THAT(failing.calls, Not(Contains(StartsWith("VORNShareDelete")))) << operation;
    EXPECT_THAT(failing.live_objects, IsEmpty()) << operation;
  }
}

TEST_F(ShareTest, LogsTheRequestThatFailed) {
  Delete(R"({"name": "nix"})");
  EXPECT_THAT(platform.LogTexts(), Contains(HasSubstr(R"(Request: {"name":"nix"})")));
}

}  // namespace
