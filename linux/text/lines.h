// Lines and words of a text. The streams of the standard library are not used for it: without memory they end as if the
// text had ended, and what was left out of a list would be lost when the list is stored again.
#ifndef VORN_LINUX_TEXT_LINES_H
#define VORN_LINUX_TEXT_LINES_H

#include <string_view>
#include <vector>

namespace vorn {

// The parts of the text between separators. A separator at the end of the text ends the last part and begins none.
// The parts live as long as the text.
std::vector<std::string_view> PartsOf(std::string_view text, char separator);

// The lines of the text, without line feeds.
inline std::vector<std::string_view> LinesOf(std::string_view text) { return PartsOf(text, '\n'); }

// The words of the text, which blanks separate (isspace(3) in the C locale).
std::vector<std::string_view> WordsOf(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_LINES_H
