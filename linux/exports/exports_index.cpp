#include "exports_index.h"

#include <algorithm>
#include <functional>
#include <unordered_set>
#include <utility>

namespace vorn {
namespace {

// Returns the path of a line as it is written, or an empty text if it is quoted or escaped.
std::string_view PlainPath(const ExportsLines& lines, std::size_t line) {
  const ExportSpan& span = lines.spans()[line];
  const std::string_view text = lines.text();
  const std::string_view rest = text.substr(span.path, span.end - span.path);
  std::size_t end = 0;
  while (end < rest.size() && !ExportsReader::EndsWord(static_cast<unsigned char>(rest[end]))) {
    if (rest[end] == '"' || rest[end] == '\\') return {};
    ++end;
  }
  return rest.substr(0, end);
}

// Whether a path is absolute and in normal form. "/" is left out: it has no parent folder.
bool IsNormal(std::string_view path) {
  if (path.size() < 2 || path[0] != '/' || path.back() == '/') return false;
  for (std::size_t slash = 0; slash != std::string_view::npos; slash = path.find('/', slash + 1)) {
    // A name that begins with a dot may be "." or "..".
    if (path[slash + 1] == '/' || path[slash + 1] == '.') return false;
  }
  return true;
}

std::string_view FolderOf(std::string_view path) { return path.substr(0, path.rfind('/')); }

}  // namespace

ExportsIndex::ExportsIndex(const ExportsLines& lines) {
  const std::size_t count = lines.spans().size();
  std::size_t slots = 16;
  while (slots < 2 * count) slots *= 2;
  slots_.resize(slots);
  earlier_.resize(count);
  std::unordered_set<std::string_view> folders;
  for (std::size_t line = 0; line < count; ++line) {
    const std::string_view path = PlainPath(lines, line);
    if (!IsNormal(path)) {
      unusual_.push_back(static_cast<std::uint32_t>(line));
      continue;
    }
    std::uint32_t& last = slots_[FindSlot(lines, path)];
    earlier_[line] = std::exchange(last, static_cast<std::uint32_t>(line + 1));
    const std::string_view folder = FolderOf(path);
    const bool is_last = !folders_.empty() && folders_.back() == folder;
    if (!is_last && folders.insert(folder).second) folders_.emplace_back(folder);
  }
}

// The slot of the path, or else the free slot at which its search ends.
std::size_t ExportsIndex::FindSlot(const ExportsLines& lines, std::string_view path) const {
  std::size_t slot = std::hash<std::string_view>()(path) % slots_.size();
  while (slots_[slot] != 0 && PlainPath(lines, slots_[slot] - 1) != path) slot = (slot + 1) % slots_.size();
  return slot;
}

// One search. Collects the lines that it finds.
class ExportsIndex::Search {
 public:
  Search(const ExportsIndex& index, const ExportsLines& lines, const std::string& path, const ExportPaths& paths)
      : index_(index), lines_(lines), paths_(paths), target_(paths.Resolve(path)) {}

  std::vector<std::size_t> Find() {
    Append(target_);
    for (const std::string& folder : index_.folders_) AppendLinked(folder);
    for (const std::uint32_t line : index_.unusual_) AppendUnusual(line);
    std::sort(found_.begin(), found_.end());
    found_.erase(std::unique(found_.begin(), found_.end()), found_.end());
    return std::move(found_);
  }

 private:
  // Appends the lines with this path, as it is written.
  void Append(std::string_view path) {
    const std::uint32_t last = index_.slots_[index_.FindSlot(lines_, path)];
    for (std::uint32_t line = last; line != 0; line = index_.earlier_[line - 1]) found_.push_back(line - 1);
  }

  // Appends the lines in `folder`, as it is written, that lead to the target by a link.
  void AppendLinked(const std::string& folder) {
    const std::string normal = folder.empty() ? "/" : folder;
    const ExportPaths::Folder real = paths_.FolderAt(normal);
    const std::string_view target_folder = FolderOf(target_);
    const std::string prefix = folder + "/";
    if (real.path != normal && real.path == (target_folder.empty() ? "/" : target_folder)) {
      Append(prefix + target_.substr(target_folder.size() + 1));
    }
    if (real.links == nullptr) return;
    for (const std::string& link : *real.links) {
      const std::size_t before = found_.size();
      Append(prefix + link);
      if (found_.size() > before && paths_.Resolve(prefix + link) != target_) found_.resize(before);
    }
  }

  void AppendUnusual(std::uint32_t line) {
    ExportsReader reader(lines_.text(), lines_.spans()[line].path);
    std::string word;
    const bool is_word = reader.ReadWord(kLongestExportPath, &word) == ExportsReader::Found::kWord;
    if (is_word && paths_.Resolve(word) == target_) found_.push_back(line);
  }

  const ExportsIndex& index_;
  const ExportsLines& lines_;
  const ExportPaths& paths_;
  const std::string target_;
  std::vector<std::size_t> found_;
};

std::vector<std::size_t> ExportsIndex::Find(const ExportsLines& lines, const std::string& path,
                                            const ExportPaths& paths) const {
  return Search(*this, lines, path, paths).Find();
}

bool HaveSamePaths(const ExportsLines& now, const ExportsLines& old) {
  if (now.spans().size() != old.spans().size()) return false;
  for (std::size_t line = now.shared_head(); line < now.spans().size() - now.shared_tail(); ++line) {
    const std::string_view path = PlainPath(now, line);
    if (path.empty() || path != PlainPath(old, line)) return false;
  }
  return true;
}

}  // namespace vorn
