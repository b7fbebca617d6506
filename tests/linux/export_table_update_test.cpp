#include "export_table_update.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "exportfs_judge.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

// There is one link, /link -> /mnt/a.
class OneLink : public ExportPaths {
 public:
  std::string Resolve(const std::string& path) const override { return path == "/link" ? "/mnt/a" : path; }
  Folder FolderAt(const std::string& path) const override {
    if (path != "/") return {path, nullptr};
    return {path, std::make_shared<const Names>(Names{"link"})};
  }
};

Result<ExportTableUpdate> PlanAll(const std::vector<std::string>& texts, const std::string& table,
                                  const HostAddresses& hosts = {}, const std::set<std::string>& resolved = {}) {
  std::vector<SharedExportsFile> files;
  for (const std::string& text : texts) {
    const std::string name = "/" + std::to_string(files.size()) + ".exports";
    files.push_back(std::make_shared<const ExportsFile>(ExportsFile{name, name, {}, ExportsDocument(text)}));
  }
  return PlanExportTable(files, table, OneLink(), hosts, resolved);
}

ExportTableUpdate Plan(const std::string& file, const std::string& table, const HostAddresses& hosts = {},
                       const std::set<std::string>& resolved = {}) {
  const auto update = PlanAll({file}, table, hosts, resolved);
  EXPECT_TRUE(update.ok()) << update.status().reason();
  return update.ok() ? *update : ExportTableUpdate();
}

TEST(ExportTableUpdate, FindsTheTableOfExportfsToBeTheFiles) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const std::vector<std::string> files = {
      "",
      "/mnt/a alpha(rw,async) *(sec=krb5:krb5i,all_squash) 10.0.0.0/8\n\"/mnt/a b\" @group(insecure,crossmnt)\n",
      "/mnt/a -sec=krb5,rw alpha(ro) beta(sec=sys)\n/mnt/a alpha(async)\n/mnt/b\n",
      "/mnt/b alpha(fsid=7,no_wdelay,anonuid=7)\n/mnt/c *.example(rw) 10.0.0.1 ::1(ro) @group *(nohide)\n",
      "/mnt/b alpha(fsid=root,subtree_check,insecure_locks,no_acl,security_label,mp)\n",
  };
  const auto verdicts = judge.Judge(files, {"alpha.example alpha", "beta"});
  for (std::size_t i = 0; i < files.size(); ++i) {
    EXPECT_THAT(Plan(files[i], verdicts[i].table).changed, IsEmpty()) << files[i] << verdicts[i].table;
  }
}

// exportfs reads the new table as it reads the files.
TEST(ExportTableUpdate, MakesATableThatExportfsReadsAsItReadsTheFiles) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const std::vector<std::string> files = {
      "/mnt/a 10.0.0.1(rw,async) *(sec=krb5:krb5i,all_squash) 10.0.0.0/8\n\"/mnt/a b\" @group(insecure,crossmnt)\n",
      "/mnt/a -sec=krb5,rw 10.0.0.1(ro) 10.0.0.2(sec=sys)\n/mnt/a 10.0.0.1(async)\n\"/mnt/b# \" *.example\n",
      "/mnt/b *(fsid=7,no_wdelay,anonuid=7)\n/mnt/c @group(sec=krb5,rw,no_root_squash,sec=sys,ro) ::1(rw)\n",
  };
  std::vector<std::string> tables;
  for (const std::string& file : files) tables.push_back(Plan(file, "").text);
  const auto verdicts = judge.Judge(tables);
  for (std::size_t i = 0; i < files.size(); ++i) {
    EXPECT_EQ(verdicts[i].status, 0) << verdicts[i].messages;
    EXPECT_THAT(Plan(files[i], verdicts[i].table).changed, IsEmpty()) << tables[i] << verdicts[i].table;
  }
}

TEST(ExportTableUpdate, ChangesTheLinesOfTheChangedDirectoryOnly) {
  const std::string other = "/b\t*(ro,sync,anything=odd)\n";
  const ExportTableUpdate update = Plan("/a 10.0.0.1(ro)\n/b *(ro,anything=odd)\n", "/a\t10.0.0.1(rw)\n" + other);
  EXPECT_THAT(update.text, HasSubstr("/a\t10.0.0.1(ro,"));
  EXPECT_THAT(update.text, HasSubstr(other));
  EXPECT_THAT(update.changed, ElementsAre("/a"));
  EXPECT_THAT(update.exported, ElementsAre("/a", "/b"));
  EXPECT_THAT(update.left, IsEmpty());
  EXPECT_THAT(update.clients, IsEmpty());
}

