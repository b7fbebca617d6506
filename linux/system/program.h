// Child processes: running a program until it ends.
#ifndef VORN_LINUX_SYSTEM_PROGRAM_H
#define VORN_LINUX_SYSTEM_PROGRAM_H

#include <chrono>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

struct ProgramOptions {
  std::chrono::milliseconds limit{60'000};    // its process group is terminated after this time
  std::chrono::milliseconds patience{2'000};  // from SIGTERM to SIGKILL
  std::string root = "/";                     // the value of VORN_ROOT in its environment
};

// Runs the program at `path` (on this system) with these arguments and waits for it. No shell is involved. The
// program gets an empty standard input, none of this process's open files, a process group of its own, and a
// fixed environment (PATH, LANG, VORN_ROOT). Each line of its standard output and error is passed to `line`.
// Succeeds if the exit status is 0. Fails with kProgramFailed, or with the system's reason if the program could
// not be started.
Status RunProgram(const std::string& path, const std::vector<std::string>& arguments,
                  const std::function<void(std::string_view)>& line, const ProgramOptions& options = {});

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_PROGRAM_H
