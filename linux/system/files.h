// Whole files: reading, and atomic durable replacement. Paths are those of this system, as Root::Locate
// returns them: the last component is no symbolic link. All functions may be called from several threads.
#ifndef VORN_LINUX_SYSTEM_FILES_H
#define VORN_LINUX_SYSTEM_FILES_H

#include <sys/stat.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

// Identifies one state of a file. A write compares the state that it read with the present one, and so
// notices an edit in between.
struct FileStamp {
  bool exists = false;
  dev_t device = 0;
  ino_t inode = 0;
  off_t size = 0;
  std::int64_t modified = 0;  // mtime, nanoseconds since the epoch
  std::int64_t changed = 0;   // ctime, nanoseconds since the epoch
};

// Whether both stamps are of one file in one state.
bool IsSameFile(const FileStamp& a, const FileStamp& b);

// The stamp of the file or folder at `path` (lstat(2)); one that does not exist has a stamp that says so.
Result<FileStamp> StampOfFile(const std::string& path);

// The clock of file timestamps, in nanoseconds since the epoch. It advances in ticks (jiffies).
std::int64_t FileClock();

// Whether every change of the file after the moment `now` (FileClock()) gives it another stamp. Two changes within one
// unit of its timestamps may have the same one. The unit is a tick of the clock, or a second where the file system
// stores whole seconds (ext2, ext3, and ext4 with inodes of 128 bytes).
bool IsSettled(const FileStamp& stamp, std::int64_t now);

// Returns the kChangedBehind failure for a file that was edited between reading and writing.
Status ChangedBehind(const std::string& path, const char* file = __builtin_FILE(), int line = __builtin_LINE());

struct FileText {
  std::string text;
  FileStamp stamp;
};

// Reads a regular file of at most 64 MiB. Fails with ENOENT if there is none.
Result<FileText> ReadFile(const std::string& path);

// The same, but a missing file reads as an empty one whose stamp does not exist.
Result<FileText> ReadFileOrNothing(const std::string& path);

// The names in a folder, unsorted, without "." and "..". A missing folder has none.
Result<std::vector<std::string>> ListFolder(const std::string& path);

// Writes all of `text` to an open file; `name` is for the failure.
Status WriteAll(int file, std::string_view text, const std::string& name);

// Creates the folder at `path` and those above it, durably and with mode 0755 whatever umask(2) is.
// Existing folders are left alone.
Status MakeFolders(const std::string& path);

// Makes the file at `path` contain `text`, atomically and durably: a reader sees the old file or the new
// one, also after a crash (fsync(2) of file and folder). An existing file keeps owner, mode, access control
// list, security label and other extended attributes; a new one gets `mode`. Missing folders are created. The
// existing file is locked (flock(2)) meanwhile, and one that another program keeps locked fails with kLockTimeout.
// A file that is a mount point cannot be replaced and fails with EBUSY. Fails with kChangedBehind, and leaves the file
// alone, if it is no longer in the state `expected`. The two files are exchanged (renameat2(2)), so that even an edit
// during the call is noticed; a file system without RENAME_EXCHANGE misses an edit of the last moment.
// Returns the stamp of the new file: a later edit has another one, also an edit that follows immediately.
// The caller holds the configuration lock: two calls for one file would disturb each other.
Result<FileStamp> ReplaceFile(const std::string& path, std::string_view text, const FileStamp& expected,
                              mode_t mode = 0644);

// Removes the file at `path` durably. Fails with kChangedBehind if it is not in the state `expected`. The
// caller holds the configuration lock.
Status RemoveFile(const std::string& path, const FileStamp& expected);

// Completes an interrupted ReplaceFile of a file that already has the wanted content: removes the temporary
// files of killed writers and makes the folder durable. The caller holds the configuration lock.
Status ConfirmFile(const std::string& path);

// Removes the temporary files that killed writers left beside the file at `path`. ReplaceFile and
// ConfirmFile do this themselves. The caller holds the configuration lock.
void RemoveLeftovers(const std::string& path);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_FILES_H
