#include "name_changes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "current_box.h"
#include "kernel_caches.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

constexpr char kTable[] = "/var/lib/nfs/etab";

class NameChanges : public testing::Test {
 protected:
  NameChanges() {
    root_.Write("/etc/exports", "/a host(rw)\n/b @group(rw)\n");
    EXPECT_TRUE(ApplyExports(CurrentBox(), Environment()).ok());
    Apply();
    caches_.Write("auth.unix.ip", "flush", "");
  }

  ExportsEnvironment Environment() {
    return {caches_.folder(), [this](const std::string&) { return addresses_; },
            [](const std::string&) { return Status(); }};
  }

  void Apply() {
    const auto read_netgroup = [this](const std::string& name) { return name == "group" ? members_ : "?"; };
    const Status status = ApplyNameChanges(CurrentBox(), Environment(), read_netgroup);
    EXPECT_TRUE(status.ok()) << status.reason();
  }

  std::string Table() const { return root_.Read(kTable).value_or(""); }
  bool IsFlushed() const { return caches_.IsFlushed("auth.unix.ip"); }

  TemporaryRoot root_;
  const KernelCaches caches_{root_};
  std::optional<std::vector<std::string>> addresses_ = std::vector<std::string>{"10.0.0.7"};
  std::string members_ = "(client,)";
};

TEST_F(NameChanges, MoveTheRightToTheNewAddress) {
  addresses_ = {"10.0.0.8"};
  Apply();
  EXPECT_THAT(Table(), AllOf(HasSubstr("/a\t10.0.0.8(rw"), Not(HasSubstr("10.0.0.7"))));
}

TEST_F(NameChanges, ChangeNothingWhereNothingChanged) {
  const std::string before = Table();
  Apply();
  EXPECT_EQ(Table(), before);
  EXPECT_FALSE(IsFlushed());
}

TEST_F(NameChanges, TakeNothingWhileTheResolverIsAwayOrForgetsAName) {
  for (const auto& answer : {std::optional<std::vector<std::string>>(), {std::vector<std::string>()}}) {
    addresses_ = answer;
    Apply();
    EXPECT_THAT(Table(), HasSubstr("/a\t10.0.0.7(rw"));
  }
}

TEST_F(NameChanges, HaveTheKernelAskAgainWhoIsInANetgroup) {
  members_ = "(other,)";
  Apply();
  EXPECT_TRUE(IsFlushed());
}

TEST_F(NameChanges, FailWithATableThatIsNotUnderstood) {
  root_.Write(kTable, "nonsense\n");
  const Status status = ApplyNameChanges(CurrentBox(), Environment(), [](const std::string&) { return ""; });
  EXPECT_EQ(status.code(), kSyntax);
  EXPECT_EQ(Table(), "nonsense\n");
}

}  // namespace
}  // namespace vorn
