#include "box_program.h"

#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>

#include "call_rights.h"
#include "configuration_lock.h"
#include "program.h"

namespace vorn {
namespace {

constexpr int kMostLines = 100;  // of a program's output in the log

constexpr char kServiceScript[] = "/usr/vorn/etc/rc.sysv/S83nfsd.sh";

// Only the effect of this one program is known.
Status RehearseProgram(Box& box, const std::string& program, const std::string& path,
                       const std::vector<std::string>& arguments) {
  if (program != kServiceScript || arguments != std::vector<std::string>{"reloadidmap"}) {
    return Status::Failure(EROFS, program + " is not run in a rehearsal");
  }
  if (access(path.c_str(), X_OK) != 0) return Status::System(errno, path);
  box.Rehearse(RehearsedAction::kReloadIdentities);
  return {};
}

// Releases the configuration locks of this thread meanwhile.
Status RunPaused(const Box& box, const std::string& program, const std::string& path,
                 const std::vector<std::string>& arguments) {
  const LockPause pause;
  ProgramOptions options;
  options.root = box.root().directory();
  int count = 0;
  const auto log_line = [&](std::string_view line) {
    if (count++ >= kMostLines) return;
    syslog(LOG_INFO, "%s: %.*s", program.c_str(), static_cast<int>(line.size()), line.data());
  };
  Status status = RunProgram(path, arguments, log_line, options);
  if (count > kMostLines) syslog(LOG_INFO, "%s: %d more lines", program.c_str(), count - kMostLines);
  return status;
}

}  // namespace

Status RunBoxProgram(Box& box, const std::string& program, const std::vector<std::string>& arguments) {
  const Result<std::string> path = box.root().Locate(program);
  if (!path.ok()) return path.status();
  if (Status status = CheckMayWrite(program); !status.ok()) return status;
  if (box.is_draft()) return RehearseProgram(box, program, *path, arguments);
  Status status = RunPaused(box, program, *path, arguments);
  box.NoteAction(arguments.empty() ? program : arguments.front(), status);
  return status;
}

}  // namespace vorn
