#include "client_info.h"

#include <charconv>
#include <map>

#include "host_names.h"
#include "lines.h"

namespace vorn {
namespace {

template <typename Number>
std::optional<Number> NumberOf(std::string_view text) {
  Number number{};
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return number;
}

std::optional<char> ByteOf(std::string_view digits) {
  unsigned value = 0;
  const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value, 16);
  if (digits.size() != 2 || error != std::errc() || end != digits.data() + digits.size()) return std::nullopt;
  return static_cast<char>(value);
}

// The content of a string in quotation marks, in which the kernel escapes these marks, backslashes and everything that
// is not printable ASCII: "\x0a". Empty for a text of another form.
std::string Unquote(std::string_view text) {
  if (text.size() < 2 || text.front() != '"' || text.back() != '"') return "";
  text = text.substr(1, text.size() - 2);
  std::string content;
  for (std::size_t at = 0; at < text.size(); ++at) {
    const bool is_escape = text.substr(at, 2) == "\\x";
    const std::optional<char> byte = is_escape ? ByteOf(text.substr(at + 2, 2)) : std::nullopt;
    content.push_back(byte.value_or(text[at]));
    if (byte) at += 3;
  }
  return content;
}

// "10.0.0.1:871" or "[fd00::1]:871".
void ReadAddress(std::string_view text, ClientInfo* info) {
  const std::size_t colon = text.rfind(':');
  if (colon == std::string_view::npos) return;
  std::string_view host = text.substr(0, colon);
  if (host.size() > 2 && host.front() == '[' && host.back() == ']') host = host.substr(1, host.size() - 2);
  info->address = HostAddress(std::string(host)).value_or("");
  info->port = NumberOf<int>(text.substr(colon + 1)).value_or(0);
}

// The lines "key: value".
std::map<std::string_view, std::string_view> ValuesOf(std::string_view text) {
  std::map<std::string_view, std::string_view> lines;
  for (const std::string_view line : LinesOf(text)) {
    const std::size_t colon = line.find(": ");
    if (colon != std::string_view::npos) lines.emplace(line.substr(0, colon), line.substr(colon + 2));
  }
  return lines;
}

}  // namespace

ClientInfo ParseClientInfo(std::string_view text) {
  std::map<std::string_view, std::string_view> lines = ValuesOf(text);
  ClientInfo info;
  info.client_id = lines["clientid"];
  info.status = lines["status"];
  info.name = Unquote(lines["name"]);
  info.implementation = Unquote(lines["Implementation name"]);
  info.minor_version = NumberOf<int>(lines["minor version"]);
  info.seconds_from_renewal = NumberOf<std::int64_t>(lines["seconds from last renew"]);
  ReadAddress(Unquote(lines["address"]), &info);
  return info;
}

}  // namespace vorn
