// The clients of a share, each with what it may do.
#ifndef VORN_LINUX_ACCESS_SHARE_CLIENTS_H
#define VORN_LINUX_ACCESS_SHARE_CLIENTS_H

#include <cstddef>
#include <string>
#include <vector>

#include "access.h"
#include "box.h"
#include "host_names.h"
#include "status.h"

namespace vorn {

// A client that is connected, or whose mount is recorded.
struct KnownClient {
  std::string client;   // an address in its usual form (HostAddress), or a host name
  std::string version;  // of NFS; empty if it is not known
  std::string state;    // as VORN::NFSClient
};

struct ShareClients {
  std::vector<VORN::ClientAccess> clients;  // of the page
  std::size_t total = 0;
};

// Answers as VORN::ExplainClients() says. `known` are in the order in which they are to be listed. Only the clients of
// the page are explained. Fails with ENOENT if there is no such share, and with kNoSuchUser or kNoSuchGroup.
Result<ShareClients> ExplainClients(Box& box, const NameService& names, const VORN::ClientsQuestion& question,
                                    const std::vector<KnownClient>& known);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_SHARE_CLIENTS_H
