// Uploaded files. Each exists until its request has been answered.
#ifndef VORN_SERVER_UPLOAD_H
#define VORN_SERVER_UPLOAD_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "unique_fd.h"

namespace vorn::server {

// A file that only the server's own user may read (mode 0600). The destructor removes it.
class Upload {
 public:
  Upload(std::string path, UniqueFd file);
  Upload(Upload&& other) noexcept;
  Upload& operator=(Upload&&) = delete;
  ~Upload();

  const std::string& path() const { return path_; }

  // Returns false, with errno set, if not all of the data could be written.
  bool Append(std::string_view data);

  // Closes the descriptor; the file stays. Returns false, with errno set, if the data could not be written.
  bool Close();

 private:
  std::string path_;
  UniqueFd file_;
};

// The folder of the uploads, with mode 0700.
class UploadFolder {
 public:
  // Creates the folder, or removes everything that a killed server left in it. Returns std::nullopt on failure,
  // with the reason in `error`.
  static std::optional<UploadFolder> Open(const std::string& path, std::string* error);

  // The files that exist at the moment. A folder that cannot be read is empty.
  struct Contents {
    std::size_t files = 0;
    std::uintmax_t bytes = 0;
  };
  Contents Count() const;

  // Creates an empty file with a unique name. Returns std::nullopt with errno set on failure.
  std::optional<Upload> Create() const;

 private:
  explicit UploadFolder(std::string path);

  std::string path_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_UPLOAD_H
