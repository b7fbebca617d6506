// The root directory: every path that the platform reads or writes is below it. It is "/" on a box, and
// any other folder for a trial or a test.
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

  // The root of this process: the environment variable VORN_ROOT, or "/". It is read at each call, so
  // that one test process can use several roots. It must not change while another thread calls this.
  static Root Current();

  bool is_box() const { return directory_ == "/"; }
  const std::string& directory() const { return directory_; }

  // The path on this system of the box's `path` ("/etc/exports"). Symbolic links are followed as the box
  // would see them: the target of an absolute link, and "..", stay below the root. The file, and any
  // folder above it, need not exist. Fails on a loop of links and on a relative path.
  Result<std::string> Locate(std::string_view path) const;

  // The box's path of a path that Locate returned: "/volume1/data", without links.
  std::string OnBox(const std::string& located) const;

 private:
  std::string directory_;
};

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_ROOT_H
