#include "missed_changes.h"

#include <filesystem>

#include "files.h"
#include "lines.h"

namespace vorn {

void MissedChanges::Add(const std::string& path) {
  std::set<std::string> paths = Read();
  if (paths.insert(path).second && !Write(paths)) unwritten_.insert(path);
}

void MissedChanges::Remove(const std::string& path) {
  unwritten_.erase(path);
  std::set<std::string> paths = Read();
  if (paths.erase(path) != 0) Write(paths);
}

bool MissedChanges::Has(const std::string& path) const {
  return unwritten_.count(path) != 0 || Read().count(path) != 0;
}

std::set<std::string> MissedChanges::Read() const {
  const Result<FileText> file = ReadFileOrNothing(location_);
  std::set<std::string> paths;
  if (!file.ok()) return paths;
  for (const std::string_view line : LinesOf(file->text)) paths.emplace(line);
  return paths;
}

bool MissedChanges::Write(const std::set<std::string>& paths) const {
  const Result<FileStamp> stamp = StampOfFile(location_);
  if (!stamp.ok() || !MakeFolders(std::filesystem::path(location_).parent_path()).ok()) return false;
  if (paths.empty()) return RemoveFile(location_, *stamp).ok();
  std::string text;
  for (const std::string& path : paths) text += path + "\n";
  return ReplaceFile(location_, text, *stamp).ok();
}

}  // namespace vorn
