// An exports(5) file: read as exportfs(8) of nfs-utils 2.6 reads it, edited in place.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H
#define VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "exports_options.h"
#include "status.h"

namespace vorn {

// One client of one path.
struct ExportEntry {
  std::string client;  // "*" also where the line names no client: it is exported to everybody
  ExportOptions options;
  // The entry as it stands in the file, where that alone tells its options; else empty, and it is
  // written from `client` and `options`.
  std::string word;
};

// The same client with the same options, however the two are written.
bool operator==(const ExportEntry& a, const ExportEntry& b);

// Where a line is: with its continuations and its line break.
struct ExportSpan {
  std::size_t begin = 0;
  std::size_t path = 0;  // its first word, after blanks
  std::size_t end = 0;
};

// What one line says.
struct ExportLine {
  ExportSpan span;
  std::size_t path_end = 0;  // the end of its first word
  std::string path;          // in normal form
  std::vector<ExportEntry> entries;
  std::string comment;  // with its "#", or empty
  // Where exportfs(8) gives up: it takes the entries before, but nothing of what follows in the
  // file. Empty: nowhere.
  std::string fault;
};

class ExportsDocument {
 public:
  explicit ExportsDocument(std::string text);

  const std::string& text() const { return text_; }

  // Every line, in order; lines after a fault are read as if there were none.
  std::vector<ExportLine> Lines() const;

  // The clients of `path` from all its lines, in order. Of two that are one to exportfs(8) the
  // first, as there.
  std::vector<ExportEntry> Entries(std::string_view path) const;

  // Makes `entries` the only ones of `path`: one line, where its first one was, with that line's
  // comment, or at the end; none, when there are no entries. Every other byte stays. The outcome is
  // read back before it is taken: fails with kRefusedText, and changes nothing, when it would say
  // anything but that.
  Status Replace(std::string_view path, const std::vector<ExportEntry>& entries);

  // The number of the line, from 1, at a position of the text.
  std::size_t LineNumber(std::size_t position) const;

 private:
  using Spans = std::vector<ExportSpan>;

  Spans LinesOf(std::string_view path) const;
  std::vector<ExportEntry> EntriesIn(const Spans& own) const;
  std::string Rendered(const Spans& own, const std::string& path, const std::vector<ExportEntry>& entries) const;
  std::optional<Spans> Added(const Spans& own, const ExportsDocument& edited) const;

  std::string text_;
  Spans lines_;
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H
