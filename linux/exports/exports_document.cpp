#include "exports_document.h"

#include <algorithm>
#include <memory>
#include <mutex>
#include <utility>

#include "exports_index.h"
#include "exports_lines.h"
#include "exports_text.h"

namespace vorn {
namespace {

// Returns the separator to insert before a line that is appended to `text`.
std::string_view Separator(std::string_view text) {
  if (text.empty()) return "";
  const std::size_t last = text.size() - 1;
  if (text[last] == '\\') return "\n\n";
  if (text[last] != '\n') return "\n";
  return last > 0 && text[last - 1] == '\\' ? "\n" : "";
}

void AppendEntries(std::string* line, const std::vector<ExportEntry>& entries) {
  for (const ExportEntry& entry : entries) {
    line->push_back(' ');
    line->append(entry.word.empty() ? EncodeExportsWord(entry.client + "(" + entry.options.Text() + ")") : entry.word);
  }
}

std::string_view WithoutEnd(std::string_view line) { return line.substr(0, line.find_last_not_of("\\\n") + 1); }

// Whether exportfs(8) stops at a fault of the line.
bool EndsFile(std::string_view text, const ExportSpan& line) {
  const ExportLine read = ReadExportLine(text, line);
  return read.fault && read.fault->ends_file;
}

// Compares the last line of a text with a line of the edited text. The last line may need a line break before another
// line can follow. That must not make a fault of it, as it would of an open quotation.
bool IsSameLastLine(const ExportsLines& old, const ExportSpan& last, const ExportsLines& now, const ExportSpan& line) {
  if (WithoutEnd(old.TextOf(last)) != WithoutEnd(now.TextOf(line))) return false;
  return !EndsFile(now.text(), line) || EndsFile(old.text(), last);
}

// Whether the line `b` of `now` is the line `a` of `old`.
bool IsSameLine(const ExportsLines& old, const ExportSpan& a, const ExportsLines& now, const ExportSpan& b) {
  const bool inherits = a.inherited != std::string_view::npos;
  if (inherits != (b.inherited != std::string_view::npos)) return false;
  if (a.end == old.text().size()) return IsSameLastLine(old, a, now, b);
  return old.TextOf(a) == now.TextOf(b);
}

std::vector<ExportLine> ReadLines(std::string_view text, const ExportSpans& spans) {
  std::vector<ExportLine> lines;
  lines.reserve(spans.size());
  for (const ExportSpan& line : spans) lines.push_back(ReadExportLine(text, line));
  return lines;
}

}  // namespace

class ExportsDocument::Content {
 public:
  explicit Content(std::string text) : lines_(std::move(text)) {}

  Content(std::string text, const Content& previous, const CommonText& common)
      : lines_(std::move(text), previous.lines_, common) {}

  Content(std::string text, const Content& previous) : lines_(std::move(text), previous.lines_) {
    const std::lock_guard lock(previous.mutex_);
    if (previous.index_ != nullptr && HaveSamePaths(lines_, previous.lines_)) index_ = previous.index_;
  }

  const ExportsLines& lines() const { return lines_; }

  std::shared_ptr<const std::vector<ExportLine>> Read() const {
    const std::lock_guard lock(mutex_);
    if (auto known = read_.lock()) return known;
    auto read = std::make_shared<const std::vector<ExportLine>>(ReadLines(lines_.text(), lines_.spans()));
    read_ = read;
    return read;
  }

  // Returns the lines whose path leads to the directory `path`, in order.
  ExportSpans LinesOf(const std::string& path, const ExportPaths& paths) const {
    ExportSpans found;
    for (const std::size_t line : Index()->Find(lines_, path, paths)) found.push_back(lines_.spans()[line]);
    return found;
  }

 private:
  std::shared_ptr<const ExportsIndex> Index() const {
    const std::lock_guard lock(mutex_);
    if (index_ == nullptr) index_ = std::make_shared<const ExportsIndex>(lines_);
    return index_;
  }

