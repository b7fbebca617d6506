#include "termination.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstring>

namespace vorn::server {
namespace {

int event_fd = -1;  // the only thing that a signal handler can tell a thread through

void OnSignal(int /*number*/) {
  const int saved = errno;
  const std::uint64_t one = 1;
  static_cast<void>(!write(event_fd, &one, sizeof one));
  errno = saved;
}

bool Handle(int number, void (*handler)(int)) {
  struct sigaction action {};
  action.sa_handler = handler;
  action.sa_flags = SA_RESTART;
  return sigaction(number, &action, nullptr) == 0;
}

}  // namespace

bool CatchTermination(std::string* error) {
  event_fd = eventfd(0, EFD_CLOEXEC);
  if (event_fd >= 0 && Handle(SIGTERM, OnSignal) && Handle(SIGINT, OnSignal) && Handle(SIGPIPE, SIG_IGN)) return true;
  *error = std::string("signals: ") + std::strerror(errno);
  return false;
}

void WaitForTermination() {
  std::uint64_t count = 0;
  while (read(event_fd, &count, sizeof count) < 0 && errno == EINTR) {
  }
}

}  // namespace vorn::server
