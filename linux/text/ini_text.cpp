#include "ini_text.h"

#include <algorithm>

namespace vorn {
namespace {

constexpr std::string_view kBlanks = " \t";

bool Has(std::string_view text, std::string_view characters) {
  return text.find_first_of(characters) != std::string_view::npos;
}

bool IsControl(char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7f; }

bool HasBlankEnds(std::string_view text) {
  return Has(kBlanks, text.substr(0, 1)) || Has(kBlanks, text.substr(text.size() - 1));
}

// What no name and no value may be or have.
bool IsUnusable(std::string_view text) { return text.empty() || std::any_of(text.begin(), text.end(), IsControl); }

bool NeedsQuotes(std::string_view value) {
  return HasBlankEnds(value) || Has(value, "#;") || Has(value.substr(0, 1), "\"'") || value.back() == '\\';
}

}  // namespace

std::optional<IniSection> IniSection::From(std::string_view text) {
  if (IsUnusable(text) || HasBlankEnds(text) || Has(text, "]\"")) return std::nullopt;
  return IniSection(std::string(text));
}

std::optional<IniKey> IniKey::From(std::string_view text) {
  if (IsUnusable(text) || HasBlankEnds(text) || Has(text, "=") || Has(text.substr(0, 1), "#;[")) return std::nullopt;
  if (FoldIniName(text) == "include") return std::nullopt;  // the reader's own word
  return IniKey(std::string(text));
}

std::optional<IniValue> IniValue::From(std::string_view text) {
  if (IsUnusable(text) || text.front() == '$') return std::nullopt;
  if (NeedsQuotes(text) && Has(text, "\"") && Has(text, "'")) return std::nullopt;
  return IniValue(std::string(text));
}

std::string IniValue::Rendered() const {
  if (!NeedsQuotes(text_)) return text_;
  const char quote = Has(text_, "\"") ? '\'' : '"';
  return quote + text_ + quote;
}

std::string FoldIniName(std::string_view name) {
  std::string folded(name);
  // ASCII only, whatever the locale: as the reader has it.
  const auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; };
  std::transform(folded.begin(), folded.end(), folded.begin(), lower);
  return folded;
}

}  // namespace vorn
