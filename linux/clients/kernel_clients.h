// The clients of NFSv4 that the kernel's server knows: the folder /proc/fs/nfsd/clients (Linux 5.3 and later).
#ifndef VORN_LINUX_CLIENTS_KERNEL_CLIENTS_H
#define VORN_LINUX_CLIENTS_KERNEL_CLIENTS_H

#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "client_info.h"
#include "client_states.h"
#include "file_descriptor.h"
#include "status.h"

namespace vorn {

constexpr char kKernelClients[] = "/proc/fs/nfsd/clients";

struct KernelClient {
  std::uint64_t number = 0;  // the name of its folder; a server that starts again may give it to another client
  ClientInfo info;
};

class KernelClients {
 public:
  // `folder` is kKernelClients on a box.
  explicit KernelClients(std::string folder) : folder_(std::move(folder)) {}

  // Returns the clients in the order of their numbers; none if there is no such folder. A client that leaves meanwhile
  // is not among them.
  Result<std::vector<KernelClient>> List() const;

  // Counts the client's states; nullopt if the client has left, or they are more than 64 MiB.
  std::optional<ClientStates> StatesOf(const KernelClient& client) const;

  // Returns when the server got to know the client, in seconds since the epoch; nullopt if the client has left.
  std::optional<std::int64_t> SinceOf(const KernelClient& client) const;

  // Succeeds if there is a client with this number and client id. Otherwise fails with ENOENT.
  Status Find(std::uint64_t number, const std::string& client_id) const;

  // Ends the state of this client: its open files, locks and sessions. Waits until the kernel has done so. Fails with
  // ENOENT if there is no such client any more.
  Status Expire(std::uint64_t number, const std::string& client_id) const;

 private:
  // Opens the folder of this client. It belongs to the client for ever: another client with the same number has
  // another folder.
  Result<FileDescriptor> Open(std::uint64_t number, const std::string& client_id) const;

  std::string folder_;
};

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_KERNEL_CLIENTS_H
