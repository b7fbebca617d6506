// vorn-nfs-names: applies changes of host addresses and netgroups to the export rules in force. Its timer runs it.
#include <syslog.h>

#include "current_box.h"
#include "service_control.h"

int main() {
  openlog("vorn-nfs-names", 0, LOG_DAEMON);
  const vorn::Status status = vorn::RefreshServiceNames(vorn::CurrentBox(), "nfsd");
  if (status.ok()) return 0;
  syslog(LOG_ERR, "%s", status.reason().c_str());
  return 1;
}
