#include <systemd/sd-bus.h>

#include <cstdlib>
#include <fstream>
#include <initializer_list>
#include <map>
#include <mutex>
#include <optional>
#include <utility>
#include <vector>

#include "configured_ports.h"
#include "engines.h"
#include "name_changes.h"
#include "owned.h"
#include "state_file.h"

namespace vorn {
namespace {

using Clock = std::chrono::steady_clock;

constexpr char kUnit[] = "nfs-server.service";
constexpr char kStatusDaemon[] = "rpc-statd.service";
constexpr char kExpiredRights[] = "/run/vorn/expired-rights";
constexpr char kDestination[] = "org.freedesktop.systemd1";
constexpr char kManagerPath[] = "/org/freedesktop/systemd1";
constexpr char kManager[] = "org.freedesktop.systemd1.Manager";

using Bus = Owned<sd_bus, sd_bus_flush_close_unref>;
using Message = Owned<sd_bus_message, sd_bus_message_unref>;

// The error of a failed call.
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

constexpr char kUnexpectedReply[] = "the reply has an unexpected type";

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

// One connection to the service manager.
class Manager {
 public:
  static Result<std::unique_ptr<Manager>> Open(const SystemdOptions& options) {
    Result<Bus> bus = Connect(options.bus_address);
    if (!bus.ok()) return bus.status();
    return std::unique_ptr<Manager>(new Manager(std::move(*bus), options.job_limit));
  }

  // The state of a unit file, as "systemctl is-enabled" prints it.
  Result<std::string> UnitFileState(const char* unit) {
    const Result<Message> reply = Call("GetUnitFileState", unit, "s", unit);
    if (!reply.ok()) return reply.status();
    const char* state = nullptr;
    if (sd_bus_message_read(reply->get(), "s", &state) < 0) return Failed("GetUnitFileState", kUnexpectedReply);
    return std::string(state);
  }

  // Makes systemd read its unit files again.
  Status Reload() { return Call("Reload", "", "").status(); }

  Status Enable(const char* unit) { return Call("EnableUnitFiles", unit, "asbb", 1, unit, 0, 1).status(); }
  Status Disable(const char* unit) { return Call("DisableUnitFiles", unit, "asb", 1, unit, 0).status(); }

  // A unit that is not loaded has no failure to reset; that error is ignored.
  void ForgetFailure(const char* unit) { static_cast<void>(Call("ResetFailedUnit", unit, "s", unit)); }

  // Starts a job ("StartUnit", "StopUnit", ...) and waits for its end. kUnknownService where there is no such
  // unit, or it is masked.
  Status RunJob(const char* method, const char* unit) {
    if (Status status = WatchJobs(); !status.ok()) return status;
    const Result<Message> reply = Call(method, unit, "ss", unit, "replace");
    if (!reply.ok()) return reply.status();
    const std::string what = Describe(method, unit);
    const char* job = nullptr;
    if (sd_bus_message_read(reply->get(), "o", &job) < 0) return Failed(what, kUnexpectedReply);
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

  // Subscribes to the end of jobs. This happens before the first job is started, so that its end is not missed.
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

  // The result of a job: "done", "failed", "timeout", ...
  Result<std::string> WaitFor(const std::string& job) {
    const auto deadline = Clock::now() + job_limit_;
    for (;;) {
      int result = 0;
      while ((result = sd_bus_process(bus_.get(), nullptr)) > 0) {
      }
      if (result < 0) return Failed("the system bus", std::strerror(-result));
      if (const auto ended = ended_.find(job); ended != ended_.end()) return ended->second;
      const auto left = std::chrono::duration_cast<std::chrono::microseconds>(deadline - Clock::now()).count();
      if (left <= 0) return Failed(job, "it did not end in time");
      sd_bus_wait(bus_.get(), static_cast<std::uint64_t>(left));
    }
  }

  Bus bus_;
  std::chrono::seconds job_limit_;
  bool watching_ = false;
  std::map<std::string, std::string> ended_;  // job to outcome
};

class SystemdEngine : public Engine {
 public:
  SystemdEngine(Box& box, SystemdOptions options) : box_(box), options_(std::move(options)) {
    if (options_.exports.write_rights) return;
    options_.exports.write_rights = [this](const std::string& lines) { return WriteRights(lines); };
  }

  Result<bool> IsEnabled() override {
    const Result<Folders> folders = ReadUnitFolders();
    if (!folders.ok()) return folders.status();
    const std::lock_guard lock(mutex_);
    const bool is_comparable = folders->front()->version.exists;
    if (is_comparable && enabled_ && folders_ == *folders) return *enabled_;
    Result<bool> enabled = AskIsEnabled();
    if (!enabled.ok()) return enabled;
    folders_ = *folders;
    enabled_ = *enabled;
    return enabled;
  }

