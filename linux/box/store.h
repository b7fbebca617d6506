// Where the configuration files of a box are: below a root folder, or in another kind of storage.
#ifndef VORN_LINUX_BOX_STORE_H
#define VORN_LINUX_BOX_STORE_H

#include <array>
#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

// Identifies one state of a file or folder. Two equal versions from one store are the same state.
struct Version {
  bool exists = false;
  std::array<std::uint64_t, 5> state{};  // defined by the store; zeros when the file does not exist
};

inline bool operator==(const Version& a, const Version& b) { return a.exists == b.exists && a.state == b.state; }
inline bool operator!=(const Version& a, const Version& b) { return !(a == b); }

// A file as it was read. A missing file has no text.
struct StoredFile {
  std::string location;  // what to call the file in messages: its path on this system
  std::string text;
  Version version;
  // Whether a later equal version guarantees an equal text. A file that was changed in the same clock
  // tick in which it was read could change once more without a new version.
  bool is_settled = false;

  // Returns the text; nullopt if there is no file, which differs from an empty one.
  std::optional<std::string> content() const { return version.exists ? std::optional(text) : std::nullopt; }
};

// The names in a folder, in the order of strverscmp(3), as they were read.
struct StoredFolder {
  std::vector<std::string> names;
  Version version;
  bool is_settled = false;
};

// A lock, from its construction to its destruction.
class HeldLock {
 public:
  HeldLock() = default;
  virtual ~HeldLock() = default;
  HeldLock(const HeldLock&) = delete;
  HeldLock& operator=(const HeldLock&) = delete;
};

// The files of one box. Paths are the box's own, absolute: "/etc/exports". All operations may be called
// from several threads; two writers of one file must be excluded by the configuration lock.
class Store {
 public:
  virtual ~Store() = default;

  // Reads a file. One that does not exist is no failure; its version says so.
  virtual Result<StoredFile> Read(const std::string& path) const = 0;

  // The present version of a file or folder, without reading it.
  virtual Result<Version> VersionOf(const std::string& path) const = 0;

  // Lists a folder. One that does not exist is no failure.
  virtual Result<StoredFolder> List(const std::string& folder) const = 0;

  // Makes the file contain `text`, atomically and durably, if it is in the state `expected`; else fails
  // with kChangedBehind and changes nothing. An existing file keeps owner and mode, a new one gets
  // `mode` (the bits of chmod(2)). Missing folders are created. Returns the version that was written: any other
  // version of the file is a later change of somebody else.
  virtual Result<Version> Replace(const std::string& path, std::string_view text, const Version& expected,
                                  unsigned mode) = 0;

  // Removes the file if it is in the state `expected`; else fails with kChangedBehind.
  virtual Status Remove(const std::string& path, const Version& expected) = 0;

  // Completes an interrupted Replace of a file that already has the wanted content.
  virtual Status Confirm(const std::string& path) = 0;

  // Gives an existing file these permissions (chmod(2)). One that does not exist is no failure.
  virtual Status SetMode(const std::string& path, unsigned mode) = 0;

  // Creates a folder and those above it.
  virtual Status MakeFolder(const std::string& path) = 0;

  // Takes the lock of this name ("/run/vorn/config.lock"), which excludes other threads and processes.
  // Fails with kLockTimeout when another owner keeps it for longer than `limit`.
  virtual Result<std::unique_ptr<HeldLock>> Lock(const std::string& name, std::chrono::milliseconds limit) = 0;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_STORE_H
