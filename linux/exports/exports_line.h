// The meaning of one line of an exports(5) file.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_LINE_H
#define VORN_LINUX_EXPORTS_EXPORTS_LINE_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "exports_options.h"

namespace vorn {

// Where a line is, with its continuations and its line break.
struct ExportSpan {
  std::size_t begin = 0;
  std::size_t path = 0;  // where its path begins, after blanks
  std::size_t end = 0;
  // Where the word of the line before is that exportfs(8) may apply to this one; npos if there is none. exportfs does
  // not clear its buffer, which is on the stack: where a line has no client, the last client of the line before, if
  // that begins with "-", is read as default options once more. On some machines the word is no longer there then.
  std::size_t inherited = std::string_view::npos;
};

using ExportSpans = std::vector<ExportSpan>;

// One client of one path.
struct ExportEntry {
  std::string client;  // "*" also where the line names no client: it is exported to everybody
  ExportOptions options;
  // The entry's text in the file, if that alone tells its options; it is written back unchanged. Otherwise
  // empty, and the entry is written from `client` and `options`.
  std::string word;
};

// Whether both are the same client with the same options. The spelling in the file does not matter.
bool operator==(const ExportEntry& a, const ExportEntry& b);

// A part of a line that is not understood.
struct ExportFault {
  std::size_t position = 0;  // in the text of the file
  std::string reason;
  // Whether exportfs(8) stops here: it exports the entries before the fault, and nothing after it in the file.
  // Otherwise it reads on, but the line hardly means what its author intended.
  bool ends_file = false;
};

// The meaning of one line.
struct ExportLine {
  ExportSpan span;
  std::size_t path_end = 0;  // the end of its first word
  std::string path;          // in normal form
  std::vector<ExportEntry> entries;
  std::string comment;  // with its "#", or empty
  std::optional<ExportFault> fault;
  std::size_t left_over = std::string_view::npos;  // where its last client is, if that begins with "-"
};

// Reads the line whose begin, path and inherited word are those of `span`. The end of `span` is not used; that of the
// result is the line's, and its inherited word is npos if the line has a client. After a fault that ends the file, the
// line ends at the next line break without a backslash, even in a quotation.
ExportLine ReadExportLine(std::string_view text, const ExportSpan& span);

// The entries of several lines in order. If two have clients that are one client to exportfs(8), only the first
// is returned, as exportfs ignores the second.
std::vector<ExportEntry> EntriesOf(const std::vector<ExportLine>& lines);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_LINE_H
