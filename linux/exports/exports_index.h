// Finds the lines of an exports(5) file by their paths.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_INDEX_H
#define VORN_LINUX_EXPORTS_EXPORTS_INDEX_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "export_paths.h"
#include "exports_lines.h"

namespace vorn {

// Finding the lines of one directory takes time in proportion to the number of different parent folders, not of
// lines. Immutable.
class ExportsIndex {
 public:
  explicit ExportsIndex(const ExportsLines& lines);

  // Returns the numbers, from 0 and in order, of the lines whose path leads to the directory `path`. `lines` are those
  // that the index was made of, or lines that have the same paths (HaveSamePaths).
  std::vector<std::size_t> Find(const ExportsLines& lines, const std::string& path, const ExportPaths& paths) const;

 private:
  class Search;

  std::size_t FindSlot(const ExportsLines& lines, std::string_view path) const;

  std::vector<std::uint32_t> slots_;    // a hash table of the plain paths: the last line of each, plus 1; or 0
  std::vector<std::uint32_t> earlier_;  // for each line the line before with the same path, plus 1; or 0
  std::vector<std::string> folders_;    // the parent folders of the plain paths, each once
  std::vector<std::uint32_t> unusual_;  // lines whose path must be decoded or normalised before it is compared
};

// Whether the lines of `now`, which were read after `old`, have the paths of `old`, as they are written.
bool HaveSamePaths(const ExportsLines& now, const ExportsLines& old);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_INDEX_H
