#include "exports_document.h"

#include <algorithm>
#include <iterator>
#include <set>
#include <utility>

#include "exports_client.h"
#include "exports_text.h"

namespace vorn {
namespace {

using Found = ExportsReader::Found;

// The end of the line at `position`, which a backslash continues.
std::size_t LineEnd(std::string_view text, std::size_t position) {
  for (;;) {
    const std::size_t newline = text.find('\n', position);
    if (newline == std::string_view::npos) return text.size();
    if (newline == 0 || text[newline - 1] != '\\') return newline + 1;
    position = newline + 1;
  }
}

// Reads one line, from its path on. After a fault the line ends where it does to the eye.
class LineReader {
 public:
  LineReader(std::string_view text, const ExportSpan& span) : text_(text), reader_(text, span.path) {
    line_.span = span;
  }

  ExportLine Read() {
    if (ReadPath()) ReadClients();
    if (line_.fault.empty()) FinishLine();
    if (!line_.fault.empty()) line_.span.end = LineEnd(text_, word_begin_);
    return std::move(line_);
  }

 private:
  bool Fail(std::string fault) {
    line_.fault = std::move(fault);
    return false;
  }

  bool ReadPath() {
    word_begin_ = reader_.position();
    const Found found = reader_.ReadWord(kLongestExportPath, &word_);
    if (found == Found::kNothing) return Fail("the line begins with something that is no path");
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
      if (found == Found::kTooLong) Fail("a client with its options is too long, or a quotation mark has no partner");
      if (found == Found::kTooLong || !AddEntry(found)) return;
    }
  }

  bool Apply(ExportOptionReader* options, std::string_view list) {
    const Status status = options->Apply(list);
    return status.ok() || Fail(status.reason());
  }

