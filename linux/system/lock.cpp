#include "lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <vector>

#include "file_descriptor.h"
#include "files.h"
#include "root.h"

namespace vorn {
namespace {

struct Held {
  std::string directory;
  FileDescriptor file;
  int depth = 0;
};

// What a thread holds, in the order taken. Each pause adds a layer that begins empty.
using Layer = std::vector<Held>;
thread_local std::vector<Layer> layers(1);

Held* Find(const std::string& directory) {
  Layer& layer = layers.back();
  const auto same = [&](const Held& held) { return held.directory == directory; };
  const auto found = std::find_if(layer.begin(), layer.end(), same);
  return found == layer.end() ? nullptr : &*found;
}

Result<FileDescriptor> Open(const std::string& path) {
  FileDescriptor file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file) return Status::System(errno, path);
  return file;
}

Status WaitFor(const FileDescriptor& file, const std::string& path) {
  while (flock(file.get(), LOCK_EX) != 0) {
    if (errno != EINTR) return Status::System(errno, path);
  }
  return {};
}

// Whether the locked file is the one that newcomers find: somebody may have removed it.
bool IsAt(const FileDescriptor& file, const std::string& path) {
  struct stat mine {};
  struct stat theirs {};
  return fstat(file.get(), &mine) == 0 && stat(path.c_str(), &theirs) == 0 && mine.st_dev == theirs.st_dev &&
         mine.st_ino == theirs.st_ino;
}

Result<FileDescriptor> Take(const std::string& directory) {
  const Result<std::string> path = Root(directory).Locate("/run/vorn/config.lock");
  if (!path.ok()) return path.status();
  if (Status status = MakeFolders(std::filesystem::path(*path).parent_path()); !status.ok()) return status;
  for (;;) {
    Result<FileDescriptor> file = Open(*path);
    if (!file.ok()) return file;
    if (Status status = WaitFor(*file, *path); !status.ok()) return status;
    if (IsAt(*file, *path)) return file;
  }
}

Status TakeAgain(Held* held) {
  Result<FileDescriptor> file = Take(held->directory);
  if (!file.ok()) return file.status();
  held->file = std::move(*file);
  return {};
}

Status Enter(const std::string& directory) {
  Held* held = Find(directory);
  if (held == nullptr) {
    Result<FileDescriptor> file = Take(directory);
    if (!file.ok()) return file.status();
    layers.back().push_back({directory, std::move(*file), 1});
    return {};
  }
  if (!held->file) {
    if (Status status = TakeAgain(held); !status.ok()) return status;
  }
  ++held->depth;
  return {};
}

void Leave(const std::string& directory) {
  Held* held = Find(directory);
  if (held == nullptr || --held->depth > 0) return;
  Layer& layer = layers.back();
  layer.erase(layer.begin() + (held - layer.data()));
}

}  // namespace

ConfigurationLock::ConfigurationLock() : directory_(Root::Current().directory()), status_(Enter(directory_)) {}

ConfigurationLock::~ConfigurationLock() {
  if (status_.ok()) Leave(directory_);
}

LockPause::LockPause() {
  for (Held& held : layers.back()) held.file.Close();
  layers.emplace_back();
}

LockPause::~LockPause() {
  layers.pop_back();
  // A failure shows at the next Enter, which tries once more.
  for (Held& held : layers.back()) static_cast<void>(TakeAgain(&held));
}

}  // namespace vorn
