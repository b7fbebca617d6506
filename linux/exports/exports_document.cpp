#include "exports_document.h"

#include <algorithm>
#include <iterator>
#include <mutex>
#include <set>
#include <utility>

#include "exports_client.h"
#include "exports_text.h"

namespace vorn {
namespace {

using Found = ExportsReader::Found;

// Returns the end of the line at `position`. A backslash before the line break continues it.
std::size_t LineEnd(std::string_view text, std::size_t position) {
  for (;;) {
    const std::size_t newline = text.find('\n', position);
    if (newline == std::string_view::npos) return text.size();
    if (newline == 0 || text[newline - 1] != '\\') return newline + 1;
    position = newline + 1;
  }
}

// Reads one line, from its path on. After a fault that ends the file, reading resumes at the next line break
// without a backslash, even in a quotation.
class LineReader {
 public:
  LineReader(std::string_view text, const ExportSpan& span) : text_(text), reader_(text, span.path) {
    line_.span = span;
  }

  ExportLine Read() {
    if (ReadPath()) ReadClients();
    if (!HasEnd()) FinishLine();
    if (HasEnd()) line_.span.end = LineEnd(text_, word_begin_);
    return std::move(line_);
  }

 private:
  bool HasEnd() const { return line_.fault && line_.fault->ends_file; }

  bool Fail(std::string reason) {
    line_.fault = {word_begin_, std::move(reason), true};
    return false;
  }

  bool ReadPath() {
    word_begin_ = reader_.position();
    const Found found = reader_.ReadWord(kLongestExportPath, &word_);
    if (found == Found::kNothing) return Fail("the line does not begin with a path");
    if (found == Found::kTooLong) return Fail("the path is too long, or a quotation mark has no partner");
    line_.path_end = reader_.word_end();
    line_.path = NormalExportPath(word_);
    return true;
  }

  Found ReadClientWord() {
    const std::size_t comment = reader_.SkipToClient();
    if (comment != std::string_view::npos) line_.comment = text_.substr(comment, reader_.position() - comment);
    word_begin_ = reader_.position();
    return reader_.ReadWord(kLongestExportClient, &word_);
  }

  void ReadClients() {
    for (bool first = true;; first = false) {
      Found found = ReadClientWord();
      if (found == Found::kNothing && !first) return;
      if (found == Found::kWord && word_.substr(0, 1) == "-") {
        if (!Apply(&defaults_, std::string_view{word_}.substr(1))) return;
        has_defaults_ = true;
        found = ReadClientWord();
      }
      if (!CheckWord(found) || !AddEntry(found)) return;
    }
  }

  // exportfs cannot resolve a client that contains the rest of the file.
  bool CheckWord(Found found) {
    if (found == Found::kTooLong) {
      return Fail("a client with its options is too long, or a quotation mark has no partner");
    }
    const bool is_open = reader_.in_quotation() && word_.find('\n') != std::string::npos;
    return !is_open || Fail("a quotation mark has no partner");
  }

  bool Apply(ExportOptionReader* options, std::string_view list) {
    const Status status = options->Apply(list);
    return status.ok() || Fail(status.reason());
  }

  // Adds the entry of the word that was read last, or of everybody if the line has no client.
  bool AddEntry(Found found) {
    if (found == Found::kNothing) word_.clear();
    ExportOptionReader options = defaults_;
    const std::size_t open = std::min(word_.find('('), word_.size());
    if (open < word_.size()) {
      if (word_.find(')', open) != word_.size() - 1) return Fail("the options of a client do not end with \")\"");
      const std::string_view list = std::string_view{word_}.substr(open + 1, word_.size() - open - 2);
      if (!Apply(&options, list)) return false;
    }
    if (word_.substr(0, 1) == "/" && !line_.fault) {
      line_.fault = {word_begin_, "a path among the clients; the line before may end with a backslash", false};
    }
    ExportEntry entry{open == 0 ? "*" : word_.substr(0, open), options.Options(), {}};
    if (!has_defaults_ && open > 0) entry.word = text_.substr(word_begin_, reader_.word_end() - word_begin_);
    line_.entries.push_back(std::move(entry));
    return true;
  }

