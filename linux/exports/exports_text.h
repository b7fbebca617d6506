// The words of an exports(5) file, read byte for byte as exportfs(8) reads them.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_TEXT_H
#define VORN_LINUX_EXPORTS_EXPORTS_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace vorn {

// The longest words that exportfs(8) takes, in bytes. A longer one ends its reading of the file.
constexpr std::size_t kLongestExportPath = 1024;
constexpr std::size_t kLongestExportClient = 511;  // with its options

// Reads on from a position. A backslash before a line break makes one blank of the break and the
// blanks that follow it, '"' begins and ends a part in which blanks and line breaks are ordinary,
// '\' and three octal digits are one byte, and '#' begins a comment where a word could begin.
class ExportsReader {
 public:
  enum class Found { kWord, kNothing, kTooLong };

  // Whether a byte ends a word outside of quotation marks.
  static bool EndsWord(int c) { return IsBlank(c) || (c >= '\t' && c <= '\r'); }

  explicit ExportsReader(std::string_view text, std::size_t position = 0) : text_(text), position_(position) {}

  std::size_t position() const { return position_; }
  bool at_end() const { return position_ == text_.size(); }

  // Skips blanks, comments and line breaks up to the next path. Where the line of that path begins;
  // the text's end when there is no further one.
  std::size_t SkipToPath();

  // Skips blanks, and a comment, but no line break. Where the comment begins, or npos.
  std::size_t SkipToClient();

  // Reads the word that begins here, of at most `longest` bytes, and the blank that ends it.
  // Nothing: there is none, and what is no line break has been passed over.
  Found ReadWord(std::size_t longest, std::string* word);

  // Where the word just read ends, without that blank.
  std::size_t word_end() const { return word_end_; }

 private:
  // A NUL is a blank to exportfs(8), which looks it up in a C string of blanks.
  static bool IsBlank(int c) { return c == ' ' || c == '\t' || c == '\0'; }

  int Next();
  void SkipComment();

  std::string_view text_;
  std::size_t position_;
  std::size_t word_end_ = 0;
};

// `text` as one word that reads back as `text`: octal escapes for what would end it, or mean
// something else.
std::string EncodeExportsWord(std::string_view text);

// `path` without empty and "." components and without a trailing "/". Links are not followed.
std::string NormalExportPath(std::string_view path);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_TEXT_H
