// An exports(5) file: read as exportfs(8) of nfs-utils 2.6 reads it, edited in place.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H
#define VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "export_paths.h"
#include "exports_index.h"
#include "exports_options.h"
#include "status.h"

namespace vorn {

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
};

// The entries of several lines in order. If two have clients that are one client to exportfs(8), only the first
// is returned, as exportfs ignores the second.
std::vector<ExportEntry> EntriesOf(const std::vector<ExportLine>& lines);

// One text of a file. Immutable: copies share it, and any number of threads may use it.
class ExportsDocument {
 public:
  explicit ExportsDocument(std::string text);

  const std::string& text() const;

  // Returns every line in order. Lines after a fault are read as if there were no fault.
  std::vector<ExportLine> Lines() const;

  // Returns the lines whose path leads to the directory `path`, in order.
  std::vector<ExportLine> LinesOf(const std::string& path, const ExportPaths& paths) const;

  // Returns EntriesOf(LinesOf(path, paths)).
  std::vector<ExportEntry> Entries(const std::string& path, const ExportPaths& paths) const;

  // Returns the text in which `entries` are the only ones of `path`. They are one line, in place of the first
  // line of `path` or at the end, with the comments of all its lines. Without entries all its lines are removed.
  // Every other byte stays. Fails with kRefusedText if the new text would not read back as exactly that, and if
  // a line of `path` has a fault, unless it is removed.
  Result<std::string> Replace(const std::string& path, const std::vector<ExportEntry>& entries,
                              const ExportPaths& paths) const;

  // Returns the line and column of a position, from 1: "12:7". A column is a byte of the line.
  std::string Place(std::size_t position) const;

 private:
  struct Content;

  ExportSpans SpansOf(const std::string& path, const ExportPaths& paths) const;
  std::vector<ExportLine> Read(const ExportSpans& spans) const;
  Result<std::string> Rendered(const ExportSpans& own, const std::string& path,
                               const std::vector<ExportEntry>& entries) const;
  std::optional<ExportSpans> Added(const ExportSpans& own, const ExportsDocument& edited) const;

  std::shared_ptr<const Content> content_;
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H
