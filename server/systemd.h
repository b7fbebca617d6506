// The connection to systemd, if it has started this process.
#ifndef VORN_SERVER_SYSTEMD_H
#define VORN_SERVER_SYSTEMD_H

namespace vorn::server {

// Whether systemd copies standard error into the journal, which also receives syslog(3): each line would be logged
// twice.
bool StartedBySystemd();

// Each function notifies systemd if it started this process with Type=notify (sd_notify(3)); otherwise it does nothing.
void NotifyReady();
void NotifyReloading();
void NotifyStopping();

}  // namespace vorn::server

#endif  // VORN_SERVER_SYSTEMD_H
