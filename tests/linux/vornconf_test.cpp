#include <gtest/gtest.h>

#include <cerrno>
#include <memory>

#include "captured_log.h"
#include "configuration_lock.h"
#include "core.h"
#include "current_box.h"
#include "processes.h"
#include "temporary_root.h"

namespace vorn {
namespace {

TEST(VornConf, KeepsOtherProcessesOutWhileAnyOfItsObjectsLives) {
  const TemporaryRoot root;
  ChildProcess writer([&] {
    if (!Eventually([&] { return root.Read("/go").has_value(); })) return 1;
    const VornConf configuration;
    root.Write("/written", "");
    return 0;
  });
  auto outer = std::make_unique<VornConf>();
  auto inner = std::make_unique<VornConf>();
  root.Write("/go", "");
  outer.reset();
  EXPECT_FALSE(root.Read("/written").has_value());
  inner.reset();
  EXPECT_EQ(writer.Wait(), 0);
  EXPECT_TRUE(root.Read("/written").has_value());
}

TEST(VornConf, NestsWithTheLockOfThePlatform) {
  const TemporaryRoot root;
  const VornConf configuration;
  const ConfigurationLock lock(CurrentBox());
  EXPECT_TRUE(lock.status().ok());
}

TEST(VornConf, ThatCannotBeTakenLivesAndLeavesTheReason) {
  const TemporaryRoot root;
  root.Write("/run", "a file where a folder must be");
  TakeLog();
  const VornConf configuration;
  EXPECT_EQ(KLIBCErrGet(), ENOTDIR);
  EXPECT_EQ(TakeLog().size(), 1U);
}

}  // namespace
}  // namespace vorn
