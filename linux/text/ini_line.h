// One line of an INI file, as nfs-utils reads it.
#ifndef VORN_LINUX_TEXT_INI_LINE_H
#define VORN_LINUX_TEXT_INI_LINE_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace vorn {

// The meaning of a line. The views point into the line.
struct IniLine {
  enum class Kind {
    kOther,       // blank, a comment, or nothing that the reader understands
    kSection,     // [name] or [name "argument"]
    kBadSection,  // a malformed section header; the assignments below it are ignored
    kAssignment,  // key = value
    kInclude,     // include = file
  };

  Kind kind = Kind::kOther;
  std::string_view name;                     // the name of the section, or the key
  std::optional<std::string_view> argument;  // of the section
  std::string_view value;                    // empty if the reader finds none
  // The range of the value in the line, including its quotes.
  std::size_t value_begin = 0;
  std::size_t value_end = 0;
};

// The extent of a line: with the line feed that ends it, and every line feed before that one that a backslash escapes.
struct IniLineExtent {
  std::size_t length = 0;
  int line_feeds = 0;
};

// The first line of `text`. It is empty if the text does not end its first line: the reader ignores such a line.
IniLineExtent FirstIniLine(std::string_view text);

// The line with each escaped line feed replaced by two blanks, which is how the reader joins its parts. The result
// has the length of `line`.
std::string JoinIniLine(std::string_view line);

// Reads one complete line in which no line feed is escaped.
IniLine ReadIniLine(std::string_view line);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_INI_LINE_H
