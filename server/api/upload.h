// Uploaded files, from their first byte to the end of their request.
#ifndef VORN_SERVER_UPLOAD_H
#define VORN_SERVER_UPLOAD_H

#include <optional>
#include <string>
#include <string_view>

#include "unique_fd.h"

namespace vorn::server {

// A file that nobody but the server's own user may read (mode 0600), removed with its object.
class Upload {
 public:
  Upload(std::string path, UniqueFd file);
  Upload(Upload&& other) noexcept;
  Upload& operator=(Upload&&) = delete;
  ~Upload();

  const std::string& path() const { return path_; }

  // False, with errno set, when not all of it could be written.
  bool Append(std::string_view data);

 private:
  std::string path_;
  UniqueFd file_;
};

// Where they are kept: a folder of mode 0700.
class UploadFolder {
 public:
  // Makes the folder and removes what a killed server has left in it. None on failure; `error` then
  // says why.
  static std::optional<UploadFolder> Open(const std::string& path, std::string* error);

  // A new, empty file under a name of its own. None with errno set.
  std::optional<Upload> Create() const;

 private:
  explicit UploadFolder(std::string path);

  std::string path_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_UPLOAD_H
