// A root directory for one test. It is the root of this process during the object's lifetime; the destructor removes
// it.
#ifndef VORN_TESTS_SUPPORT_LINUX_TEMPORARY_ROOT_H
#define VORN_TESTS_SUPPORT_LINUX_TEMPORARY_ROOT_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

// Roots nest: the destructor makes the previous root the root of this process again.
class TemporaryRoot {
 public:
  TemporaryRoot();
  ~TemporaryRoot();
  TemporaryRoot(const TemporaryRoot&) = delete;
  TemporaryRoot& operator=(const TemporaryRoot&) = delete;

  const std::string& directory() const { return directory_; }

  // Returns the path on this system of a path below the root, such as "/etc/exports". Links are not followed.
  std::string At(std::string_view path) const { return directory_ + std::string(path); }

  // Writes the file, and creates the folders above it.
  void Write(std::string_view path, std::string_view text) const;

  // Returns the content of the file; nullopt for a missing file.
  std::optional<std::string> Read(std::string_view path) const;

  // Returns the names in a folder, sorted, including hidden ones.
  std::vector<std::string> Names(std::string_view folder) const;

 private:
  std::string directory_;
  std::optional<std::string> previous_;  // VORN_ROOT before
};

#endif  // VORN_TESTS_SUPPORT_LINUX_TEMPORARY_ROOT_H
