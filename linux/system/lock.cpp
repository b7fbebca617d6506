#include "lock.h"

#include <algorithm>
#include <vector>

#include "file_lock.h"
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

Result<FileDescriptor> Take(const std::string& directory) {
  return TakeFileLock(Root(directory), "/run/vorn/config.lock");
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
