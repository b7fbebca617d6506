// The clients of a box, from what the kernel's server and rpc.mountd(8) know.
#ifndef VORN_LINUX_CLIENTS_CLIENT_LIST_H
#define VORN_LINUX_CLIENTS_CLIENT_LIST_H

#include <cstddef>
#include <string>
#include <vector>

#include "box.h"
#include "clients.h"
#include "mount_log.h"

namespace vorn {

struct ClientPage {
  std::vector<VORN::NFSClient> clients;
  std::size_t total = 0;  // of all pages
};

// Lists the clients as VORN::ListClients() says; `log` has the mounts of NFSv3 that were admitted and refused. The
// states of NFSv4 are counted for the clients of the page only.
Result<ClientPage> ListClients(Box& box, const MountLog& log, const std::string& filter, std::size_t offset,
                               std::size_t limit);

// Lists all clients in no particular order, without what the kernel keeps per client beyond its description: since when
// it is known, and its open files and locks.
Result<std::vector<VORN::NFSClient>> ListClientsWithoutStates(Box& box);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_CLIENT_LIST_H