  void FinishLine() {
    const std::size_t comment = reader_.SkipToClient();
    if (comment != std::string_view::npos) line_.comment = text_.substr(comment, reader_.position() - comment);
    line_.span.end = reader_.position();
    if (reader_.at_end()) return;
    word_begin_ = reader_.position();
    if (text_[line_.span.end] != '\n') Fail("exportfs would take the word after the last client for a path");
    ++line_.span.end;
  }

  std::string_view text_;
  ExportsReader reader_;
  std::size_t word_begin_ = 0;
  std::string word_;
  ExportOptionReader defaults_;
  bool has_defaults_ = false;
  ExportLine line_;
};

// Finds one line after the other. Nearly all lines have no quotation mark and no backslash; those end at the
// next line break and need not be read for that.
class LineFinder {
 public:
  explicit LineFinder(std::string_view text) : text_(text) {}

  // Returns the next line that begins at or after `position`, which must not decrease from call to call. After the
  // last line it returns an empty span at the end of the text.
  ExportSpan Next(std::size_t position) {
    ExportsReader reader(text_, position);
    ExportSpan span{position, position, position};
    if (position == text_.size() || text_[position] != '/') span.begin = reader.SkipToPath();
    span.path = reader.position();
    const std::size_t newline = text_.find('\n', span.path);
    span.end = newline == std::string_view::npos ? text_.size() : newline + 1;
    const bool simple =
        Following('"', span.path, &quotation_) >= span.end && Following('\\', span.path, &backslash_) >= span.end;
    return simple ? span : LineReader(text_, span).Read().span;
  }

 private:
  // Returns where `c` is next at or after `position`. `last` keeps the result of the last search, so that the whole
  // text is searched only once.
  std::size_t Following(char c, std::size_t position, std::size_t* last) const {
    if (*last < position || position == 0) *last = std::min(text_.find(c, position), text_.size());
    return *last;
  }

  std::string_view text_;
  std::size_t quotation_ = 0;
  std::size_t backslash_ = 0;
};

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

std::string_view Text(std::string_view text, const ExportSpan& line) {
  return text.substr(line.begin, line.end - line.begin);
}

std::string_view WithoutEnd(std::string_view line) { return line.substr(0, line.find_last_not_of("\\\n") + 1); }

// Whether exportfs(8) stops at a fault of the line.
bool EndsFile(std::string_view text, const ExportSpan& line) {
  const ExportLine read = LineReader(text, line).Read();
  return read.fault && read.fault->ends_file;
}

// Whether `same` is the line `line`, the last one of its text, in another text. It may need a line break before
// another line can follow. That must not make a fault of it, as it would of an open quotation.
bool SameLastLine(std::string_view text, const ExportSpan& line, std::string_view other, const ExportSpan& same) {
  if (WithoutEnd(Text(text, line)) != WithoutEnd(Text(other, same))) return false;
  return !EndsFile(other, same) || EndsFile(text, line);
}

}  // namespace

bool operator==(const ExportEntry& a, const ExportEntry& b) { return a.client == b.client && a.options == b.options; }

std::vector<ExportEntry> EntriesOf(const std::vector<ExportLine>& lines) {
  std::vector<ExportEntry> entries;
  std::set<std::string> seen;
  for (const ExportLine& line : lines) {
    for (const ExportEntry& entry : line.entries) {
      if (seen.insert(ExportClientKey(entry.client)).second) entries.push_back(entry);
    }
  }
  return entries;
}

struct ExportsDocument::Content {
  explicit Content(std::string file_text) : text(std::move(file_text)) {
    lines.reserve(text.size() / 64 + 1);
    LineFinder finder(text);
    for (ExportSpan line = finder.Next(0); line.path < text.size(); line = finder.Next(line.end)) lines.push_back(line);
  }

