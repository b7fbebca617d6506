#include "access.h"

#include <cerrno>
#include <utility>

#include "client_list.h"
#include "current_box.h"
#include "error.h"
#include "explain.h"
#include "share_clients.h"

namespace {

int FailureOf(int code) {
  if (code == ENOENT) return VORN::kAccessNoShare;
  if (code == vorn::kNoSuchUser) return VORN::kAccessNoUser;
  return code == vorn::kNoSuchGroup ? VORN::kAccessNoGroup : VORN::kAccessFailed;
}

// The clients that are connected or have a recorded mount.
vorn::Result<std::vector<vorn::KnownClient>> ReadKnownClients(vorn::Box& box) {
  const vorn::Result<std::vector<VORN::NFSClient>> clients = vorn::ListClientsWithoutStates(box);
  if (!clients.ok()) return clients.status();
  std::vector<vorn::KnownClient> known;
  for (const VORN::NFSClient& client : *clients) {
    const std::string& host = client.address.empty() ? client.name : client.address;
    if (client.state != "refused" && !host.empty()) known.push_back({host, client.version, client.state});
  }
  return known;
}

}  // namespace

namespace VORN {

int ExplainAccess(const AccessQuestion& question, AccessAnswer* answer) {
  std::vector<AccessAnswer> answers;
  const int explained = ExplainAccesses(question, {question.share}, &answers);
  if (explained == 0) *answer = std::move(answers.front());
  return explained;
}

int ExplainAccesses(const AccessQuestion& question, const std::vector<std::string>& shares,
                    std::vector<AccessAnswer>* answers) {
  vorn::Result<std::vector<AccessAnswer>> explained =
      vorn::ExplainAccesses(vorn::CurrentBox(), vorn::NameService::OfSystem(), question, shares);
  if (vorn::ToResult(explained.status()) != 0) return FailureOf(explained.status().code());
  *answers = std::move(*explained);
  return 0;
}

int ExplainClients(const ClientsQuestion& question, std::vector<ClientAccess>* clients, int* total) {
  vorn::Box& box = vorn::CurrentBox();
  const vorn::Result<std::vector<vorn::KnownClient>> known = ReadKnownClients(box);
  if (vorn::ToResult(known.status()) != 0) return kAccessFailed;
  vorn::Result<vorn::ShareClients> explained =
      vorn::ExplainClients(box, vorn::NameService::OfSystem(), question, *known);
  if (vorn::ToResult(explained.status()) != 0) return FailureOf(explained.status().code());
  *clients = std::move(explained->clients);
  *total = static_cast<int>(explained->total);
  return 0;
}

}  // namespace VORN
