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
// kChangedBehind, and writes nothing, when the file is no longer the one that `expected` was taken
// of. The caller holds the configuration lock: two writers of one file would disturb each other.
Status ReplaceFile(const std::string& path, std::string_view text, const FileStamp& expected, mode_t mode = 0644);

// Removes the temporary files that killed writers of the file at `path` left beside it.
// ReplaceFile does so itself; the caller holds the configuration lock.
void RemoveLeftovers(const std::string& path);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_FILES_H
