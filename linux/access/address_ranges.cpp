#include "address_ranges.h"

#include <arpa/inet.h>

#include <algorithm>

#include "exports_client.h"

namespace vorn {
namespace {

int FamilyOf(const AddressBytes& address) { return address[0] == 4 ? AF_INET : AF_INET6; }
std::size_t SizeOf(const AddressBytes& address) { return address[0] == 4 ? 4 : 16; }

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
  const auto network = ReadExportNetwork(client);
  if (!network || !PrefixLength(network->mask)) return std::nullopt;
  AddressRange range{};
  range.first[0] = range.last[0] = network->family == AF_INET ? 4 : 6;
  for (std::size_t at = 0; at < SizeOf(range.first); ++at) {
    const std::uint8_t mask = network->mask[at];
    range.first[1 + at] = static_cast<std::uint8_t>(network->address[at] & mask);
    range.last[1 + at] = static_cast<std::uint8_t>(network->address[at] | ~mask);
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
