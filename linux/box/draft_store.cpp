#include "draft_store.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <utility>

#include "files.h"

namespace vorn {
namespace {

// In place of a device number, of which none is so large.
constexpr std::uint64_t kDraft = std::numeric_limits<std::uint64_t>::max();

class NoLock : public HeldLock {};

std::string FolderOf(const std::string& path) { return path.substr(0, path.rfind('/')); }
std::string NameOf(const std::string& path) { return path.substr(path.rfind('/') + 1); }

bool ComesBefore(const std::string& a, const std::string& b) { return strverscmp(a.c_str(), b.c_str()) < 0; }

void Put(const std::string& name, bool exists, std::vector<std::string>* names) {
  const auto place = std::lower_bound(names->begin(), names->end(), name, ComesBefore);
  const bool is_listed = place != names->end() && *place == name;
  if (exists && !is_listed) names->insert(place, name);
  if (!exists && is_listed) names->erase(place);
}

}  // namespace

// Returns the file at `path` after its first read. The caller owns the mutex.
Result<DraftStore::File*> DraftStore::Find(const std::string& path) const {
  if (const auto known = locations_.find(path); known != locations_.end()) return &files_.at(known->second);
  Result<StoredFile> read = stored_.Read(path);
  if (!read.ok()) return read.status();
  read->is_settled = true;  // a snapshot does not change
  const std::string location = read->location;
  const auto [file, is_new] = files_.try_emplace(location);
  if (is_new) {
    file->second.snapshot = *read;
    file->second.now = std::move(*read);
  }
  locations_.emplace(path, location);
  return &file->second;
}

Version DraftStore::NextVersion() { return {true, {kDraft, ++versions_, 0, 0, 0}}; }

Result<StoredFile> DraftStore::Read(const std::string& path) const {
  const std::lock_guard lock(mutex_);
  const Result<File*> file = Find(path);
  if (!file.ok()) return file.status();
  return (*file)->now;
}

Result<Version> DraftStore::VersionOf(const std::string& path) const {
  const std::lock_guard lock(mutex_);
  if (const auto file = locations_.find(path); file != locations_.end()) return files_.at(file->second).now.version;
  if (const auto folder = changed_folders_.find(path); folder != changed_folders_.end()) return folder->second;
  if (const auto folder = folders_.find(path); folder != folders_.end()) return folder->second.version;
  return stored_.VersionOf(path);
}

Result<StoredFolder> DraftStore::List(const std::string& folder) const {
  const std::lock_guard lock(mutex_);
  auto snapshot = folders_.find(folder);
  if (snapshot == folders_.end()) {
    Result<StoredFolder> read = stored_.List(folder);
    if (!read.ok()) return read.status();
    read->is_settled = true;
    snapshot = folders_.emplace(folder, std::move(*read)).first;
  }
  StoredFolder listed = snapshot->second;
  const auto changed = changed_folders_.find(folder);
  if (changed == changed_folders_.end()) return listed;
  listed.version = changed->second;
  for (const auto& [location, file] : files_) {
    const bool is_in_folder = !file.written_as.empty() && FolderOf(file.written_as) == folder;
    if (is_in_folder) Put(NameOf(file.written_as), file.now.version.exists, &listed.names);
  }
  return listed;
}

// Without a text the file is removed.
Result<Version> DraftStore::Write(const std::string& path, std::optional<std::string> text, const Version& expected) {
  const std::lock_guard lock(mutex_);
  const Result<File*> found = Find(path);
  if (!found.ok()) return found.status();
  File& file = **found;
  if (file.now.version != expected) return ChangedBehind(file.now.location);
  if (file.written_as.empty()) file.written_as = path;
  const bool exists = text.has_value();
  if (file.now.version.exists != exists) changed_folders_[FolderOf(file.written_as)] = NextVersion();
  file.now.version = exists ? NextVersion() : Version{};
  file.now.text = std::move(text).value_or("");
  return file.now.version;
}

Result<Version> DraftStore::Replace(const std::string& path, std::string_view text, const Version& expected,
                                    unsigned /*mode*/) {
  return Write(path, std::string(text), expected);
}

Status DraftStore::Remove(const std::string& path, const Version& expected) {
  return Write(path, std::nullopt, expected).status();
}

Status DraftStore::Confirm(const std::string& /*path*/) { return {}; }

Status DraftStore::SetMode(const std::string& /*path*/, unsigned /*mode*/) { return {}; }

Status DraftStore::MakeFolder(const std::string& /*path*/) { return {}; }

Result<std::unique_ptr<HeldLock>> DraftStore::Lock(const std::string& /*name*/, std::chrono::milliseconds /*limit*/) {
  return std::unique_ptr<HeldLock>(std::make_unique<NoLock>());
}

std::vector<DraftStore::ChangedFile> DraftStore::Changes() const {
  const std::lock_guard lock(mutex_);
  std::vector<ChangedFile> changes;
  for (const auto& [location, file] : files_) {
    if (file.written_as.empty() || file.snapshot.content() == file.now.content()) continue;
    changes.push_back({file.written_as, file.snapshot.content(), file.now.content()});
  }
  std::sort(changes.begin(), changes.end(), [](const ChangedFile& a, const ChangedFile& b) { return a.path < b.path; });
  return changes;
}

}  // namespace vorn
