#include "service_control.h"

#include <chrono>
#include <functional>
#include <memory>

#include "call_rights.h"
#include "configuration_lock.h"
#include "live_settings.h"

namespace vorn {
namespace {

constexpr char kQueue[] = "/run/vorn/service-nfsd.lock";

// Longer than a restart may take with all its jobs.
constexpr std::chrono::minutes kQueueLimit{10};

Result<Engine*> EngineOf(Box& box, const std::string& service) {
  if (service != "nfsd") return Status::Failure(kUnknownService, "there is no service \"" + service + "\"");
  return box.engine();
}

Status OperateAlone(Box& box, const std::string& service, const std::function<Status(Engine&)>& operation) {
  const Result<Engine*> engine = EngineOf(box, service);
  if (!engine.ok()) return engine.status();
  if (Status status = CheckMayWrite("the service " + service); !status.ok()) return status;
  const LockPause pause;
  const Result<std::unique_ptr<HeldLock>> turn = box.Lock(kQueue, kQueueLimit);
  return turn.ok() ? operation(**engine) : turn.status();
}

// Records the attempt under the name `action`.
Status Operate(Box& box, const std::string& service, const char* action,
               const std::function<Status(Engine&)>& operation) {
  Status status = OperateAlone(box, service, operation);
  box.NoteAction(action, status);
  return status;
}

// Starts or restarts the service with the transfer sizes that are configured now.
Status BringUp(Box& box, const std::string& service, const char* action, Status (Engine::*operation)()) {
  return Operate(box, service, action, [&](Engine& engine) {
    const Status prepared = PrepareTransferSizes(box);
    return prepared.ok() ? (engine.*operation)() : prepared;
  });
}

}  // namespace

Result<bool> IsServiceEnabled(Box& box, const std::string& service) {
  const Result<Engine*> engine = EngineOf(box, service);
  return engine.ok() ? (*engine)->IsEnabled() : engine.status();
}

Status StartService(Box& box, const std::string& service) { return BringUp(box, service, "start", &Engine::Start); }

Status StopService(Box& box, const std::string& service) {
  return Operate(box, service, "stop", [](Engine& engine) { return engine.Stop(); });
}

Status RestartService(Box& box, const std::string& service) {
  return BringUp(box, service, "restart", &Engine::Restart);
}

Status ReloadService(Box& box, const std::string& service) {
  return Operate(box, service, "reload", [](Engine& engine) { return engine.Reload(); });
}

Status RefreshServiceNames(Box& box, const std::string& service) {
  // Not recorded: a timer does this every few minutes, and it changes no setting.
  return OperateAlone(box, service, [](Engine& engine) { return engine.RefreshNames(); });
}

}  // namespace vorn
