// The API "VORN.Core.FileServ.NFS.Health" against the fake platform.
#include "health_handler.h"

#include <gmock/gmock.h>

#include <string>
#include <utility>
#include <vector>

#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using Severity = VORN::HealthFinding::Severity;

Answer Check(const std::string& params) { return Call(EntryOf("VORN.Core.FileServ.NFS.Health", "check"), params); }

std::vector<std::string> KindsOf(const Json::Value& data) {
  std::vector<std::string> kinds;
  for (const Json::Value& finding : data["findings"]) kinds.push_back(finding["kind"].asString());
  return kinds;
}

class HealthTest : public testing::Test {
 protected:
  HealthTest() {
    platform.health.findings = {{"a", Severity::kError, {}, "A.", "Mend a.", {}},
                                {"b", Severity::kWarning, {"data", "", "", 0, "", ""}, "B.", "Mend b.", {}},
                                {"c", Severity::kNotice, {"data", "", "", 0, "", ""}, "C.", "Mend c.", {}},
                                {"c", Severity::kNotice, {}, "D.", "Mend d.", {}}};
  }

  FakePlatform platform;
};

TEST_F(HealthTest, AnswersWithAllThatAFindingHas) {
  platform.health.findings = {
      {"left_share",
       Severity::kWarning,
       {"data", "10.0.0.0/8", "/etc/exports", 3, "nfsd vers4", "root@X"},
       "It is left.",
       "Remove it.",
       {"VORN.X",
        2,
        "delete",
        {{"name", std::string("data")}, {"id", std::vector<std::string>{"a", "b"}}, {"on", true}}}},
      {"exports_fault", Severity::kNotice, {}, "It is faulty.", "Mend it.", {}}};
  platform.health.not_checked = {{"clock", "There is no clock."}};
  EXPECT_EQ(Check("{}").data.toStyledString(), Parse(R"({
    "findings": [
      {"kind": "left_share", "severity": "warning", "text": "It is left.", "remedy": "Remove it.",
       "subject": {"share": "data", "client": "10.0.0.0/8", "file": "/etc/exports", "line": 3, "setting": "nfsd vers4",
                   "mapping": "root@X"},
       "call": {"api": "VORN.X", "version": 2, "method": "delete",
                "parameters": {"name": "data", "id": ["a", "b"], "on": true}}},
      {"kind": "exports_fault", "severity": "notice", "text": "It is faulty.", "remedy": "Mend it.", "call": null,
       "subject": {"share": null, "client": null, "file": null, "line": null, "setting": null, "mapping": null}}],
    "total": 2, "counts": {"error": 0, "warning": 1, "notice": 1},
    "not_checked": [{"kind": "clock", "reason": "There is no clock."}]})")
                                                   .toStyledString());
}

TEST_F(HealthTest, AnswersWithTheFindingsThatAreWanted) {
  const std::pair<const char*, std::vector<std::string>> cases[] = {
      {"{}", {"a", "b", "c", "c"}},
      {R"({"severity": null, "kind": null, "share": null, "offset": null, "limit": null})", {"a", "b", "c", "c"}},
      {R"({"severity": "error"})", {"a"}},
      {R"({"severity": "warning"})", {"a", "b"}},
      {R"({"severity": "notice", "share": "data"})", {"b", "c"}},
      {R"({"kind": "c"})", {"c", "c"}},
      {R"({"kind": "other"})", {}},
      {R"({"offset": 1, "limit": 2})", {"b", "c"}},
      {R"({"limit": 0})", {}},
  };
  for (const auto& [params, kinds] : cases) EXPECT_EQ(KindsOf(Check(params).data), kinds) << params;
  EXPECT_THAT(platform.calls, Contains("CheckHealth"));
}

TEST_F(HealthTest, CountsWhatMatchesAndNotThePage) {
  const Json::Value data = Check(R"({"kind": "c", "limit": 1})").data;
  EXPECT_EQ(data["total"], 2);
  EXPECT_EQ(data["counts"], Parse(R"({"error": 0, "warning": 0, "notice": 2})"));
}

TEST_F(HealthTest, AnswersWithTheGapsOfTheKindThatIsWanted) {
  platform.health.not_checked = {{"a", "No."}, {"b", "Not now."}};
  EXPECT_EQ(Check("{}").data["not_checked"].size(), 2U);
  EXPECT_EQ(Check(R"({"kind": "b"})").data["not_checked"], Parse(R"([{"kind": "b", "reason": "Not now."}])"));
}

TEST_F(HealthTest, AnswersABoxWithoutFindings) {
  platform.health = {};
  EXPECT_EQ(Check("{}").data, Parse(R"({"findings": [], "total": 0, "not_checked": [],
                                        "counts": {"error": 0, "warning": 0, "notice": 0}})"));
}

TEST_F(HealthTest, RefusesParametersThatAreNoQuestion) {
  const std::pair<const char*, const char*> cases[] = {
      {"severity", R"({"severity": "fatal"})"}, {"severity", R"({"severity": 1})"}, {"kind", R"({"kind": []})"},
      {"share", R"({"share": true})"},          {"offset", R"({"offset": "1"})"},   {"limit", R"({"limit": 1.5})"},
  };
  for (const auto& [name, params] : cases) {
    platform.log.clear();
    EXPECT_EQ(Check(params).code, kBadParameter) << params;
    EXPECT_THAT(platform.LogTexts(), Contains("variable '" + std::string(name) + "' is missing or not accepted."));
  }
  EXPECT_THAT(platform.calls, testing::Not(Contains("CheckHealth")));
}

}  // namespace
