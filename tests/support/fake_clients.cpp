// The clients of the fake platform.
#include "clients.h"
#include "fake_platform.h"

namespace VORN {

int ListClients(const std::string& filter, int offset, int limit, std::vector<NFSClient>* clients, int* total) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string arguments = "'" + filter + "' " + std::to_string(offset) + " " + std::to_string(limit);
  if (platform.Fails("ListClients", arguments)) return platform.FailureResult("ListClients");
  *clients = {platform.client};
  *total = 1;
  return 0;
}

int DisconnectClient(std::uint64_t id, const std::string& client_id) {
  FakePlatform& platform = FakePlatform::Current();
  const bool fails = platform.Fails("DisconnectClient", std::to_string(id) + " '" + client_id + "'");
  return fails ? platform.FailureResult("DisconnectClient") : 0;
}

}  // namespace VORN
