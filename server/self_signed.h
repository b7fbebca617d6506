// Makes certificates that the server signs itself.
#ifndef VORN_SERVER_SELF_SIGNED_H
#define VORN_SERVER_SELF_SIGNED_H

#include <optional>
#include <string>
#include <vector>

namespace vorn::server {

// Browsers accept no server certificate that is valid for longer.
constexpr int kSelfSignedDays = 397;

// Returns a new ECDSA key on P-256 and a certificate of it, both in PEM. The certificate is for `names`: host names and
// IP addresses without brackets; the first is its subject. It is valid from one day ago. Returns std::nullopt, with the
// reason in `error`, on failure.
std::optional<std::string> MakeSelfSigned(const std::vector<std::string>& names, std::string* error);

// The names by which this machine may be reached: its host name, "localhost", and the addresses of its interfaces
// except those of a link.
std::vector<std::string> NamesOfThisMachine();

}  // namespace vorn::server

#endif  // VORN_SERVER_SELF_SIGNED_H
