// The configuration lock and context: one writer at a time, over all threads and processes of one box.
#ifndef VORN_LINUX_BOX_CONFIGURATION_LOCK_H
#define VORN_LINUX_BOX_CONFIGURATION_LOCK_H

#include <chrono>
#include <string>

#include "box.h"
#include "status.h"

namespace vorn {

constexpr char kConfigurationLockFile[] = "/run/vorn/config.lock";
constexpr std::chrono::seconds kConfigurationLockLimit{20};

// The thread that constructs an object owns the box's configuration lock until it destroys it. Objects of
// one thread nest; the outermost one is the configuration context, which also remembers the first version
// read of each file (see FirstReads). In a call that may not write an object takes no lock and succeeds.
//
// The lock is a file lock on /run/vorn/config.lock: the kernel releases it when the process dies, and a child
// of fork(2) shares it until it runs a program. Waiting for it fails with kLockTimeout after `limit`.
class ConfigurationLock {
 public:
  explicit ConfigurationLock(Box& box, std::chrono::milliseconds limit = kConfigurationLockLimit);
  ~ConfigurationLock();
  ConfigurationLock(const ConfigurationLock&) = delete;
  ConfigurationLock& operator=(const ConfigurationLock&) = delete;

  // Whether the lock was taken, and if not, why.
  const Status& status() const { return status_; }

 private:
  Box& box_;
  Status status_;
  bool entered_ = false;
};

// Releases all configuration locks of this thread while the object lives, for waits during which others
// must be able to write. The destructor takes the locks again in their first order; a failure is reported
// by the next ConfigurationLock, which retries. A lock that is taken during the pause ends within it.
class LockPause {
 public:
  LockPause();
  ~LockPause();
  LockPause(const LockPause&) = delete;
  LockPause& operator=(const LockPause&) = delete;
};

// The versions that the configuration context of this thread read first. Without a context nothing is
// remembered and every check succeeds.
class FirstReads {
 public:
  // Remembers the version of the file at `path`, unless one is remembered.
  static void Note(Box& box, const std::string& path, const Version& version);

  // Fails with kChangedBehind if `version` is not the remembered one: another writer changed the file
  // since the context read it.
  static Status Check(Box& box, const std::string& path, const Version& version);

  // Remembers the version that the context has written itself.
  static void Renew(Box& box, const std::string& path, const Version& version);
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_CONFIGURATION_LOCK_H
