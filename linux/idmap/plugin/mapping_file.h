// The mapping table of a box as a long-running daemon follows it.
#ifndef VORN_LINUX_IDMAP_PLUGIN_MAPPING_FILE_H
#define VORN_LINUX_IDMAP_PLUGIN_MAPPING_FILE_H

#include <sys/stat.h>

#include <optional>
#include <string>
#include <utility>

#include "mapping_table.h"

namespace vorn {

// The owner of an open file, or of none.
class OpenFile {
 public:
  OpenFile() = default;
  explicit OpenFile(int number) : number_(number) {}
  ~OpenFile();
  OpenFile(const OpenFile&) = delete;
  OpenFile& operator=(const OpenFile&) = delete;

  int number() const { return number_; }
  void Swap(OpenFile* other) { std::swap(number_, other->number_); }

 private:
  int number_ = -1;
};

// Reads the table again when another file has taken its path, which costs one stat(2) per question. Not thread-safe,
// like libnfsidmap itself.
class MappingFile {
 public:
  explicit MappingFile(std::string path) : path_(std::move(path)) {}

  // The table in force. nullptr with `*error` 0: there has been no table since the object exists. nullptr with another
  // `*error` (errno(3); EBADMSG for a file that is no table): there is one, and it cannot be read. A table that was
  // read stays in force if its file disappears.
  const MappingTable* Current(int* error);

 private:
  int Read();

  const std::string path_;
  OpenFile file_;        // what table_ was read from; open, so that no later file gets its inode number
  struct stat read_ {};  // of file_
  std::optional<MappingTable> table_;
};

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_PLUGIN_MAPPING_FILE_H
