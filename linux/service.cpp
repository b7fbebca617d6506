#include "service.h"

#include <functional>
#include <string_view>

#include "core.h"
#include "error.h"
#include "file_lock.h"
#include "live.h"
#include "lock.h"
#include "root.h"
#include "settings.h"

namespace vorn {

namespace {

// The one that the settings of the current root ask for.
Result<std::unique_ptr<ServiceEngine>> EngineOf(std::string_view service) {
  if (service != "nfsd")
    return Status::Failure(kUnknownService, "there is no service \"" + std::string(service) + "\"");
  const Result<Settings> settings = Settings::Load();
  if (!settings.ok()) return settings.status();
  return settings->engine == Settings::Engine::kSystemd ? MakeSystemdEngine() : MakeLocalEngine();
}

// One operation at a time, over all threads and processes. Nobody waits for it with the
// configuration: that is let go until the operation is done.
Status Operate(std::string_view service, const std::function<Status(ServiceEngine&)>& operation) {
  const Result<std::unique_ptr<ServiceEngine>> engine = EngineOf(service);
  if (!engine.ok()) return engine.status();
  const LockPause pause;
  const Result<FileDescriptor> turn = TakeFileLock(Root::Current(), "/run/vorn/service-nfsd.lock");
  return turn.ok() ? operation(**engine) : turn.status();
}

Result<bool> IsEnabled(std::string_view service) {
  const Result<std::unique_ptr<ServiceEngine>> engine = EngineOf(service);
  return engine.ok() ? (*engine)->IsEnabled() : engine.status();
}

// A service that starts takes the transfer sizes that are configured.
Status Start(ServiceEngine& engine) {
  const Status prepared = PrepareTransferSizes();
  return prepared.ok() ? engine.Start() : prepared;
}

Status Restart(ServiceEngine& engine) {
  const Status prepared = PrepareTransferSizes();
  return prepared.ok() ? engine.Restart() : prepared;
}

}  // namespace
}  // namespace vorn

using vorn::Operate;
using vorn::ServiceEngine;
using vorn::ToResult;

int KLIBServiceIsEnabled(const char* service) {
  const vorn::Result<bool> enabled = vorn::IsEnabled(service);
  if (!enabled.ok()) return ToResult(enabled.status());
  return *enabled ? 1 : 0;
}

int KLIBServiceStart(const char* service, int /*flags*/) { return ToResult(Operate(service, vorn::Start)); }

int KLIBServiceStop(const char* service, int /*flags*/) {
  return ToResult(Operate(service, [](ServiceEngine& engine) { return engine.Stop(); }));
}

int KLIBServiceRestart(const char* service) { return ToResult(Operate(service, vorn::Restart)); }

int KLIBServiceReload(const char* service) {
  return ToResult(Operate(service, [](ServiceEngine& engine) { return engine.Reload(); }));
}
