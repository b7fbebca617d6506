// Header values with parameters: `multipart/form-data; boundary="..."` (RFC 9110, 5.6.6).
#ifndef VORN_SERVER_HEADER_VALUE_H
#define VORN_SERVER_HEADER_VALUE_H

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace vorn::server {

struct HeaderValue {
  std::string value;                              // in lower case
  std::map<std::string, std::string> parameters;  // names in lower case; values as they are, unquoted
};

std::string_view TrimBlanks(std::string_view text);  // spaces and tabs, at both ends
std::string LowerAscii(std::string_view text);
bool EqualsIgnoringCase(std::string_view a, std::string_view b);  // of ASCII letters

// Calls `visit` for each non-empty element of a comma-separated list (RFC 9110, 5.6.1), without the blanks around it.
// Commas in quoted strings are not recognised.
void ForEachElement(std::string_view list, const std::function<void(std::string_view)>& visit);

// Returns nullopt for a value that does not follow the grammar or that gives a parameter twice.
std::optional<HeaderValue> ParseHeaderValue(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_HEADER_VALUE_H
