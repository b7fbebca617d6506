// The meaning of a change of exports(5) files for the clients that they name.
#include "rule_changes.h"

#include <gmock/gmock.h>

#include <set>

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

// "DIRECTORY CLIENT: CHANGE(FLAVOUR) ACCESS, ..."
std::vector<std::string> Compare(const std::string& before, const std::string& after, const std::string& other = "") {
  const ExportsDocument foreign(other);
  std::vector<std::string> sentences;
  for (const RuleChange& rule :
       CompareRules(ExportsDocument(before), ExportsDocument(after), {&foreign}, ExportPaths())) {
    std::string sentence = rule.directory + " " + rule.client + ":";
    for (const RightChange& right : rule.rights) {
      sentence += " " + right.change;
      if (!right.flavor.empty()) sentence += "(" + right.flavor + ")";
      sentence += right.access == RightChange::Access::kLess   ? "-"
                  : right.access == RightChange::Access::kMore ? "+"
                                                               : "";
      EXPECT_FALSE(right.text.empty());
    }
    sentences.push_back(sentence);
  }
  return sentences;
}

TEST(RuleChanges, AreNoneForAnotherSpelling) {
  EXPECT_THAT(Compare("/a 10.0.0.1(rw)\n", "/a 10.0.0.1(rw)\n"), IsEmpty());
  EXPECT_THAT(Compare("/a 10.0.0.1(rw)\n", "# ours\n/a\t10.0.0.1(rw,sync,sec=sys)\n"), IsEmpty());
}

TEST(RuleChanges, NameWhoGetsAndLosesARule) {
  EXPECT_THAT(Compare("/a 10.0.0.1(rw) 10.0.0.2(ro)\n/b *(ro)\n", "/a 10.0.0.2(ro) host(rw)\n/b *(ro)\n"),
              ElementsAre("/a 10.0.0.1: removed-", "/a host: added+"));
  EXPECT_THAT(Compare("/a *(ro)\n", ""), ElementsAre("/a *: removed-"));
  EXPECT_THAT(Compare("", "/a *(ro)\n"), ElementsAre("/a *: added+"));
}

TEST(RuleChanges, NameEachRight) {
  const struct {
    const char* before;
    const char* after;
    const char* change;
  } rows[] = {
      {"rw", "ro", "read_only(sys)-"},
      {"ro", "rw", "read_write(sys)+"},
      {"root_squash", "no_root_squash", "root_not_squashed(sys)+"},
      {"no_root_squash", "root_squash", "root_squashed(sys)-"},
      {"", "all_squash", "all_squashed(sys)"},
      {"all_squash", "", "all_not_squashed(sys)"},
      {"secure", "insecure", "any_port(sys)+"},
      {"insecure", "secure", "reserved_ports_only(sys)-"},
      {"", "crossmnt", "crossmnt+"},
      {"crossmnt", "", "no_crossmnt-"},
      {"sync", "async", "async"},
      {"async", "sync", "sync"},
      {"anonuid=1", "anonuid=2", "other_account"},
      {"", "fsid=7", "other_options"},
      {"sec=sys:krb5", "sec=krb5", "flavor_removed(sys)-"},
      {"sec=krb5", "sec=krb5:krb5p", "flavor_added(krb5p)+"},
  };
  std::set<std::string> seen = {"added", "removed"};
  for (const auto& row : rows) {
    const auto line = [](const char* options) { return std::string("/a 10.0.0.1(") + options + ")\n"; };
    EXPECT_THAT(Compare(line(row.before), line(row.after)), ElementsAre(std::string("/a 10.0.0.1: ") + row.change))
        << row.before << " -> " << row.after;
    const std::string change = row.change;
    seen.insert(change.substr(0, change.find_first_of("(+-")));
  }
  const std::vector<std::string> all = AllRightChanges();
  EXPECT_EQ(seen, std::set<std::string>(all.begin(), all.end()));
}

TEST(RuleChanges, AreSeenForEachFlavour) {
  EXPECT_THAT(Compare("/a *(sec=sys,ro,sec=krb5,rw)\n", "/a *(sec=sys,ro,sec=krb5,ro)\n"),
              ElementsAre("/a *: read_only(krb5)-"));
}

TEST(RuleChanges, DoNotNameAnAccountThatNobodyActsAs) {
  EXPECT_THAT(Compare("/a *(no_root_squash,anonuid=1)\n", "/a *(no_root_squash,anonuid=2)\n"), IsEmpty());
}

TEST(RuleChanges, TakeOneClientForOne) {
  EXPECT_THAT(Compare("/a HOST(rw) 10.1(rw)\n", "/a host(rw) 10.0.0.1(ro)\n"),
              ElementsAre("/a 10.0.0.1: read_only(sys)-"));
}

TEST(RuleChanges, ConsiderTheRulesOfOtherFiles) {
  EXPECT_THAT(Compare("/a 10.0.0.1(ro)\n", "", "/a 10.0.0.1(rw)\n"), ElementsAre("/a 10.0.0.1: read_write(sys)+"));
  EXPECT_THAT(Compare("", "/a 10.0.0.1(rw)\n", "/a 10.0.0.1(rw)\n"), IsEmpty());
}

TEST(RuleChanges, OfOneDirectoryMayBeInSeveralLines) {
  EXPECT_THAT(Compare("/a 10.0.0.1(rw)\n/a 10.0.0.2(rw)\n", "/a 10.0.0.2(ro)\n/a/ 10.0.0.1(ro)\n"),
              UnorderedElementsAre("/a 10.0.0.1: read_only(sys)-", "/a 10.0.0.2: read_only(sys)-"));
}

}  // namespace
}  // namespace vorn
