#include "exports_document.h"

#include <algorithm>
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
  LineReader(std::string_view text, std::size_t line_begin) : text_(text), reader_(text, line_begin) {
    line_.span.begin = line_begin;
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
    reader_.SkipToPath();
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
        if (!Apply(&defaults_, std::string_view(word_).substr(1))) return;
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
      const std::string_view list = std::string_view(word_).substr(open + 1, word_.size() - open - 2);
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

// The next line that begins at or after `position`; empty when there is none. Lines without quotation
// marks and backslashes, nearly all, end at the next line break, whatever they say.
ExportSpan NextLine(std::string_view text, std::size_t position) {
  ExportsReader reader(text, position);
  const std::size_t begin = reader.SkipToPath();
  if (reader.at_end()) return {text.size(), text.size()};
  const std::size_t newline = text.find('\n', begin);
  const std::size_t end = newline == std::string_view::npos ? text.size() : newline + 1;
  const std::string_view line = text.substr(begin, end - begin);
  const bool simple = line.find('\\') == std::string_view::npos && line.find('"') == std::string_view::npos;
  return simple ? ExportSpan{begin, end} : LineReader(text, begin).Read().span;
}

template <typename Visitor>
void ForEachLine(std::string_view text, const Visitor& visit) {
  for (ExportSpan line = NextLine(text, 0); line.begin < line.end; line = NextLine(text, line.end)) visit(line);
}

bool IsNormal(std::string_view path) {
  return path.find("//") == std::string_view::npos && path.find("/.") == std::string_view::npos &&
         (path.size() < 2 || path.back() != '/');
}

// Whether a line is one of `path`, which is in normal form.
bool Names(std::string_view text, ExportSpan line, std::string_view path) {
  ExportsReader reader(text, line.begin);
  reader.SkipToPath();
  const std::string_view rest = text.substr(reader.position(), line.end - reader.position());
  const std::string_view raw = rest.substr(0, rest.find_first_of(std::string_view(" \t\n\v\f\r\0", 7)));
  if (raw == path) return true;
  if (raw.find_first_of("\\\"") == std::string_view::npos && IsNormal(raw)) return false;
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

bool SameEntries(const std::vector<ExportEntry>& a, const std::vector<ExportEntry>& b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](const ExportEntry& x, const ExportEntry& y) {
    return x.client == y.client && x.options == y.options;
  });
}

// The lines that are not of `path`, one after the other, without their ends: what stands at the end
// of the file may need a line break before another line can follow.
std::vector<std::string_view> Foreign(std::string_view text, const std::string& path) {
  std::vector<std::string_view> lines;
  ForEachLine(text, [&](ExportSpan line) {
    if (Names(text, line, path)) return;
    const std::string_view whole = text.substr(line.begin, line.end - line.begin);
    lines.push_back(whole.substr(0, whole.find_last_not_of("\\\n") + 1));
  });
  return lines;
}

}  // namespace

std::vector<ExportLine> ExportsDocument::Lines() const {
  std::vector<ExportLine> lines;
  ForEachLine(text_, [&](ExportSpan line) { lines.push_back(LineReader(text_, line.begin).Read()); });
  return lines;
}

std::vector<ExportEntry> ExportsDocument::Entries(std::string_view path) const {
  const std::string normal = NormalExportPath(path);
  std::vector<ExportEntry> entries;
  std::set<std::string> seen;
  ForEachLine(text_, [&](ExportSpan line) {
    if (!Names(text_, line, normal)) return;
    for (ExportEntry& entry : LineReader(text_, line.begin).Read().entries) {
      if (seen.insert(ExportClientKey(entry.client)).second) entries.push_back(std::move(entry));
    }
  });
  return entries;
}

Status ExportsDocument::Replace(std::string_view path, const std::vector<ExportEntry>& entries) {
  const std::string normal = NormalExportPath(path);
  ExportsDocument edited(Rendered(normal, entries));
  Status status = CheckEdit(edited, normal, entries);
  if (status.ok()) text_ = std::move(edited.text_);
  return status;
}

std::string ExportsDocument::Rendered(const std::string& path, const std::vector<ExportEntry>& entries) const {
  std::string out;
  out.reserve(text_.size() + 512);
  std::size_t copied = 0;
  bool missing = !entries.empty();
  ForEachLine(text_, [&](ExportSpan span) {
    if (!Names(text_, span, path)) return;
    out.append(text_, copied, span.begin - copied);
    copied = span.end;
    if (!missing) return;
    const ExportLine line = LineReader(text_, span.begin).Read();
    out.append(text_, span.begin, line.path_end - span.begin);
    AppendEntries(&out, entries);
    out.append(line.comment.empty() ? "" : " ").append(line.comment).append("\n");
    missing = false;
  });
  out.append(text_, copied);
  if (!missing) return out;
  out.append(Separator(out)).append(EncodeExportsWord(path));
  AppendEntries(&out, entries);
  return out.append("\n");
}

Status ExportsDocument::CheckEdit(const ExportsDocument& edited, const std::string& path,
                                  const std::vector<ExportEntry>& entries) const {
  const std::string where = "the exports of " + path + " cannot be written: ";
  if (!SameEntries(edited.Entries(path), entries))
    return Status::Failure(kRefusedText, where + "they do not read back");
  if (Foreign(edited.text_, path) != Foreign(text_, path)) {
    return Status::Failure(kRefusedText, where + "the file's other lines would change");
  }
  return {};
}

std::size_t ExportsDocument::LineNumber(std::size_t position) const {
  const auto end = text_.begin() + static_cast<std::ptrdiff_t>(std::min(position, text_.size()));
  return 1 + static_cast<std::size_t>(std::count(text_.begin(), end, '\n'));
}

}  // namespace vorn
