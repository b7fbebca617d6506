#include "small_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstring>

#include "unique_fd.h"

namespace vorn::server {
namespace {

constexpr off_t kMaxBytes = off_t{1} << 20;

std::nullopt_t Fail(const std::string& path, int code, const char* reason, std::string* error) {
  *error = path + ": " + reason;
  errno = code;
  return std::nullopt;
}

}  // namespace

std::optional<SmallFile> ReadSmallFile(const std::string& path, std::string* error) {
  const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status {};
  if (!file || fstat(file.get(), &status) != 0) return Fail(path, errno, std::strerror(errno), error);
  if (!S_ISREG(status.st_mode)) return Fail(path, EINVAL, "not a regular file", error);
  if (status.st_size > kMaxBytes) return Fail(path, EFBIG, "larger than 1 MiB", error);
  std::string text(static_cast<std::size_t>(status.st_size), '\0');
  const ssize_t count = read(file.get(), text.data(), text.size());
  if (count < 0) return Fail(path, errno, std::strerror(errno), error);
  text.resize(static_cast<std::size_t>(count));
  return SmallFile{std::move(text), status.st_mode & 07777};
}

}  // namespace vorn::server
