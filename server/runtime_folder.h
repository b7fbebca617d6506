// ROOT/run/vorn, the folder of the server's socket and uploads.
#ifndef VORN_SERVER_RUNTIME_FOLDER_H
#define VORN_SERVER_RUNTIME_FOLDER_H

#include <optional>
#include <string>

#include "unique_fd.h"

namespace vorn::server {

// One server at a time owns the folder. The kernel releases the lock when the process dies (flock(2)).
class RuntimeFolder {
 public:
  // Creates the folder below `root`, a canonical path, and locks it. Returns std::nullopt on failure, for
  // example if another server owns it; `error` then has the reason.
  static std::optional<RuntimeFolder> Claim(const std::string& root, std::string* error);

  const std::string& path() const { return path_; }

 private:
  RuntimeFolder(std::string path, UniqueFd folder);

  std::string path_;
  UniqueFd folder_;  // owns the lock
};

}  // namespace vorn::server

#endif  // VORN_SERVER_RUNTIME_FOLDER_H
