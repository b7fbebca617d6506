// The clients of an export, in the forms that exports(5) knows.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_CLIENT_H
#define VORN_LINUX_EXPORTS_EXPORTS_CLIENT_H

#include <sys/socket.h>

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// Accepts a host name, a pattern of host names, an IPv4 or IPv6 address, a network with a prefix length or a
// mask, a "@netgroup" and "*". Fails with kRefusedText and the reason for everything else: text at which
// exportfs(8) would stop or which it would skip, and forms that it accepts with a meaning that hardly anyone
// intends ("10" is 0.0.0.10, "0.0.0.0/0" is one address on most processors, "gss/krb5" is an old spelling of sec=).
Status CheckExportClient(std::string_view client);

// Returns the same text for two clients that exportfs(8) takes for one. It ignores the case of names, and it
// compares single hosts by their address: "10.1" is "10.0.0.1", "::1" is "0:0::1". The final dot of a host name
// has no meaning to the resolver. Names are not resolved here, so two names of one host have two keys.
std::string ExportClientKey(std::string_view client);

// The addresses that a client of an export stands for. Those that have the bits of `address` where `mask` has ones.
struct ExportNetwork {
  using Address = std::array<std::uint8_t, 16>;  // in network order; of IPv4 the first four

  int family = AF_UNSPEC;  // AF_INET or AF_INET6
  Address address{};
  Address mask{};

  int bits() const { return family == AF_INET ? 32 : 128; }
};

// Returns a mask whose first `length` bits are ones.
ExportNetwork::Address PrefixMask(int length);

// Returns the length of the prefix that a mask stands for; nullopt for a mask with gaps.
std::optional<int> PrefixLength(const ExportNetwork::Address& mask);

// Reads an address, or a network with a prefix length or a mask, as rpc.mountd(8) does, which accepts more than
// CheckExportClient() does, among it masks with gaps. Returns nullopt for every other client.
std::optional<ExportNetwork> ReadExportNetwork(std::string_view client);

// Whether the client is a network with a prefix of length 0, which rpc.mountd(8) takes for one address, or for 32 bits
// of IPv6, on most processors.
bool HasPrefixOfLengthZero(std::string_view client);

// Whether all addresses of `inner` are in the network.
bool Contains(const ExportNetwork& network, const ExportNetwork& inner);

// Returns the same text for two networks with the same addresses: "10.0.0.0/8".
std::string ExportNetworkKey(const ExportNetwork& network);

// Returns the same text for two networks with the same addresses, which exportfs(8) keeps as two clients:
// "10.0.0.0/8" and "10.1.0.0/255.0.0.0". For any other client it is ExportClientKey().
std::string ExportNetworkKey(std::string_view client);

// Whether exportfs(8) asks the resolver for `client`, and may keep it under another name.
bool IsExportHostName(std::string_view client);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_CLIENT_H
