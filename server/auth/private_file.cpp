#include "private_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "unique_fd.h"

namespace vorn::server {
namespace {

constexpr off_t kMaxBytes = off_t{16} * 1024 * 1024;

bool Fail(const std::string& path, const char* reason, std::string* error) {
  *error = path + ": " + reason;
  return false;
}

bool IsPrivate(const UniqueFd& file, const std::string& path, std::string* error) {
  struct stat status {};
  if (fstat(file.get(), &status) != 0) return Fail(path, std::strerror(errno), error);
  if (!S_ISREG(status.st_mode)) return Fail(path, "not a regular file", error);
  if ((status.st_mode & 077) != 0) return Fail(path, "other users may use it; its mode must be 0600", error);
  if (status.st_uid != geteuid()) return Fail(path, "it belongs to another user", error);
  if (status.st_size > kMaxBytes) return Fail(path, "it is too large", error);
  return true;
}

bool WriteAll(int file, std::string_view data) {
  while (!data.empty()) {
    const ssize_t written = write(file, data.data(), data.size());
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) return false;
    data.remove_prefix(static_cast<std::size_t>(written));
  }
  return true;
}

bool SyncFolder(const std::string& path) {
  const UniqueFd folder(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return folder && fsync(folder.get()) == 0;
}

}  // namespace

std::optional<std::string> ReadPrivateFile(const std::string& path, std::string* error) {
  const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
  if (!file && errno == ENOENT) return "";
  if (!file) {
    Fail(path, std::strerror(errno), error);
    return std::nullopt;
  }
  if (!IsPrivate(file, path, error)) return std::nullopt;
  std::string content;
  char piece[4096];
  ssize_t count = 0;
  while ((count = read(file.get(), piece, sizeof piece)) > 0) content.append(piece, static_cast<std::size_t>(count));
  if (count == 0) return content;
  Fail(path, std::strerror(errno), error);
  return std::nullopt;
}

// mkostemp(3) creates the file with mode 0600.
bool ReplacePrivateFile(const std::string& path, std::string_view content, std::string* error) {
  std::string temporary = path + ".XXXXXX";
  const UniqueFd file(mkostemp(temporary.data(), O_CLOEXEC));
  if (!file) return Fail(path, std::strerror(errno), error);
  if (WriteAll(file.get(), content) && fsync(file.get()) == 0 && rename(temporary.c_str(), path.c_str()) == 0) {
    if (SyncFolder(std::filesystem::path(path).parent_path())) return true;
    return Fail(path, std::strerror(errno), error);
  }
  const int failure = errno;
  unlink(temporary.c_str());
  return Fail(path, std::strerror(failure), error);
}

}  // namespace vorn::server
