// Files that the platform changed while the history could not be written.
#ifndef VORN_LINUX_HISTORY_MISSED_CHANGES_H
#define VORN_LINUX_HISTORY_MISSED_CHANGES_H

#include <set>
#include <string>
#include <utility>

namespace vorn {

inline constexpr char kMissedChanges[] = "/run/vorn/history.missed";

// A list in a file of another disk than the history, for all processes until the next boot: they must not take the
// changes for edits by hand. The caller owns the configuration lock.
class MissedChanges {
 public:
  explicit MissedChanges(std::string location) : location_(std::move(location)) {}

  // Adds the path of a file. If the list cannot be written, only this object knows it.
  void Add(const std::string& path);
  void Remove(const std::string& path);

  bool Has(const std::string& path) const;

 private:
  std::set<std::string> Read() const;
  bool Write(const std::set<std::string>& paths) const;

  const std::string location_;
  std::set<std::string> unwritten_;
};

}  // namespace vorn

#endif  // VORN_LINUX_HISTORY_MISSED_CHANGES_H
