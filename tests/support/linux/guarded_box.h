// A box on which hostile requests are tried: its files hold an administrator's lines beside those that
// requests may change, and whatever a request leaves in them is looked at byte for byte.
#ifndef VORN_TESTS_SUPPORT_LINUX_GUARDED_BOX_H
#define VORN_TESTS_SUPPORT_LINUX_GUARDED_BOX_H

#include <cstddef>
#include <string>
#include <vector>

#include "temporary_root.h"

// Its share is "data" at /volume1/data, its people are alice and bob, its service is only kept book of.
class GuardedBox {
 public:
  GuardedBox();

  const TemporaryRoot& root() const { return root_; }

  // Returns the damage that requests did, one sentence each: a changed line of the administrator's, more than
  // `mappings` new ID mappings, a file that its readers refuse, invisible characters, a temporary file.
  std::vector<std::string> Faults(std::size_t mappings) const;

  // Whether every file is as it was at first.
  bool IsUntouched() const;

  // Makes it so.
  void Restore() const;

 private:
  TemporaryRoot root_;
};

#endif  // VORN_TESTS_SUPPORT_LINUX_GUARDED_BOX_H
