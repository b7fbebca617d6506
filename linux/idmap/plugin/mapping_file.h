// The mapping table of a box as a long-running daemon follows it.
#ifndef VORN_LINUX_IDMAP_PLUGIN_MAPPING_FILE_H
#define VORN_LINUX_IDMAP_PLUGIN_MAPPING_FILE_H

#include <sys/stat.h>

#include <optional>
#include <string>

#include "mapping_table.h"

namespace vorn {

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
  struct stat read_ {};  // the file that table_ was read from
  std::optional<MappingTable> table_;
};

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_PLUGIN_MAPPING_FILE_H
