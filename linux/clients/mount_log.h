// The log lines of rpc.mountd(8) about mounts of NFSv3.
#ifndef VORN_LINUX_CLIENTS_MOUNT_LOG_H
#define VORN_LINUX_CLIENTS_MOUNT_LOG_H

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace vorn {

// A request to mount, as mountd of nfs-utils 2.6 logs it.
struct MountRequest {
  std::string address;  // in its usual form (HostAddress)
  std::string path;     // that the client asked for; it may contain any bytes
  std::string reason;   // why it was refused: "no_rule", "not_exported", "port" or "path"; empty: admitted
};

// Reads a message of mountd; nullopt for one about something else. The client chooses the path. The address comes
// before it and the reason is read from the end of the message, so that no path can look like either.
std::optional<MountRequest> ParseMountMessage(std::string_view message);

constexpr std::size_t kMostRefusals = 20;

// The requests of clients, by address.
struct MountLog {
  struct Refused {
    int count = 0;
    std::int64_t last = 0;  // in seconds since the epoch
  };
  std::map<std::string, std::int64_t> admitted;  // the time of the last admitted request

  // By address; then by path and reason, at most kMostRefusals for an address: a client chooses the paths.
  std::map<std::string, std::map<std::pair<std::string, std::string>, Refused>> refused;

  // Adds a request. The newest ones come first.
  void Add(const MountRequest& request, std::int64_t time);
};

// Reads the journal of this system: the messages of mountd of the last day, at most the newest 10,000. Reads nothing if
// there is no journal.
MountLog ReadMountLog();

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_MOUNT_LOG_H
