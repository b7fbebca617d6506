#include "files.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <filesystem>

#include "extended_attributes.h"
#include "file_descriptor.h"
#include "file_lock.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t kLargestFile = std::size_t{64} << 20;

constexpr char kUnique[] = "XXXXXX";  // as mkstemp(3)

// For another program that has locked a file while it changes it.
constexpr std::chrono::seconds kOtherWritersLimit{5};

// A hidden file beside the target: the readers of a folder such as nfs.conf.d ignore it.
fs::path TemporaryPath(const fs::path& path, const std::string& ending) {
  return path.parent_path() / ("." + path.filename().string() + ".vorn-" + ending);
}

constexpr std::int64_t kSecond = 1'000'000'000;  // in nanoseconds

std::int64_t Nanoseconds(const timespec& time) { return time.tv_sec * kSecond + time.tv_nsec; }

FileStamp StampOf(const struct stat& file) {
  return {true, file.st_dev, file.st_ino, file.st_size, Nanoseconds(file.st_mtim), Nanoseconds(file.st_ctim)};
}

// Reads a file to its end. `size` is the size to expect.
Result<std::string> ReadAll(int file, std::size_t size, const std::string& path) {
  constexpr std::size_t kFurther = std::size_t{64} << 10;
  std::string text(std::min(size, kLargestFile) + 1, '\0');  // one byte more, to see the end
  std::size_t filled = 0;
  for (;;) {
    const ssize_t got = read(file, text.data() + filled, text.size() - filled);
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) return Status::System(errno, path);
    filled += static_cast<std::size_t>(got);
    if (filled > kLargestFile) return Status::System(EFBIG, path);
    if (got == 0) break;
    if (filled == text.size()) text.resize(filled + kFurther);
  }
  text.resize(filled);
  return text;
}

Status SyncFolder(const fs::path& folder) {
  const FileDescriptor file(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!file || fsync(file.get()) != 0) return Status::System(errno, folder.string());
  return {};
}

// A temporary file beside the target. It replaces the target, or is removed with the object.
class TemporaryFile {
 public:
  explicit TemporaryFile(const fs::path& target) : path_(TemporaryPath(target, kUnique)) {
    file_ = FileDescriptor(mkostemp(path_.data(), O_CLOEXEC));
    if (!file_) status_ = Status::System(errno, target.string());
  }
  ~TemporaryFile() {
    if (file_) unlink(path_.c_str());
  }
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  const Status& status() const { return status_; }

  // After Replace(): the stamp that the target has unless somebody else has changed it since.
  const FileStamp& stamp() const { return stamp_; }

  Status Write(std::string_view text) { return WriteAll(file_.get(), text, path_); }

  Status Sync() {
    if (fsync(file_.get()) != 0) return Status::System(errno, path_);
    return {};
  }

  // Copies owner, mode and extended attributes. The owner comes before the mode, because chown(2) clears the set-id
  // bits, and the mode before an access control list, which chmod(2) would change.
  Status CopyAttributes(const FileDescriptor& original, const std::string& name) {
    struct stat theirs {};
    struct stat mine {};
    if (fstat(original.get(), &theirs) != 0) return Status::System(errno, name);
    if (fstat(file_.get(), &mine) != 0) return Status::System(errno, path_);
    const bool same_owner = mine.st_uid == theirs.st_uid && mine.st_gid == theirs.st_gid;
    if (!same_owner && fchown(file_.get(), theirs.st_uid, theirs.st_gid) != 0) return Status::System(errno, path_);
    if (Status status = SetMode(theirs.st_mode & 07777); !status.ok()) return status;
    return CopyExtendedAttributes(original, file_, name);
  }

  Status SetMode(mode_t mode) {
    if (fchmod(file_.get(), mode) != 0) return Status::System(errno, path_);
    return {};
  }

  // Atomic. Fails with kChangedBehind if the target is not in the expected state.
  Status Replace(const fs::path& target, const FileStamp& expected) {
    struct stat filled {};
    if (fstat(file_.get(), &filled) != 0) return Status::System(errno, path_);
    stamp_ = StampOf(filled);
    if (renameat2(AT_FDCWD, path_.c_str(), AT_FDCWD, target.c_str(),
                  expected.exists ? RENAME_EXCHANGE : RENAME_NOREPLACE) == 0) {
      return expected.exists ? VerifyAndUnlink(target, expected) : Done();
    }
    if (errno == ENOENT || errno == EEXIST) return ChangedBehind(target.string());
    if (errno == EBUSY) {
      return Status::Failure(EBUSY, target.string() +
                                        " is a mount point (a bind mount?) and cannot be replaced in one "
                                        "step; mount the folder that contains it instead");
    }
    if (errno != EINVAL) return Status::System(errno, target.string());
    // The file system cannot exchange files: an edit since the last check would be lost.
    if (rename(path_.c_str(), target.c_str()) != 0) return Status::System(errno, target.string());
    return Done();
  }

