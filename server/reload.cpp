#include "reload.h"

#include <grp.h>
#include <syslog.h>

#include <ctime>
#include <optional>
#include <utility>

#include "configuration.h"
#include "program_folders.h"
#include "systemd.h"
#include "tls_files.h"
#include "tls_upkeep.h"

namespace vorn::server {
namespace {

// Returns the number of a group of this system; std::nullopt, which is logged, if there is none.
std::optional<gid_t> GroupId(const std::string& name) {
  if (const group* found = getgrnam(name.c_str()); found != nullptr) return found->gr_gid;
  syslog(LOG_NOTICE, "There is no group %s: nobody has its rights", name.c_str());
  return std::nullopt;
}

// The groups in a trial root are not those of the processes that connect to its socket.
LocalGroups GroupsAtSocket(const Options& options, const Settings& settings) {
  if (options.root != "/") return {};
  return {GroupId(settings.administrators.name), GroupId(settings.readers.name)};
}

}  // namespace

std::vector<std::string> PasswordHelper(const Options& options, const Settings& settings) {
  return {PasswordHelperPath(), options.root, settings.administrators.name, settings.readers.name};
}

Sessions::Limits SessionLimits(const Settings& settings) {
  Sessions::Limits limits;
  limits.idle = settings.session_idle.time;
  limits.lifetime = settings.session_lifetime.time;
  limits.per_account = settings.sessions_per_account.number;
  limits.total = settings.sessions.number;
  return limits;
}

std::string SelfSignedPath(const Options& options) {
  return (options.root == "/" ? "" : options.root) + "/var/lib/vorn/self-signed.pem";
}

void Apply(const Options& options, const Settings& settings, const Reloadable& parts) {
  setlogmask(LOG_UPTO(settings.log_level.priority));
  parts.sessions.SetLimits(SessionLimits(settings));
  parts.authenticator.SetGroups(GroupsAtSocket(options, settings));
  parts.passwords.SetCommand(PasswordHelper(options, settings));
  parts.names.Set(settings.host_names.each);
}

void Reload(const Options& options, const Reloadable& parts, Settings* settings) {
  NotifyReloading();
  Configuration next = LoadConfiguration(options);
  TlsIdentityPtr identity;
  if (parts.tls != nullptr && next.faults.empty()) {
    std::string error;
    identity = OpenTlsIdentity(next.settings, SelfSignedPath(options), std::time(nullptr), &error);
    if (!identity) next.faults.push_back(error);
  }
  for (const std::string& fault : next.faults) syslog(LOG_ERR, "%s", fault.c_str());
  if (next.faults.empty()) {
    for (const std::string& key : NeedRestart(*settings, next.settings)) {
      syslog(LOG_WARNING, "%s has changed, which only a restart applies", key.c_str());
    }
    Apply(options, next.settings, parts);
    if (identity) ApplyTls(next.settings, identity, parts.tls);
    *settings = std::move(next.settings);
    syslog(LOG_NOTICE, "The configuration was read again");
  } else {
    syslog(LOG_ERR, "The configuration is not applied; the previous one stays in force");
  }
  NotifyReady();
}

}  // namespace vorn::server
