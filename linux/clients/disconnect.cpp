#include "disconnect.h"

#include "call_rights.h"
#include "kernel_clients.h"

namespace vorn {

Status DisconnectClient(Box& box, std::uint64_t number, const std::string& client_id) {
  const Result<std::string> folder = box.root().Locate(kKernelClients);
  if (!folder.ok()) return folder.status();
  const KernelClients clients(*folder);
  if (Status status = clients.Find(number, client_id); !status.ok()) return status;
  if (box.Rehearse(RehearsedAction::kDisconnect)) return {};
  if (Status status = CheckMayWrite("The client"); !status.ok()) return status;
  Status status = clients.Expire(number, client_id);
  box.NoteAction("disconnect", status);
  return status;
}

}  // namespace vorn
