#include "upload.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>
#include <utility>

namespace vorn::server {
namespace {

// Returns whether the path is a folder, not a symbolic link, that the server's user owns.
bool IsPrivateFolder(const std::string& path) {
  struct stat there {};
  if (lstat(path.c_str(), &there) != 0) return false;
  errno = ENOTDIR;
  if (!S_ISDIR(there.st_mode)) return false;
  errno = EPERM;
  return there.st_uid == geteuid() && chmod(path.c_str(), 0700) == 0;
}

}  // namespace

Upload::Upload(std::string path, UniqueFd file) : path_(std::move(path)), file_(std::move(file)) {}

Upload::Upload(Upload&& other) noexcept : path_(std::exchange(other.path_, {})), file_(std::move(other.file_)) {}

Upload::~Upload() {
  if (!path_.empty()) unlink(path_.c_str());
}

bool Upload::Append(std::string_view data) {
  while (!data.empty()) {
    const ssize_t written = write(file_.get(), data.data(), data.size());
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) return false;
    data.remove_prefix(static_cast<std::size_t>(written));
  }
  return true;
}

// close(2) must not be repeated after EINTR.
bool Upload::Close() { return close(file_.release()) == 0 || errno == EINTR; }

UploadFolder::UploadFolder(std::string path) : path_(std::move(path)) {}

std::optional<UploadFolder> UploadFolder::Open(const std::string& path, std::string* error) {
  const bool there = mkdir(path.c_str(), 0700) == 0 || errno == EEXIST;
  if (!there || !IsPrivateFolder(path)) {
    *error = path + ": " + std::strerror(errno);
    return std::nullopt;
  }
  std::error_code failure;
  for (const auto& left : std::filesystem::directory_iterator(path, failure)) {
    std::filesystem::remove_all(left.path(), failure);
    if (failure) break;
  }
  if (!failure) return UploadFolder(path);
  *error = path + ": what was left there cannot be removed: " + failure.message();
  return std::nullopt;
}

// A file may be removed while its size is read.
UploadFolder::Contents UploadFolder::Count() const {
  Contents contents;
  std::error_code failure;
  for (auto each = std::filesystem::directory_iterator(path_, failure); !failure && each != end(each);
       each.increment(failure)) {
    std::error_code removed;
    const std::uintmax_t bytes = each->file_size(removed);
    if (removed) continue;
    ++contents.files;
    contents.bytes += bytes;
  }
  return contents;
}

std::optional<Upload> UploadFolder::Create() const {
  std::string path = path_ + "/XXXXXX";
  UniqueFd file(mkostemp(path.data(), O_CLOEXEC));
  if (!file) return std::nullopt;
  return Upload(std::move(path), std::move(file));
}

}  // namespace vorn::server
