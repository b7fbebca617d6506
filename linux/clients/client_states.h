// The open files and locks of a client of NFSv4: the file "states" of a client below /proc/fs/nfsd/clients.
#ifndef VORN_LINUX_CLIENTS_CLIENT_STATES_H
#define VORN_LINUX_CLIENTS_CLIENT_STATES_H

#include <cstdint>
#include <string>
#include <string_view>

namespace vorn {

struct ClientStates {
  std::uint64_t open_files = 0;   // different files
  std::uint64_t locks = 0;        // one for each file and owner, whatever ranges the owner has locked
  std::uint64_t delegations = 0;  // one for each file
};

// Counts the states in the text of the file. `client_id` is that of the client (ClientInfo).
//
// The text contains the names of files as they are, with line breaks and quotation marks, so that a name can look like
// the line of another state. Nothing behind the name is read, each state id counts once, and a state id must contain
// the client's id.
ClientStates CountClientStates(std::string_view text, const std::string& client_id);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_CLIENT_STATES_H
