// A root directory for one test: this process's root while the object lives, removed with it.
#ifndef VORN_TESTS_SUPPORT_LINUX_TEMPORARY_ROOT_H
#define VORN_TESTS_SUPPORT_LINUX_TEMPORARY_ROOT_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

// Roots nest: the one before is this process's root again afterwards.
class TemporaryRoot {
 public:
  TemporaryRoot();
  ~TemporaryRoot();
  TemporaryRoot(const TemporaryRoot&) = delete;
  TemporaryRoot& operator=(const TemporaryRoot&) = delete;

  const std::string& directory() const { return directory_; }

  // Where the root's "/etc/exports" is on this system; links are not followed.
  std::string At(std::string_view path) const { return directory_ + std::string(path); }

  // Makes the file, and the folders above it.
  void Write(std::string_view path, std::string_view text) const;

  // The file's text; none when there is no file.
  std::optional<std::string> Read(std::string_view path) const;

  // The names in a folder, hidden ones too, sorted.
  std::vector<std::string> Names(std::string_view folder) const;

 private:
  std::string directory_;
  std::optional<std::string> previous_;  // VORN_ROOT before
};

#endif  // VORN_TESTS_SUPPORT_LINUX_TEMPORARY_ROOT_H
