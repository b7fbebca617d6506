#include <systemd/sd-bus.h>

#include <cstdlib>
#include <fstream>
#include <initializer_list>
#include <map>
#include <utility>

#include "exports.h"
#include "service.h"

namespace vorn {
namespace {

using Clock = std::chrono::steady_clock;

constexpr char kUnit[] = "nfs-server.service";
constexpr char kDestination[] = "org.freedesktop.systemd1";
constexpr char kManagerPath[] = "/org/freedesktop/systemd1";
constexpr char kManager[] = "org.freedesktop.systemd1.Manager";

struct CloseBus {
  void operator()(sd_bus* bus) const { sd_bus_flush_close_unref(bus); }
};
struct UnrefMessage {
  void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
};
using Bus = std::unique_ptr<sd_bus, CloseBus>;
using Message = std::unique_ptr<sd_bus_message, UnrefMessage>;

// What a failed call says; freed with the object.
class BusError {
 public:
  BusError() = default;
  ~BusError() { sd_bus_error_free(&error_); }
  BusError(const BusError&) = delete;
  BusError& operator=(const BusError&) = delete;
  sd_bus_error* get() { return &error_; }
  std::string text(int result) const {
    return error_.message != nullptr ? error_.message : std::string(std::strerror(-result));
  }
  bool is_no_unit() const {
    return sd_bus_error_has_name(&error_, "org.freedesktop.systemd1.NoSuchUnit") > 0 ||
           sd_bus_error_has_name(&error_, "org.freedesktop.systemd1.UnitMasked") > 0;
  }

 private:
  sd_bus_error error_ = SD_BUS_ERROR_NULL;
};

constexpr char kOddAnswer[] = "an answer of another kind";

Status Failed(const std::string& what, const std::string& why, int code = kServiceFailed) {
  return Status::Failure(code, what + ": " + why);
}

Result<Bus> Connect(const std::string& address) {
  sd_bus* connection = nullptr;
  int result = 0;
  if (address.empty()) {
    result = sd_bus_open_system(&connection);
  } else if ((result = sd_bus_new(&connection)) >= 0) {
    sd_bus_set_address(connection, address.c_str());
    sd_bus_set_bus_client(connection, 1);
    result = sd_bus_start(connection);
  }
  Bus bus(connection);
  if (result < 0) return Failed("the system bus", std::strerror(-result));
  return bus;
}

// One conversation with the service manager.
class Manager {
 public:
  static Result<std::unique_ptr<Manager>> Open(const SystemdOptions& options) {
    Result<Bus> bus = Connect(options.bus_address);
    if (!bus.ok()) return bus.status();
    return std::unique_ptr<Manager>(new Manager(std::move(*bus), options.job_limit));
  }

  // The state of a unit's file, as systemctl(1) is-enabled prints it.
  Result<std::string> UnitFileState(const char* unit) {
    const Result<Message> reply = Call("GetUnitFileState", unit, "s", unit);
    if (!reply.ok()) return reply.status();
    const char* state = nullptr;
    if (sd_bus_message_read(reply->get(), "s", &state) < 0) return Failed("GetUnitFileState", kOddAnswer);
    return std::string(state);
  }

  // Has systemd read its files again.
  Status Reload() { return Call("Reload", "", "").status(); }

  Status Enable(const char* unit) { return Call("EnableUnitFiles", unit, "asbb", 1, unit, 0, 1).status(); }
  Status Disable(const char* unit) { return Call("DisableUnitFiles", unit, "asb", 1, unit, 0).status(); }

  // A unit that was never loaded has nothing to forget.
  void ForgetFailure(const char* unit) { static_cast<void>(Call("ResetFailedUnit", unit, "s", unit)); }

  // Starts a job ("StartUnit", "StopUnit", ...) and waits for its end. kUnknownService where there is no such
  // unit, or it is masked.
  Status RunJob(const char* method, const char* unit) {
    if (Status status = WatchJobs(); !status.ok()) return status;
    const Result<Message> reply = Call(method, unit, "ss", unit, "replace");
    if (!reply.ok()) return reply.status();
    const std::string what = Describe(method, unit);
    const char* job = nullptr;
    if (sd_bus_message_read(reply->get(), "o", &job) < 0) return Failed(what, kOddAnswer);
    const Result<std::string> outcome = WaitFor(job);
    if (!outcome.ok()) return Failed(what, outcome.status().reason());
    return *outcome == "done" || *outcome == "skipped" ? Status() : Failed(what, "the job ended as " + *outcome);
  }

 private:
  Manager(Bus bus, std::chrono::seconds job_limit) : bus_(std::move(bus)), job_limit_(job_limit) {}

  static std::string Describe(const std::string& method, const std::string& unit) {
    return unit.empty() ? method : method + " " + unit;
  }

  // `types` and `arguments` as sd_bus_call_method(3) has them; `unit` is for the reason of a failure.
  template <typename... Arguments>
  Result<Message> Call(const char* method, const char* unit, const char* types, Arguments... arguments) {
    BusError error;
    sd_bus_message* reply = nullptr;
    const int result = sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, method, error.get(), &reply,
                                          types, arguments...);
    Message owned(reply);
    if (result >= 0) return owned;
    return Failed(Describe(method, unit), error.text(result), error.is_no_unit() ? kUnknownService : kServiceFailed);
  }

