// Reads the small files that an administrator writes for vornd: its settings, its certificate and its key.
#ifndef VORN_SERVER_SMALL_FILE_H
#define VORN_SERVER_SMALL_FILE_H

#include <sys/types.h>

#include <optional>
#include <string>

namespace vorn::server {

struct SmallFile {
  std::string text;
  mode_t mode = 0;  // the permission bits
};

// Returns the content of a regular file of at most 1 MiB. Returns std::nullopt on failure, with the reason in `error`
// and in errno; it is ENOENT if there is no such file.
std::optional<SmallFile> ReadSmallFile(const std::string& path, std::string* error);

}  // namespace vorn::server

#endif  // VORN_SERVER_SMALL_FILE_H
