#include "left_shares.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "captured_log.h"
#include "current_box.h"
#include "exports_files.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::HasSubstr;

constexpr char kShares[] = "/etc/vorn/shares.conf";
constexpr char kExports[] = "/etc/exports";
constexpr char kRemembered[] = "/var/lib/vorn/exported-shares";

class LeftShares : public testing::Test {
 protected:
  LeftShares() {
    root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\n");
    root_.Write(kShares, "[shares]\ndata = /srv/data\nleft = /srv/left\n");
    root_.Write(kExports, "/srv/data *(rw)\n/srv/left *(rw)\n/own *(ro)\n");
    Check();
    root_.Write(kShares, "[shares]\ndata = /srv/data\n");
  }

  // Returns what was logged.
  std::string Check() {
    TakeLog();
    const auto file = OpenExportsFile(CurrentBox(), kExports);
    EXPECT_TRUE(file.ok()) << file.status().reason();
    const Result<bool> withdrawn = CheckLeftShares(CurrentBox(), (*file)->document);
    EXPECT_TRUE(withdrawn.ok()) << withdrawn.status().reason();
    withdrawn_ = withdrawn.ok() && *withdrawn;
    std::string log;
    for (const LogLine& line : TakeLog()) log += line.text + "\n";
    return log;
  }

  std::string Exports() const { return root_.Read(kExports).value_or(""); }

  TemporaryRoot root_;
  bool withdrawn_ = false;  // what the last check returned
};

TEST_F(LeftShares, AreNamedEachTimeAndStayExported) {
  for (int i = 0; i < 2; ++i) {
    const std::string log = Check();
    EXPECT_THAT(log, HasSubstr("/srv/left is exported although it is no share any more"));
    EXPECT_FALSE(withdrawn_);
    EXPECT_THAT(log, testing::Not(HasSubstr("/own")));
    EXPECT_THAT(log, testing::Not(HasSubstr("/srv/data")));
  }
  EXPECT_THAT(Exports(), HasSubstr("/srv/left"));
}

TEST_F(LeftShares, AreWithdrawnIfTheSettingSaysSo) {
  root_.Write("/etc/vorn/platform.conf", "[platform]\nwithdraw_left_shares = yes\n");
  EXPECT_THAT(Check(), HasSubstr("/srv/left is no share any more; its export rules were removed"));
  EXPECT_TRUE(withdrawn_);
  EXPECT_EQ(Exports(), "/srv/data *(rw)\n/own *(ro)\n");
  EXPECT_EQ(Check(), "");
  EXPECT_FALSE(withdrawn_);
}

TEST_F(LeftShares, AreSharesAgainWhenTheyReturn) {
  Check();
  root_.Write(kShares, "[shares]\nback = /srv/left\n");
  EXPECT_THAT(Check(), testing::Not(HasSubstr("/srv/left")));
}

TEST_F(LeftShares, AreForgottenWithTheirRules) {
  root_.Write(kExports, "/own *(ro)\n");
  EXPECT_EQ(Check(), "");
  EXPECT_EQ(root_.Read(kRemembered), "");
}

TEST_F(LeftShares, AreNotConcludedFromAMissingFile) {
  ASSERT_EQ(std::remove(root_.At(kShares).c_str()), 0);
  root_.Write("/etc/vorn/platform.conf", "[platform]\nwithdraw_left_shares = yes\n");
  EXPECT_EQ(Check(), "");
  EXPECT_THAT(Exports(), HasSubstr("/srv/left"));
}

}  // namespace
}  // namespace vorn
