#include "export_decision.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Outcome = ExportDecision::Outcome;
using Reason = ExportDecision::Other::Reason;

TableExport Rule(const std::string& directory, const std::string& client, bool crossmnt = false) {
  TableExport one;
  one.directory = directory;
  one.client = client;
  one.kind = ExportKindOf(client);
  one.options.crossmnt = crossmnt;
  return one;
}

struct Decided {
  Outcome outcome;
  std::string rule;  // "/srv *"
  std::vector<std::pair<std::string, Reason>> others;
};

// Decides for a client that every rule but that of "absent" is for.
Decided Decide(const ExportList& exports, const std::string& directory, bool is_version_4,
               const std::set<std::string>& mount_points = {}) {
  const auto matches = [](const TableExport& one) { return one.client != "absent"; };
  const ExportDecision decision = DecideExport(exports, {directory, is_version_4, mount_points, matches});
  const auto name = [&](std::size_t index) { return exports[index].directory + " " + exports[index].client; };
  Decided decided{decision.outcome, decision.decider ? name(*decision.decider) : "", {}};
  for (const auto& other : decision.others) decided.others.emplace_back(name(other.index), other.reason);
  return decided;
}

TEST(ExportKind, IsToldByTheText) {
  const std::pair<const char*, ExportKind> cases[] = {
      {"10.0.0.1", ExportKind::kHost},       {"host.example", ExportKind::kHost}, {"fd00::1", ExportKind::kHost},
      {"10.0.0.0/24", ExportKind::kNetwork}, {"fd00::/8", ExportKind::kNetwork},  {"*.example", ExportKind::kPattern},
      {"h?st", ExportKind::kPattern},        {"host[12]", ExportKind::kPattern},  {"*/24", ExportKind::kPattern},
      {"@group", ExportKind::kNetgroup},     {"*", ExportKind::kEverybody},       {"", ExportKind::kEverybody},
  };
  for (const auto& [client, kind] : cases) EXPECT_EQ(ExportKindOf(client), kind) << client;
}

TEST(ExportDecision, TakesTheEarliestKindAndThenTheFirstRule) {
  const ExportList exports = {Rule("/srv", "*"),      Rule("/srv", "10.0.0.0/8"), Rule("/srv", "10.0.0.0/24"),
                              Rule("/srv", "@group"), Rule("/srv", "*.example"),  Rule("/srv", "absent")};
  for (const bool is_version_4 : {false, true}) {
    const Decided decided = Decide(exports, "/srv", is_version_4);
    EXPECT_EQ(decided.outcome, Outcome::kRule);
    EXPECT_EQ(decided.rule, "/srv 10.0.0.0/8");
    EXPECT_THAT(decided.others,
                ElementsAre(std::pair("/srv 10.0.0.0/24", Reason::kOrder), std::pair("/srv *.example", Reason::kKind),
                            std::pair("/srv @group", Reason::kKind), std::pair("/srv *", Reason::kKind)));
  }
}

TEST(ExportDecision, IsNoneWithoutARuleForTheClient) {
  for (const bool is_version_4 : {false, true}) {
    const Decided decided = Decide({Rule("/srv", "absent"), Rule("/srvs", "*")}, "/srv", is_version_4);
    EXPECT_EQ(decided.outcome, Outcome::kNone);
    EXPECT_THAT(decided.others, IsEmpty());
  }
}

TEST(ExportDecision, OfNestedDirectoriesIsTheInnerOneInVersion3AndTheOuterOneInVersion4) {
  const ExportList exports = {Rule("/srv", "*"), Rule("/srv/in", "10.0.0.1")};
  EXPECT_EQ(Decide(exports, "/srv/in", false).rule, "/srv/in 10.0.0.1");
  const Decided decided = Decide(exports, "/srv/in", true);
  EXPECT_EQ(decided.rule, "/srv *");
  EXPECT_THAT(decided.others, ElementsAre(std::pair("/srv/in 10.0.0.1", Reason::kDirectory)));
}

TEST(ExportDecision, FallsBackToAnOuterDirectory) {
  for (const bool is_version_4 : {false, true}) {
    EXPECT_EQ(Decide({Rule("/", "*")}, "/srv/in", is_version_4).rule, "/ *");
    EXPECT_EQ(Decide({Rule("/srv", "*"), Rule("/srv/in/deep", "absent")}, "/srv/in", is_version_4).rule, "/srv *");
  }
}

TEST(ExportDecision, ShowsTheWayToInnerDirectoriesInVersion4Only) {
  const ExportList exports = {Rule("/srv/in", "*")};
  EXPECT_EQ(Decide(exports, "/srv", true).outcome, Outcome::kPassage);
  EXPECT_EQ(Decide(exports, "/srv", false).outcome, Outcome::kNone);
  EXPECT_EQ(Decide({Rule("/srv/in", "absent")}, "/srv", true).outcome, Outcome::kNone);
}

TEST(ExportDecision, ChangesAtAMountPoint) {
  const std::set<std::string> mount_points = {"/srv/volume"};
  const ExportList own = {Rule("/srv", "*"), Rule("/srv/volume", "10.0.0.1")};
  EXPECT_EQ(Decide(own, "/srv/volume", true, mount_points).rule, "/srv/volume 10.0.0.1");
  EXPECT_EQ(Decide(own, "/srv/volume/in", true, mount_points).rule, "/srv/volume 10.0.0.1");
  const ExportList outer = {Rule("/srv", "*")};
  EXPECT_EQ(Decide(outer, "/srv/volume/in", true, mount_points).outcome, Outcome::kHidden);
  EXPECT_EQ(Decide(outer, "/srv/volume", false, mount_points).outcome, Outcome::kFolder);
  const ExportList crossed = {Rule("/srv", "*", true)};
  for (const bool is_version_4 : {false, true}) {
    EXPECT_EQ(Decide(crossed, "/srv/volume/in", is_version_4, mount_points).rule, "/srv *");
    EXPECT_EQ(Decide(crossed, "/srv/volume/in", is_version_4, mount_points).outcome, Outcome::kRule);
  }
}

TEST(ExportDecision, TakesTheNearestCrossingRuleAtAMountPoint) {
  const ExportList exports = {Rule("/", "10.0.0.1", true), Rule("/srv", "*", true)};
  EXPECT_EQ(Decide(exports, "/srv/volume", true, {"/srv/volume"}).rule, "/srv *");
}

}  // namespace
}  // namespace vorn
