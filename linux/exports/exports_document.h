// An exports(5) file: read as exportfs(8) of nfs-utils 2.6 reads it, edited in place.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H
#define VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "export_paths.h"
#include "exports_line.h"
#include "exports_lines.h"
#include "status.h"

namespace vorn {

// One text of a file. Immutable: copies share it, and any number of threads may use it.
class ExportsDocument {
 public:
  explicit ExportsDocument(std::string text);

  // Reads another version of the text of `previous`. That is faster than reading the text alone if they have most
  // lines in common.
  ExportsDocument(std::string text, const ExportsDocument& previous);

  const std::string& text() const;

  // Returns every line in order. Lines after a fault are read as if there were no fault. Callers share the result of an
  // earlier call for as long as somebody owns it.
  std::shared_ptr<const std::vector<ExportLine>> Lines() const;

  // Returns the lines whose path leads to the directory `path`, in order.
  std::vector<ExportLine> LinesOf(const std::string& path, const ExportPaths& paths) const;

  // Returns EntriesOf(LinesOf(path, paths)).
  std::vector<ExportEntry> Entries(const std::string& path, const ExportPaths& paths) const;

  // Returns the file in which `entries` are the only ones of `path`. They are one line, in place of the first
  // line of `path` or at the end, with the comments of all its lines. Without entries all its lines are removed.
  // Every other byte stays. Fails with kRefusedText if the new text would not read back as exactly that, and if
  // a line of `path` has a fault, unless it is removed.
  Result<ExportsDocument> Replace(const std::string& path, const std::vector<ExportEntry>& entries,
                                  const ExportPaths& paths) const;

  // Returns the line and column of a position, from 1: "12:7". A column is a byte of the line.
  std::string Place(std::size_t position) const;

 private:
  class Content;

  explicit ExportsDocument(std::shared_ptr<const Content> content) : content_(std::move(content)) {}

  std::vector<ExportLine> Read(const ExportSpans& spans) const;
  Result<ExportsDocument> Edited(const ExportSpans& own, const std::string& path,
                                 const std::vector<ExportEntry>& entries) const;
  CommonText AroundAll(const ExportSpans& own) const;
  std::optional<ExportSpans> Added(const ExportSpans& own, const ExportsDocument& edited) const;

  std::shared_ptr<const Content> content_;
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_DOCUMENT_H
