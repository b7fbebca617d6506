#include <gmock/gmock.h>

#include <atomic>
#include <cstdlib>
#include <thread>

#include "captured_log.h"
#include "configuration_lock.h"
#include "core.h"
#include "current_box.h"
#include "file_lock.h"
#include "root.h"
#include "stand_in_manager.h"

namespace {

using testing::ElementsAre;

constexpr char kQueue[] = "/run/vorn/service-nfsd.lock";
constexpr char kDropIn[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";

std::string TakeLogTexts() {
  std::string all;
  for (const LogLine& line : TakeLog()) all += line.text + "\n";
  return all;
}

TEST(Service, IsOffUntilItIsStartedAndAgainOnceItIsStopped) {
  const TemporaryRoot root;
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 0);
  EXPECT_EQ(KLIBServiceStart("nfsd", 0), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 1);
  EXPECT_EQ(KLIBServiceRestart("nfsd"), 0);
  EXPECT_EQ(KLIBServiceReload("nfsd"), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 1);
  EXPECT_EQ(KLIBServiceStop("nfsd", 0), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 0);
}

TEST(Service, SaysOnATrialRootWhatWouldHaveBeenDone) {
  const struct {
    int (*operation)();
    const char* log;
  } cases[] = {{[] { return KLIBServiceStart("nfsd", 0); }, "enabled and started"},
               {[] { return KLIBServiceStop("nfsd", 0); }, "stopped and disabled"},
               {[] { return KLIBServiceRestart("nfsd"); }, "restarted"},
               {[] { return KLIBServiceReload("nfsd"); }, "reloaded"}};
  const TemporaryRoot root;
  for (const auto& c : cases) {
    TakeLog();
    EXPECT_EQ(c.operation(), 0) << c.log;
    EXPECT_EQ(TakeLogTexts(),
              std::string("nfs-server.service would be ") + c.log + ": this root is no booted system\n");
  }
}

TEST(Service, ThatIsUnknownFails) {
  const TemporaryRoot root;
  for (const char* name : {"", "nfs", "NFSD", "nfs-server.service", "../nfsd"}) {
    const int results[] = {KLIBServiceIsEnabled(name), KLIBServiceStart(name, 0), KLIBServiceStop(name, 0),
                           KLIBServiceRestart(name), KLIBServiceReload(name)};
    EXPECT_THAT(results, testing::Each(testing::Lt(0))) << name;
    EXPECT_EQ(KLIBCErrGet(), vorn::kUnknownService) << name;
  }
}

TEST(Service, FailsWhereItsSettingsCannotBeUnderstood) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = maybe\n");
  EXPECT_LT(KLIBServiceIsEnabled("nfsd"), 0);
  EXPECT_LT(KLIBServiceStart("nfsd", 0), 0);
  EXPECT_EQ(KLIBCErrGet(), vorn::kSyntax);
}

TEST(Service, FailsWhereItsStateCannotBeKept) {
  const TemporaryRoot root;
  root.Write("/var/lib/vorn", "a file, and no folder");
  EXPECT_LT(KLIBServiceStart("nfsd", 0), 0);
  EXPECT_LT(KLIBServiceIsEnabled("nfsd"), 0);
}

TEST(Service, IsPreparedForTheConfiguredSizesBeforeItComesUp) {
  for (const bool restart : {false, true}) {
    const TemporaryRoot root;
    EXPECT_EQ(restart ? KLIBServiceRestart("nfsd") : KLIBServiceStart("nfsd", 0), 0);
    EXPECT_TRUE(root.Read(kDropIn).has_value());
  }
}

TEST(Service, DoesNotComeUpUnprepared) {
  const TemporaryRoot root;
  root.Write("/etc/systemd", "a file, and no folder");
  TakeLog();
  EXPECT_LT(KLIBServiceStart("nfsd", 0), 0);
  EXPECT_LT(KLIBServiceRestart("nfsd"), 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 0);
  EXPECT_THAT(TakeLogTexts(), testing::Not(testing::HasSubstr("would be")));
}

// An operation that waits in the service queue behind another process.
class WaitingOperation : public testing::Test {
 protected:
  WaitingOperation() {
    EXPECT_TRUE(Eventually([this] { return root_.Read("/taken").has_value(); }));
    thread_ = std::thread([this] {
      const VornConf configuration;
      has_configuration_ = true;
      result_ = KLIBServiceStart("nfsd", 0);
      root_.Write("/started", "");
    });
  }
  ~WaitingOperation() override {
    if (thread_.joinable()) Release();
  }

  void Release() {
    root_.Write("/go", "");
    thread_.join();
  }

  const TemporaryRoot root_;
  ChildProcess other_{[this] {
    const auto turn = vorn::TakeFileLock(vorn::Root::Current(), kQueue, std::chrono::minutes(1));
    root_.Write("/taken", "");
    return turn.ok() && Eventually([this] { return root_.Read("/go").has_value(); }) ? 0 : 1;
  }};
  std::atomic<bool> has_configuration_{false};
  int result_ = -1;
  std::thread thread_;
};

TEST_F(WaitingOperation, LetsOthersHaveTheConfigurationAndIsDoneInItsTurn) {
  ASSERT_TRUE(Eventually([this] { return has_configuration_.load(); }));
  {
    const vorn::ConfigurationLock ours(vorn::CurrentBox());  // never, unless the operation lets go of it
    EXPECT_TRUE(ours.status().ok());
    EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 0);
    EXPECT_FALSE(root_.Read("/started").has_value());
  }
  Release();
  EXPECT_EQ(result_, 0);
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 1);
  EXPECT_EQ(other_.Wait(), 0);
}

TEST(ServiceOfABox, IsSystemds) {
  StandInManager manager;
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = systemd\n");
  setenv("DBUS_SYSTEM_BUS_ADDRESS", manager.address().c_str(), 1);
  manager.SetUnitFileState("enabled");
  EXPECT_EQ(KLIBServiceIsEnabled("nfsd"), 1);
  EXPECT_EQ(KLIBServiceStop("nfsd", 0), 0);
  unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
  EXPECT_THAT(manager.TakeCalls(),
              ElementsAre("GetUnitFileState nfs-server.service", "Subscribe", "StopUnit nfs-server.service replace",
                          "DisableUnitFiles nfs-server.service", "Reload"));
}

}  // namespace
