// The description of a client of NFSv4 by the kernel's server: the file "info" of a client below /proc/fs/nfsd/clients.
#ifndef VORN_LINUX_CLIENTS_CLIENT_INFO_H
#define VORN_LINUX_CLIENTS_CLIENT_INFO_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace vorn {

// Members that the text does not have are empty. `name` and `implementation` are chosen by the client and may contain
// any bytes.
struct ClientInfo {
  std::string client_id;  // "0x6d077c99675dd2b3": the boot time of the server, and a number (RFC 7530, 3.3.3)
  std::string address;    // in its usual form (HostAddress)
  int port = 0;
  std::string status;  // "confirmed", "unconfirmed", "courtesy" or "expirable"
  std::string name;    // by which the client is known to the server across reboots (RFC 8881, 2.4)
  std::optional<int> minor_version;
  std::optional<std::int64_t> seconds_from_renewal;
  std::string implementation;
};

// Reads the text of the file. A line that is not understood is ignored, and of a repeated one the first counts.
ClientInfo ParseClientInfo(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_CLIENT_INFO_H
