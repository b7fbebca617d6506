// Waiting for SIGTERM, SIGINT and SIGHUP.
#ifndef VORN_SERVER_TERMINATION_H
#define VORN_SERVER_TERMINATION_H

#include <chrono>
#include <string>

namespace vorn::server {

// Makes the first SIGTERM or SIGINT, and each SIGHUP, end AwaitSignal() instead of the process; a second SIGTERM or
// SIGINT ends the process immediately, with status 128 + its number. Ignores SIGPIPE. No signal is blocked, so programs
// that a module starts have the usual signal mask. Returns false and sets `error` on failure.
bool CatchSignals(std::string* error);

enum class Awaited {
  kTermination,
  kReload,  // SIGHUP; several of them may count as one
  kTime,    // none of them within the time limit
};
Awaited AwaitSignal(std::chrono::seconds limit);

}  // namespace vorn::server

#endif  // VORN_SERVER_TERMINATION_H
