#include "connections.h"

#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <optional>

#include "host_names.h"

namespace vorn {
namespace {

constexpr int kEstablished = 1;  // TCP_ESTABLISHED

// Removes the next line, or the next word of a line, from `text` and returns it.
std::string_view Next(std::string_view* text, char end) {
  if (end == ' ') text->remove_prefix(std::min(text->find_first_not_of(' '), text->size()));
  const std::string_view part = text->substr(0, text->find(end));
  text->remove_prefix(std::min(text->size(), part.size() + 1));
  return part;
}

std::optional<std::uint32_t> ReadHex(std::string_view digits) {
  std::uint32_t number = 0;
  const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number, 16);
  if (error != std::errc() || end != digits.data() + digits.size()) return std::nullopt;
  return number;
}

// The address of "0100007F": words of 32 bits, each as this machine reads the bytes of the address. Empty for a text of
// another form.
std::string ReadAddress(std::string_view digits) {
  std::array<unsigned char, sizeof(in6_addr)> bytes{};
  constexpr std::size_t kWordDigits = 8;
  const bool is_4 = digits.size() == kWordDigits;
  if (!is_4 && digits.size() != 4 * kWordDigits) return "";
  for (std::size_t word = 0; word < digits.size() / kWordDigits; ++word) {
    const std::optional<std::uint32_t> value = ReadHex(digits.substr(word * kWordDigits, kWordDigits));
    if (!value) return "";
    std::memcpy(&bytes[word * sizeof *value], &*value, sizeof *value);
  }
  std::array<char, INET6_ADDRSTRLEN> text{};
  inet_ntop(is_4 ? AF_INET : AF_INET6, bytes.data(), text.data(), text.size());
  return HostAddress(text.data()).value_or("");
}

}  // namespace

std::vector<Connection> ParseConnections(std::string_view text, int local_port) {
  std::vector<Connection> connections;
  while (!text.empty()) {
    std::string_view line = Next(&text, '\n');
    Next(&line, ' ');  // the number of the entry
    const std::string_view local = Next(&line, ' ');
    const std::string_view remote = Next(&line, ' ');
    const std::size_t colon = remote.find(':');
    if (ReadHex(Next(&line, ' ')).value_or(0) != kEstablished || colon == std::string_view::npos) continue;
    const auto port = static_cast<std::uint32_t>(local_port);
    if (ReadHex(local.substr(std::min(local.rfind(':'), local.size() - 1) + 1)) != port) continue;
    Connection connection{ReadAddress(remote.substr(0, colon)), 0};
    connection.port = static_cast<int>(ReadHex(remote.substr(colon + 1)).value_or(0));
    if (!connection.address.empty()) connections.push_back(std::move(connection));
  }
  return connections;
}

// An IPv6 address has colons, and a path may have some; the path begins with the first slash.
std::vector<RecordedMount> ParseRecordedMounts(std::string_view text) {
  std::vector<RecordedMount> mounts;
  while (!text.empty()) {
    const std::string_view line = Next(&text, '\n');
    const std::size_t path = line.find(":/");
    const std::size_t count = line.rfind(":0x");
    if (path == std::string_view::npos || path == 0 || count == std::string_view::npos || count <= path) continue;
    const std::string client(line.substr(0, path));
    mounts.push_back({HostAddress(client).value_or(client), std::string(line.substr(path + 1, count - path - 1))});
  }
  return mounts;
}

}  // namespace vorn
