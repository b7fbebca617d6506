#include "exports_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "exportfs_judge.h"

namespace vorn {
namespace {

using testing::HasSubstr;

// There is one link, /link -> /mnt/a.
class OneLink : public ExportPaths {
 public:
  std::string Resolve(const std::string& path) const override { return path == "/link" ? "/mnt/a" : path; }
};

Status CompareAll(const std::vector<std::string>& texts, const std::string& table) {
  std::vector<SharedExportsFile> files;
  for (const std::string& text : texts) {
    const std::string name = "/" + std::to_string(files.size()) + ".exports";
    files.push_back(std::make_shared<const ExportsFile>(ExportsFile{name, name, {}, ExportsDocument(text)}));
  }
  return CompareExportTable(files, ExportsDocument(table), OneLink());
}

Status Compare(const std::string& file, const std::string& table) { return CompareAll({file}, table); }

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
      {"option", "# c\n/mnt/a *(rw)\n/mnt/b *(rw,foo)\n/mnt/c *\n", ".exports:3:", "\"foo\""},
      {"parenthesis", "/mnt/a *(rw\n/mnt/b *\n", ".exports:1:", "\")\""},
      {"address", "/mnt/a *\n/mnt/b 10.0.0.0/33\n", ".exports:2:", "prefix"},
      {"host", "/mnt/a \\\n *\n/mnt/b nowhere(rw)\n", ".exports:3:", "no such host"},
      {"path", "/mnt/a *\n\r\n/mnt/b *\n", ".exports:2:", "path"},
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
  EXPECT_THAT(Compare(file, "").reason(), HasSubstr(".exports:1:"));
  EXPECT_THAT(Compare(file, "/a\tx(rw)\n").reason(), HasSubstr(".exports:2:"));
  EXPECT_THAT(Compare(file, "/a\tx(ro)\n/b\t*(ro)\n").reason(), HasSubstr("another access"));
  EXPECT_THAT(Compare(file, "/a\tx.example(ro)\n/b\t*(ro)\n").reason(), HasSubstr(".exports:1:"));
  EXPECT_THAT(Compare(file, "/a\tx(rw)\n/b\t*(ro,sec=krb5)\n").reason(), HasSubstr("another access"));
}

TEST(CompareExportTable, ReadsSeveralFilesInOrder) {
  EXPECT_TRUE(CompareAll({"/a x(rw)\n", "/a x(ro)\n/b *\n"}, "/a\tx(rw)\n/b\t*(ro)\n").ok());
  EXPECT_THAT(CompareAll({"/a x(rw)\n", "/a x(ro)\n\n/b *\n"}, "/a\tx(rw)\n").reason(), HasSubstr("/1.exports:3:"));
  EXPECT_THAT(CompareAll({"/a x(rw)\n", "/a y(foo)\n"}, "/a\tx(rw)\n").reason(), HasSubstr("/1.exports:1:4"));
  EXPECT_THAT(CompareAll({"/a x(sec=krb5,insecure,sec=sys,secure)\n"}, "/a\tx(insecure,sec=krb5:sys)\n").reason(),
              HasSubstr("another access"));
}

TEST(CompareExportTable, FollowsLinksOfTheFile) {
  EXPECT_TRUE(Compare("/link *(rw)\n", "/mnt/a\t*(rw)\n").ok());
  EXPECT_FALSE(Compare("/other *(rw)\n", "/mnt/a\t*(rw)\n").ok());
}

}  // namespace
}  // namespace vorn
