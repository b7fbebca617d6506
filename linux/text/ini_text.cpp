#include "ini_text.h"

#include <algorithm>

#include "ascii.h"

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

// Neither a name nor a value may be empty or contain a control character.
bool IsUnusable(std::string_view text) { return text.empty() || std::any_of(text.begin(), text.end(), IsControl); }

bool NeedsQuotes(std::string_view value) {
  return HasBlankEnds(value) || Has(value, "#;") || Has(value.substr(0, 1), "\"'") || value.back() == '\\';
}

}  // namespace

bool IniSectionRules::Accepts(std::string_view text) {
  return !IsUnusable(text) && !HasBlankEnds(text) && !Has(text, "]\"");
}

bool IniKeyRules::Accepts(std::string_view text) {
  if (IsUnusable(text) || HasBlankEnds(text) || Has(text, "=") || Has(text.substr(0, 1), "#;[")) return false;
  return LowerAscii(text) != "include";
}

bool IniValueRules::Accepts(std::string_view text) {
  if (IsUnusable(text) || text.front() == '$') return false;
  return !(NeedsQuotes(text) && Has(text, "\"") && Has(text, "'"));
}

IniValue NumberValue(int number) { return *IniValue::From(std::to_string(number)); }

IniValue SwitchValue(bool on) { return *IniValue::From(on ? "y" : "n"); }

std::string Rendered(const IniValue& value) {
  const std::string& text = value.text();
  if (!NeedsQuotes(text)) return text;
  const char quote = Has(text, "\"") ? '\'' : '"';
  return quote + text + quote;
}

}  // namespace vorn
