// Waiting for SIGTERM or SIGINT.
#ifndef VORN_SERVER_TERMINATION_H
#define VORN_SERVER_TERMINATION_H

#include <string>

namespace vorn::server {

// Makes the first SIGTERM or SIGINT end WaitForTermination() instead of the process; a second one ends the process
// immediately, with status 128 + its number. Ignores SIGPIPE. No signal is blocked, so programs that a module starts
// have the usual signal mask. Returns false and sets `error` on failure.
bool CatchTermination(std::string* error);

// Waits for the first of the two signals.
void WaitForTermination();

}  // namespace vorn::server

#endif  // VORN_SERVER_TERMINATION_H