TEST(ExportTableUpdate, NamesTheClientsThatTheWholeTableGainsOrLoses) {
  const ExportTableUpdate update =
      Plan("/a 10.0.0.2(ro)\n/b 10.0.0.3(ro)\n", "/a\t10.0.0.1(ro)\n/a\t10.0.0.3(ro)\n/b\t10.0.0.3(ro)\n");
  EXPECT_THAT(update.clients, ElementsAre("10.0.0.1", "10.0.0.2"));
}

TEST(ExportTableUpdate, RemovesADirectoryThatNoLineHas) {
  const ExportTableUpdate update = Plan("/b *(ro)\n", "/a\t*(ro)\n/b\t*(ro)\n");
  EXPECT_EQ(update.text, "/b\t*(ro)\n");
  EXPECT_THAT(update.changed, ElementsAre("/a"));
  EXPECT_THAT(update.exported, ElementsAre("/b"));
  EXPECT_THAT(update.left, ElementsAre("/a"));
}

TEST(ExportTableUpdate, SeesEachOptionThatCounts) {
  for (const char* option :
       {"async", "no_wdelay", "nohide", "crossmnt", "insecure", "no_root_squash", "all_squash", "subtree_check",
        "insecure_locks", "no_acl", "security_label", "fsid=7", "anonuid=7", "anongid=7", "sec=krb5", "rw"}) {
    const std::string file = std::string("/a *(") + option + ")\n";
    EXPECT_THAT(Plan(file, "/a\t*(ro,sync)\n").changed, ElementsAre("/a")) << option;
    EXPECT_THAT(Plan("/a *\n", std::string("/a\t*(") + option + ")\n").changed, ElementsAre("/a")) << option;
    EXPECT_THAT(Plan(file, std::string("/a\t*(") + option + ")\n").changed, IsEmpty()) << option;
  }
}

TEST(ExportTableUpdate, SeesTheOrderOfOverlappingClients) {
  const std::string table = "/a\t10.0.0.0/8(ro)\n/a\t10.1.0.0/16(rw)\n";
  EXPECT_THAT(Plan("/a 10.0.0.0/8(ro) 10.1.0.0/16(rw)\n", table).changed, IsEmpty());
  EXPECT_THAT(Plan("/a 10.1.0.0/16(rw) 10.0.0.0/8(ro)\n", table).text, "/a\t10.1.0.0/16(rw)\n/a\t10.0.0.0/8(ro)\n");
  EXPECT_THAT(Plan("/a *(ro) 10.0.0.0/8(ro) 10.1.0.0/16(rw)\n", table + "/a\t*(ro)\n").changed, IsEmpty());
}

TEST(ExportTableUpdate, TakesTheFirstRuleOfAClientFromAllFiles) {
  const auto update = PlanAll({"/a 10.0.0.1(rw)\n", "/link *(rw)\n/a 10.0.0.1(ro)\n/b *\n"}, "/a\t10.0.0.1(rw)\n");
  ASSERT_TRUE(update.ok());
  EXPECT_THAT(update->changed, ElementsAre("/b", "/mnt/a"));
}

struct FaultCase {
  const char* name;
  const char* line;  // faulty, about /slip
};

TEST(ExportTableUpdate, AppliesEverySoundLineAndNothingOfAFaultyOne) {
  const FaultCase cases[] = {{"option", "/slip *(rw,foo)\n"},
                             {"flavour", "/slip *(rw,sec=krb7)\n"},
                             {"bracket", "/slip *(rw\n"},
                             {"quotation", "\"/slip *(rw)\n"},
                             {"number", "/slip *(rw,anonuid=x)\n"}};
  const std::string table = "/slip\t10.0.0.9(ro)\n/a\t10.0.0.1(rw)\n";
  for (const FaultCase& c : cases) {
    const ExportTableUpdate update = Plan(std::string(c.line) + "/a 10.0.0.1(rw)\n/b 10.0.0.2(rw)\n", table);
    EXPECT_THAT(update.text, HasSubstr(table)) << c.name;
    EXPECT_THAT(update.changed, ElementsAre("/b")) << c.name;
  }
}

