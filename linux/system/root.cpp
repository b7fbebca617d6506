#include "root.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <vector>

#include "file_descriptor.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

constexpr int kMaxLinks = 40;  // as path_resolution(7)

std::string WithoutTrailingSlashes(std::string directory) {
  while (!directory.empty() && directory.back() == '/') directory.pop_back();
  return directory;
}

// Whether `path` names an existing file or folder below `top` without any symbolic link on the way:
// openat2(2). False also where the kernel lacks that call.
bool IsWithoutLinks(const std::string& top, const char* path) {
  const FileDescriptor folder(open(top.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!folder) return false;
  open_how how{};
  how.flags = O_PATH | O_CLOEXEC;
  how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS;
  const FileDescriptor file(static_cast<int>(syscall(SYS_openat2, folder.get(), path, &how, sizeof how)));
  return static_cast<bool>(file);
}

// Whether every component of the absolute `path` is a name: none is empty, "." or "..".
bool HasOnlyNames(std::string_view path) {
  while (!path.empty()) {
    path.remove_prefix(1);  // the slash
    const std::string_view name = path.substr(0, path.find('/'));
    if (name.empty() || name == "." || name == "..") return false;
    path.remove_prefix(name.size());
  }
  return true;
}

// Resolves a path component by component, below a folder that it never leaves.
class Resolver {
 public:
  Resolver(fs::path top, std::string_view path) : top_(std::move(top)) { Push(fs::path(path).relative_path()); }

  Result<std::string> Resolve() {
    while (!pending_.empty()) {
      const fs::path name = std::move(pending_.back());
      pending_.pop_back();
      if (Status status = Step(name); !status.ok()) return status;
    }
    return (top_ / reached_).string();
  }

 private:
  // The component to visit next is the last one of pending_.
  void Push(const fs::path& path) {
    const std::vector<fs::path> names(path.begin(), path.end());
    pending_.insert(pending_.end(), names.rbegin(), names.rend());
  }

  Status Step(const fs::path& name) {
    if (name.empty() || name == ".") return {};
    if (name == "..") {
      reached_ = reached_.parent_path();
      return {};
    }
    std::error_code error;
    const fs::path here = top_ / reached_ / name;
    const fs::path target = fs::read_symlink(here, error);
    if (!error) return Follow(here, target);
    reached_ /= name;
    // Not a link, or nothing there: opening the file will tell.
    if (error.value() == EINVAL || error.value() == ENOENT || error.value() == ENOTDIR) return {};
    return Status::System(error.value(), here.string());
  }

  Status Follow(const fs::path& link, const fs::path& target) {
    if (++links_ > kMaxLinks) return Status::System(ELOOP, link.string());
    if (target.is_absolute()) reached_.clear();
    Push(target.relative_path());
    return {};
  }

  const fs::path top_;
  fs::path reached_;  // below top_
  std::vector<fs::path> pending_;
  int links_ = 0;
};

}  // namespace

Root::Root(std::string directory) : directory_(WithoutTrailingSlashes(std::move(directory))) {
  if (directory_.empty()) directory_ = "/";
}

Root Root::Current() {
  const char* directory = std::getenv("VORN_ROOT");
  return Root(directory == nullptr ? "/" : directory);
}

Result<std::string> Root::Locate(std::string_view path) const {
  if (directory_.front() != '/') return Status::Failure(EINVAL, "the root " + directory_ + " is no absolute path");
  if (path.empty() || path.front() != '/') {
    return Status::Failure(EINVAL, "\"" + std::string(path) + "\" is no absolute path");
  }
  const std::string top = is_box() ? "" : directory_;
  if (HasOnlyNames(path) && IsWithoutLinks(directory_, std::string(path).c_str() + 1)) return top + std::string(path);
  return Resolver(directory_, path).Resolve();
}

std::string Root::OnBox(const std::string& located) const {
  if (is_box()) return located;
  const std::string path = located.substr(directory_.size());
  return path.empty() ? "/" : path;
}

}  // namespace vorn
