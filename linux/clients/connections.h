// The TCP connections of clients to the NFS server, and the mounts of NFSv3 that rpc.mountd(8) has recorded.
#ifndef VORN_LINUX_CLIENTS_CONNECTIONS_H
#define VORN_LINUX_CLIENTS_CONNECTIONS_H

#include <string>
#include <string_view>
#include <vector>

namespace vorn {

constexpr char kTCPConnections[] = "/proc/net/tcp";
constexpr char kTCP6Connections[] = "/proc/net/tcp6";
constexpr char kRecordedMounts[] = "/var/lib/nfs/rmtab";

struct Connection {
  std::string address;  // of the client, in its usual form (HostAddress)
  int port = 0;         // of the client
};

// Returns the established connections to the local port in the text of /proc/net/tcp or tcp6 (proc(5)).
std::vector<Connection> ParseConnections(std::string_view text, int local_port);

struct RecordedMount {
  std::string client;  // an address in its usual form, or a host name
  std::string path;    // what the client asked for
};

// Reads the text of rmtab: "10.0.0.1:/srv/data:0x00000001". A line of another form is ignored. mountd adds a line when
// it admits a client, and removes it when the client says that it has unmounted, which a client that dies does not.
std::vector<RecordedMount> ParseRecordedMounts(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_CONNECTIONS_H
