#include <gmock/gmock.h>

#include "current_box.h"
#include "engines.h"
#include "kernel_caches.h"
#include "stand_in_manager.h"

namespace {

using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using vorn::Status;

class SystemdEngine : public testing::Test {
 protected:
  SystemdEngine() { SetThreads("8\n"); }

  void SetThreads(const char* text) { folder_.Write("/threads", text); }

  std::unique_ptr<vorn::Engine> Engine() {
    vorn::SystemdOptions options;
    options.bus_address = manager_.address();
    options.threads_file = folder_.At("/threads");
    options.job_limit = std::chrono::seconds(limit_);
    options.exports.kernel_caches = caches_.folder();
    return vorn::MakeSystemdEngine(vorn::CurrentBox(), options);
  }

  StandInManager manager_;
  TemporaryRoot folder_;
  const KernelCaches caches_{folder_};
  int limit_ = 60;
};

const std::vector<std::string> kBringUp = {"Reload",
                                           "ResetFailedUnit nfs-idmapd.service",
                                           "ResetFailedUnit nfs-mountd.service",
                                           "ResetFailedUnit rpc-statd.service",
                                           "ResetFailedUnit nfs-server.service",
                                           "Subscribe",
                                           "TryRestartUnit rpc-statd.service replace"};

std::vector<std::string> Joined(std::vector<std::string> a, const std::vector<std::string>& b) {
  a.insert(a.end(), b.begin(), b.end());
  return a;
}

TEST_F(SystemdEngine, CountsAnEnabledUnitAsEnabled) {
  for (const auto& [state, enabled] : std::vector<std::pair<const char*, bool>>{
           {"enabled", true}, {"enabled-runtime", true}, {"disabled", false}, {"masked", false}, {"static", false}}) {
    manager_.SetUnitFileState(state);
    const auto answer = Engine()->IsEnabled();
    ASSERT_TRUE(answer.ok()) << answer.status().reason();
    EXPECT_EQ(*answer, enabled) << state;
  }
}

TEST_F(SystemdEngine, StartsAndThenEnables) {
  const Status status = Engine()->Start();
  EXPECT_TRUE(status.ok()) << status.reason();
  EXPECT_THAT(manager_.TakeCalls(), ElementsAreArray(Joined(kBringUp, {"StartUnit nfs-server.service replace",
                                                                       "EnableUnitFiles nfs-server.service"})));
}

TEST_F(SystemdEngine, DoesNotEnableWhatDoesNotStart) {
  manager_.End("StartUnit nfs-server.service", "failed");
  EXPECT_FALSE(Engine()->Start().ok());
  EXPECT_THAT(manager_.TakeCalls(), testing::Not(testing::Contains("EnableUnitFiles nfs-server.service")));
}

TEST_F(SystemdEngine, StopsAndDisables) {
  EXPECT_TRUE(Engine()->Stop().ok());
  EXPECT_THAT(manager_.TakeCalls(), ElementsAre("Subscribe", "StopUnit nfs-server.service replace",
                                                "DisableUnitFiles nfs-server.service", "Reload"));
}

TEST_F(SystemdEngine, ForgetsOldFailuresAndMovesTheStatusDaemonBeforeARestart) {
  EXPECT_TRUE(Engine()->Restart().ok());
  EXPECT_THAT(manager_.TakeCalls(), ElementsAreArray(Joined(kBringUp, {"RestartUnit nfs-server.service replace"})));
}

TEST_F(SystemdEngine, StopsTheServerWhereItsLockManagerHasThePortOfTheStatusDaemon) {
  manager_.End("TryRestartUnit rpc-statd.service", "failed");
  const Status status = Engine()->Restart();
  EXPECT_TRUE(status.ok()) << status.reason();
  EXPECT_THAT(manager_.TakeCalls(),
              ElementsAreArray(
                  Joined(kBringUp, {"StopUnit nfs-server.service replace", "ResetFailedUnit rpc-statd.service",
                                    "StartUnit rpc-statd.service replace", "RestartUnit nfs-server.service replace"})));
}

TEST_F(SystemdEngine, NamesThePortsThatMayKeepTheServiceFromStarting) {
  folder_.Write("/etc/nfs.conf",
                "[vorn]\ncustom-ports = y\n[statd]\nport = 4001\n[lockd]\nport = 4002\nudp-port = 4002\n");
  manager_.End("TryRestartUnit rpc-statd.service", "failed");
  manager_.End("StartUnit rpc-statd.service", "failed");
  EXPECT_THAT(Engine()->Restart().reason(),
              HasSubstr("StartUnit rpc-statd.service: the job ended as failed; check the ports: statd_port = 4001, "
                        "nlm_port = 4002"));
  manager_.End("StartUnit rpc-statd.service", "done");
  SetThreads("0\n");
  EXPECT_THAT(Engine()->Restart().reason(), HasSubstr("no threads; check the ports: statd_port = 4001"));
}

TEST_F(SystemdEngine, NeedsNoStatusDaemon) {
  for (const char* error : {"NoSuchUnit", "UnitMasked"}) {
    manager_.Refuse("TryRestartUnit rpc-statd.service", error);
    const Status status = Engine()->Start();
    EXPECT_TRUE(status.ok()) << error << ": " << status.reason();
  }
}

TEST_F(SystemdEngine, FailsWithoutTheServersUnit) {
  manager_.Refuse("RestartUnit nfs-server.service", "NoSuchUnit");
  EXPECT_THAT(Engine()->Restart().reason(), HasSubstr("RestartUnit nfs-server.service is refused"));
}

TEST_F(SystemdEngine, AppliesTheRulesWithoutTheUnit) {
  folder_.Write("/etc/exports", "/volume1/data 10.0.0.1(rw)\n");
  const Status status = Engine()->Reload();
  EXPECT_TRUE(status.ok()) << status.reason();
  EXPECT_THAT(*folder_.Read("/var/lib/nfs/etab"), HasSubstr("/volume1/data\t10.0.0.1(rw,"));
  EXPECT_THAT(manager_.TakeCalls(), ElementsAre());
}

TEST_F(SystemdEngine, HasAUnitOutsideOfItsNamespaceExpireTheRights) {
  caches_.Fill("nfsd.export", "/volume1/data\t10.0.0.1(ro)\n");
  folder_.Write("/var/lib/nfs/etab", "/volume1/data\t10.0.0.1(ro)\n");
  folder_.Write("/etc/exports", "/volume1/data 10.0.0.1(rw)\n");
  EXPECT_TRUE(Engine()->Reload().ok());
  EXPECT_THAT(manager_.TakeCalls(), ElementsAre("Subscribe", "StartUnit vorn-nfs-forget.service replace"));
  EXPECT_THAT(*folder_.Read("/run/vorn/expired-rights"), HasSubstr("10.0.0.1 /volume1/data "));
  EXPECT_FALSE(caches_.IsFlushed("nfsd.export"));
}

TEST_F(SystemdEngine, FlushesAllRightsWhereThatUnitFails) {
  manager_.End("StartUnit vorn-nfs-forget.service", "failed");
  caches_.Fill("nfsd.export", "/volume1/data\t10.0.0.1(ro)\n");
  folder_.Write("/etc/exports", "/volume1/data 10.0.0.1(rw)\n");
  EXPECT_TRUE(Engine()->Reload().ok());
  EXPECT_TRUE(caches_.IsFlushed("nfsd.export"));
}

TEST_F(SystemdEngine, AppliesWhatExportfsIgnoredAfterAStart) {
  folder_.Write("/etc/exports", "/slip *(foo)\n/volume1/data 10.0.0.1(rw)\n");
  EXPECT_TRUE(Engine()->Start().ok());
  EXPECT_THAT(*folder_.Read("/var/lib/nfs/etab"), HasSubstr("/volume1/data\t10.0.0.1(rw,"));
}

TEST_F(SystemdEngine, HasNothingToReloadWhileTheKernelServerIsOff) {
  SetThreads("0\n");
  EXPECT_TRUE(Engine()->Reload().ok());
  EXPECT_THAT(manager_.TakeCalls(), ElementsAre());
}

TEST_F(SystemdEngine, FailsWhenTheUnitStartsButTheKernelServerIsOff) {
  SetThreads("0\n");
  const Status status = Engine()->Start();
  EXPECT_EQ(status.code(), vorn::kServiceFailed);
  EXPECT_THAT(status.reason(), HasSubstr("no threads"));
  EXPECT_THAT(manager_.TakeCalls(), testing::Not(testing::Contains("EnableUnitFiles nfs-server.service")));
}

TEST_F(SystemdEngine, RestartsAUnitThatMayBeActiveWithoutThreadsAndLeavesNoneActive) {
  SetThreads("0\n");
  EXPECT_FALSE(Engine()->Start().ok());
  EXPECT_THAT(manager_.TakeCalls(), ElementsAreArray(Joined(kBringUp, {"RestartUnit nfs-server.service replace",
                                                                       "StopUnit nfs-server.service replace"})));
}

TEST_F(SystemdEngine, FailsWithTheNameOfTheJobAndItsOutcome) {
  for (const char* outcome : {"failed", "timeout", "dependency", "canceled"}) {
    manager_.End("RestartUnit nfs-server.service", outcome);
    const Status status = Engine()->Restart();
    EXPECT_EQ(status.code(), vorn::kServiceFailed);
    EXPECT_THAT(status.reason(), HasSubstr(std::string("RestartUnit nfs-server.service: the job ended as ") + outcome));
  }
}

TEST_F(SystemdEngine, HasATimeLimitForAJob) {
  limit_ = 0;
  manager_.End("StopUnit nfs-server.service", "never");
  EXPECT_THAT(Engine()->Stop().reason(), HasSubstr("it did not end in time"));
}

TEST_F(SystemdEngine, StopsWhereACallIsRefused) {
  for (const char* call :
       {"EnableUnitFiles nfs-server.service", "StartUnit nfs-server.service", "Reload", "Subscribe"}) {
    StandInManager manager;
    manager.Refuse(call);
    vorn::SystemdOptions options;
    options.bus_address = manager.address();
    options.threads_file = folder_.At("/threads");
    const Status status = vorn::MakeSystemdEngine(vorn::CurrentBox(), options)->Start();
    EXPECT_EQ(status.code(), vorn::kServiceFailed) << call;
    EXPECT_THAT(status.reason(), HasSubstr("is refused")) << call;
    const std::vector<std::string> calls = manager.TakeCalls();
    ASSERT_FALSE(calls.empty()) << call;
    EXPECT_THAT(calls.back(), HasSubstr(call)) << call;
  }
}

TEST_F(SystemdEngine, IsNotStoppedByAnOldFailureThatCannotBeForgotten) {
  manager_.Refuse("ResetFailedUnit nfs-idmapd.service");
  EXPECT_TRUE(Engine()->Start().ok());
}

TEST_F(SystemdEngine, SaysThatThereIsNoBus) {
  vorn::SystemdOptions options;
  options.bus_address = "unix:path=" + folder_.At("/nobody");
  EXPECT_THAT(vorn::MakeSystemdEngine(vorn::CurrentBox(), options)->IsEnabled().status().reason(),
              HasSubstr("the system bus"));
}

}  // namespace
