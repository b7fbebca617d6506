#include "header_value.h"

#include <algorithm>
#include <cstddef>

namespace vorn::server {
namespace {

constexpr std::string_view kTokenMarks = "!#$%&'*+-.^_`|~";

bool IsTokenCharacter(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
         kTokenMarks.find(c) != std::string_view::npos;
}

// Removes a token from the front of `rest` and returns it; empty if `rest` does not begin with one.
std::string_view TakeToken(std::string_view* rest) {
  const auto end = std::find_if_not(rest->begin(), rest->end(), IsTokenCharacter);
  const std::string_view token = rest->substr(0, static_cast<std::size_t>(end - rest->begin()));
  rest->remove_prefix(token.size());
  return token;
}

// Removes the quoted string at the front of `rest` and returns its content.
std::optional<std::string> TakeQuoted(std::string_view* rest) {
  std::string text;
  for (std::size_t i = 1; i < rest->size(); ++i) {
    char c = (*rest)[i];
    if (c == '"') {
      rest->remove_prefix(i + 1);
      return text;
    }
    if (c == '\\' && i + 1 < rest->size()) c = (*rest)[++i];
    text += c;
  }
  return std::nullopt;
}

std::optional<std::string> TakeParameterValue(std::string_view* rest) {
  if (!rest->empty() && rest->front() == '"') return TakeQuoted(rest);
  const std::string_view token = TakeToken(rest);
  if (token.empty()) return std::nullopt;
  return std::string(token);
}

// Removes `; name=value` from the front of `rest`.
bool TakeParameter(std::string_view* rest, HeaderValue* header) {
  if (rest->front() != ';') return false;
  *rest = TrimBlanks(rest->substr(1));
  const std::string name = LowerAscii(TakeToken(rest));
  if (name.empty() || rest->empty() || rest->front() != '=') return false;
  rest->remove_prefix(1);
  auto value = TakeParameterValue(rest);
  *rest = TrimBlanks(*rest);
  return value.has_value() && header->parameters.emplace(name, std::move(*value)).second;
}

}  // namespace

std::string_view TrimBlanks(std::string_view text) {
  const std::size_t begin = text.find_first_not_of(" \t");
  if (begin == std::string_view::npos) return {};
  return text.substr(begin, text.find_last_not_of(" \t") - begin + 1);
}

std::string LowerAscii(std::string_view text) {
  std::string lower(text);
  for (char& c : lower) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  }
  return lower;
}

bool EqualsIgnoringCase(std::string_view a, std::string_view b) {
  const auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; };
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [lower](char left, char right) { return lower(left) == lower(right); });
}

void ForEachElement(std::string_view list, const std::function<void(std::string_view)>& visit) {
  while (!list.empty()) {
    const std::size_t comma = std::min(list.find(','), list.size());
    const std::string_view element = TrimBlanks(list.substr(0, comma));
    if (!element.empty()) visit(element);
    list.remove_prefix(std::min(comma + 1, list.size()));
  }
}

std::optional<HeaderValue> ParseHeaderValue(std::string_view text) {
  std::string_view rest = TrimBlanks(text);
  const std::size_t end = std::min(rest.find(';'), rest.size());
  HeaderValue header{LowerAscii(TrimBlanks(rest.substr(0, end))), {}};
  rest.remove_prefix(end);
  while (!rest.empty()) {
    if (!TakeParameter(&rest, &header)) return std::nullopt;
  }
  return header;
}

}  // namespace vorn::server
