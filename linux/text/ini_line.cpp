#include "ini_line.h"

#include <algorithm>

#include "ascii.h"

namespace vorn {
namespace {

// The reader distinguishes blanks (isblank(3)) from white space (isspace(3)).
constexpr std::string_view kBlank = " \t";
constexpr std::string_view kSpace = " \t\n\v\f\r";

constexpr std::size_t kNone = std::string_view::npos;

std::string_view TrimLeft(std::string_view text, std::string_view characters) {
  const std::size_t begin = text.find_first_not_of(characters);
  return begin == kNone ? text.substr(text.size()) : text.substr(begin);
}

std::string_view TrimRight(std::string_view text, std::string_view characters) {
  return text.substr(0, text.find_last_not_of(characters) + 1);
}

IniLine ReadSection(std::string_view line) {
  IniLine result;
  const std::size_t end = line.find(']');
  result.kind = end == kNone ? IniLine::Kind::kBadSection : IniLine::Kind::kSection;
  std::string_view name = TrimLeft(line.substr(1, end == kNone ? kNone : end - 1), kBlank);
  const std::size_t quote = name.find('"');
  if (quote != kNone) {
    const std::string_view rest = name.substr(quote + 1);
    const std::size_t close = rest.find('"');
    if (close != kNone) result.argument = rest.substr(0, close);
    name = name.substr(0, quote);
  }
  result.name = TrimRight(name, kBlank);
  return result;
}

// Finds the value that begins at or behind `begin`.
void ReadValue(std::string_view line, std::size_t begin, IniLine* result) {
  const std::string_view text = TrimLeft(line.substr(begin), kBlank);
  result->value_begin = result->value_end = line.size() - text.size();
  if (text.empty()) return;
  if (text.front() == '"' || text.front() == '\'') {
    const std::size_t close = text.find(text.front(), 1);
    if (close == kNone) return;
    result->value = text.substr(1, close - 1);
    result->value_end += close + 1;
    return;
  }
  const std::string_view value = text.substr(0, text.find_first_of("#;"));
  // The reader never trims the first character: where lines end by "\r\n", an empty value reads as "\r".
  result->value = value.substr(0, std::max(TrimRight(value, kSpace).size(), std::min(value.size(), std::size_t{1})));
  result->value_end += result->value.size();
}

IniLine ReadAssignment(std::string_view line, std::size_t begin) {
  IniLine result;
  const std::size_t equals = line.find('=', begin);
  if (equals == kNone) return result;
  result.name = TrimRight(line.substr(begin, equals - begin), kBlank);
  if (result.name.empty()) return result;
  result.kind = LowerAscii(result.name) == "include" ? IniLine::Kind::kInclude : IniLine::Kind::kAssignment;
  ReadValue(line, equals + 1, &result);
  return result;
}

}  // namespace

std::size_t IniLineLength(std::string_view text) {
  for (std::size_t at = 0; (at = text.find('\n', at)) != kNone; ++at) {
    if (at == 0 || text[at - 1] != '\\') return at + 1;
  }
  return 0;
}

std::string JoinIniLine(std::string_view line) {
  std::string joined(line);
  for (std::size_t at = 0; (at = joined.find("\\\n", at)) != kNone;) joined.replace(at, 2, "  ");
  return joined;
}

IniLine ReadIniLine(std::string_view line) {
  line.remove_suffix(1);  // its line feed
  const std::size_t begin = line.find_first_not_of(kSpace);
  if (begin == kNone || line[begin] == '#' || line[begin] == ';') return {};
  if (line[begin] == '[') return ReadSection(line.substr(begin));
  return ReadAssignment(line, begin);
}

}  // namespace vorn
