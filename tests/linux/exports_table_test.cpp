#include "exports_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "exportfs_judge.h"

namespace vorn {
namespace {

using testing::HasSubstr;

std::string Resolve(const std::string& path) { return path == "/link" ? "/mnt/a" : path; }

Status Compare(const std::string& file, const std::string& table) {
  return CompareExportTable(ExportsDocument(file), ExportsDocument(table), Resolve);
}

TEST(CompareExportTable, FindsTheTableOfExportfsToBeTheFiles) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const std::vector<std::string> files = {
      "",
      "/mnt/a alpha(rw,async) *(sec=krb5:krb5i,all_squash) 10.0.0.0/8\n\"/mnt/a b\" @group(insecure,crossmnt)\n",
      "/mnt/a -sec=krb5,rw alpha(ro) beta(sec=sys)\n/mnt/a alpha(async)\n/mnt/b\n",
      "/mnt/b alpha(fsid=7,no_wdelay,anonuid=7,refer=/x@y)\n",
  };
  const auto verdicts = judge.Judge(files, {"alpha.example alpha", "beta"});
  for (std::size_t i = 0; i < files.size(); ++i) {
    const Status status = Compare(files[i], verdicts[i].table);
    EXPECT_TRUE(status.ok()) << status.reason() << "\n" << verdicts[i].table;
  }
}

struct DifferenceCase {
  const char* name;
  std::string file;
  const char* line;
  const char* reason;
};

TEST(CompareExportTable, NamesTheLineThatExportfsDidNotTake) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const DifferenceCase cases[] = {
      {"option", "# c\n/mnt/a *(rw)\n/mnt/b *(rw,foo)\n/mnt/c *\n", "line 3", "\"foo\""},
      {"parenthesis", "/mnt/a *(rw\n/mnt/b *\n", "line 1", "\")\""},
      {"address", "/mnt/a *\n/mnt/b 10.0.0.0/33\n", "line 2", "prefix"},
      {"host", "/mnt/a \\\n *\n/mnt/b nowhere(rw)\n", "line 3", "no such host"},
      {"path", "/mnt/a *\n\r\n/mnt/b *\n", "line 2", "no path"},
  };
  std::vector<std::string> files;
  for (const DifferenceCase& c : cases) files.push_back(c.file);
  const auto verdicts = judge.Judge(files);
  for (std::size_t i = 0; i < files.size(); ++i) {
    const Status status = Compare(files[i], verdicts[i].table);
    EXPECT_EQ(status.code(), kServiceFailed) << cases[i].name;
    EXPECT_THAT(status.reason(), HasSubstr(cases[i].line)) << cases[i].name;
    EXPECT_THAT(status.reason(), HasSubstr(cases[i].reason)) << cases[i].name;
  }
}

TEST(CompareExportTable, NoticesATableThatIsNotTheFiles) {
  const std::string file = "/a x(rw)\n/b *\n";
  EXPECT_TRUE(Compare(file, "/a\tx(rw,hide)\n/b\t*(ro)\n").ok());
  EXPECT_TRUE(Compare(file, "/a\tx(rw)\n/b\t*(ro)\n/other\t*(ro)\n").ok());
  EXPECT_TRUE(Compare(file, "/a\tx.example(rw)\n/b\t*(ro)\n").ok()) << "a host by its own name";
  EXPECT_THAT(Compare(file, "").reason(), HasSubstr("line 1"));
  EXPECT_THAT(Compare(file, "/a\tx(rw)\n").reason(), HasSubstr("line 2"));
  EXPECT_THAT(Compare(file, "/a\tx(ro)\n/b\t*(ro)\n").reason(), HasSubstr("another access"));
  EXPECT_THAT(Compare(file, "/a\tx.example(ro)\n/b\t*(ro)\n").reason(), HasSubstr("line 1"));
  EXPECT_THAT(Compare(file, "/a\tx(rw)\n/b\t*(ro,sec=krb5)\n").reason(), HasSubstr("another access"));
}

TEST(CompareExportTable, FollowsLinksOfTheFile) {
  EXPECT_TRUE(Compare("/link *(rw)\n", "/mnt/a\t*(rw)\n").ok());
  EXPECT_FALSE(Compare("/other *(rw)\n", "/mnt/a\t*(rw)\n").ok());
}

}  // namespace
}  // namespace vorn
