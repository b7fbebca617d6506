#include "settings.h"

#include <algorithm>

namespace vorn::server {
namespace {

template <auto kMember>
constexpr Setting Row(std::string_view section, std::string_view key, bool reloads) {
  return {section, key, reloads,
          [](std::string_view text, Settings* settings) { return ParseValue(text, &(settings->*kMember)); },
          [](const Settings& settings) { return FormatValue(settings.*kMember); }};
}

constexpr bool kReloads = true;
constexpr bool kNeedsRestart = false;

}  // namespace

const std::vector<Setting>& SettingsTable() {
  using S = Settings;
  static const std::vector<Setting> table = {
      Row<&S::listen>("server", "listen", kNeedsRestart),
      Row<&S::host_names>("server", "host-names", kReloads),
      Row<&S::modules>("server", "modules", kNeedsRestart),

      Row<&S::administrators>("access", "administrators", kReloads),
      Row<&S::readers>("access", "readers", kReloads),
      Row<&S::password_time>("access", "password-time", kNeedsRestart),

      Row<&S::certificate>("tls", "certificate", kReloads),
      Row<&S::key>("tls", "key", kReloads),
      Row<&S::strict_transport>("tls", "strict-transport", kReloads),

      Row<&S::session_idle>("sessions", "idle", kReloads),
      Row<&S::session_lifetime>("sessions", "lifetime", kReloads),
      Row<&S::sessions_per_account>("sessions", "per-account", kReloads),
      Row<&S::sessions>("sessions", "total", kReloads),

      Row<&S::tcp_connections>("limits", "tcp-connections", kNeedsRestart),
      Row<&S::tcp_connections_per_address>("limits", "tcp-connections-per-address", kNeedsRestart),
      Row<&S::unix_connections>("limits", "unix-connections", kNeedsRestart),
      Row<&S::head_time>("limits", "head-time", kNeedsRestart),
      Row<&S::body_time>("limits", "body-time", kNeedsRestart),
      Row<&S::idle_time>("limits", "idle-time", kNeedsRestart),
      Row<&S::write_time>("limits", "write-time", kNeedsRestart),
      Row<&S::body_memory>("limits", "body-memory", kNeedsRestart),
      Row<&S::body_memory_per_address>("limits", "body-memory-per-address", kNeedsRestart),
      Row<&S::parameter_memory>("limits", "parameter-memory", kNeedsRestart),

      Row<&S::log_level>("log", "level", kReloads),
      Row<&S::access_log>("log", "access", kNeedsRestart),
  };
  return table;
}

const Setting* FindSetting(std::string_view section, std::string_view key) {
  const auto& table = SettingsTable();
  const auto found = std::find_if(table.begin(), table.end(), [section, key](const Setting& each) {
    return each.section == section && each.key == key;
  });
  return found == table.end() ? nullptr : &*found;
}

std::vector<Contradiction> FindContradictions(const Settings& settings) {
  std::vector<Contradiction> found;
  const auto require = [&found](bool sound, std::string_view section, std::string_view key, std::string_view other,
                                std::string text) {
    if (!sound) found.push_back({FindSetting(section, key), FindSetting(section, other), std::move(text)});
  };
  require(settings.certificate.path.empty() || !settings.key.path.empty(), "tls", "certificate", "key", "needs a key");
  require(settings.key.path.empty() || !settings.certificate.path.empty(), "tls", "key", "certificate",
          "needs a certificate");
  // With this header browsers let nobody accept a certificate that they do not trust.
  require(settings.strict_transport.time.count() == 0 || !settings.certificate.path.empty(), "tls", "strict-transport",
          "certificate", "needs a certificate of an authority");
  require(settings.session_idle.time <= settings.session_lifetime.time, "sessions", "idle", "lifetime",
          "is longer than the lifetime of a session");
  require(settings.sessions_per_account.number <= settings.sessions.number, "sessions", "per-account", "total",
          "is larger than the total");
  require(settings.tcp_connections_per_address.number <= settings.tcp_connections.number, "limits",
          "tcp-connections-per-address", "tcp-connections", "is larger than tcp-connections");
  require(settings.body_memory_per_address.bytes <= settings.body_memory.bytes, "limits", "body-memory-per-address",
          "body-memory", "is larger than body-memory");
  require(settings.password_time.time <= std::chrono::minutes(1), "access", "password-time", "",
          "is longer than a minute");
  require(settings.administrators.name != settings.readers.name, "access", "readers", "administrators",
          "is the administrators' group, too");
  return found;
}

HttpLimits HttpLimitsOf(const Settings& settings) {
  HttpLimits limits;
  limits.tcp_connections = {settings.tcp_connections.number, settings.tcp_connections_per_address.number};
  limits.unix_connections = {settings.unix_connections.number, settings.unix_connections.number};
  limits.head = settings.head_time.time;
  limits.body = settings.body_time.time;
  limits.idle = settings.idle_time.time;
  limits.write = settings.write_time.time;
  return limits;
}

}  // namespace vorn::server
