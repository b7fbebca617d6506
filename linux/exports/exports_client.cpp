#include "exports_client.h"

#include <arpa/inet.h>
#include <netdb.h>
#include <netinet/in.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <optional>

#include "ascii.h"
#include "exports_text.h"

namespace vorn {
namespace {

constexpr std::size_t kLongestName = 253;  // RFC 1035, without the final dot
constexpr std::size_t kLongestLabel = 63;
// rpc.mountd(8) reads the table that exportfs(8) writes, where every option is spelled out, and stops
// at a client that exceeds kLongestExportClient there.
constexpr std::size_t kLongestClient = kLongestName + 1;

bool IsDigit(char c) { return c >= '0' && c <= '9'; }
bool IsLetter(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); }
// RFC 1123 does not allow the underscore in a host name, but it is common.
bool IsNameCharacter(char c) { return IsLetter(c) || IsDigit(c) || c == '-' || c == '_'; }

Status Refuse(std::string_view client, const std::string& why) {
  return Status::Failure(kRefusedText, "export client \"" + std::string(client) + "\": " + why);
}

using Address = ExportNetwork::Address;

// A network of one address.
ExportNetwork SingleAddress(int family) {
  ExportNetwork network;
  network.family = family;
  network.mask = PrefixMask(network.bits());
  return network;
}

std::optional<ExportNetwork> ReadAddress(std::string_view text) {
  const std::string address_text(text);
  if (text.find('\0') != std::string_view::npos) return std::nullopt;
  for (const int family : {AF_INET, AF_INET6}) {
    ExportNetwork network = SingleAddress(family);
    if (inet_pton(family, address_text.c_str(), network.address.data()) == 1) return network;
  }
  return std::nullopt;
}

// rpc.mountd(8) shifts a word of 32 bits by 32 for a prefix of length 0. Most processors shift by 0 instead, so that
// the prefix has 32 bits.
#if defined(__arm__) || defined(__powerpc__) || defined(__s390x__)
constexpr int kLengthZero = 0;
#else
constexpr int kLengthZero = 32;
#endif

// Reads the length of a prefix as strtoul(3) does, with which rpc.mountd(8) reads it: "08" is 8, and "" is 0.
std::optional<Address> ReadPrefixMask(const std::string& text, int bits) {
  char* end = nullptr;
  const unsigned long length = std::strtoul(text.c_str(), &end, 10);
  if (*end != '\0' || length > static_cast<unsigned long>(bits)) return std::nullopt;
  return PrefixMask(length == 0 ? kLengthZero : static_cast<int>(length));
}

bool IsNumber(std::string_view text) { return !text.empty() && std::all_of(text.begin(), text.end(), IsDigit); }

// Accepts less than rpc.mountd(8) does: only spellings that leave no doubt about what is meant.
Status CheckNetwork(std::string_view client) {
  const std::size_t slash = client.find('/');
  const std::string_view size = client.substr(slash + 1);
  if (!ReadAddress(client.substr(0, slash))) return Refuse(client, "what stands before \"/\" is no address");
  if (HasPrefixOfLengthZero(client)) {
    return Refuse(client,
                  "rpc.mountd does not take a prefix of length 0 for all addresses; \"*\" is every client, "
                  "\"0.0.0.0/0.0.0.0\" is all of IPv4, and \"::/::\" is all of IPv6");
  }
  const auto network = ReadExportNetwork(client);
  const bool is_clear = IsNumber(size) ? size.front() != '0' : ReadAddress(size).has_value();
  if (!network || !is_clear || !PrefixLength(network->mask)) {
    return Refuse(client, "what follows \"/\" is no prefix length and no mask of this network");
  }
  return {};
}

Status CheckNetgroup(std::string_view client) {
  const auto allowed = [](char c) { return IsNameCharacter(c) || c == '.' || c == '+'; };
  if (client.size() < 2 || !std::all_of(client.begin() + 1, client.end(), allowed)) {
    return Refuse(client, "no name of a netgroup");
  }
  return {};
}

// Returns the length of a set of characters such as "[a-z0]" at the beginning of `text`; 0 if it is not well formed.
std::size_t SetLength(std::string_view text) {
  std::size_t at = 1;
  if (at < text.size() && text[at] == '^') ++at;
  const std::size_t first = at;
  while (at < text.size() && (IsNameCharacter(text[at]) || text[at] == '.')) ++at;
  return at > first && at < text.size() && text[at] == ']' ? at + 1 : 0;
}

Status CheckPattern(std::string_view client) {
  for (std::size_t at = 0; at < client.size(); ++at) {
    const char c = client[at];
    if (IsNameCharacter(c) || c == '.' || c == '*' || c == '?') continue;
    const std::size_t length = c == '[' ? SetLength(client.substr(at)) : 0;
    if (client.substr(at, 2) == "[!") return Refuse(client, "rpc.mountd negates a set of characters with \"[^\" only");
    if (length == 0) return Refuse(client, c == '[' ? "a bracket without its partner" : "no pattern of host names");
    at += length - 1;
  }
  return {};
}

std::string_view WithoutFinalDot(std::string_view name) {
  if (name.size() > 1 && name.back() == '.') name.remove_suffix(1);
  return name;
}

Status CheckHostName(std::string_view client) {
  const std::string_view name = WithoutFinalDot(client);
  if (name.size() > kLongestName) return Refuse(client, "too long");
  std::string_view label;
  for (std::size_t begin = 0; begin <= name.size(); begin += label.size() + 1) {
    label = name.substr(begin, name.find('.', begin) - begin);
    const bool outer_hyphen = !label.empty() && (label.front() == '-' || label.back() == '-');
    if (label.empty() || label.size() > kLongestLabel || outer_hyphen ||
        !std::all_of(label.begin(), label.end(), IsNameCharacter)) {
      return Refuse(client, "neither a host name nor an address");
    }
  }
  in_addr address{};
  const bool like_address = std::all_of(label.begin(), label.end(), IsDigit);
  if (like_address || inet_aton(std::string(client).c_str(), &address) != 0) {
    return Refuse(client, "not a whole address");
  }
  return {};
}

bool IsPattern(std::string_view client) { return client.find_first_of("*?[") != std::string_view::npos; }

std::string AddressText(int family, const Address& address) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  return inet_ntop(family, address.data(), text.data(), text.size());
}

