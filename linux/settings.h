// The platform's own settings: /etc/vorn/platform.conf below the root.
#ifndef VORN_LINUX_SETTINGS_H
#define VORN_LINUX_SETTINGS_H

#include <string>

#include "status.h"

namespace vorn {

// [platform]
// service_engine = systemd | local | auto     auto: systemd where it is PID 1 and the root is "/"
// kerberos = auto | yes | no                  auto: what the running kernel offers
// admin_account = NAME                        whom the squash modes mean; "admin", "nobody" if unset
// guest_account = NAME
// firewall = yes | no                         yes on a box, no elsewhere, if unset
struct Settings {
  enum class Kerberos { kAuto, kYes, kNo };
  enum class Engine { kSystemd, kLocal };

  Engine engine = Engine::kLocal;
  Kerberos kerberos = Kerberos::kAuto;
  std::string admin_account = "admin";
  std::string guest_account = "nobody";
  bool firewall = false;

  // Those of the current root. A value that is none of the above is a failure that names it.
  static Result<Settings> Load();
};

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_H
