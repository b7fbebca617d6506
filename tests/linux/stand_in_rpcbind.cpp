#include "stand_in_rpcbind.h"

#include <rpc/rpc.h>
#include <rpc/rpcb_prot.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <stdexcept>

#include "file_descriptor.h"

namespace {

constexpr char kSocket[] = "/run/rpcbind.sock";

rpcblist* head = nullptr;

void Answer(svc_req* request, SVCXPRT* transport) {
  if (request->rq_proc == RPCBPROC_DUMP) {
    svc_sendreply(transport, reinterpret_cast<xdrproc_t>(xdr_rpcblist_ptr), &head);
  } else {
    svcerr_noproc(transport);
  }
}

std::vector<rpcblist> Link(const std::vector<Registration>& registrations) {
  std::vector<rpcblist> list(registrations.size());
  for (std::size_t i = 0; i < list.size(); ++i) {
    list[i].rpcb_map = {static_cast<rpcprog_t>(registrations[i].program), 1,
                        const_cast<char*>(registrations[i].netid.c_str()),
                        const_cast<char*>(registrations[i].address.c_str()), const_cast<char*>("")};
    list[i].rpcb_next = i + 1 < list.size() ? &list[i + 1] : nullptr;
  }
  return list;
}

bool IsThere() {
  const vorn::FileDescriptor client(socket(AF_UNIX, SOCK_STREAM, 0));
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kSocket);
  return connect(client.get(), reinterpret_cast<sockaddr*>(&address), sizeof address) == 0;
}

}  // namespace

StandInRpcbind::StandInRpcbind(const std::vector<Registration>& registrations) {
  server_ = std::make_unique<ChildProcess>([&] {
    std::vector<rpcblist> list = Link(registrations);
    head = list.data();
    SVCXPRT* transport = svcunix_create(RPC_ANYSOCK, 0, 0, const_cast<char*>(kSocket));
    if (transport == nullptr) return 1;
    for (const rpcvers_t version : {RPCBVERS, RPCBVERS4}) svc_reg(transport, RPCBPROG, version, Answer, nullptr);
    svc_run();
    return 0;
  });
  if (!Eventually(IsThere)) throw std::runtime_error("no stand-in for rpcbind");
}

StandInRpcbind::~StandInRpcbind() {
  server_.reset();
  unlink(kSocket);
}
