#include "mapping_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

namespace vorn {
namespace {

bool IsSame(const timespec& a, const timespec& b) { return a.tv_sec == b.tv_sec && a.tv_nsec == b.tv_nsec; }

// The file is only ever replaced (rename(2)), so that one inode has one content.
bool IsSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino && a.st_size == b.st_size && IsSame(a.st_mtim, b.st_mtim) &&
         IsSame(a.st_ctim, b.st_ctim);
}

// Returns errno(3), or 0 and the content of the file.
int ReadAll(int file, std::string* text) {
  char buffer[1 << 16];
  for (;;) {
    const ssize_t count = read(file, buffer, sizeof buffer);
    if (count == 0) return 0;
    if (count > 0) text->append(buffer, static_cast<std::size_t>(count));
    if (count < 0 && errno != EINTR) return errno;
  }
}

}  // namespace

OpenFile::~OpenFile() {
  if (number_ >= 0) close(number_);
}

const MappingTable* MappingFile::Current(int* error) {
  struct stat now {};
  *error = stat(path_.c_str(), &now) == 0 ? 0 : errno;
  const bool is_missing = *error == ENOENT || *error == ENOTDIR;
  if (*error == 0 && !(table_ && IsSameFile(now, read_))) *error = Read();
  if (is_missing) *error = 0;
  return *error == 0 && table_ ? &*table_ : nullptr;
}

int MappingFile::Read() {
  OpenFile file(open(path_.c_str(), O_RDONLY | O_CLOEXEC));
  if (file.number() < 0) return errno;
  struct stat opened {};
  if (fstat(file.number(), &opened) != 0) return errno;
  std::string text;
  if (const int error = ReadAll(file.number(), &text); error != 0) return error;
  std::optional<MappingTable> table = MappingTable::Parse(std::move(text));
  if (!table) return EBADMSG;
  table_ = std::move(table);
  file_.Swap(&file);
  read_ = opened;
  return 0;
}

}  // namespace vorn
