// The call context: what the server knows of the call that a thread is running, and what the platform
// has to say about it besides the operations' results. Our own addition to the contract: a platform
// works without it, and a module never sees it.
#ifndef VORN_PLATFORM_CALL_H
#define VORN_PLATFORM_CALL_H

#include <functional>
#include <string>
#include <vector>

namespace VORN {

class Draft;  // rehearsal.h

// One call, as the server sees it.
struct CallDescription {
  std::string caller;  // the authenticated account or token, for logs; empty when it is unknown
  std::string origin;  // the peer's address without a port, or "unix"
  std::string method;  // "VORN.Core.FileServ.NFS/v1/set"

  // The parameters as JSON on one line, without secrets, for the history; may be empty.
  std::string parameters;

  // Whether the call may change anything. In a call that may not, VornConf takes no lock, and each
  // operation that would write a file, drive a service, apply a live setting, reload the firewall or
  // run a program fails with EROFS in the error facility and changes nothing.
  bool may_write = true;

  // Absolute paths, on this system, of the files that were uploaded with the call. KLIBCFileExist and
  // VORNNFSKeytabImport open these where they are; they look for every other path below the root.
  std::vector<std::string> uploads;

  // The draft on which a rehearsed call works; null for a call that works on the box. It must outlive the call.
  // Warnings of a rehearsal are collected as usual; remarks about what was done are not logged.
  const Draft* draft = nullptr;

  // Whether the answer may tell the caller the reasons and warnings, which name files and settings of the box.
  bool sees_remarks = true;
};

// The context of the calling thread, from construction to destruction. Contexts of one thread nest:
// the innermost one counts. Construct and destroy an object in the same thread, around the entry
// function, and call End() behind it. Without a context a thread may write and has no uploads, and reasons and warnings
// are only logged.
class CallContext {
 public:
  explicit CallContext(CallDescription description);
  ~CallContext();
  CallContext(const CallContext&) = delete;
  CallContext& operator=(const CallContext&) = delete;

  // The context of this thread, or null.
  static CallContext* Current();

  const CallDescription& description() const;

  // Ends the call: the platform completes what it postponed to this moment, which may add warnings. A second call does
  // nothing; the destructor calls it. Throws nothing.
  void End() noexcept;

  // Sentences for the caller, in the order in which the platform found them, each once.
  const std::vector<std::string>& reasons() const;   // why operations of the call failed
  const std::vector<std::string>& warnings() const;  // what a caller should know of a call that succeeded

  // For the platform. A context keeps at most 32 sentences of a kind, of at most 1024 bytes each.
  void AddReason(const std::string& sentence);
  void AddWarning(const std::string& sentence);

  // For the platform: postpones `action`, which must throw nothing, to the end of the call.
  void AtEnd(std::function<void()> action);
  bool has_ended() const;

 private:
  CallDescription description_;
  std::vector<std::string> reasons_;
  std::vector<std::string> warnings_;
  std::vector<std::function<void()>> postponed_;
  bool has_ended_ = false;
  CallContext* outer_;
};

// The configuration lock for a call whose reading and changing must be one step: like VornConf (core.h), but it says
// whether the lock was taken. Construct it before the contexts of the calls, and destroy it in the same thread.
class CallLock {
 public:
  CallLock();
  ~CallLock();
  CallLock(const CallLock&) = delete;
  CallLock& operator=(const CallLock&) = delete;

  // Whether the thread owns the configuration lock. If not, the error facility (core.h) and the log have the reason.
  bool held() const;

 private:
  void* lock_;  // the platform's own
};

}  // namespace VORN

#endif  // VORN_PLATFORM_CALL_H