  // The entry of the word just read, or that of everybody, where there is none.
  bool AddEntry(Found found) {
    if (found == Found::kNothing) word_.clear();
    ExportOptionReader options = defaults_;
    const std::size_t open = std::min(word_.find('('), word_.size());
    if (open < word_.size()) {
      if (word_.find(')', open) != word_.size() - 1) return Fail("the options of a client do not end with \")\"");
      const std::string_view list = std::string_view{word_}.substr(open + 1, word_.size() - open - 2);
      if (!Apply(&options, list)) return false;
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
    if (text_[line_.span.end] != '\n') Fail("a word after the last client would be taken for a path");
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

// Finds one line after the other. Lines without quotation marks and backslashes, nearly all, end at
// the next line break, whatever they say.
class LineFinder {
 public:
  explicit LineFinder(std::string_view text) : text_(text) {}

  // The next line that begins at or after `position`, which never goes back; at the end of the text
  // its path begins there.
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
  // Where `c` follows `position`; `last` remembers it, so that the whole text is searched but once.
  std::size_t Following(char c, std::size_t position, std::size_t* last) const {
    if (*last < position || position == 0) *last = std::min(text_.find(c, position), text_.size());
    return *last;
  }

  std::string_view text_;
  std::size_t quotation_ = 0;
  std::size_t backslash_ = 0;
};

bool IsPlain(char c) { return c != '"' && c != '\\' && !ExportsReader::EndsWord(c); }

// Whether a line is one of `path`, which is in normal form. Only a path that is not written as it is
// has to be decoded.
bool Names(std::string_view text, const ExportSpan& span, std::string_view path) {
  std::size_t end = span.path;
  char last = '\0';
  bool normal = true;
  for (; end < span.end && IsPlain(text[end]); last = text[end++]) {
    normal = normal && (last != '/' || (text[end] != '/' && text[end] != '.'));
  }
  const std::string_view plain = text.substr(span.path, end - span.path);
  const bool whole = end == span.end || ExportsReader::EndsWord(text[end]);
  if (whole && normal && (last != '/' || plain.size() == 1)) return plain == path;
  ExportsReader reader(text, span.path);
  std::string word;
  return reader.ReadWord(kLongestExportPath, &word) == Found::kWord && NormalExportPath(word) == path;
}

// What must stand before a line that is put at the end of `text`, so that it becomes a line of its own.
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

// The last line of a file may need a line break before another can follow. That must not make a
// fault of it, as it would of an open quotation.
bool SameLastLine(std::string_view text, const ExportSpan& line, std::string_view other, const ExportSpan& same) {
  if (WithoutEnd(Text(text, line)) != WithoutEnd(Text(other, same))) return false;
  return LineReader(other, same).Read().fault.empty() || !LineReader(text, line).Read().fault.empty();
}

}  // namespace

bool operator==(const ExportEntry& a, const ExportEntry& b) { return a.client == b.client && a.options == b.options; }

ExportsDocument::ExportsDocument(std::string text) : text_(std::move(text)) {
  lines_.reserve(text_.size() / 64 + 1);
  LineFinder finder(text_);
  for (ExportSpan line = finder.Next(0); line.path < text_.size(); line = finder.Next(line.end)) {
    lines_.push_back(line);
  }
}

std::vector<ExportLine> ExportsDocument::Lines() const {
  std::vector<ExportLine> lines;
  lines.reserve(lines_.size());
  for (const ExportSpan& line : lines_) lines.push_back(LineReader(text_, line).Read());
  return lines;
}

ExportsDocument::Spans ExportsDocument::LinesOf(std::string_view path) const {
  Spans own;
  std::copy_if(lines_.begin(), lines_.end(), std::back_inserter(own),
               [&](const ExportSpan& line) { return Names(text_, line, path); });
  return own;
}

std::vector<ExportEntry> ExportsDocument::Entries(std::string_view path) const {
  return EntriesIn(LinesOf(NormalExportPath(path)));
}

std::vector<ExportEntry> ExportsDocument::EntriesIn(const Spans& own) const {
  std::vector<ExportEntry> entries;
  std::set<std::string> seen;
  for (const ExportSpan& line : own) {
    for (ExportEntry& entry : LineReader(text_, line).Read().entries) {
      if (seen.insert(ExportClientKey(entry.client)).second) entries.push_back(std::move(entry));
    }
  }
  return entries;
}

Status ExportsDocument::Replace(std::string_view path, const std::vector<ExportEntry>& entries) {
  const std::string normal = NormalExportPath(path);
  const std::string where = "the exports of " + normal + " cannot be written: ";
  const Spans own = LinesOf(normal);
  ExportsDocument edited(Rendered(own, normal, entries));
  const auto added = Added(own, edited);
  if (!added) return Status::Failure(kRefusedText, where + "the file's other lines would change");
  const auto is_own = [&](const ExportSpan& line) { return Names(edited.text_, line, normal); };
  if (!std::all_of(added->begin(), added->end(), is_own) || !(edited.EntriesIn(*added) == entries)) {
    return Status::Failure(kRefusedText, where + "they do not read back");
  }
  *this = std::move(edited);
  return {};
}

// The lines that the edited file has beside all those that are not `own`; none when one is missing.
std::optional<ExportsDocument::Spans> ExportsDocument::Added(const Spans& own, const ExportsDocument& edited) const {
  Spans added;
  auto mine = own.begin();
  auto next = edited.lines_.begin();
  for (const ExportSpan& line : lines_) {
    if (mine != own.end() && mine->begin == line.begin) {
      ++mine;
      continue;
    }
    const bool last = line.end == text_.size();
    const auto same = [&](const ExportSpan& other) {
      if (last) return SameLastLine(text_, line, edited.text_, other);
      return Text(text_, line) == Text(edited.text_, other);
    };
    while (next != edited.lines_.end() && !same(*next)) added.push_back(*next++);
    if (next == edited.lines_.end()) return std::nullopt;
    ++next;
  }
  added.insert(added.end(), next, edited.lines_.end());
  return added;
}

std::string ExportsDocument::Rendered(const Spans& own, const std::string& path,
                                      const std::vector<ExportEntry>& entries) const {
  std::string out;
  out.reserve(text_.size() + 512);
  std::size_t copied = 0;
  bool missing = !entries.empty();
  for (const ExportSpan& span : own) {
    out.append(text_, copied, span.begin - copied);
    copied = span.end;
    if (!missing) continue;
    const ExportLine line = LineReader(text_, span).Read();
    out.append(text_, span.begin, line.path_end - span.begin);
    AppendEntries(&out, entries);
    out.append(line.comment.empty() ? "" : " ").append(line.comment).append("\n");
    missing = false;
  }
  out.append(text_, copied);
  if (!missing) return out;
  out.append(Separator(out)).append(EncodeExportsWord(path));
  AppendEntries(&out, entries);
  return out.append("\n");
}

std::size_t ExportsDocument::LineNumber(std::size_t position) const {
  const auto end = text_.begin() + static_cast<std::ptrdiff_t>(std::min(position, text_.size()));
  return 1 + static_cast<std::size_t>(std::count(text_.begin(), end, '\n'));
}

}  // namespace vorn