  // Ended jobs are collected from before the first one begins, so that none ends unseen.
  Status WatchJobs() {
    if (watching_) return {};
    const int result = sd_bus_match_signal(bus_.get(), nullptr, kDestination, kManagerPath, kManager, "JobRemoved",
                                           OnJobRemoved, this);
    if (result < 0) return Failed("the system bus", std::strerror(-result));
    Status status = Call("Subscribe", "", "").status();
    watching_ = status.ok();
    return status;
  }

  static int OnJobRemoved(sd_bus_message* message, void* self, sd_bus_error* /*error*/) {
    const char* job = nullptr;
    const char* outcome = nullptr;
    if (sd_bus_message_read(message, "uoss", nullptr, &job, nullptr, &outcome) >= 0) {
      static_cast<Manager*>(self)->ended_[job] = outcome;
    }
    return 0;
  }

  // How the job ended: "done", "failed", "timeout", ...
  Result<std::string> WaitFor(const std::string& job) {
    const auto deadline = Clock::now() + job_limit_;
    for (;;) {
      int result = 0;
      while ((result = sd_bus_process(bus_.get(), nullptr)) > 0) {
      }
      if (result < 0) return Failed("the system bus", std::strerror(-result));
      if (const auto ended = ended_.find(job); ended != ended_.end()) return ended->second;
      const auto left = std::chrono::duration_cast<std::chrono::microseconds>(deadline - Clock::now()).count();
      if (left <= 0) return Failed(job, "no end in sight");
      sd_bus_wait(bus_.get(), static_cast<std::uint64_t>(left));
    }
  }

  Bus bus_;
  std::chrono::seconds job_limit_;
  bool watching_ = false;
  std::map<std::string, std::string> ended_;  // job to outcome
};

class SystemdEngine : public ServiceEngine {
 public:
  explicit SystemdEngine(SystemdOptions options) : options_(std::move(options)) {}

  Result<bool> IsEnabled() override {
    const auto manager = Manager::Open(options_);
    if (!manager.ok()) return manager.status();
    const Result<std::string> state = (*manager)->UnitFileState(kUnit);
    if (!state.ok()) return state.status();
    return *state == "enabled" || *state == "enabled-runtime";
  }

  // Enabled last: one that does not start must not count as switched on, or nobody could switch it on again.
  Status Start() override {
    return With([this](Manager& manager) {
      const Status started = BringUp(manager, "StartUnit");
      return started.ok() ? manager.Enable(kUnit) : started;
    });
  }

  Status Stop() override {
    return With([](Manager& manager) {
      if (Status status = manager.RunJob("StopUnit", kUnit); !status.ok()) return status;
      if (Status status = manager.Disable(kUnit); !status.ok()) return status;
      return manager.Reload();
    });
  }

  Status Restart() override {
    return With([this](Manager& manager) { return BringUp(manager, "RestartUnit"); });
  }

  Status Reload() override {
    if (!HasThreads()) return {};
    const Result<FileStamp> reloaded = ExportsFileStamp();
    if (!reloaded.ok()) return reloaded.status();
    const Status status = With([](Manager& manager) { return manager.RunJob("ReloadUnit", kUnit); });
    return status.ok() ? CheckExportTable(*reloaded) : status;
  }

 private:
  template <typename Steps>
  Status With(const Steps& steps) {
    const auto manager = Manager::Open(options_);
    return manager.ok() ? steps(**manager) : manager.status();
  }

  Status BringUp(Manager& manager, const char* method) {
    // Its files may have changed since systemd read them.
    if (Status status = manager.Reload(); !status.ok()) return status;
    // A handful of quick restarts makes systemd refuse further ones for good.
    for (const char* unit : {"nfs-idmapd.service", "nfs-mountd.service", kUnit}) manager.ForgetFailure(unit);
    if (Status status = MoveStatusDaemon(manager); !status.ok()) return status;
    if (Status status = manager.RunJob(method, kUnit); !status.ok()) return status;
    return HasThreads() ? Status() : Failed(kUnit, "it started, but the kernel's server has no threads");
  }

  // It alone takes new ports, for itself and for the lock manager. Where it does not run it will be started with
  // the service; a box for NFSv4 alone may have masked it.
  static Status MoveStatusDaemon(Manager& manager) {
    const Status status = manager.RunJob("TryRestartUnit", "rpc-statd.service");
    return status.code() == kUnknownService ? Status() : status;
  }

  // The unit counts as active even when the kernel serves nobody.
  bool HasThreads() const {
    int threads = 0;
    std::ifstream(options_.threads_file) >> threads;
    return threads > 0;
  }

  const SystemdOptions options_;
};

}  // namespace

std::unique_ptr<ServiceEngine> MakeSystemdEngine(SystemdOptions options) {
  return std::make_unique<SystemdEngine>(std::move(options));
}

}  // namespace vorn
