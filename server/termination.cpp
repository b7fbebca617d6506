#include "termination.h"

#include <semaphore.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>

namespace vorn::server {
namespace {

sem_t terminated;  // sem_post(3) is async-signal-safe
volatile std::sig_atomic_t signals = 0;

void OnSignal(int number) {
  const int saved = errno;
  if (signals > 0) _exit(128 + number);
  signals = 1;
  sem_post(&terminated);
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
  if (sem_init(&terminated, 0, 0) == 0 && Handle(SIGTERM, OnSignal) && Handle(SIGINT, OnSignal) &&
      Handle(SIGPIPE, SIG_IGN)) {
    return true;
  }
  *error = std::string("signals: ") + std::strerror(errno);
  return false;
}

void WaitForTermination() {
  while (sem_wait(&terminated) != 0 && errno == EINTR) {
  }
}

}  // namespace vorn::server
