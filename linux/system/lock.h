// The configuration lock: one writer at a time, over all threads and processes of one root.
#ifndef VORN_LINUX_SYSTEM_LOCK_H
#define VORN_LINUX_SYSTEM_LOCK_H

#include "status.h"

namespace vorn {

// Holds the lock of the current root while it lives. Nests within a thread. The lock belongs to
// the process's open file (flock(2)), so a killed holder leaves none behind.
class ConfigurationLock {
 public:
  ConfigurationLock();  // waits for its turn
  ~ConfigurationLock();
  ConfigurationLock(const ConfigurationLock&) = delete;
  ConfigurationLock& operator=(const ConfigurationLock&) = delete;

  // Whether the lock is held, and if not, why.
  const Status& status() const { return status_; }

 private:
  Status status_;
};

// Lets others have the lock while this object lives, however often the thread holds it: for waits
// that must not keep others from reading. Takes it again at the end.
class LockPause {
 public:
  LockPause();
  ~LockPause();
  LockPause(const LockPause&) = delete;
  LockPause& operator=(const LockPause&) = delete;
};

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_LOCK_H
