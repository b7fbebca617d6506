#include "file_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include "deadline_timer.h"
#include "files.h"

namespace vorn {
namespace {

Result<FileDescriptor> Open(const std::string& path) {
  FileDescriptor file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file) return Status::System(errno, path);
  return file;
}

// flock(2) has no time limit of its own: the timer interrupts it.
Status WaitFor(const FileDescriptor& file, const std::string& path, const DeadlineTimer& timer) {
  while (flock(file.get(), LOCK_EX) != 0) {
    if (errno != EINTR) return Status::System(errno, path);
    if (timer.has_expired()) return Status::Failure(kLockTimeout, path + " is locked by another process for too long");
  }
  return {};
}

// Whether the locked file is still the one at `path`: another process may have removed it meanwhile.
bool IsAt(const FileDescriptor& file, const std::string& path) {
  struct stat mine {};
  struct stat theirs {};
  return fstat(file.get(), &mine) == 0 && stat(path.c_str(), &theirs) == 0 && mine.st_dev == theirs.st_dev &&
         mine.st_ino == theirs.st_ino;
}

}  // namespace

Status LockFile(const FileDescriptor& file, const std::string& name, std::chrono::milliseconds limit) {
  if (flock(file.get(), LOCK_EX | LOCK_NB) == 0) return {};
  if (errno != EWOULDBLOCK && errno != EINTR) return Status::System(errno, name);
  const DeadlineTimer timer(limit);
  return timer.status().ok() ? WaitFor(file, name, timer) : timer.status();
}

Result<FileDescriptor> TakeFileLock(const Root& root, std::string_view path, std::chrono::milliseconds limit) {
  const Result<std::string> location = root.Locate(path);
  if (!location.ok()) return location.status();
  if (Status status = MakeFolders(std::filesystem::path(*location).parent_path()); !status.ok()) return status;
  for (;;) {
    Result<FileDescriptor> file = Open(*location);
    if (!file.ok()) return file;
    if (Status status = LockFile(*file, *location, limit); !status.ok()) return status;
    if (IsAt(*file, *location)) return file;
  }
}

}  // namespace vorn
