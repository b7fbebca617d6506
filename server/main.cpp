// vornd: constructs the parts in the order of their dependencies, and runs the server.
#include <grp.h>
#include <sys/socket.h>
#include <syslog.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>
#include <system_error>
#include <utility>
#include <variant>
#include <vector>

#include "access_log.h"
#include "authenticator.h"
#include "budget.h"
#include "http.h"
#include "listener.h"
#include "memory.h"
#include "metrics.h"
#include "module.h"
#include "options.h"
#include "password_checker.h"
#include "recovery.h"
#include "routes.h"
#include "runtime_folder.h"
#include "server_methods.h"
#include "server_metrics.h"
#include "sessions.h"
#include "termination.h"
#include "token_store.h"
#include "upload.h"
#include "web_api.h"
#include "worker_pool.h"

namespace vorn::server {
namespace {

// The memory that the bodies of all requests may have, and those of one address.
constexpr std::size_t kBodies = std::size_t{12} * 1024 * 1024;
constexpr std::size_t kBodiesOfPeer = std::size_t{4} * 1024 * 1024;

// The memory of the parsed parameters of all requests. The most expensive single call takes 42 MiB of it.
constexpr std::size_t kMemory = std::size_t{48} * 1024 * 1024;
constexpr const char* kHelperName = "vorn-pam-helper";
constexpr std::chrono::seconds kStopLimit{10};  // for running calls, after SIGTERM

// systemd copies standard error into the journal, which also receives syslog(3): each line would be logged twice.
bool StartedBySystemd() {
  const char* pid = std::getenv("SYSTEMD_EXEC_PID");
  return pid != nullptr && pid == std::to_string(getpid());
}

// Notifies systemd if it started this process with Type=notify (sd_notify(3)); otherwise does nothing.
void Notify(const char* state) { sd_notify(0, state); }

// The folder of this program.
std::filesystem::path ProgramFolder() {
  std::error_code failure;
  return std::filesystem::read_symlink("/proc/self/exe", failure).parent_path();
}

// Returns the module folder of the build tree if there is one, otherwise that of the installation.
std::string DefaultModuleFolder() {
  std::error_code failure;
  const auto prefix = ProgramFolder().parent_path();
  const auto installed = prefix / VORN_MODULE_FOLDER;
  const auto built = prefix / "modules";
  return std::filesystem::is_directory(built, failure) ? built.string() : installed.string();
}

// The command of the program that checks passwords. In the build tree it is beside this program.
std::vector<std::string> PasswordHelper(const Options& options) {
  std::error_code failure;
  const auto built = ProgramFolder() / kHelperName;
  const auto installed = ProgramFolder().parent_path() / VORN_HELPER_FOLDER / kHelperName;
  return {std::filesystem::exists(built, failure) ? built.string() : installed.string(), options.root,
          options.administrators, options.readers};
}

// Returns the number of a group of this system; std::nullopt, which is logged, if there is none.
std::optional<gid_t> GroupId(const std::string& name) {
  if (const group* found = getgrnam(name.c_str()); found != nullptr) return found->gr_gid;
  syslog(LOG_NOTICE, "There is no group %s: nobody has its rights", name.c_str());
  return std::nullopt;
}

// The groups in a trial root are not those of the processes that connect to its socket.
LocalGroups GroupsAtSocket(const Options& options) {
  if (options.root != "/") return {};
  return {GroupId(options.administrators), GroupId(options.readers)};
}

// Printed, never logged.
void PrintSignInLink(const std::vector<Listener>& listeners, Sessions* sessions) {
  const std::string code = sessions->NewCode(Sessions::Clock::now());
  for (const Listener& listener : listeners) {
    if (listener.family() == AF_UNIX) continue;
    std::printf(
        "Sign in once, within %lld minutes: http://%s/#code=%s\n",
        static_cast<long long>(std::chrono::duration_cast<std::chrono::minutes>(sessions->limits().code).count()),
        listener.name().c_str(), code.c_str());
  }
  std::fflush(stdout);
}

// A thread that runs a module's method cannot be ended, and destructors would wait for it. Files that are left are
// removed at the next start.
[[noreturn]] void EndWithRunningCalls() {
  syslog(LOG_WARNING, "Ends although calls are still running: they have had %lld s",
         static_cast<long long>(kStopLimit.count()));
  closelog();
  _exit(EXIT_SUCCESS);
}

std::optional<std::vector<Listener>> Listen(const Options& options, const RuntimeFolder& folder) {
  const bool allow_tcp = options.root != "/";
  std::vector<Listener> listeners;
  std::string error;
  const auto keep = [&](const std::string& name, std::optional<Listener> listener) {
    if (!listener) {
      syslog(LOG_ERR, "%s: %s", name.c_str(), error.c_str());
      return false;
    }
    syslog(LOG_INFO, "Listening at %s", listener->name().c_str());
    listeners.push_back(std::move(*listener));
    return true;
  };
  for (UniqueFd& socket : TakeActivatedSockets()) {
    if (!keep("Socket from systemd", AdoptListener(std::move(socket), allow_tcp, &error))) return std::nullopt;
  }
  std::vector<std::string> addresses = options.listen;
  if (addresses.empty() && listeners.empty()) addresses.push_back("unix:" + folder.path() + "/vornd.sock");
  for (const std::string& address : addresses) {
    if (!keep("--listen " + address, OpenListener(address, allow_tcp, &error))) return std::nullopt;
  }
  return listeners;
}

int Serve(const Options& options) {
  std::string error;
  const std::optional<RuntimeFolder> folder = RuntimeFolder::Claim(options.root, &error);
  std::optional<UploadFolder> uploads;
  if (folder) uploads = UploadFolder::Open(folder->path() + "/uploads", &error);
  std::optional<std::string> state;
  if (uploads) state = MakeFolders(options.root, {"var", "lib", "vorn"}, &error);
  if (!state || !CatchTermination(&error)) {
    syslog(LOG_ERR, "%s", error.c_str());
    return EXIT_FAILURE;
  }
  (void)VORN::RemoveLeftovers();  // a failure is logged, and is no reason not to serve
  const std::string module_folder = options.modules.empty() ? DefaultModuleFolder() : options.modules;
  const std::vector<Module> modules = LoadModules(module_folder);
  if (modules.empty()) {
    syslog(LOG_ERR, "%s: there is no module to serve", module_folder.c_str());
    return EXIT_FAILURE;
  }
  std::optional<std::vector<Listener>> listeners = Listen(options, *folder);
  if (!listeners) return EXIT_FAILURE;

  TokenStore tokens(*state + "/tokens.json");
  Sessions sessions(Sessions::Limits{});
  PasswordChecker passwords(PasswordHelper(options), PasswordChecker::Limits{});
  const Authenticator authenticator(tokens, sessions, GroupsAtSocket(options));
  if (options.sign_in_link) PrintSignInLink(*listeners, &sessions);
  Routes routes(modules);
  AddServerMethods(tokens, sessions, &routes);
  Budget memory(kMemory, kMemory);
  Budget bodies(kBodies, kBodiesOfPeer);
  const OwnNames names(options.host_names);
  const AuditSink audit = StartedBySystemd() ? JournalAudit() : SyslogAudit();
  AccessLog log(StartedBySystemd() ? JournalSink() : LineSink(STDERR_FILENO));
  CallMetrics metrics;
  const std::vector<MetricsSource> figures = {[&] {
                                                return HttpMetrics(log, {{"bodies", bodies}, {"parameters", memory}});
                                              },
                                              ProcessMetrics, VORN::ReadMetrics};
  Workers workers;  // after everything that a running call uses: its destructor waits for them
  WebApi api({routes, *uploads, workers, memory, names, audit, metrics, figures, authenticator, {sessions, passwords}});
  const HttpLimits limits = FitToDescriptors(HttpLimits{}, *listeners, DescriptorLimit());
  HttpServer server(api, std::move(*listeners), limits, {&bodies, &log});
  Notify("READY=1");
  WaitForTermination();
  Notify("STOPPING=1");
  server.Stop();
  workers.Close();
  passwords.Close();
  if (!server.JoinFor(kStopLimit)) EndWithRunningCalls();
  return EXIT_SUCCESS;
}

// Exports the canonical root in VORN_ROOT, where the platform library reads it, for the first time when it is
// loaded. There are no threads yet.
bool SettleRoot(Options* options) {
  std::error_code failure;
  options->root = std::filesystem::canonical(options->root, failure).string();
  if (!failure && std::filesystem::is_directory(options->root, failure) &&
      setenv("VORN_ROOT", options->root.c_str(), 1) == 0) {
    return true;
  }
  syslog(LOG_ERR, "--root: %s", failure ? failure.message().c_str() : "not a folder");
  return false;
}

}  // namespace
}  // namespace vorn::server

int main(int argc, char** argv) {
  using namespace vorn::server;  // NOLINT(google-build-using-namespace)
  std::variant<Options, int> parsed = ParseOptions(argc, argv);
  if (const int* status = std::get_if<int>(&parsed)) return *status;
  ConfigureAllocator();
  openlog("vornd", LOG_PID | (StartedBySystemd() ? 0 : LOG_PERROR), LOG_DAEMON);
  auto& options = std::get<Options>(parsed);
  const int status = SettleRoot(&options) ? Serve(options) : EXIT_FAILURE;
  closelog();
  return status;
}
