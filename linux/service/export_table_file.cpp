#include "export_table_file.h"

#include <fcntl.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <utility>

#include "deadline_timer.h"
#include "export_table.h"
#include "files.h"

namespace vorn {
namespace {

constexpr char kFolder[] = "/var/lib/nfs";
constexpr std::chrono::seconds kLockLimit{30};

// Takes a lock of lockf(3), as exportfs(8) does, but for the open file instead of the process.
Result<FileDescriptor> Lock(const std::string& path) {
  FileDescriptor file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  if (!file) return Status::System(errno, path);
  const DeadlineTimer timer(kLockLimit);
  if (!timer.status().ok()) return timer.status();
  struct flock whole {};
  whole.l_type = F_WRLCK;
  whole.l_whence = SEEK_SET;
  while (fcntl(file.get(), F_OFD_SETLKW, &whole) != 0) {
    if (errno != EINTR) return Status::System(errno, path);
    if (timer.has_expired()) return Status::Failure(kLockTimeout, path + " is locked by another process for too long");
  }
  return file;
}

}  // namespace

Result<ExportTableFile> ExportTableFile::Open(Box& box) {
  const Result<std::string> folder = box.root().Locate(kFolder);
  if (!folder.ok()) return folder.status();
  if (Status status = MakeFolders(*folder); !status.ok()) return status;
  Result<FileDescriptor> run_lock = Lock(*folder + "/export-lock");
  if (!run_lock.ok()) return run_lock.status();
  Result<FileDescriptor> table_lock = Lock(*folder + "/.etab.lock");
  if (!table_lock.ok()) return table_lock.status();
  Result<std::string> path = box.root().Locate(kExportTable);
  if (!path.ok()) return path.status();
  Result<FileText> file = ReadFileOrNothing(*path);
  if (!file.ok()) return file.status();
  ExportTableFile table;
  table.path_ = std::move(*path);
  table.text_ = std::move(file->text);
  table.run_lock_ = std::move(*run_lock);
  table.table_lock_ = std::move(*table_lock);
  return table;
}

Status ExportTableFile::Replace(const std::string& text) {
  const std::string fresh = path_ + ".tmp";
  const FileDescriptor file(open(fresh.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644));
  if (!file) return Status::System(errno, fresh);
  if (Status status = WriteAll(file.get(), text, fresh); !status.ok()) return status;
  if (std::rename(fresh.c_str(), path_.c_str()) != 0) return Status::System(errno, path_);
  text_ = text;
  return {};
}

}  // namespace vorn
