// The log lines of rpc.svcgssd(8) about tickets that it refused.
#ifndef VORN_LINUX_CLIENTS_TICKET_LOG_H
#define VORN_LINUX_CLIENTS_TICKET_LOG_H

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace vorn {

// Reads why a ticket was refused from a message of svcgssd of nfs-utils 2.6 and 2.8; nullopt for a message about
// something else. The reason is that of the Kerberos library; it may contain the service's name in the client's ticket,
// which the client can choose.
std::optional<std::string> ParseTicketMessage(std::string_view message);

constexpr std::size_t kMostTicketReasons = 5;

// Refused tickets by reason, at most kMostTicketReasons. The daemon does not log whose tickets they were.
class TicketLog {
 public:
  struct Refused {
    int count = 0;
    std::int64_t last = 0;  // in seconds since the epoch
  };

  // Adds a message. The newest ones come first.
  void Add(std::string_view message, std::int64_t time);

  const std::map<std::string, Refused>& refused() const { return refused_; }

 private:
  std::map<std::string, Refused> refused_;
};

// Reads the journal of this system: the messages of svcgssd of the last hour.
TicketLog ReadTicketLog();

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_TICKET_LOG_H
