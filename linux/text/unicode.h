// Texts as Unicode has them: upper and lower case, and what of a text is seen.
#ifndef VORN_LINUX_TEXT_UNICODE_H
#define VORN_LINUX_TEXT_UNICODE_H

#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// Unicode's full case mapping, of no particular language. Fails on text that is no UTF-8.
Result<std::string> UpperCase(std::string_view text);

// A test for "contains this text, upper and lower case being the same". Text that is no UTF-8 is
// compared byte for byte.
class CaselessSubstring {
 public:
  explicit CaselessSubstring(std::string_view substring);
  bool IsIn(std::string_view text) const;

 private:
  std::string substring_;
};

// Whether who reads `text` sees what it is: UTF-8, and none of what RFC 8264 keeps out of every
// identifier: control and format characters, line separators, what has no width, what is not
// assigned, and compatibility forms such as full-width letters, which look like others. Nor are there
// letters of two alphabets in one word: "a" is in the Latin and in the Cyrillic one.
bool IsPlainText(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_UNICODE_H
