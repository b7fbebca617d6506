// Running a program of the box to its end.
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
  std::chrono::milliseconds limit{60'000};    // then its process group is ended
  std::chrono::milliseconds patience{2'000};  // from SIGTERM to SIGKILL
};

// Runs the program at `path` (of this system) with these arguments, without a shell: an empty standard input, no
// other open file of ours, a process group of its own, a fixed environment (PATH, LANG, and VORN_ROOT). Standard
// output and error go to `line`, line by line. Success is exit status 0; all else is kProgramFailed, or the
// system's reason why it could not be run.
Status RunProgram(const std::string& path, const std::vector<std::string>& arguments,
                  const std::function<void(std::string_view)>& line, const ProgramOptions& options = {});

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_PROGRAM_H
