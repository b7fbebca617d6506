#include "file_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include "files.h"

namespace vorn {
namespace {

Result<FileDescriptor> Open(const std::string& path) {
  FileDescriptor file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file) return Status::System(errno, path);
  return file;
}

Status WaitFor(const FileDescriptor& file, const std::string& path) {
  while (flock(file.get(), LOCK_EX) != 0) {
    if (errno != EINTR) return Status::System(errno, path);
  }
  return {};
}

// Whether the locked file is the one that newcomers find: somebody may have removed it.
bool IsAt(const FileDescriptor& file, const std::string& path) {
  struct stat mine {};
  struct stat theirs {};
  return fstat(file.get(), &mine) == 0 && stat(path.c_str(), &theirs) == 0 && mine.st_dev == theirs.st_dev &&
         mine.st_ino == theirs.st_ino;
}

}  // namespace

Result<FileDescriptor> TakeFileLock(const Root& root, std::string_view path) {
  const Result<std::string> place = root.Locate(path);
  if (!place.ok()) return place.status();
  if (Status status = MakeFolders(std::filesystem::path(*place).parent_path()); !status.ok()) return status;
  for (;;) {
    Result<FileDescriptor> file = Open(*place);
    if (!file.ok()) return file;
    if (Status status = WaitFor(*file, *place); !status.ok()) return status;
    if (IsAt(*file, *place)) return file;
  }
}

}  // namespace vorn
