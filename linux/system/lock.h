// The configuration lock: one writer at a time, over all threads and processes of one root.
#ifndef VORN_LINUX_SYSTEM_LOCK_H
#define VORN_LINUX_SYSTEM_LOCK_H

#include <string>

#include "status.h"

namespace vorn {

// Holds the lock of the current root while it lives, in the thread that made it. Nests within a
// thread. The lock is that of an open file (flock(2) on ROOT/run/vorn/config.lock), so a killed
// holder leaves none behind, and a child of fork(2) shares its parent's until it runs a program.
class ConfigurationLock {
 public:
  ConfigurationLock();  // waits for its turn
  ~ConfigurationLock();
  ConfigurationLock(const ConfigurationLock&) = delete;
  ConfigurationLock& operator=(const ConfigurationLock&) = delete;

  // Whether the lock was taken, and if not, why.
  const Status& status() const { return status_; }

 private:
  std::string directory_;  // of the root that it is for
  Status status_;
};

// Lets others have what this thread holds, however often and of however many roots, while this
// object lives: for waits that must not keep others from reading. At the end the locks are taken
// again, in the order in which they were taken first. A lock made during the pause ends within it.
// A lock that cannot be had again fails for those who nest in it afterwards.
class LockPause {
 public:
  LockPause();
  ~LockPause();
  LockPause(const LockPause&) = delete;
  LockPause& operator=(const LockPause&) = delete;
};

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_LOCK_H
