// A box for hostile requests. Its files have an administrator's lines beside those that requests may
// change, and its files are checked byte for byte after a request.
#ifndef VORN_TESTS_SUPPORT_LINUX_GUARDED_BOX_H
#define VORN_TESTS_SUPPORT_LINUX_GUARDED_BOX_H

#include <cstddef>
#include <string>
#include <vector>

#include "temporary_root.h"

// The box has the share "data" at /volume1/data and the users alice and bob. Service operations are only recorded.
class GuardedBox {
 public:
  GuardedBox();

  const TemporaryRoot& root() const { return root_; }

  // Returns the damage that requests did, one sentence each: a changed line of the administrator's, more than
  // `mappings` new ID mappings, a file that its readers refuse, invisible characters, a temporary file.
  std::vector<std::string> Faults(std::size_t mappings) const;

  // Returns whether every file has its initial content.
  bool IsUntouched() const;

  // Restores the initial content of every file.
  void Restore() const;

 private:
  TemporaryRoot root_;
};

#endif  // VORN_TESTS_SUPPORT_LINUX_GUARDED_BOX_H
