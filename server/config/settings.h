// The settings of vornd, and the table of their keys.
#ifndef VORN_SERVER_SETTINGS_H
#define VORN_SERVER_SETTINGS_H

#include <syslog.h>

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "http.h"
#include "setting_values.h"

namespace vorn::server {

// The members' initial values are the defaults.
struct Settings {
  // [server]
  ListenAddresses listen{};  // empty: the Unix socket below the root, and the sockets from systemd
  HostNames host_names{};
  FilePath modules{};  // empty: where this program's modules are

  // [access]
  GroupName administrators{"vorn-admin"};
  GroupName readers{"vorn-readonly"};
  Duration password_time{std::chrono::seconds(10)};

  // [tls]
  FilePath certificate{};  // empty: a self-signed certificate is made
  FilePath key{};
  Duration strict_transport{};  // 0: Strict-Transport-Security is not sent

  // [sessions]
  Duration session_idle{std::chrono::minutes(30)};
  Duration session_lifetime{std::chrono::hours(12)};
  Count sessions_per_account{16};
  Count sessions{256};

  // [limits]
  Count tcp_connections{512};
  Count tcp_connections_per_address{128};
  Count unix_connections{320};
  Duration head_time{std::chrono::seconds(10)};
  Duration body_time{std::chrono::seconds(60)};
  Duration idle_time{std::chrono::seconds(60)};
  Duration write_time{std::chrono::seconds(60)};
  ByteCount body_memory{std::size_t{8} << 20};
  ByteCount body_memory_per_address{std::size_t{4} << 20};
  ByteCount parameter_memory{std::size_t{48} << 20};

  // [log]
  LogLevel log_level{LOG_INFO};
  bool access_log = true;
};

// The limits of the transport.
HttpLimits HttpLimitsOf(const Settings& settings);

// A key of the configuration file.
struct Setting {
  std::string_view section;
  std::string_view key;
  bool reloads;  // whether a reload applies it; false: only a restart
  std::optional<ValueFault> (*parse)(std::string_view text, Settings* settings);
  std::string (*format)(const Settings& settings);
};

// All keys, grouped by section.
const std::vector<Setting>& SettingsTable();

// Returns nullptr if there is no such key. The result has static lifetime.
const Setting* FindSetting(std::string_view section, std::string_view key);

// Two settings that contradict each other.
struct Contradiction {
  const Setting* setting;  // the one to change
  const Setting* other;    // nullptr: the setting contradicts a fixed limit
  std::string text;
};
std::vector<Contradiction> FindContradictions(const Settings& settings);

}  // namespace vorn::server

#endif  // VORN_SERVER_SETTINGS_H
