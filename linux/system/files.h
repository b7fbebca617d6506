// Whole files: read at once, replaced at once.
#ifndef VORN_LINUX_SYSTEM_FILES_H
#define VORN_LINUX_SYSTEM_FILES_H

#include <sys/stat.h>

#include <cstdint>
#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// What a file was when it was read, so that a later write notices somebody else's edit.
struct FileStamp {
  bool exists = false;
  dev_t device = 0;
  ino_t inode = 0;
  off_t size = 0;
  std::int64_t modified = 0;  // nanoseconds since the epoch
  std::int64_t changed = 0;   // likewise, of the inode
};

// Whether both are of one file in one state.
bool IsSameFile(const FileStamp& a, const FileStamp& b);

// The failure of a write that would lose somebody's edit of the file at `path`.
Status ChangedBehind(const std::string& path, const char* file = __builtin_FILE(), int line = __builtin_LINE());

struct FileText {
  std::string text;
  FileStamp stamp;
};

// The file at `path`, a path of this system as Root::Locate gives it: its last name is no link. A
// regular file of at most 64 MiB. Fails with ENOENT when there is none.
Result<FileText> ReadFile(const std::string& path);

// Likewise; no file reads as an empty one, with a stamp that says so.
Result<FileText> ReadFileOrNothing(const std::string& path);

// Makes the folder at `path`, durably, and those above it; open to read for everybody, whatever
// umask(2) says. One that is there stays as it is.
Status MakeFolders(const std::string& path);

// Makes the file at `path` hold `text`, durably (fsync(2) of file and folder), in one step: a reader
// sees the old file or the new one, whatever happens on the way. An existing file keeps its owner
// and mode, a new one gets `mode`; neither depends on umask(2). Missing folders are made. Fails with
// kChangedBehind, and leaves the file alone, when it is no longer the one that `expected` was taken
// of: an edit by hand at any moment is noticed if it is over when the files change places
// (renameat2(2)); a file system that cannot exchange files notices all but those of the last instant.
// The caller holds the configuration lock: two writers of one file would disturb each other.
Status ReplaceFile(const std::string& path, std::string_view text, const FileStamp& expected, mode_t mode = 0644);

// For a file that holds already what it should: ends what a killed writer of it began. Its temporary
// file goes, and what it put in place is made durable. The caller holds the configuration lock.
Status ConfirmFile(const std::string& path);

// Removes the temporary files that killed writers of the file at `path` left beside it. The two
// above do so themselves; the caller holds the configuration lock.
void RemoveLeftovers(const std::string& path);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_FILES_H
