// The directory under which everything lives that the platform reads or writes: "/" on a box, any
// other folder for a trial or a test.
#ifndef VORN_LINUX_SYSTEM_ROOT_H
#define VORN_LINUX_SYSTEM_ROOT_H

#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

class Root {
 public:
  // `directory` must be an absolute path; "" and "/" are the box itself.
  explicit Root(std::string directory);

  // The root of this process: the environment variable VORN_ROOT, or "/". Read at each call, so that
  // one test process can visit several roots; nobody changes it while requests run.
  static Root Current();

  bool is_box() const { return directory_ == "/"; }
  const std::string& directory() const { return directory_; }

  // Where the box's `path` ("/etc/exports") is on this system. Symbolic links are followed as the
  // box would see them: an absolute one, and "..", stay below the root. The last name (and so any
  // folder above it) need not exist. Fails on a loop of links and on a relative path.
  Result<std::string> Locate(std::string_view path) const;

  // What the box calls a place that Locate found: "/volume1/data", without links.
  std::string OnBox(const std::string& located) const;

 private:
  std::string directory_;
};

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_ROOT_H