  const ExportsIndex& Index() const {
    std::call_once(has_index_, [this] { index_.emplace(text, lines); });
    return *index_;
  }

  const std::string text;
  ExportSpans lines;

 private:
  mutable std::once_flag has_index_;
  mutable std::optional<ExportsIndex> index_;
};

ExportsDocument::ExportsDocument(std::string text) : content_(std::make_shared<const Content>(std::move(text))) {}

const std::string& ExportsDocument::text() const { return content_->text; }

std::vector<ExportLine> ExportsDocument::Lines() const { return Read(content_->lines); }

std::vector<ExportLine> ExportsDocument::Read(const ExportSpans& spans) const {
  std::vector<ExportLine> lines;
  lines.reserve(spans.size());
  for (const ExportSpan& line : spans) lines.push_back(LineReader(text(), line).Read());
  return lines;
}

ExportSpans ExportsDocument::SpansOf(const std::string& path, const ExportPaths& paths) const {
  ExportSpans own;
  for (const std::size_t line : content_->Index().Find(path, paths)) own.push_back(content_->lines[line]);
  return own;
}

std::vector<ExportLine> ExportsDocument::LinesOf(const std::string& path, const ExportPaths& paths) const {
  return Read(SpansOf(path, paths));
}

std::vector<ExportEntry> ExportsDocument::Entries(const std::string& path, const ExportPaths& paths) const {
  return EntriesOf(LinesOf(path, paths));
}

Result<std::string> ExportsDocument::Replace(const std::string& path, const std::vector<ExportEntry>& entries,
                                             const ExportPaths& paths) const {
  const std::string normal = NormalExportPath(path);
  const std::string where = "the exports of " + normal + " cannot be written: ";
  const ExportSpans own = SpansOf(normal, paths);
  Result<std::string> rendered = Rendered(own, normal, entries);
  if (!rendered.ok()) return rendered;
  const ExportsDocument edited(std::move(*rendered));
  const auto added = Added(own, edited);
  if (!added) return Status::Failure(kRefusedText, where + "the file's other lines would change");
  const std::vector<ExportLine> lines = edited.Read(*added);
  const auto is_own = [&](const ExportLine& line) { return line.path == normal; };
  if (!std::all_of(lines.begin(), lines.end(), is_own) || !(EntriesOf(lines) == entries)) {
    return Status::Failure(kRefusedText, where + "they do not read back");
  }
  return edited.text();
}

// Returns the lines that the edited file has beside those of this file that are not `own`, or nullopt if one of
// those is missing.
std::optional<ExportSpans> ExportsDocument::Added(const ExportSpans& own, const ExportsDocument& edited) const {
  ExportSpans added;
  auto mine = own.begin();
  auto next = edited.content_->lines.begin();
  const auto end = edited.content_->lines.end();
  for (const ExportSpan& line : content_->lines) {
    if (mine != own.end() && mine->begin == line.begin) {
      ++mine;
      continue;
    }
    const bool last = line.end == text().size();
    const auto same = [&](const ExportSpan& other) {
      if (last) return SameLastLine(text(), line, edited.text(), other);
      return Text(text(), line) == Text(edited.text(), other);
    };
    while (next != end && !same(*next)) added.push_back(*next++);
    if (next == end) return std::nullopt;
    ++next;
  }
  added.insert(added.end(), next, end);
  return added;
}

Result<std::string> ExportsDocument::Rendered(const ExportSpans& own, const std::string& path,
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
  return out;
}

std::string ExportsDocument::Place(std::size_t position) const {
  const std::size_t end = std::min(position, text().size());
  const auto stop = text().begin() + static_cast<std::ptrdiff_t>(end);
  const std::size_t begin = end == 0 ? 0 : text().rfind('\n', end - 1) + 1;  // npos + 1 is 0
  return std::to_string(1 + std::count(text().begin(), stop, '\n')) + ":" + std::to_string(end - begin + 1);
}

}  // namespace vorn
