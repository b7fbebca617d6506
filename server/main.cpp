// vornd: constructs the parts in the order of their dependencies, and runs the server.
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <climits>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <system_error>
#include <utility>
#include <variant>
#include <vector>

#include "access_log.h"
#include "authenticator.h"
#include "browser_guard.h"
#include "budget.h"
#include "configuration.h"
#include "console.h"
#include "http.h"
#include "listener.h"
#include "memory.h"
#include "metrics.h"
#include "module.h"
#include "options.h"
#include "password_checker.h"
#include "program_folders.h"
#include "recovery.h"
#include "reload.h"
#include "routes.h"
#include "runtime_folder.h"
#include "server_methods.h"
#include "server_metrics.h"
#include "sessions.h"
#include "sha256.h"
#include "systemd.h"
#include "termination.h"
#include "tls.h"
#include "tls_files.h"
#include "tls_upkeep.h"
#include "token_store.h"
#include "upload.h"
#include "web_api.h"
#include "worker_pool.h"

namespace vorn::server {
namespace {

constexpr std::chrono::seconds kStopLimit{10};  // for running calls, after SIGTERM
constexpr std::chrono::hours kLookAfter{12};    // between two looks after what changes with time

// Printed, never logged.
void PrintSignInLink(const std::vector<Listener>& listeners, Sessions* sessions) {
  const std::string code = sessions->NewCode(Sessions::Clock::now());
  for (const Listener& listener : listeners) {
    if (listener.family() == AF_UNIX) continue;
    const std::string url =
        listener.tls() ? "https://" + listener.name().substr(std::string("tls:").size()) : "http://" + listener.name();
    std::printf(
        "Sign in once, within %lld minutes: %s/#code=%s\n",
        static_cast<long long>(std::chrono::duration_cast<std::chrono::minutes>(sessions->limits().code).count()),
        url.c_str(), code.c_str());
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

std::optional<std::vector<Listener>> Listen(const Settings& settings, const RuntimeFolder& folder) {
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
    if (!keep("Socket from systemd", AdoptListener(std::move(socket), &error))) return std::nullopt;
  }
  std::vector<std::string> addresses = settings.listen.each;
  if (addresses.empty() && listeners.empty()) addresses.push_back("unix:" + folder.path() + "/vornd.sock");
  for (const std::string& address : addresses) {
    if (!keep(address, OpenListener(address, &error))) return std::nullopt;
  }
  return listeners;
}

// Handles signals until the server is to end.
void Attend(const Options& options, const Reloadable& parts, Settings settings) {
  for (;;) {
    switch (AwaitSignal(kLookAfter)) {
      case Awaited::kTermination:
        return;
      case Awaited::kReload:
        Reload(options, parts, &settings);
        break;
      case Awaited::kTime:
        if (parts.tls != nullptr) MaintainTls(settings, SelfSignedPath(options), std::time(nullptr), parts.tls);
        break;
    }
  }
}

PasswordChecker::Limits PasswordLimits(const Settings& settings) {
  PasswordChecker::Limits limits;
  limits.deadline = settings.password_time.time;
  return limits;
}

AccessLog::Sink AccessSink(const Settings& settings) {
  if (!settings.access_log)
    return {[](const AccessRecord& /*record*/) {}, [] {}, [](const AccessLog::Counts& /*counts*/) {}};
  return StartedBySystemd() ? JournalSink() : LineSink(STDERR_FILENO);
}

// The folders that the server needs below its root.
struct Folders {
  RuntimeFolder runtime;
  UploadFolder uploads;
  std::string state;
};

std::optional<Folders> OpenFolders(const Options& options) {
  std::string error;
  std::optional<RuntimeFolder> runtime = RuntimeFolder::Claim(options.root, &error);
  std::optional<UploadFolder> uploads;
  if (runtime) uploads = UploadFolder::Open(runtime->path() + "/uploads", &error);
  std::optional<std::string> state;
  if (uploads) state = MakeFolders(options.root, {"var", "lib", "vorn"}, &error);
  if (state) return Folders{*std::move(runtime), *std::move(uploads), *std::move(state)};
  syslog(LOG_ERR, "%s", error.c_str());
  return std::nullopt;
}

std::vector<Module> LoadModulesOf(const Settings& settings) {
  const std::string folder = settings.modules.path.empty() ? DefaultModuleFolder() : settings.modules.path;
  std::vector<Module> modules = LoadModules(folder);
  if (modules.empty()) syslog(LOG_ERR, "%s: there is no module to serve", folder.c_str());
  return modules;
}

std::string MachineName() {
  char name[HOST_NAME_MAX + 1] = "";
  return gethostname(name, sizeof name - 1) == 0 ? name : "";
}

// Returns false, after logging the reason, if a listener needs TLS and it cannot be set up.
bool OpenTls(const Options& options, const Settings& settings, std::unique_ptr<TlsServer>* tls) {
  std::string error;
  if (WantsTls(settings)) *tls = OpenTlsServer(settings, SelfSignedPath(options), std::time(nullptr), &error);
  if (!error.empty()) syslog(LOG_ERR, "%s", error.c_str());
  return error.empty();
}

int Serve(const Options& options, const Settings& settings) {
  const std::optional<Folders> folders = OpenFolders(options);
  std::string error;
  if (folders && !CatchSignals(&error)) syslog(LOG_ERR, "%s", error.c_str());
  if (!folders || !error.empty()) return EXIT_FAILURE;
  (void)VORN::RemoveLeftovers();  // a failure is logged, and is no reason not to serve
  const std::vector<Module> modules = LoadModulesOf(settings);
  if (modules.empty()) return EXIT_FAILURE;
  std::unique_ptr<TlsServer> tls;
  std::optional<std::vector<Listener>> listeners;
  if (OpenTls(options, settings, &tls)) listeners = Listen(settings, folders->runtime);
  if (!listeners) return EXIT_FAILURE;

  Sha256("");  // loads the algorithm
  TokenStore tokens(folders->state + "/tokens.json");
  Sessions sessions(SessionLimits(settings));
  PasswordChecker passwords(PasswordHelper(options, settings), PasswordLimits(settings));
  Authenticator authenticator(tokens, sessions, {});
  OwnNames names({}, MachineName());
  const Reloadable reloadable{sessions, authenticator, passwords, names, tls.get()};
  Apply(options, settings, reloadable);
  if (options.sign_in_link) PrintSignInLink(*listeners, &sessions);
  Routes routes(modules);
  AddServerMethods(tokens, sessions, &routes);
  Budget memory(settings.parameter_memory.bytes, settings.parameter_memory.bytes);
  Budget bodies(settings.body_memory.bytes, settings.body_memory_per_address.bytes);
  const AuditSink audit = StartedBySystemd() ? JournalAudit() : SyslogAudit();
  AccessLog log(AccessSink(settings));
  const Console console(ConsoleFolder());
  CallMetrics metrics;
  const std::vector<MetricsSource> figures = {[&] {
                                                return HttpMetrics(log, {{"bodies", bodies}, {"parameters", memory}});
                                              },
                                              [&] { return UploadMetrics(folders->uploads); },
                                              [&] { return SessionMetrics(sessions); }, ProcessMetrics,
                                              VORN::ReadMetrics};
  Workers workers;  // after everything that a running call uses: its destructor waits for them
  WebApi api({routes,
              folders->uploads,
              workers,
              memory,
              names,
              audit,
              metrics,
              figures,
              authenticator,
              {sessions, passwords},
              console});
  const HttpLimits limits = FitToDescriptors(HttpLimitsOf(settings), *listeners, DescriptorLimit());
  HttpServer server(api, std::move(*listeners), limits, {&bodies, &log, tls.get()});
  NotifyReady();
  Attend(options, reloadable, settings);
  NotifyStopping();
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

// Prints what is wrong with the configuration.
int Check(const Options& options, Configuration configuration) {
  std::string error;
  TlsIdentityPtr identity;
  if (configuration.faults.empty()) identity = CheckTls(configuration.settings, SelfSignedPath(options), &error);
  if (!error.empty()) configuration.faults.push_back(error);
  for (const std::string& fault : configuration.faults) std::fprintf(stderr, "%s\n", fault.c_str());
  if (!configuration.faults.empty()) return EXIT_FAILURE;
  std::printf("%s: no fault\n", ConfigurationPath(options).c_str());
  if (!identity) return EXIT_SUCCESS;
  std::printf("The TLS certificate has the SHA-256 fingerprint %s\n", identity->fingerprint().c_str());
  const std::string warning = ExpiryWarning(*identity, std::time(nullptr));
  if (!warning.empty()) std::printf("%s\n", warning.c_str());
  return EXIT_SUCCESS;
}

int Run(const Options& options) {
  const Configuration configuration = LoadConfiguration(options);
  if (options.check) return Check(options, configuration);
  for (const std::string& fault : configuration.faults) syslog(LOG_ERR, "%s", fault.c_str());
  return configuration.faults.empty() ? Serve(options, configuration.settings) : EXIT_FAILURE;
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
  const int status = SettleRoot(&options) ? Run(options) : EXIT_FAILURE;
  closelog();
  return status;
}
