// A temporary folder for one test. The destructor removes it with its content.
#ifndef VORN_TESTS_SERVER_SANDBOX_H
#define VORN_TESTS_SERVER_SANDBOX_H

#include <chrono>
#include <functional>
#include <string>
#include <string_view>

namespace vorn::server {

class Sandbox {
 public:
  Sandbox();
  ~Sandbox();
  Sandbox(const Sandbox&) = delete;
  Sandbox& operator=(const Sandbox&) = delete;

  const std::string& path() const { return path_; }
  std::string File(const std::string& name) const { return path_ + "/" + name; }
  void Write(const std::string& name, std::string_view text) const;

 private:
  std::string path_;
};

std::string ReadWholeFile(const std::string& path);

// Longer than any step takes on the slowest machine. Reaching this limit is a failure.
constexpr std::chrono::seconds kGenerous{60};

// Polls `condition` until it is true. Returns false after the time limit.
bool Eventually(const std::function<bool()>& condition);

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_SANDBOX_H
