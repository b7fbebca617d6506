// The numbers of the lines of a text.
#ifndef VORN_LINUX_TEXT_LINE_NUMBERS_H
#define VORN_LINUX_TEXT_LINE_NUMBERS_H

#include <algorithm>
#include <cstddef>
#include <string>

namespace vorn {

// Counts the lines of a text up to positions that only grow, so that numbering all lines takes one pass. The text must
// outlive the object. Not thread-safe.
class LineNumbers {
 public:
  explicit LineNumbers(const std::string& text) : text_(text) {}

  // Returns the number, from 1, of the line with the character at `position`.
  int At(std::size_t position) {
    const auto begin = text_.begin();
    number_ += static_cast<int>(std::count(begin + Offset(counted_), begin + Offset(position), '\n'));
    counted_ = position;
    return number_;
  }

 private:
  static std::ptrdiff_t Offset(std::size_t position) { return static_cast<std::ptrdiff_t>(position); }

  const std::string& text_;
  std::size_t counted_ = 0;
  int number_ = 1;
};

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_LINE_NUMBERS_H