struct FreeAddresses {
  void operator()(addrinfo* list) const { freeaddrinfo(list); }
};

// The address that getaddrinfo(3), which exportfs(8) asks, sees in a text without any look-up: also "10.1",
// "0xa.0.0.1", "fe80::1%lo". nullopt for a name.
std::optional<std::string> NumericHost(std::string_view client) {
  const bool may_be_number = !client.empty() && (IsDigit(client[0]) || client.find(':') != std::string_view::npos);
  if (!may_be_number || client.find('\0') != std::string_view::npos) return std::nullopt;
  if (const auto one = ReadAddress(client))
    return AddressText(one->family, one->address);  // the usual spelling, in less time
  addrinfo hints{};
  hints.ai_flags = AI_NUMERICHOST;
  addrinfo* found = nullptr;
  if (getaddrinfo(std::string(client).c_str(), nullptr, &hints, &found) != 0) return std::nullopt;
  const std::unique_ptr<addrinfo, FreeAddresses> owner(found);
  std::array<char, NI_MAXHOST> text{};
  const int error =
      getnameinfo(found->ai_addr, found->ai_addrlen, text.data(), text.size(), nullptr, 0, NI_NUMERICHOST);
  return error == 0 ? std::optional<std::string>(text.data()) : std::nullopt;
}

}  // namespace

Status CheckExportClient(std::string_view client) {
  if (client.empty()) return Refuse(client, "an empty client would admit everybody; \"*\" says so");
  if (client.size() > kLongestClient) return Refuse(client.substr(0, 40), "too long");
  if (client.front() == '@') return CheckNetgroup(client);
  if (client.substr(0, 4) == "gss/") return Refuse(client, "obsolete; name the security flavours instead");
  if (client.find('/') != std::string_view::npos) return CheckNetwork(client);
  if (ReadAddress(client)) return {};
  // A word beginning with "-" sets default options for the clients after it.
  if (client.front() == '-') return Refuse(client, "begins with a hyphen");
  return IsPattern(client) ? CheckPattern(client) : CheckHostName(client);
}

std::string ExportClientKey(std::string_view client) {
  if (const auto address = NumericHost(client)) return *address;
  return LowerAscii(IsExportHostName(client) ? WithoutFinalDot(client) : client);
}

ExportNetwork::Address PrefixMask(int length) {
  Address mask{};
  for (int bit = 0; bit < length; ++bit) {
    auto& byte = mask[static_cast<std::size_t>(bit / 8)];
    byte = static_cast<std::uint8_t>(byte | (0x80 >> (bit % 8)));
  }
  return mask;
}

std::optional<int> PrefixLength(const Address& mask) {
  int ones = 0;
  for (const std::uint8_t byte : mask) ones += __builtin_popcount(byte);
  return mask == PrefixMask(ones) ? std::optional(ones) : std::nullopt;
}

std::optional<ExportNetwork> ReadExportNetwork(std::string_view client) {
  const std::size_t slash = client.find('/');
  auto network = ReadAddress(client.substr(0, slash));
  if (!network || slash == std::string_view::npos) return network;
  const std::string size(client.substr(slash + 1));
  if (size.find(network->family == AF_INET ? '.' : ':') == std::string::npos) {
    const auto mask = ReadPrefixMask(size, network->bits());
    if (!mask) return std::nullopt;
    network->mask = *mask;
    return network;
  }
  const auto mask = ReadAddress(size);
  if (!mask || mask->family != network->family) return std::nullopt;
  network->mask = mask->address;
  return network;
}

bool HasPrefixOfLengthZero(std::string_view client) {
  const std::size_t slash = client.find('/');
  return slash != std::string_view::npos && ReadAddress(client.substr(0, slash)) &&
         client.find_first_not_of('0', slash + 1) == std::string_view::npos;
}

bool Contains(const ExportNetwork& network, const ExportNetwork& inner) {
  if (network.family != inner.family) return false;
  for (std::size_t at = 0; at < network.mask.size(); ++at) {
    const int mask = network.mask[at];
    if ((mask & ~inner.mask[at]) != 0 || ((network.address[at] ^ inner.address[at]) & mask) != 0) return false;
  }
  return true;
}

std::string ExportNetworkKey(const ExportNetwork& network) {
  Address address = network.address;
  for (std::size_t at = 0; at < address.size(); ++at) {
    address[at] = static_cast<std::uint8_t>(address[at] & network.mask[at]);
  }
  const auto length = PrefixLength(network.mask);
  return AddressText(network.family, address) + "/" +
         (length ? std::to_string(*length) : AddressText(network.family, network.mask));
}

std::string ExportNetworkKey(std::string_view client) {
  const auto network = ReadExportNetwork(client);
  return network ? ExportNetworkKey(*network) : ExportClientKey(client);
}

bool IsExportHostName(std::string_view client) {
  return !client.empty() && client.front() != '@' && client.find('/') == std::string_view::npos && !IsPattern(client) &&
         !ReadAddress(client);
}

}  // namespace vorn