  // The unit is enabled last: a service that does not start must not count as enabled, because switching it on
  // would then do nothing.
  //
  // StartUnit does nothing with an active unit, which may have no threads.
  Status Start() override {
    return With([this](Manager& manager) {
      const Status started = BringUp(manager, HasThreads() ? "StartUnit" : "RestartUnit");
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

  Status Reload() override { return HasThreads() ? ApplyExports(box_, options_.exports) : Status(); }

  Status RefreshNames() override {
    return HasThreads() ? ApplyNameChanges(box_, options_.exports, ReadNetgroup) : Status();
  }

  Status RehearseRules(Box& draft, bool starts) override {
    return starts || HasThreads() ? RehearseExports(draft) : Status();
  }

 private:
  using Folders = std::vector<std::shared_ptr<const StoredFolder>>;

  // The folders in which systemctl(1) enables, disables or masks the unit. The box returns the same object for a
  // folder that has not changed, so comparing them tells whether the unit file's state can have changed.
  Result<Folders> ReadUnitFolders() {
    Folders folders;
    for (const char* path : {"/etc/systemd/system", "/etc/systemd/system/multi-user.target.wants",
                             "/run/systemd/system", "/run/systemd/system/multi-user.target.wants"}) {
      Result<std::shared_ptr<const StoredFolder>> folder = box_.List(path);
      if (!folder.ok()) return folder.status();
      folders.push_back(std::move(*folder));
    }
    return folders;
  }

  Result<bool> AskIsEnabled() {
    const auto manager = Manager::Open(options_);
    if (!manager.ok()) return manager.status();
    const Result<std::string> state = (*manager)->UnitFileState(kUnit);
    if (!state.ok()) return state.status();
    return *state == "enabled" || *state == "enabled-runtime";
  }

  // vornd.service has a mount namespace of its own, so a unit without one writes the lines.
  Status WriteRights(const std::string& lines) {
    if (Status status = StoreState(box_, kExpiredRights, lines); !status.ok()) return status;
    return With([](Manager& manager) { return manager.RunJob("StartUnit", "vorn-nfs-forget.service"); });
  }

  template <typename Steps>
  Status With(const Steps& steps) {
    const auto manager = Manager::Open(options_);
    return manager.ok() ? steps(**manager) : manager.status();
  }

  Status BringUp(Manager& manager, const char* method) {
    // The unit files may have changed since systemd read them.
    if (Status status = manager.Reload(); !status.ok()) return status;
    // After a few quick restarts systemd refuses further ones until the failure is reset.
    for (const char* unit : {"nfs-idmapd.service", "nfs-mountd.service", kStatusDaemon, kUnit}) {
      manager.ForgetFailure(unit);
    }
    if (Status status = RestartStatusDaemon(manager); !status.ok()) return WithPorts(status);
    if (Status status = manager.RunJob(method, kUnit); !status.ok()) return WithPorts(status);
    if (!HasThreads()) {
      static_cast<void>(manager.RunJob("StopUnit", kUnit));  // a unit that is active would claim to serve
      return WithPorts(Failed(kUnit, "it started, but the kernel's server has no threads"));
    }
    // exportfs(8), which the unit runs, ignores what follows a faulty line, and hosts that it cannot resolve.
    return ApplyExports(box_, options_.exports);
  }

  // Only a restart of rpc.statd(8) applies new ports of the status daemon and the lock manager. A daemon that does
  // not run is started with the service; a box for NFSv4 only may have masked its unit.
  //
  // The lock manager keeps its old port until the kernel's server stops. If rpc.statd is to have that port, it fails
  // to start until then.
  static Status RestartStatusDaemon(Manager& manager) {
    const Status status = manager.RunJob("TryRestartUnit", kStatusDaemon);
    if (status.ok() || status.code() == kUnknownService) return {};
    if (Status stopped = manager.RunJob("StopUnit", kUnit); !stopped.ok()) return stopped;
    manager.ForgetFailure(kStatusDaemon);
    return manager.RunJob("StartUnit", kStatusDaemon);
  }

  // Adds the ports that the daemons are configured to use, because a port that they cannot have is the most likely
  // reason of a failed start.
  Status WithPorts(const Status& failure) {
    const Result<std::vector<ConfiguredPort>> ports = ReadConfiguredPorts(box_);
    if (!ports.ok()) return failure;
    std::string sentence;
    for (const ConfiguredPort& port : *ports) {
      const char* setting = port.service == "nfs_statd" ? "statd_port" : port.service == "nfs_nlm" ? "nlm_port" : "";
      if (*setting != 0)
        sentence += std::string(sentence.empty() ? "" : ", ") + setting + " = " + std::to_string(port.port);
    }
    if (sentence.empty()) return failure;
    return Status::Failure(failure.code(), failure.reason() + "; check the ports: " + sentence);
  }

  // The unit counts as active even while the kernel's server has no threads.
  bool HasThreads() const {
    int threads = 0;
    std::ifstream(options_.threads_file) >> threads;
    return threads > 0;
  }

  Box& box_;
  SystemdOptions options_;
  std::mutex mutex_;
  Folders folders_;              // when enabled_ was asked for
  std::optional<bool> enabled_;  // by systemd
};

}  // namespace

std::unique_ptr<Engine> MakeSystemdEngine(Box& box, SystemdOptions options) {
  return std::make_unique<SystemdEngine>(box, std::move(options));
}

}  // namespace vorn
