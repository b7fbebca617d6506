// Records the changes of a box.
#ifndef VORN_LINUX_BOX_CHANGE_RECORDER_H
#define VORN_LINUX_BOX_CHANGE_RECORDER_H

#include <optional>
#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// A box calls these on the thread that makes the change, which owns the configuration lock. A change is everything that
// one thread does between the construction and the destruction of its outermost ConfigurationLock; in a call
// (platform/call.h) it is everything that the call does, with the service operations for which it releases the lock. No
// operation fails: a change that cannot be recorded is made all the same, and a warning (notice.h) says so.
class ChangeRecorder {
 public:
  ChangeRecorder() = default;
  virtual ~ChangeRecorder() = default;
  ChangeRecorder(const ChangeRecorder&) = delete;
  ChangeRecorder& operator=(const ChangeRecorder&) = delete;

  // Whether changes are recorded at present. May be called without the lock.
  virtual bool IsOn() = 0;

  // The file at `path` is about to contain `text`, or to be removed if there is none. The record of this is durable
  // afterwards.
  virtual void Intend(const std::string& path, std::optional<std::string_view> text) = 0;

  // The change of the file was made, or failed and left the file as it was.
  virtual void Settle(const std::string& path, const Status& status) = 0;

  // The service operation `action` was attempted.
  virtual void NoteAction(const std::string& action, const Status& status) = 0;

  // The change is complete. Throws nothing.
  virtual void End() noexcept = 0;

  // The thread releases the lock before its change is complete. Returns whether it has begun a change for which this is
  // the first time.
  virtual bool Postpone() = 0;

  // The thread cannot own the lock again to end its change; `reason` says why. Called without the lock. Throws nothing.
  virtual void Abandon(const Status& reason) noexcept = 0;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_CHANGE_RECORDER_H
