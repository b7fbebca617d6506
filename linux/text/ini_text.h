// Texts that an INI file of nfs-utils can carry: whoever has one of these types cannot break a file.
//
// The reader (nfs.conf(5), idmapd.conf(5)) takes "[section]" and "key = value" lines. Names are the
// same in upper and lower case. In a value "#" and ";" begin a comment unless it is quoted, either
// way; there is no escape for a quote, "$" at the beginning asks for a variable even when quoted,
// and an empty value counts as none.
#ifndef VORN_LINUX_TEXT_INI_TEXT_H
#define VORN_LINUX_TEXT_INI_TEXT_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace vorn {

// A section's name.
class IniSection {
 public:
  static std::optional<IniSection> From(std::string_view text);
  const std::string& text() const { return text_; }

 private:
  explicit IniSection(std::string text) : text_(std::move(text)) {}
  std::string text_;
};

// A key.
class IniKey {
 public:
  static std::optional<IniKey> From(std::string_view text);
  const std::string& text() const { return text_; }

 private:
  explicit IniKey(std::string text) : text_(std::move(text)) {}
  std::string text_;
};

// A value.
class IniValue {
 public:
  static std::optional<IniValue> From(std::string_view text);
  static IniValue From(int number) { return IniValue(std::to_string(number)); }
  const std::string& text() const { return text_; }

  // As it stands in a file: in quotes where it needs them.
  std::string Rendered() const;

 private:
  explicit IniValue(std::string text) : text_(std::move(text)) {}
  std::string text_;
};

// A name as the reader compares it.
std::string FoldIniName(std::string_view name);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_INI_TEXT_H