TEST(ExportTableUpdate, KeepsADirectoryThatAFaultyLineMayMean) {
  const std::string table = "/a\t10.0.0.1(rw)\n/slip\t*(ro)\n";
  EXPECT_THAT(Plan("/slip *(ro) \\\n/a 10.0.0.1(rw)\n", table).changed, IsEmpty());
  EXPECT_THAT(Plan("/slip *(ro,foo)\n", table).left, ElementsAre("/a")) << "no line has it";
  EXPECT_THAT(Plan("/slip *(ro) \\\n/a 10.0.0.1(rw)\n/a 10.0.0.1(ro)\n", table).text, HasSubstr("/a\t10.0.0.1(ro,"))
      << "a sound line counts";
}

const HostAddresses kHosts = {{"host", {"10.0.0.7", "10.0.0.8"}}};

TEST(ExportTableUpdate, WritesTheAddressesOfAHost) {
  const ExportTableUpdate update = Plan("/a Host(rw)\n", "", kHosts, {"host"});
  EXPECT_THAT(update.text, HasSubstr("/a\t10.0.0.7(rw,"));
  EXPECT_THAT(update.text, HasSubstr("/a\t10.0.0.8(rw,"));
  EXPECT_THAT(update.unresolved, IsEmpty());
  EXPECT_THAT(update.names, ElementsAre("host"));
}

TEST(ExportTableUpdate, GivesANewRuleNoRememberedAddress) {
  const ExportTableUpdate update = Plan("/a host(rw)\n", "", kHosts);
  EXPECT_THAT(update.text, IsEmpty());
  EXPECT_THAT(update.unresolved, ElementsAre("host"));
}

TEST(ExportTableUpdate, KeepsARuleInForceByTheRememberedAddresses) {
  const std::string table = "/a\t10.0.0.7(rw)\n/a\t10.0.0.8(rw)\n";
  EXPECT_THAT(Plan("/a host(rw)\n", table, kHosts).changed, IsEmpty());
  EXPECT_THAT(Plan("/a host(rw)\n", table, kHosts).unresolved, IsEmpty());
  EXPECT_THAT(Plan("/a host(ro)\n", table, kHosts).text, Not(HasSubstr("rw")));
}

TEST(ExportTableUpdate, KeepsAHostThatTheTableHasByItsName) {
  const std::string table = "/a\thost.example(rw)\n";
  for (const char* name : {"host.example", "alias"}) {
    const ExportTableUpdate update = Plan(std::string("/a ") + name + "(rw)\n", table);
    EXPECT_THAT(update.changed, IsEmpty()) << name;
    EXPECT_THAT(update.unresolved, ElementsAre(name));
  }
  EXPECT_THAT(Plan("/a other(ro)\n", table).text, IsEmpty()) << "a rule with another access";
  const ExportTableUpdate known = Plan("/a host.example(rw)\n", table, {{"host.example", {"10.0.0.7"}}});
  EXPECT_THAT(known.text, HasSubstr("/a\t10.0.0.7(rw"));
  EXPECT_THAT(known.clients, ElementsAre("10.0.0.7", "host.example"));
}

TEST(ExportTableUpdate, RefusesATableThatIsNone) {
  for (const char* table : {"nonsense\n", "/a\t*\n", "/a\t*(foo)\n", "/a\t*(rw\n"}) {
    const auto update = PlanAll({"/a *\n"}, table);
    EXPECT_EQ(update.status().code(), kSyntax) << table;
    EXPECT_THAT(update.status().reason(), HasSubstr("/var/lib/nfs/etab: unexpected line"));
  }
}

TEST(ExportTableUpdate, EscapesPaths) {
  const std::string text = Plan("\"/mnt/a b\" *(rw)\n", "").text;
  EXPECT_THAT(text, HasSubstr("/mnt/a\\040b\t*(rw"));
  EXPECT_THAT(Plan("\"/mnt/a b\" *(rw)\n", text).changed, IsEmpty());
}

}  // namespace
}  // namespace vorn
