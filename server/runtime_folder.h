// ROOT/run/vorn, the folder of the server's socket and uploads.
#ifndef VORN_SERVER_RUNTIME_FOLDER_H
#define VORN_SERVER_RUNTIME_FOLDER_H

#include <initializer_list>
#include <optional>
#include <string>

#include "unique_fd.h"

namespace vorn::server {

// Creates ROOT/NAMES[0]/NAMES[1]/..., as far as they are missing, and returns its canonical path. Returns std::nullopt
// on failure, for example if a link leads out of the root; `error` then has the reason. `root` is a canonical path.
std::optional<std::string> MakeFolders(const std::string& root, std::initializer_list<const char*> names,
                                       std::string* error);

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
