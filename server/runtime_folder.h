// ROOT/run/vorn, the folder that the server keeps its socket and its uploads in.
#ifndef VORN_SERVER_RUNTIME_FOLDER_H
#define VORN_SERVER_RUNTIME_FOLDER_H

#include <optional>
#include <string>

#include "unique_fd.h"

namespace vorn::server {

// One server at a time has it; a killed one leaves no claim behind (flock(2)).
class RuntimeFolder {
 public:
  // Makes the folder below `root`, a canonical path, and claims it. None on failure (another server
  // has it, for one); `error` then says why.
  static std::optional<RuntimeFolder> Claim(const std::string& root, std::string* error);

  const std::string& path() const { return path_; }

 private:
  RuntimeFolder(std::string path, UniqueFd folder);

  std::string path_;
  UniqueFd folder_;  // holds the claim
};

}  // namespace vorn::server

#endif  // VORN_SERVER_RUNTIME_FOLDER_H