 private:
  // Everything but the ctime was read before the file was visible: it cannot be that of an edit.
  Status Done() {
    struct stat visible {};
    if (fstat(file_.get(), &visible) == 0) stamp_.changed = StampOf(visible).changed;
    file_.Close();
    return {};
  }

  // After the exchange, compares the old file with the expected state and exchanges back if it was edited. Its
  // ctime, and on some file systems its inode, have changed by the exchange itself.
  Status VerifyAndUnlink(const fs::path& target, const FileStamp& expected) {
    struct stat old {};
    if (lstat(path_.c_str(), &old) != 0) return Status::System(errno, path_);
    const FileStamp stamp = StampOf(old);
    if (stamp.size != expected.size || stamp.modified != expected.modified) {
      if (rename(path_.c_str(), target.c_str()) == 0) file_.Close();
      return ChangedBehind(target.string());
    }
    unlink(path_.c_str());
    return Done();
  }

  std::string path_;
  FileDescriptor file_;
  FileStamp stamp_{};
  Status status_;
};

// Checked before the files are exchanged, so that a rejected version is never visible.
Status CheckUnchanged(const fs::path& path, const FileStamp& expected) {
  const Result<FileStamp> stamp = StampOfFile(path);
  if (!stamp.ok()) return stamp.status();
  return IsSameFile(*stamp, expected) ? Status() : ChangedBehind(path.string());
}

// Opens the file that is to be replaced, and locks it, because nfsconf(8) does so while it changes a file. The
// result is no open file if there is none to replace.
Result<FileDescriptor> OpenOriginal(const std::string& path) {
  FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY));
  struct stat stat {};
  if (!file && errno == ENOENT) return file;
  if (!file && errno == ELOOP) return Status::Failure(EINVAL, path + " is no regular file");
  if (!file || fstat(file.get(), &stat) != 0) return Status::System(errno, path);
  if (!S_ISREG(stat.st_mode)) return Status::Failure(EINVAL, path + " is no regular file");
  if (Status status = LockFile(file, path, kOtherWritersLimit); !status.ok()) return status;
  return file;
}

Status Fill(TemporaryFile* temporary, const FileDescriptor& original, const std::string& path, std::string_view text,
            mode_t mode) {
  if (!temporary->status().ok()) return temporary->status();
  // The mode is set last, because a write clears the set-id bits.
  if (Status status = temporary->Write(text); !status.ok()) return status;
  Status status = original ? temporary->CopyAttributes(original, path) : temporary->SetMode(mode);
  return status.ok() ? temporary->Sync() : status;
}

}  // namespace

bool IsSameFile(const FileStamp& a, const FileStamp& b) {
  if (a.exists != b.exists || !a.exists) return a.exists == b.exists;
  return a.device == b.device && a.inode == b.inode && a.size == b.size && a.modified == b.modified &&
         a.changed == b.changed;
}

Result<FileStamp> StampOfFile(const std::string& path) {
  struct stat file {};
  if (lstat(path.c_str(), &file) == 0) return StampOf(file);
  if (errno == ENOENT || errno == ENOTDIR) return FileStamp{};
  return Status::System(errno, path);
}

std::int64_t FileClock() {
  timespec now{};
  clock_gettime(CLOCK_REALTIME_COARSE, &now);
  return Nanoseconds(now);
}

bool IsSettled(const FileStamp& stamp, std::int64_t now) {
  if (!stamp.exists) return true;  // it can only appear
  const bool may_be_whole_seconds = stamp.changed % kSecond == 0;
  return may_be_whole_seconds ? stamp.changed + kSecond <= now : stamp.changed < now;
}

Status WriteAll(int file, std::string_view text, const std::string& name) {
  while (!text.empty()) {
    const ssize_t size = write(file, text.data(), text.size());
    if (size < 0 && errno == EINTR) continue;
    if (size < 0) return Status::System(errno, name);
    text.remove_prefix(static_cast<std::size_t>(size));
  }
  return {};
}

