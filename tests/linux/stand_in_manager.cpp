#include "stand_in_manager.h"

#include <sys/stat.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <stdexcept>
#include <utility>

#include "requirements.h"

namespace {

[[maybe_unused]] const bool kRequired = RequirePrograms({"dbus-daemon"});

constexpr char kPath[] = "/org/freedesktop/systemd1";
constexpr char kInterface[] = "org.freedesktop.systemd1.Manager";
constexpr char kName[] = "org.freedesktop.systemd1";

template <int kTexts>
int OnCall(sd_bus_message* message, void* manager, sd_bus_error* /*error*/) {
  return static_cast<StandInManager*>(manager)->Take(message, kTexts == 2 ? "ss" : kTexts == 1 ? "s" : "");
}

int OnFiles(sd_bus_message* message, void* manager, sd_bus_error* /*error*/) {
  return static_cast<StandInManager*>(manager)->Take(message, "as");
}

const sd_bus_vtable kMethods[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_METHOD("Subscribe", "", "", OnCall<0>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("Reload", "", "", OnCall<0>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("GetUnitFileState", "s", "s", OnCall<1>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("ResetFailedUnit", "s", "", OnCall<1>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("EnableUnitFiles", "asbb", "ba(sss)", OnFiles, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("DisableUnitFiles", "asb", "a(sss)", OnFiles, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("StartUnit", "ss", "o", OnCall<2>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("StopUnit", "ss", "o", OnCall<2>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("RestartUnit", "ss", "o", OnCall<2>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("TryRestartUnit", "ss", "o", OnCall<2>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD("ReloadUnit", "ss", "o", OnCall<2>, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_SIGNAL("JobRemoved", "uoss", 0),
    SD_BUS_VTABLE_END,
};

void ThrowIfFailed(int result, const char* what) {
  if (result < 0) throw std::runtime_error(what);
}

// Formats a call for the tests: the method and its string arguments.
std::string Describe(sd_bus_message* message, const std::string& types) {
  std::string call = sd_bus_message_get_member(message);
  if (types == "as") ThrowIfFailed(sd_bus_message_enter_container(message, 'a', "s"), "array");
  const std::size_t count = types == "as" ? 1 : types.size();
  for (std::size_t i = 0; i < count; ++i) {
    const char* text = nullptr;
    ThrowIfFailed(sd_bus_message_read(message, "s", &text), "text");
    call += std::string(" ") + text;
  }
  return call;
}

bool IsJob(const std::string& method) { return method.size() > 4 && method.substr(method.size() - 4) == "Unit"; }

}  // namespace

StandInManager::StandInManager() {
  address_ = "unix:path=" + folder_.At("/bus");
  folder_.Write("/bus.conf", "<busconfig><type>session</type><listen>" + address_ +
                                 "</listen><policy context=\"default\"><allow send_destination=\"*\"/>"
                                 "<allow receive_sender=\"*\"/><allow own=\"*\"/></policy></busconfig>");
  const std::string option = "--config-file=" + folder_.At("/bus.conf");
  daemon_ = std::make_unique<ChildProcess>([option] {
    execlp("dbus-daemon", "dbus-daemon", option.c_str(), "--nofork", nullptr);
    return 127;
  });
  if (!Eventually([this] { return Connect(); })) throw std::runtime_error("no dbus-daemon");
  ThrowIfFailed(sd_bus_add_object_vtable(bus_, nullptr, kPath, kInterface, kMethods, this), "object");
  ThrowIfFailed(sd_bus_request_name(bus_, kName, 0), "name");
  thread_ = std::thread([this] { Serve(); });
}

bool StandInManager::Connect() {
  bus_ = sd_bus_flush_close_unref(bus_);
  ThrowIfFailed(sd_bus_new(&bus_), "bus");
  ThrowIfFailed(sd_bus_set_address(bus_, address_.c_str()), "address");
  ThrowIfFailed(sd_bus_set_bus_client(bus_, 1), "client");
  return sd_bus_start(bus_) >= 0;
}

StandInManager::~StandInManager() {
  stop_ = true;
  thread_.join();
  sd_bus_flush_close_unref(bus_);
}

void StandInManager::Serve() {
  while (!stop_) {
    while (sd_bus_process(bus_, nullptr) > 0) {
    }
    sd_bus_wait(bus_, 20'000);
  }
}

std::vector<std::string> StandInManager::TakeCalls() {
  const std::lock_guard<std::mutex> guard(mutex_);
  return std::exchange(calls_, {});
}

void StandInManager::Refuse(const std::string& call, const std::string& error) {
  const std::lock_guard<std::mutex> guard(mutex_);
  refused_[call] = std::string(kName) + "." + error;
}

void StandInManager::End(const std::string& call, const std::string& outcome) {
  const std::lock_guard<std::mutex> guard(mutex_);
  outcomes_[call] = outcome;
}

void StandInManager::SetUnitFileState(const std::string& state) {
  const std::lock_guard<std::mutex> guard(mutex_);
  unit_file_state_ = state;
}

int StandInManager::Take(sd_bus_message* message, const char* types) {
  const std::lock_guard<std::mutex> guard(mutex_);
  const std::string call = Describe(message, types);
  calls_.push_back(call);
  const std::string method = sd_bus_message_get_member(message);
  const std::string named = call.substr(0, call.find(' ', method.size() + 1));
  if (const auto refused = refused_.find(named); refused != refused_.end()) {
    return sd_bus_reply_method_errorf(message, refused->second.c_str(), "%s is refused", named.c_str());
  }
  if (method == "GetUnitFileState") return sd_bus_reply_method_return(message, "s", unit_file_state_.c_str());
  if (method == "EnableUnitFiles") return sd_bus_reply_method_return(message, "ba(sss)", 1, 0);
  if (method == "DisableUnitFiles") return sd_bus_reply_method_return(message, "a(sss)", 0);
  if (IsJob(method) && method != "ResetFailedUnit") return AnswerJob(message, named);
  return sd_bus_reply_method_return(message, "");
}

int StandInManager::AnswerJob(sd_bus_message* message, const std::string& call) {
  const std::string job = std::string(kPath) + "/job/" + std::to_string(++jobs_);
  const auto found = outcomes_.find(call);
  const std::string outcome = found == outcomes_.end() ? "done" : found->second;
  // The signal is sent before the reply, as it can happen for a job without work.
  if (outcome != "never") {
    sd_bus_emit_signal(bus_, kPath, kInterface, "JobRemoved", "uoss", static_cast<unsigned>(jobs_), job.c_str(),
                       call.c_str(), outcome.c_str());
  }
  return sd_bus_reply_method_return(message, "o", job.c_str());
}
