// One line of an INI file, as nfs-utils reads it.
#ifndef VORN_LINUX_TEXT_INI_LINE_H
#define VORN_LINUX_TEXT_INI_LINE_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace vorn {

struct IniLine {
  enum class Kind {
    kOther,       // blank, comment, include, or nothing that the reader knows
    kSection,     // [name] or [name "argument"]
    kNoSection,   // a section line that is none: assignments below it count for nothing
    kAssignment,  // key = value
  };

  Kind kind = Kind::kOther;
  std::string name;                     // the section's, or the key
  std::optional<std::string> argument;  // the section's
  std::string value;                    // empty: none that counts
  // Where the value, with its quotes, stands in the line.
  std::size_t value_begin = 0;
  std::size_t value_end = 0;
};

// The length of the first line of `text`: to its line feed and with it, past every line feed that a
// backslash escapes. All of `text` when it does not end its line, or only by an escaped line feed:
// the reader ignores such a line.
std::size_t IniLineLength(std::string_view text);

// Whether the line is ended.
bool IsEndedIniLine(std::string_view line);

// Reads one line.
IniLine ReadIniLine(std::string_view line);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_INI_LINE_H
