#include "exports_index.h"

#include <algorithm>
#include <functional>
#include <unordered_set>

namespace vorn {
namespace {

bool EndsPlainPath(char c) { return c == '"' || c == '\\' || ExportsReader::EndsWord(static_cast<unsigned char>(c)); }

// Whether a path is absolute and in normal form. "/" is left out: it has no parent folder.
bool IsPlain(std::string_view path) {
  if (path.size() < 2 || path[0] != '/' || path.back() == '/') return false;
  for (std::size_t slash = 0; slash != std::string_view::npos; slash = path.find('/', slash + 1)) {
    // A name that begins with a dot may be "." or "..".
    if (path[slash + 1] == '/' || path[slash + 1] == '.') return false;
  }
  return true;
}

std::string_view FolderOf(std::string_view path) { return path.substr(0, path.rfind('/')); }

}  // namespace

ExportsIndex::ExportsIndex(std::string_view text, const ExportSpans& lines) : text_(text), lines_(&lines) {
  std::size_t slots = 16;
  while (slots < 2 * lines.size()) slots *= 2;
  slots_.resize(slots);
  std::unordered_set<std::string_view> folders;
  for (std::size_t line = 0; line < lines.size(); ++line) {
    const std::string_view path = PlainPath(line);
    if (!IsPlain(path)) {
      unusual_.push_back(static_cast<std::uint32_t>(line));
      continue;
    }
    std::size_t slot = Slot(path);
    while (slots_[slot] != 0) slot = (slot + 1) % slots;
    slots_[slot] = static_cast<std::uint32_t>(line + 1);
    const std::string_view folder = FolderOf(path);
    const bool is_last = !folders_.empty() && folders_.back() == folder;
    if (!is_last && folders.insert(folder).second) folders_.push_back(folder);
  }
}

// The path of a line as it is written, or an empty text if it is quoted or escaped.
std::string_view ExportsIndex::PlainPath(std::size_t line) const {
  const ExportSpan& span = (*lines_)[line];
  const std::string_view rest = text_.substr(span.path, span.end - span.path);
  const auto end = std::find_if(rest.begin(), rest.end(), EndsPlainPath);
  if (end != rest.end() && (*end == '"' || *end == '\\')) return {};
  return rest.substr(0, static_cast<std::size_t>(end - rest.begin()));
}

std::size_t ExportsIndex::Slot(std::string_view path) const {
  return std::hash<std::string_view>()(path) % slots_.size();
}

void ExportsIndex::Append(std::string_view path, std::vector<std::size_t>* found) const {
  for (std::size_t slot = Slot(path); slots_[slot] != 0; slot = (slot + 1) % slots_.size()) {
    if (PlainPath(slots_[slot] - 1) == path) found->push_back(slots_[slot] - 1);
  }
}

// Appends the lines in `folder`, as it is written, that lead to `target` by a link.
void ExportsIndex::AppendLinked(std::string_view folder, const std::string& target, const ExportPaths& paths,
                                std::vector<std::size_t>* found) const {
  const ExportPaths::Folder real = paths.FolderAt(folder.empty() ? "/" : std::string(folder));
  const std::string_view target_folder = FolderOf(target);
  const std::string prefix = std::string(folder) + "/";
  const bool is_linked = real.path != (folder.empty() ? "/" : folder);
  if (is_linked && real.path == (target_folder.empty() ? "/" : target_folder)) {
    Append(prefix + target.substr(target_folder.size() + 1), found);
  }
  if (real.links == nullptr) return;
  for (const std::string& link : *real.links) {
    const std::size_t before = found->size();
    Append(prefix + link, found);
    if (found->size() > before && paths.Resolve(prefix + link) != target) found->resize(before);
  }
}

std::vector<std::size_t> ExportsIndex::Find(const std::string& path, const ExportPaths& paths) const {
  const std::string target = paths.Resolve(path);
  std::vector<std::size_t> found;
  Append(target, &found);
  for (const std::string_view folder : folders_) AppendLinked(folder, target, paths, &found);
  for (const std::uint32_t line : unusual_) {
    ExportsReader reader(text_, (*lines_)[line].path);
    std::string word;
    const bool is_word = reader.ReadWord(kLongestExportPath, &word) == ExportsReader::Found::kWord;
    if (is_word && paths.Resolve(word) == target) found.push_back(line);
  }
  std::sort(found.begin(), found.end());
  found.erase(std::unique(found.begin(), found.end()), found.end());
  return found;
}

}  // namespace vorn
