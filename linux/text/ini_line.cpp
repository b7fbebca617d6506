#include "ini_line.h"

#include <algorithm>

#include "ascii.h"

namespace vorn {
namespace {

// The reader distinguishes blanks (isblank(3)) from white space (isspace(3)).
bool IsBlank(char c) { return c == ' ' || c == '\t'; }
bool IsSpace(char c) { return c == ' ' || (c >= '\t' && c <= '\r'); }

constexpr std::size_t kNone = std::string_view::npos;

template <typename Is>
std::string_view TrimLeft(std::string_view text, Is is_trimmed) {
  const auto begin = std::find_if_not(text.begin(), text.end(), is_trimmed);
  return text.substr(static_cast<std::size_t>(begin - text.begin()));
}

template <typename Is>
std::string_view TrimRight(std::string_view text, Is is_trimmed) {
  const auto end = std::find_if_not(text.rbegin(), text.rend(), is_trimmed);
  return text.substr(0, static_cast<std::size_t>(text.rend() - end));
}

std::string_view BeforeComment(std::string_view text) {
  const auto end = std::find_if(text.begin(), text.end(), [](char c) { return c == '#' || c == ';'; });
  return text.substr(0, static_cast<std::size_t>(end - text.begin()));
}

IniLine ReadSection(std::string_view line) {
  IniLine result;
  const std::size_t end = line.find(']');
  result.kind = end == kNone ? IniLine::Kind::kBadSection : IniLine::Kind::kSection;
  std::string_view name = TrimLeft(line.substr(1, end == kNone ? kNone : end - 1), IsBlank);
  const std::size_t quote = name.find('"');
  if (quote != kNone) {
    const std::string_view rest = name.substr(quote + 1);
    const std::size_t close = rest.find('"');
    if (close != kNone) result.argument = rest.substr(0, close);
    name = name.substr(0, quote);
  }
  result.name = TrimRight(name, IsBlank);
  return result;
}

// Finds the value that begins at or behind `begin`.
void ReadValue(std::string_view line, std::size_t begin, IniLine* result) {
  const std::string_view text = TrimLeft(line.substr(begin), IsBlank);
  result->value_begin = result->value_end = line.size() - text.size();
  if (text.empty()) return;
  if (text.front() == '"' || text.front() == '\'') {
    const std::size_t close = text.find(text.front(), 1);
    if (close == kNone) return;
    result->value = text.substr(1, close - 1);
    result->value_end += close + 1;
    return;
  }
  const std::string_view value = BeforeComment(text);
  // The reader never trims the first character: where lines end by "\r\n", an empty value reads as "\r".
  result->value = value.substr(0, std::max(TrimRight(value, IsSpace).size(), std::min(value.size(), std::size_t{1})));
  result->value_end += result->value.size();
}

bool IsInclude(std::string_view name) {
  constexpr std::string_view kInclude = "include";
  return name.size() == kInclude.size() && LowerAscii(name) == kInclude;
}

IniLine ReadAssignment(std::string_view line, std::size_t begin) {
  IniLine result;
  const std::size_t equals = line.find('=', begin);
  if (equals == kNone) return result;
  result.name = TrimRight(line.substr(begin, equals - begin), IsBlank);
  if (result.name.empty()) return result;
  result.kind = IsInclude(result.name) ? IniLine::Kind::kInclude : IniLine::Kind::kAssignment;
  ReadValue(line, equals + 1, &result);
  return result;
}

}  // namespace

IniLineExtent FirstIniLine(std::string_view text) {
  int line_feeds = 0;
  for (std::size_t at = 0; (at = text.find('\n', at)) != kNone; ++at) {
    ++line_feeds;
    if (at == 0 || text[at - 1] != '\\') return {at + 1, line_feeds};
  }
  return {};
}

std::string JoinIniLine(std::string_view line) {
  std::string joined(line);
  for (std::size_t at = 0; (at = joined.find("\\\n", at)) != kNone;) joined.replace(at, 2, "  ");
  return joined;
}

IniLine ReadIniLine(std::string_view line) {
  line.remove_suffix(1);  // its line feed
  const std::size_t begin = line.size() - TrimLeft(line, IsSpace).size();
  if (begin == line.size() || line[begin] == '#' || line[begin] == ';') return {};
  if (line[begin] == '[') return ReadSection(line.substr(begin));
  return ReadAssignment(line, begin);
}

}  // namespace vorn
