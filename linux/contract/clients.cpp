#include "clients.h"

#include <cerrno>
#include <utility>

#include "client_list.h"
#include "current_box.h"
#include "disconnect.h"
#include "error.h"

namespace VORN {

int ListClients(const std::string& filter, int offset, int limit, std::vector<NFSClient>* clients, int* total) {
  vorn::Box& box = vorn::CurrentBox();
  const vorn::MountLog log =
      box.root().is_box() ? vorn::ReadMountLog() : vorn::MountLog();  // the journal is this box's
  vorn::Result<vorn::ClientPage> page =
      vorn::ListClients(box, log, filter, static_cast<std::size_t>(offset), static_cast<std::size_t>(limit));
  if (vorn::ToResult(page.status()) != 0) return kClientsFailed;
  *clients = std::move(page->clients);
  *total = static_cast<int>(page->total);
  return 0;
}

int DisconnectClient(std::uint64_t id, const std::string& client_id) {
  const vorn::Status status = vorn::DisconnectClient(vorn::CurrentBox(), id, client_id);
  if (vorn::ToResult(status) == 0) return 0;
  return status.code() == ENOENT ? kClientsGone : kClientsFailed;
}

}  // namespace VORN
