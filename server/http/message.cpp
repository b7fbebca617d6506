#include "message.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "header_value.h"
#include "unique_fd.h"

namespace vorn::server {
namespace {

class FileBody : public BodySource {
 public:
  FileBody(UniqueFd file, std::uint64_t size) : file_(std::move(file)), left_(size), size_(size) {}

  std::optional<std::uint64_t> Size() const override { return size_; }

  ssize_t Read(char* data, std::size_t size) override {
    if (left_ == 0) return 0;
    ssize_t count = 0;
    do {
      count = read(file_.get(), data, static_cast<std::size_t>(std::min<std::uint64_t>(size, left_)));
    } while (count < 0 && errno == EINTR);
    if (count <= 0) return -1;  // the file has become shorter than the announced length
    left_ -= static_cast<std::uint64_t>(count);
    return count;
  }

 private:
  UniqueFd file_;
  std::uint64_t left_;
  const std::uint64_t size_;
};

}  // namespace

std::optional<std::string_view> Head::Header(std::string_view name) const {
  for (const auto& [header, value] : headers) {
    if (EqualsIgnoringCase(header, name)) return value;
  }
  return std::nullopt;
}

std::size_t Head::Count(std::string_view name) const {
  return static_cast<std::size_t>(std::count_if(
      headers.begin(), headers.end(), [name](const auto& header) { return EqualsIgnoringCase(header.first, name); }));
}

std::shared_ptr<BodySource> OpenFileBody(const std::string& path) {
  // O_NONBLOCK: opening a FIFO must not wait for its writer.
  UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status {};
  if (!file || fstat(file.get(), &status) != 0) return nullptr;
  if (!S_ISREG(status.st_mode)) {
    errno = EINVAL;
    return nullptr;
  }
  return std::make_shared<FileBody>(std::move(file), static_cast<std::uint64_t>(status.st_size));
}

}  // namespace vorn::server
