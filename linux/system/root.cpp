#include "root.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <vector>

#include "file_descriptor.h"

namespace vorn {
namespace {

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

// The target of a symbolic link: readlink(2). Fails with EINVAL if the file is no link.
Result<std::string> ReadLink(const std::string& path) {
  std::string target(PATH_MAX, '\0');
  const ssize_t size = readlink(path.c_str(), target.data(), target.size());
  if (size < 0) return Status::System(errno, path);
  if (static_cast<std::size_t>(size) == target.size()) return Status::System(ENAMETOOLONG, path);
  target.resize(static_cast<std::size_t>(size));
  return target;
}

// Resolves a path component by component, below a folder that it never leaves.
class Resolver {
 public:
  // `top` has no slash at its end.
  Resolver(std::string top, std::string_view path) : top_(std::move(top)) { Push(path); }

  Result<std::string> Resolve() {
    while (!pending_.empty()) {
      const std::string name = std::move(pending_.back());
      pending_.pop_back();
      if (Status status = Step(name); !status.ok()) return status;
    }
    return top_ + (reached_.empty() ? "/" : reached_);
  }

 private:
  // The component to visit next is the last one of pending_.
  void Push(std::string_view path) {
    while (!path.empty()) {
      const std::size_t begin = path.rfind('/') + 1;  // npos + 1 is 0
      pending_.emplace_back(path.substr(begin));
      path = path.substr(0, begin == 0 ? 0 : begin - 1);
    }
  }

  Status Step(const std::string& name) {
    if (name.empty() || name == ".") return {};
    if (name == "..") {
      if (!reached_.empty()) reached_.erase(reached_.rfind('/'));
      return {};
    }
    const std::string here = top_ + reached_ + "/" + name;
    const Result<std::string> target = ReadLink(here);
    if (target.ok()) return Follow(here, *target);
    reached_ += "/" + name;
    // Not a link, or nothing there: opening the file will tell.
    const int error = target.status().code();
    return error == EINVAL || error == ENOENT || error == ENOTDIR ? Status() : target.status();
  }

  Status Follow(const std::string& link, const std::string& target) {
    if (++links_ > kMaxLinks) return Status::System(ELOOP, link);
    if (target[0] == '/') reached_.clear();
    Push(target);
    return {};
  }

  const std::string top_;
  std::string reached_;  // below top_, each name after a slash
  std::vector<std::string> pending_;
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
  return Resolver(top, path).Resolve();
}

std::string Root::OnBox(const std::string& located) const {
  if (is_box()) return located;
  const std::string path = located.substr(directory_.size());
  return path.empty() ? "/" : path;
}

}  // namespace vorn
