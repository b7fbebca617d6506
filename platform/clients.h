// The clients of the NFS service: who is connected, who has mounted what, who was turned away. Our own addition to the
// contract: the API "VORN.Core.FileServ.NFS.Client" needs it. The operations are C++ functions with values that belong
// to the caller. Thread-safe. All strings are valid UTF-8; clients choose some of them.
#ifndef VORN_PLATFORM_CLIENTS_H
#define VORN_PLATFORM_CLIENTS_H

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace VORN {

// An export that a client uses.
struct ClientExport {
  std::string path;
  bool is_mounted = false;  // whether the server has recorded a mount of NFSv3 by this address

  // The clients of the export table whose rights the client has: "10.0.0.0/24". Empty if the server has asked for no
  // rights in this export for half an hour; then the bytes are not known either. Otherwise they are those of all
  // clients of the rule, counted since `since`; the counter begins anew when the server asks for the rights again.
  std::string rule;
  std::optional<std::uint64_t> bytes_read;
  std::optional<std::uint64_t> bytes_written;
  std::optional<std::int64_t> since;  // in seconds since the epoch
};

// Requests of a client that were turned away.
struct ClientRefusal {
  std::string path;                  // what the client asked for; empty if it is not known
  std::string reason;                // "no_rule", "not_exported", "port" or "path"
  std::string text;                  // a sentence that says so
  int count = 0;                     // 0: not known
  std::optional<std::int64_t> last;  // the time of the last request, in seconds since the epoch
};

// A client of NFSv4; or an address without one, for NFSv3, for a connection, and for refusals alone.
struct NFSClient {
  std::string address;
  std::string name;  // by which the client of NFSv4 calls itself, or the host name that it mounted with; may be empty
  std::string version;  // "3", "4.0", "4.1" or "4.2"; empty if it is not known

  // The state of a client of NFSv4: "confirmed", "unconfirmed", "courtesy" (its lease has expired, and nobody needs its
  // locks) or "expirable". Otherwise "connected" over TCP, "mounted" (a recorded mount without a connection) or
  // "refused".
  std::string state;

  std::optional<std::int64_t> since;  // of NFSv4: when the server got to know it; of NFSv3: its last accepted mount

  // The following are known of clients of NFSv4 only.
  std::optional<std::uint64_t> id;
  std::string client_id;
  std::string implementation;
  std::optional<std::int64_t> renewed;  // seconds since the client renewed its lease
  std::optional<std::uint64_t> open_files;
  std::optional<std::uint64_t> locks;
  std::optional<std::uint64_t> delegations;

  std::vector<ClientExport> exports;    // in the order of their paths
  std::vector<ClientRefusal> refusals;  // of the address, in the order of their paths; the newest of many
};

enum : int {
  kClientsFailed = -1,  // a failure other than the following one
  kClientsGone = -2,    // there is no such client any more
};

// Lists the clients whose address, name, version or paths contain `filter`, without regard to case, without the first
// `offset` of them and at most `limit`, in the order of their addresses. `total` receives the number of those that
// match. Returns 0, or kClientsFailed with the reason in the error facility (core.h). Takes no lock.
int ListClients(const std::string& filter, int offset, int limit, std::vector<NFSClient>* clients, int* total);

// Ends the state of a client of NFSv4: the server forgets its open files, locks and sessions. A client that lives gets
// them again if nobody else has them meanwhile. `client_id` is that of the list: the server may give the number `id` to
// another client after a restart. Waits until the server has done so. In a rehearsal nothing is done. Returns 0 or one
// of the values above.
int DisconnectClient(std::uint64_t id, const std::string& client_id);

}  // namespace VORN

#endif  // VORN_PLATFORM_CLIENTS_H
