// Unicode case mapping, repair of malformed UTF-8, and detection of invisible and confusable characters.
#ifndef VORN_LINUX_TEXT_UNICODE_H
#define VORN_LINUX_TEXT_UNICODE_H

#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// Unicode's full case mapping, independent of any language (The Unicode Standard, 3.13). Fails with EILSEQ for a
// string that is not UTF-8.
Result<std::string> UpperCase(std::string_view text);

// The upper-case string, or the string itself if it is not UTF-8.
std::string UpperCaseOrSame(std::string_view text);

// A test whether strings contain a given one, without regard to case. Strings that are not UTF-8 are compared byte for
// byte. Thread-safe.
class CaselessSubstring {
 public:
  explicit CaselessSubstring(std::string_view substring);
  bool IsIn(std::string_view text) const;

 private:
  std::string substring_;
};

// The string with each maximal malformed part of it replaced by U+FFFD (The Unicode Standard, 3.9). Everything
// around such a part is preserved; valid UTF-8 is returned as it is. JSON can carry the result (RFC 8259).
std::string ToValidUtf8(std::string_view text);

// Whether ToValidUtf8 returns the string as it is.
bool IsValidUtf8(std::string_view text);

// Returns whether the string is what it looks like: it is UTF-8 and contains none of the characters that RFC 8264
// keeps out of every identifier (control and format characters, line separators, characters without width,
// unassigned ones, compatibility forms such as full-width letters). No word mixes the letters of two alphabets,
// because "a" exists in the Latin and in the Cyrillic one.
bool IsPlainText(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_UNICODE_H
