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

 private:
  sd_bus_error error_ = SD_BUS_ERROR_NULL;
};

Status Failed(const std::string& what, const std::string& why) {
  return Status::Failure(kServiceFailed, what + ": " + why);
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

  // Calls a method that answers with one text.
  Result<std::string> Ask(const char* method, const char* argument) {
    BusError error;
    sd_bus_message* reply = nullptr;
    const int result = sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, method, error.get(), &reply,
                                          "s", argument);
    const Message owned(reply);
    if (result < 0) return Failed(std::string(method) + " " + argument, error.text(result));
    const char* text = nullptr;
    // A unit's state is a text, a unit itself an object path.
    if (sd_bus_message_read(reply, "s", &text) < 0 && sd_bus_message_read(reply, "o", &text) < 0) {
      return Failed(method, "an answer of another kind");
    }
    return std::string(text);
  }

  Status Reload() {
    BusError error;
    const int result =
        sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, "Reload", error.get(), nullptr, nullptr);
    return result < 0 ? Failed("systemctl daemon-reload", error.text(result)) : Status();
  }

  Status Enable() { return ChangeUnitFiles("EnableUnitFiles", true); }
  Status Disable() { return ChangeUnitFiles("DisableUnitFiles", false); }

  // A unit that was never loaded has nothing to forget.
  void ForgetFailure(const char* unit) {
    sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, "ResetFailedUnit", nullptr, nullptr, "s",
                       unit);
  }

  // Starts a job ("StartUnit", "StopUnit", ...) and waits for its end.
  Status RunJob(const char* method, const char* unit) {
    if (Status status = WatchJobs(); !status.ok()) return status;
    BusError error;
    sd_bus_message* reply = nullptr;
    const int result = sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, method, error.get(), &reply,
                                          "ss", unit, "replace");
    const Message owned(reply);
    const std::string what = std::string(method) + " " + unit;
    if (result < 0) return Failed(what, error.text(result));
    const char* job = nullptr;
    if (sd_bus_message_read(reply, "o", &job) < 0) return Failed(what, "an answer of another kind");
    const Result<std::string> outcome = WaitFor(job);
    if (!outcome.ok()) return Failed(what, outcome.status().reason());
    return *outcome == "done" || *outcome == "skipped" ? Status() : Failed(what, "the job ended as " + *outcome);
  }

 private:
  Manager(Bus bus, std::chrono::seconds job_limit) : bus_(std::move(bus)), job_limit_(job_limit) {}

  Status ChangeUnitFiles(const char* method, bool enable) {
    BusError error;
    const int result = enable ? sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, method,
                                                   error.get(), nullptr, "asbb", 1, kUnit, 0, 1)
                              : sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, method,
                                                   error.get(), nullptr, "asb", 1, kUnit, 0);
    return result < 0 ? Failed(std::string(method) + " " + kUnit, error.text(result)) : Reload();
  }

  // Ended jobs are collected from before the first one begins, so that none ends unseen.
  Status WatchJobs() {
    if (watching_) return {};
    int result = sd_bus_match_signal(bus_.get(), nullptr, kDestination, kManagerPath, kManager, "JobRemoved",
                                     OnJobRemoved, this);
    BusError error;
    if (result >= 0) {
      result = sd_bus_call_method(bus_.get(), kDestination, kManagerPath, kManager, "Subscribe", error.get(), nullptr,
                                  nullptr);
    }
    watching_ = result >= 0;
    return watching_ ? Status() : Failed("Subscribe", error.text(result));
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
    const Result<std::string> state = (*manager)->Ask("GetUnitFileState", kUnit);
    if (!state.ok()) return state.status();
    return *state == "enabled" || *state == "enabled-runtime";
  }

  Status Start() override {
    return With([this](Manager& manager) {
      if (Status status = manager.Enable(); !status.ok()) return status;
      return BringUp(manager, "StartUnit");
    });
  }

  Status Stop() override {
    return With([](Manager& manager) {
      if (Status status = manager.RunJob("StopUnit", kUnit); !status.ok()) return status;
      return manager.Disable();
    });
  }

  Status Restart() override {
    return With([this](Manager& manager) { return BringUp(manager, "RestartUnit"); });
  }

  Status Reload() override {
    if (!HasThreads()) return {};
    const Status status = With([](Manager& manager) { return manager.RunJob("ReloadUnit", kUnit); });
    return status.ok() ? CheckExportTable() : status;
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
    // It alone takes new ports, for itself and for the lock manager. Where it does not run it will be
    // started with the service.
    if (Status status = manager.RunJob("TryRestartUnit", "rpc-statd.service"); !status.ok()) return status;
    if (Status status = manager.RunJob(method, kUnit); !status.ok()) return status;
    return HasThreads() ? Status() : Failed(kUnit, "it started, but the kernel's server has no threads");
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
