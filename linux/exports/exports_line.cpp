#include "exports_line.h"

#include <algorithm>
#include <set>
#include <utility>

#include "exports_client.h"
#include "exports_text.h"

namespace vorn {
namespace {

using Found = ExportsReader::Found;

constexpr std::size_t kNone = std::string_view::npos;

// Returns the end of the line at `position`. A backslash before the line break continues it.
std::size_t LineEnd(std::string_view text, std::size_t position) {
  for (;;) {
    const std::size_t newline = text.find('\n', position);
    if (newline == kNone) return text.size();
    if (newline == 0 || text[newline - 1] != '\\') return newline + 1;
    position = newline + 1;
  }
}

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
    if (HasOpenQuotation()) return Fail("a quotation mark has no partner");
    line_.path_end = reader_.word_end();
    line_.path = NormalExportPath(word_);
    return true;
  }

  Found ReadClientWord() {
    const std::size_t comment = reader_.SkipToClient();
    if (comment != kNone) line_.comment = text_.substr(comment, reader_.position() - comment);
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
      if (!CheckWord(found) || !ApplyInherited(found) || !AddEntry(found)) return;
    }
  }

  bool ApplyInherited(Found found) {
    const std::size_t inherited = std::exchange(line_.span.inherited, kNone);
    const bool is_applied = found == Found::kNothing && !has_defaults_ && line_.entries.empty();
    if (inherited == kNone || !is_applied) return true;
    line_.span.inherited = inherited;
    std::string word;
    ExportsReader(text_, inherited).ReadWord(kLongestExportClient, &word);
    word.resize(std::min(word.find('('), word.size()));
    if (!Apply(&defaults_, std::string_view{word}.substr(1))) return false;
    line_.fault = {line_.span.path, "no client; exportfs may apply \"" + word + "\" of the line before", false};
    return true;
  }

  // Whether the word is the rest of the file, several lines of it. exportfs takes it for a path or a client.
  bool HasOpenQuotation() const { return reader_.in_quotation() && word_.find('\n') != std::string::npos; }

  bool CheckWord(Found found) {
    if (found == Found::kTooLong) {
      return Fail("a client with its options is too long, or a quotation mark has no partner");
    }
    return !HasOpenQuotation() || Fail("a quotation mark has no partner");
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
    line_.left_over = word_.substr(0, 1) == "-" ? word_begin_ : kNone;
    Doubt("/", "a path among the clients; the line before may end with a backslash");
    Doubt("-", "exportfs takes a second word of default options for a host name");
    ExportEntry entry{open == 0 ? "*" : word_.substr(0, open), options.Options(), {}};
    if (!has_defaults_ && open > 0) entry.word = text_.substr(word_begin_, reader_.word_end() - word_begin_);
    line_.entries.push_back(std::move(entry));
    return true;
  }

  // exportfs reads on after such a client.
  void Doubt(std::string_view first_character, const char* reason) {
    if (word_.substr(0, 1) == first_character && !line_.fault) line_.fault = {word_begin_, reason, false};
  }

  void FinishLine() {
    const std::size_t comment = reader_.SkipToClient();
    if (comment != kNone) line_.comment = text_.substr(comment, reader_.position() - comment);
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

}  // namespace

ExportLine ReadExportLine(std::string_view text, const ExportSpan& span) { return LineReader(text, span).Read(); }

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

}  // namespace vorn
