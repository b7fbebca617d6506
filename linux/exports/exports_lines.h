// The text of an exports(5) file, divided into its lines.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_LINES_H
#define VORN_LINUX_EXPORTS_EXPORTS_LINES_H

#include <cstddef>
#include <string>
#include <string_view>

#include "exports_line.h"

namespace vorn {

// The sizes of the parts at the beginning and at the end that two texts have in common, in whole lines.
struct CommonText {
  std::size_t head = 0;
  std::size_t tail = 0;
};

// Finding the lines takes time in proportion to the size of the text. The lines of another version of a text are
// found in the time of comparing both, because nearly all of them stay. Immutable.
class ExportsLines {
 public:
  explicit ExportsLines(std::string text);
  ExportsLines(std::string text, const ExportsLines& previous);

  // Reads a text that is known to have these parts in common with `previous`. Nothing is compared.
  ExportsLines(std::string text, const ExportsLines& previous, const CommonText& common);

  // The spans refer to positions, so this class can be moved.
  ExportsLines(ExportsLines&&) = default;

  const std::string& text() const { return text_; }
  const ExportSpans& spans() const { return spans_; }

  std::string_view TextOf(const ExportSpan& line) const {
    return std::string_view{text_}.substr(line.begin, line.end - line.begin);
  }

  // The numbers of lines at the beginning and at the end that have the same bytes as those of `previous`. Zero if
  // the lines were found without it.
  std::size_t shared_head() const { return shared_head_; }
  std::size_t shared_tail() const { return shared_tail_; }

 private:
  bool FindChanged(const ExportsLines& previous, const CommonText& common);
  void FindAll();

  std::string text_;
  // Whether no line depends on another one: there is no quotation mark and no backslash, and no word that exportfs(8)
  // applies to the next line.
  bool is_plain_ = false;
  ExportSpans spans_;
  std::size_t shared_head_ = 0;
  std::size_t shared_tail_ = 0;
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_LINES_H