  const ExportsLines lines_;
  mutable std::mutex mutex_;
  mutable std::shared_ptr<const ExportsIndex> index_;  // made for the first search
  mutable std::weak_ptr<const std::vector<ExportLine>> read_;
};

ExportsDocument::ExportsDocument(std::string text) : content_(std::make_shared<const Content>(std::move(text))) {}

ExportsDocument::ExportsDocument(std::string text, const ExportsDocument& previous)
    : content_(std::make_shared<const Content>(std::move(text), *previous.content_)) {}

const std::string& ExportsDocument::text() const { return content_->lines().text(); }

std::shared_ptr<const std::vector<ExportLine>> ExportsDocument::Lines() const { return content_->Read(); }

std::vector<ExportLine> ExportsDocument::Read(const ExportSpans& spans) const { return ReadLines(text(), spans); }

std::vector<ExportLine> ExportsDocument::LinesOf(const std::string& path, const ExportPaths& paths) const {
  return Read(content_->LinesOf(path, paths));
}

std::vector<ExportEntry> ExportsDocument::Entries(const std::string& path, const ExportPaths& paths) const {
  return EntriesOf(LinesOf(path, paths));
}

Result<ExportsDocument> ExportsDocument::Replace(const std::string& path, const std::vector<ExportEntry>& entries,
                                                 const ExportPaths& paths) const {
  const std::string normal = NormalExportPath(path);
  const std::string where = "the exports of " + normal + " cannot be written: ";
  const ExportSpans own = content_->LinesOf(normal, paths);
  Result<ExportsDocument> edited = Edited(own, normal, entries);
  if (!edited.ok()) return edited;
  const auto added = Added(own, *edited);
  if (!added) return Status::Failure(kRefusedText, where + "the file's other lines would change");
  const std::vector<ExportLine> lines = edited->Read(*added);
  const auto is_own = [&](const ExportLine& line) { return line.path == normal; };
  if (!std::all_of(lines.begin(), lines.end(), is_own) || !(EntriesOf(lines) == entries)) {
    return Status::Failure(kRefusedText, where + "they do not read back");
  }
  return edited;
}

// Returns the lines that the edited file has beside those of this file that are not `own`, or nullopt if one of
// those is missing. No own line is among those that both files are known to have at the beginning and at the end.
std::optional<ExportSpans> ExportsDocument::Added(const ExportSpans& own, const ExportsDocument& edited) const {
  const ExportsLines& old = content_->lines();
  const ExportsLines& now = edited.content_->lines();
  const auto head = static_cast<std::ptrdiff_t>(now.shared_head());
  const auto tail = static_cast<std::ptrdiff_t>(now.shared_tail());
  const auto end = now.spans().end() - tail;
  ExportSpans added;
  auto mine = own.begin();
  auto next = now.spans().begin() + head;
  for (auto line = old.spans().begin() + head; line != old.spans().end() - tail; ++line) {
    if (mine != own.end() && mine->begin == line->begin) {
      ++mine;
      continue;
    }
    while (next != end && !IsSameLine(old, *line, now, *next)) added.push_back(*next++);
    if (next == end) return std::nullopt;
    ++next;
  }
  added.insert(added.end(), next, end);
  return added;
}

// Returns the parts of the text around all `own` lines.
CommonText ExportsDocument::AroundAll(const ExportSpans& own) const {
  const std::size_t begin = own.empty() ? text().size() : own.front().begin;
  const std::size_t head = std::string_view{text()}.substr(0, begin).rfind('\n') + 1;  // npos + 1 is 0
  return {head, own.empty() ? 0 : text().size() - own.back().end};
}

Result<ExportsDocument> ExportsDocument::Edited(const ExportSpans& own, const std::string& path,
                                                const std::vector<ExportEntry>& entries) const {
  std::string line;
  std::string comments;
  for (const ExportLine& present : entries.empty() ? std::vector<ExportLine>() : Read(own)) {
    if (present.fault)
      return Status::Failure(kRefusedText, Place(present.fault->position) + ": " + present.fault->reason);
    // The spelling of the path stays, unless it leads to the directory by a link, which could change.
    if (line.empty() && present.path == path) {
      line = text().substr(present.span.begin, present.path_end - present.span.begin);
    }
    if (!present.comment.empty()) comments += " " + present.comment;
  }
  if (line.empty()) line = EncodeExportsWord(path);
  AppendEntries(&line, entries);
  line += comments + "\n";

  std::string out;
  out.reserve(text().size() + line.size() + 2);
  std::size_t copied = 0;
  bool missing = !entries.empty();
  for (const ExportSpan& span : own) {
    out.append(text(), copied, span.begin - copied);
    copied = span.end;
    if (std::exchange(missing, false)) out += line;
  }
  out.append(text(), copied);
  if (missing) out.append(Separator(out)).append(line);
  return ExportsDocument(std::make_shared<const Content>(std::move(out), *content_, AroundAll(own)));
}

std::string ExportsDocument::Place(std::size_t position) const {
  const std::size_t end = std::min(position, text().size());
  const auto stop = text().begin() + static_cast<std::ptrdiff_t>(end);
  const std::size_t begin = end == 0 ? 0 : text().rfind('\n', end - 1) + 1;  // npos + 1 is 0
  return std::to_string(1 + std::count(text().begin(), stop, '\n')) + ":" + std::to_string(end - begin + 1);
}

}  // namespace vorn
