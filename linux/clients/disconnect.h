// The end of a client's state.
#ifndef VORN_LINUX_CLIENTS_DISCONNECT_H
#define VORN_LINUX_CLIENTS_DISCONNECT_H

#include <cstdint>
#include <string>

#include "box.h"
#include "status.h"

namespace vorn {

// Ends the state of a client of NFSv4, and records that in the history. In a draft nothing is ended. Fails with ENOENT
// if there is no such client any more.
Status DisconnectClient(Box& box, std::uint64_t number, const std::string& client_id);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_DISCONNECT_H
