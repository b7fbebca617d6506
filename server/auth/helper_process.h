// The process of the program that checks one password (pam_helper.cpp).
#ifndef VORN_SERVER_HELPER_PROCESS_H
#define VORN_SERVER_HELPER_PROCESS_H

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

#include "password_helper.h"
#include "unique_fd.h"

namespace vorn::server {

// The destructor kills the process, with the processes that PAM modules have started in its process group, and reaps
// it.
class HelperProcess {
 public:
  // Starts the program `command[0]` and sends it the request. Returns std::nullopt on failure, with the reason in
  // `error`.
  static std::optional<HelperProcess> Start(const std::vector<std::string>& command, const PasswordRequest& request,
                                            std::string* error);
  HelperProcess(HelperProcess&& other) noexcept;
  HelperProcess& operator=(HelperProcess&&) = delete;
  ~HelperProcess();

  // Becomes readable when there is a verdict, and when the process ends without one.
  int descriptor() const { return socket_.get(); }

  // Returns std::nullopt if there is none yet. A process that has ended without one has the verdict kUnavailable.
  std::optional<PasswordVerdict> Verdict() const;

 private:
  HelperProcess(pid_t pid, UniqueFd socket) : pid_(pid), socket_(std::move(socket)) {}

  pid_t pid_;
  UniqueFd socket_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_HELPER_PROCESS_H
