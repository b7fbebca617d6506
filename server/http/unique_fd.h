// A file descriptor with an owner. The platform library has a class of its own (linux/system/file_descriptor.h): the
// server and the platform share nothing but platform/, which is C and contains no helpers.
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
  // Closes the descriptor that this object owned.
  UniqueFd& operator=(UniqueFd&& other) noexcept {
    const UniqueFd former(std::exchange(fd_, other.release()));
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
