#include "systemd.h"

#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <string>

namespace vorn::server {

bool StartedBySystemd() {
  const char* pid = std::getenv("SYSTEMD_EXEC_PID");
  return pid != nullptr && pid == std::to_string(getpid());
}

void NotifyReady() { sd_notify(0, "READY=1"); }

void NotifyReloading() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  const auto microseconds = std::int64_t{now.tv_sec} * 1000000 + now.tv_nsec / 1000;
  sd_notify(0, ("RELOADING=1\nMONOTONIC_USEC=" + std::to_string(microseconds)).c_str());
}

void NotifyStopping() { sd_notify(0, "STOPPING=1"); }

}  // namespace vorn::server
