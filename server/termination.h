// Waiting for SIGTERM or SIGINT.
#ifndef VORN_SERVER_TERMINATION_H
#define VORN_SERVER_TERMINATION_H

#include <string>

namespace vorn::server {

// From here on SIGTERM and SIGINT are waited for instead of ending the process, and SIGPIPE is
// ignored. No signal is blocked, so programs that a module starts begin as usual. False with `error`.
bool CatchTermination(std::string* error);

// Returns when the first of them has come.
void WaitForTermination();

}  // namespace vorn::server

#endif  // VORN_SERVER_TERMINATION_H