Status ChangedBehind(const std::string& path, const char* file, int line) {
  return Status::Failure(kChangedBehind, path + " was changed by somebody else meanwhile", file, line);
}

Result<FileText> ReadFile(const std::string& path) {
  // O_NONBLOCK: opening a FIFO or a device must not block.
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY));
  struct stat stat {};
  if (!file || fstat(file.get(), &stat) != 0) return Status::System(errno, path);
  if (!S_ISREG(stat.st_mode)) return Status::Failure(EINVAL, path + " is no regular file");
  constexpr int kMostReads = 10;
  for (int reads = 1;; ++reads) {
    Result<std::string> text = ReadAll(file.get(), static_cast<std::size_t>(stat.st_size), path);
    if (!text.ok()) return text.status();
    // A file that is written in place while it is read can give parts of two contents.
    const FileStamp before = StampOf(stat);
    if (fstat(file.get(), &stat) != 0) return Status::System(errno, path);
    if (IsSameFile(StampOf(stat), before) || reads == kMostReads) return FileText{std::move(*text), before};
    if (lseek(file.get(), 0, SEEK_SET) != 0) return Status::System(errno, path);
  }
}

Result<FileText> ReadFileOrNothing(const std::string& path) {
  Result<FileText> file = ReadFile(path);
  if (!file.ok() && file.status().code() == ENOENT) return FileText{};
  return file;
}

Result<std::vector<std::string>> ListFolder(const std::string& path) {
  std::vector<std::string> names;
  std::error_code failure;
  for (const fs::directory_entry& entry : fs::directory_iterator(path, failure)) {
    names.push_back(entry.path().filename().string());
  }
  const bool is_missing = failure == std::errc::no_such_file_or_directory || failure == std::errc::not_a_directory;
  if (failure && !is_missing) return Status::System(failure.value(), path);
  return names;
}

Status MakeFolders(const std::string& path) {
  const fs::path folder(path);
  if (folder.empty() || access(path.c_str(), F_OK) == 0) return {};
  if (Status status = MakeFolders(folder.parent_path()); !status.ok()) return status;
  if (mkdir(path.c_str(), 0755) != 0 && errno != EEXIST) return Status::System(errno, path);
  if (chmod(path.c_str(), 0755) != 0) return Status::System(errno, path);
  return SyncFolder(folder.parent_path());
}

Result<FileStamp> ReplaceFile(const std::string& path, std::string_view text, const FileStamp& expected, mode_t mode) {
  const fs::path folder = fs::path(path).parent_path();
  if (Status status = MakeFolders(folder); !status.ok()) return status;
  const Result<FileDescriptor> original = OpenOriginal(path);
  if (!original.ok()) return original.status();

  RemoveLeftovers(path);
  TemporaryFile temporary(path);
  if (Status status = Fill(&temporary, *original, path, text, mode); !status.ok()) return status;
  if (Status status = CheckUnchanged(path, expected); !status.ok()) return status;
  if (Status status = temporary.Replace(path, expected); !status.ok()) return status;
  if (Status status = SyncFolder(folder); !status.ok()) return status;
  return temporary.stamp();
}

Status RemoveFile(const std::string& path, const FileStamp& expected) {
  if (Status status = CheckUnchanged(path, expected); !status.ok()) return status;
  RemoveLeftovers(path);
  if (unlink(path.c_str()) != 0 && errno != ENOENT) return Status::System(errno, path);
  return SyncFolder(fs::path(path).parent_path());
}

Status ConfirmFile(const std::string& path) {
  const fs::path folder = fs::path(path).parent_path();
  if (access(folder.c_str(), F_OK) != 0) return {};  // no writer ever began
  RemoveLeftovers(path);
  return SyncFolder(folder);
}

void RemoveLeftovers(const std::string& path) {
  std::error_code ignored;
  const std::string begin = TemporaryPath(path, "").filename().string();
  for (const fs::directory_entry& entry : fs::directory_iterator(fs::path(path).parent_path(), ignored)) {
    const std::string name = entry.path().filename().string();
    const bool ours = name.size() == begin.size() + std::strlen(kUnique) && name.compare(0, begin.size(), begin) == 0;
    if (ours) unlink(entry.path().c_str());
  }
}

}  // namespace vorn
