// The words of an exports(5) file, read byte for byte as exportfs(8) reads them.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_TEXT_H
#define VORN_LINUX_EXPORTS_EXPORTS_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace vorn {

// The longest words that exportfs(8) accepts, in bytes. It stops reading the file at a longer one.
constexpr std::size_t kLongestExportPath = 1024;
constexpr std::size_t kLongestExportClient = 511;  // with its options

// Reads words from a position on. The syntax of exportfs(8):
//  - A backslash, the line break after it, and the blanks after that are one blank.
//  - '"' begins and ends a quotation, in which blanks and line breaks are ordinary characters.
//  - '\' and three octal digits up to \377 are one byte.
//  - '#' begins a comment where a word could begin.
class ExportsReader {
 public:
  enum class Found { kWord, kNothing, kTooLong };

  // Whether a byte ends a word outside of quotation marks.
  static bool EndsWord(int c) { return IsBlank(c) || (c >= '\t' && c <= '\r'); }

  explicit ExportsReader(std::string_view text, std::size_t position = 0) : text_(text), position_(position) {}

  std::size_t position() const { return position_; }
  bool at_end() const { return position_ == text_.size(); }

  // Skips blanks, comments and line breaks up to the next path. Returns where the line of that path
  // begins, or the end of the text if there is no further path.
  std::size_t SkipToPath();

  // Skips blanks and a comment, but no line break. Returns where the comment begins, or npos.
  std::size_t SkipToClient();

  // Reads the word that begins here, of at most `longest` bytes, and the blank that ends it. kNothing:
  // there is no word; a separator other than a line break has been consumed.
  Found ReadWord(std::size_t longest, std::string* word);

  // Whether the word that was read last ends with the text, in a quotation.
  bool in_quotation() const { return in_quotation_; }

  // The end of the word that was read last, without that blank.
  std::size_t word_end() const { return word_end_; }

 private:
  // exportfs(8) takes a NUL for a blank, because it searches a C string of blanks, which ends with a NUL.
  static bool IsBlank(int c) { return c == ' ' || c == '\t' || c == '\0'; }

  int Next();
  void SkipComment();

  std::string_view text_;
  std::size_t position_;
  std::size_t word_end_ = 0;
  bool in_quotation_ = false;
};

// Returns one word that reads back as `text`: bytes with another meaning are written as octal escapes.
std::string EncodeExportsWord(std::string_view text);

// Returns `path` without empty and "." components and without a trailing "/". Symbolic links are not followed.
std::string NormalExportPath(std::string_view path);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_TEXT_H
