#include "apply_exports.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "call.h"
#include "current_box.h"
#include "kernel_caches.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::AllOf;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr char kTable[] = "/var/lib/nfs/etab";

class ApplyExportsTest : public testing::Test {
 protected:
  Status Apply() {
    return ApplyWith([this](const std::string& name) {
      asked_.push_back(name);
      return addresses_;
    });
  }

  Status ApplyWith(HostResolver resolve) {
    const auto write_rights = [this](const std::string& lines) {
      caches_.Write("nfsd.export", "channel", lines);
      return Status();
    };
    return ApplyExports(CurrentBox(), {caches_.folder(), std::move(resolve), write_rights});
  }

  std::string Table() const { return root_.Read(kTable).value_or(""); }

  TemporaryRoot root_;
  const KernelCaches caches_{root_};
  VORN::CallContext call_{{}};
  std::optional<std::vector<std::string>> addresses_ = std::vector<std::string>{"10.0.0.7"};
  std::vector<std::string> asked_;
};

TEST_F(ApplyExportsTest, WritesTheTable) {
  root_.Write("/etc/exports", "/a 10.0.0.1(rw)\n");
  const Status status = Apply();
  EXPECT_TRUE(status.ok()) << status.reason();
  EXPECT_THAT(Table(), HasSubstr("/a\t10.0.0.1(rw,"));
  EXPECT_THAT(root_.Names("/var/lib/nfs"), ElementsAre(".etab.lock", "etab", "export-lock"));
}

TEST_F(ApplyExportsTest, WithdrawsTheRulesOfAFormerShareAtOnce) {
  root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\n");
  root_.Write("/etc/vorn/platform.conf", "[platform]\nwithdraw_left_shares = yes\n");
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /data\nleft = /left\n");
  root_.Write("/etc/exports", "/data 10.0.0.1(rw)\n/left 10.0.0.1(rw)\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(Table(), HasSubstr("/left\t"));
  root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /data\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(Table(), AllOf(HasSubstr("/data\t"), Not(HasSubstr("/left\t"))));
}

TEST_F(ApplyExportsTest, LeavesATableAloneThatIsAsItShouldBe) {
  root_.Write("/etc/exports", "/a 10.0.0.1(rw)\n");
  root_.Write(kTable, "/a\t10.0.0.1(rw)\n");
  caches_.Fill("nfsd.export", "/a\t10.0.0.1(rw)\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_EQ(Table(), "/a\t10.0.0.1(rw)\n");
  EXPECT_EQ(caches_.Channel("nfsd.export"), "");
}

TEST_F(ApplyExportsTest, HasTheKernelForgetWhatChanged) {
  root_.Write("/etc/exports", "/a 10.0.0.1(ro)\n");
  root_.Write(kTable, "/a\t10.0.0.1(rw)\n");
  caches_.Fill("nfsd.export", "/a\t10.0.0.1(rw)\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(caches_.Channel("nfsd.export"), HasSubstr("10.0.0.1 /a "));
}

TEST_F(ApplyExportsTest, WarnsOfEachFaultyLine) {
  root_.Write("/etc/exports", "/slip *(foo)\n/a 10.0.0.1(rw)\n");
  root_.Write(kTable, "/slip\t*(ro)\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(Table(), AllOf(HasSubstr("/slip\t*(ro)\n"), HasSubstr("/a\t10.0.0.1(rw,")));
  EXPECT_THAT(call_.warnings(), ElementsAre(AllOf(HasSubstr("/etc/exports:1:"), HasSubstr("must be mended"))));
}

TEST_F(ApplyExportsTest, ResolvesANewNameAndRemembersIt) {
  root_.Write("/etc/exports", "/a host(rw)\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(Table(), HasSubstr("/a\t10.0.0.7(rw,"));
  EXPECT_EQ(root_.Read("/var/lib/vorn/export-hosts"), "host 10.0.0.7\n");
  addresses_ = std::nullopt;
  root_.Write("/etc/exports", "/a host(rw)\n/b 10.0.0.1(rw)\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(asked_, ElementsAre("host"));
  EXPECT_THAT(Table(), AllOf(HasSubstr("/a\t10.0.0.7(rw,"), HasSubstr("/b\t10.0.0.1(rw,")));
  EXPECT_THAT(call_.warnings(), IsEmpty());
}

TEST_F(ApplyExportsTest, AppliesTheOtherRulesBeforeItAsksForANameThatMayTakeLong) {
  root_.Write("/etc/exports", "/a host(rw)\n/b 10.0.0.1(rw)\n");
  std::string table;
  const Status status = ApplyWith([&](const std::string&) -> std::optional<std::vector<std::string>> {
    table = Table();
    return std::nullopt;
  });
  EXPECT_TRUE(status.ok());
  EXPECT_THAT(table, HasSubstr("/b\t10.0.0.1(rw,"));
  EXPECT_THAT(call_.warnings(), ElementsAre(HasSubstr("\"host\"")));
}

TEST_F(ApplyExportsTest, AsksAResolverThatDoesNotAnswerOnce) {
  root_.Write("/etc/exports", "/a host(rw) guest(rw) third(rw)\n");
  addresses_ = std::nullopt;
  EXPECT_TRUE(Apply().ok());
  EXPECT_EQ(asked_.size(), 1U);
}

TEST_F(ApplyExportsTest, KnowsAHostThatTheKernelServesByItsName) {
  root_.Write("/etc/exports", "/a host.example(rw)\n/b 10.0.0.1(rw)\n");
  root_.Write(kTable, "/a\thost.example(rw)\n");
  caches_.Fill("auth.unix.ip", "#class IP domain\nnfsd 10.0.0.9 *,host.example\n");
  addresses_ = std::nullopt;
  EXPECT_TRUE(Apply().ok());
  EXPECT_THAT(Table(), AllOf(HasSubstr("/a\t10.0.0.9(rw,"), Not(HasSubstr("host.example"))));
}

TEST_F(ApplyExportsTest, ForgetsANameThatNoRuleHasAnyMore) {
  root_.Write("/etc/exports", "/a 10.0.0.1(rw)\n");
  root_.Write("/var/lib/vorn/export-hosts", "host 10.0.0.7\n");
  EXPECT_TRUE(Apply().ok());
  EXPECT_EQ(root_.Read("/var/lib/vorn/export-hosts"), "");
}

TEST_F(ApplyExportsTest, RefusesATableThatItDoesNotUnderstand) {
  root_.Write("/etc/exports", "/a 10.0.0.1(rw)\n");
  root_.Write(kTable, "nonsense\n");
  EXPECT_EQ(Apply().code(), kSyntax);
  EXPECT_EQ(Table(), "nonsense\n");
}

}  // namespace
}  // namespace vorn
