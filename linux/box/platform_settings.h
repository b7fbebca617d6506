// The platform's own settings: /etc/vorn/platform.conf.
#ifndef VORN_LINUX_BOX_PLATFORM_SETTINGS_H
#define VORN_LINUX_BOX_PLATFORM_SETTINGS_H

#include <memory>
#include <string>

#include "box.h"
#include "ini_file.h"
#include "status.h"

namespace vorn {

// [platform]
// service_engine = systemd | local | auto     default auto: systemd if it is PID 1 and the root is "/"
// kerberos = auto | yes | no                  default auto: what the running kernel supports
// admin_account = NAME                        the account of the squash modes; default "admin"
// guest_account = NAME                        default "nobody"
// firewall = yes | no                         default: yes if the root is "/"
// withdraw_left_shares = yes | no             default no; yes: a directory that is no share any more loses its export
//                                             rules at the next save or start, instead of only being named in the log
// history = yes | no                          default: yes if the root is "/"; whether changes are recorded in
//                                             /var/lib/vorn/history.git
// history_changes = N                         default 2000, at least 1000: the newest changes that are always kept
struct PlatformSettings {
  enum class Kerberos { kAuto, kYes, kNo };
  enum class EngineKind { kSystemd, kLocal };

  EngineKind engine = EngineKind::kLocal;
  Kerberos kerberos = Kerberos::kAuto;
  std::string admin_account = "admin";
  std::string guest_account = "nobody";
  bool firewall = false;
  bool withdraw_left_shares = false;
  bool history = false;
  std::size_t history_changes = 2000;

  // Reads the settings of the box. A value that is not in the list above is a failure that names it.
  static Result<std::shared_ptr<const PlatformSettings>> Load(Box& box);

 private:
  static Result<PlatformSettings> Read(const Box& box, const IniFile& file);
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_PLATFORM_SETTINGS_H
