// A file descriptor with an owner.
#ifndef VORN_SERVER_UNIQUE_FD_H
#define VORN_SERVER_UNIQUE_FD_H

#include <unistd.h>

#include <utility>

namespace vorn::server {

class UniqueFd {
 public:
  UniqueFd() = default;
  explicit UniqueFd(int fd) : fd_(fd) {}
  UniqueFd(UniqueFd&& other) noexcept : fd_(other.release()) {}
  UniqueFd& operator=(UniqueFd&& other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  ~UniqueFd() {
    if (fd_ >= 0) close(fd_);
  }

  explicit operator bool() const { return fd_ >= 0; }
  int get() const { return fd_; }
  int release() { return std::exchange(fd_, -1); }

 private:
  int fd_ = -1;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_UNIQUE_FD_H
