// Finds the lines of an exports(5) file by their paths.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_INDEX_H
#define VORN_LINUX_EXPORTS_EXPORTS_INDEX_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "export_paths.h"

namespace vorn {

// Where a line is, with its continuations and its line break.
struct ExportSpan {
  std::size_t begin = 0;
  std::size_t path = 0;  // where its path begins, after blanks
  std::size_t end = 0;
};

using ExportSpans = std::vector<ExportSpan>;

// Finding the lines of one directory takes time in proportion to the number of different parent folders, not of
// lines. Immutable. Refers to the text and the lines that it was made of.
class ExportsIndex {
 public:
  ExportsIndex(std::string_view text, const ExportSpans& lines);

  // Returns the numbers, from 0 and in order, of the lines whose path leads to the directory `path`.
  std::vector<std::size_t> Find(const std::string& path, const ExportPaths& paths) const;

 private:
  void Append(std::string_view path, std::vector<std::size_t>* found) const;
  void AppendLinked(std::string_view folder, const std::string& target, const ExportPaths& paths,
                    std::vector<std::size_t>* found) const;
  std::size_t Slot(std::string_view path) const;
  std::string_view PlainPath(std::size_t line) const;

  std::string_view text_;
  const ExportSpans* lines_;
  std::vector<std::uint32_t> slots_;       // a hash table of the plain paths: line + 1, or 0
  std::vector<std::string_view> folders_;  // the parent folders of the plain paths, each once
  std::vector<std::uint32_t> unusual_;     // lines whose path must be decoded or normalised before it is compared
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_INDEX_H
