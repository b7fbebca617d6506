#include "address_ranges.h"

#include <arpa/inet.h>

#include <algorithm>
#include <charconv>
#include <system_error>

#include "exports_client.h"

namespace vorn {
namespace {

int FamilyOf(const AddressBytes& address) { return address[0] == 4 ? AF_INET : AF_INET6; }
std::size_t SizeOf(const AddressBytes& address) { return address[0] == 4 ? 4 : 16; }

std::optional<AddressBytes> ReadAddress(const std::string& text) {
  AddressBytes address{};
  for (const std::uint8_t family : {std::uint8_t{4}, std::uint8_t{6}}) {
    address[0] = family;
    if (inet_pton(FamilyOf(address), text.c_str(), &address[1]) == 1) return address;
  }
  return std::nullopt;
}

AddressBytes Next(AddressBytes address) {
  for (std::size_t at = SizeOf(address); at > 0 && ++address[at] == 0; --at) {
  }
  return address;
}

AddressBytes Previous(AddressBytes address) {
  for (std::size_t at = SizeOf(address); at > 0 && address[at]-- == 0; --at) {
  }
  return address;
}

// Whether the network has addresses of its own at both ends: RFC 3021 says that two addresses are hosts.
bool HasEnds(const AddressRange& network) { return Next(network.first) < network.last; }

bool IsInside(const AddressRange& range, const AddressRange& network) {
  const bool is_same = range.first == network.first && range.last == network.last;
  return !is_same && network.first <= range.first && range.last <= network.last;
}

}  // namespace

std::optional<AddressRange> AddressRangeOf(const std::string& client) {
  const std::string key = ExportNetworkKey(client);  // "10.0.0.0/24"
  const std::size_t slash = key.find('/');
  const std::optional<AddressBytes> first = ReadAddress(key.substr(0, slash));
  if (!first) return std::nullopt;
  AddressRange range{*first, *first};
  std::size_t length = SizeOf(*first) * 8;
  if (slash != std::string::npos) {
    const auto [end, error] = std::from_chars(key.data() + slash + 1, key.data() + key.size(), length);
    if (error != std::errc() || end != key.data() + key.size() || length > SizeOf(*first) * 8) return std::nullopt;
  }
  for (std::size_t bit = length; bit < SizeOf(*first) * 8; ++bit) {
    std::uint8_t& byte = range.last[1 + bit / 8];
    byte = static_cast<std::uint8_t>(byte | (0x80 >> (bit % 8)));
  }
  return range;
}

void AddressRanges::Sort() {
  std::sort(ranges_.begin(), ranges_.end(),
            [](const AddressRange& a, const AddressRange& b) { return a.first < b.first; });
}

std::optional<AddressBytes> AddressRanges::FirstFree(const AddressRange& network, const AddressBytes& begin) const {
  const bool has_broadcast = network.first[0] == 4 && HasEnds(network);
  const AddressBytes last = has_broadcast ? Previous(network.last) : network.last;
  AddressBytes free = begin;
  for (const AddressRange& range : ranges_) {
    if (range.last < free || !IsInside(range, network)) continue;
    if (free < range.first) break;
    if (last <= range.last) return std::nullopt;
    free = Next(range.last);
  }
  return free;
}

AddressBytes FirstHostOf(const AddressRange& network) { return HasEnds(network) ? Next(network.first) : network.first; }

std::string TextOf(const AddressBytes& address) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  return inet_ntop(FamilyOf(address), &address[1], text.data(), text.size());
}

}  // namespace vorn
