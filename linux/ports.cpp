// Whether a port is free for a service: WebUtils::IsPortConflict.
#include <arpa/inet.h>
#include <netinet/in.h>
#include <rpc/pmap_clnt.h>
#include <rpc/pmap_prot.h>
#include <sys/socket.h>

#include <algorithm>
#include <fstream>
#include <set>
#include <sstream>
#include <string>

#include "error.h"
#include "nfs_ports.h"
#include "webapi.h"

namespace vorn {
namespace {

constexpr int kHighestPort = 65535;

// RFC 1833's program numbers.
constexpr unsigned long kStatusProgram = 100024;
constexpr unsigned long kLockProgram = 100021;

unsigned long ProgramOf(const std::string& service) {
  if (service == "nfs_statd") return kStatusProgram;
  return service == "nfs_nlm" ? kLockProgram : 0;
}

// The ports that rpcbind(8) knows to be of the service itself. None where no rpcbind answers: then
// nothing of the service can be registered either.
std::set<int> OwnPorts(const std::string& service) {
  std::set<int> own;
  sockaddr_in local{};
  local.sin_family = AF_INET;
  local.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  pmaplist* const registered = pmap_getmaps(&local);
  for (const pmaplist* entry = registered; entry != nullptr; entry = entry->pml_next) {
    if (entry->pml_map.pm_prog == ProgramOf(service)) own.insert(static_cast<int>(entry->pml_map.pm_port));
  }
  if (registered != nullptr)
    xdr_free(reinterpret_cast<xdrproc_t>(xdr_pmaplist_ptr), const_cast<pmaplist**>(&registered));
  return own;
}

// Local ports in a table of proc(5): "0: 0100007F:0016 00000000:0000 0A ...". `state` is what a socket
// that waits for others has there.
void AddListeners(const char* table, const std::string& state, std::set<int>* ports) {
  std::ifstream lines(table);
  std::string line;
  std::getline(lines, line);
  while (std::getline(lines, line)) {
    std::istringstream words(line);
    std::string number;
    std::string local;
    std::string remote;
    std::string found;
    words >> number >> local >> remote >> found;
    const std::size_t colon = local.rfind(':');
    if (found == state && colon != std::string::npos) ports->insert(std::stoi(local.substr(colon + 1), nullptr, 16));
  }
}

std::set<int> ListeningPorts() {
  std::set<int> ports;
  AddListeners("/proc/net/tcp", "0A", &ports);
  AddListeners("/proc/net/tcp6", "0A", &ports);
  AddListeners("/proc/net/udp", "07", &ports);
  AddListeners("/proc/net/udp6", "07", &ports);
  return ports;
}

Result<bool> IsConflict(const std::string& service, int first, int last) {
  if (first < 1 || last > kHighestPort || first > last) return true;
  const auto configured = ConfiguredPorts();
  if (!configured.ok()) return configured.status();
  const bool taken = std::any_of(configured->begin(), configured->end(), [&](const ConfiguredPort& port) {
    return port.service != service && port.port >= first && port.port <= last;
  });
  if (taken) return true;
  const std::set<int> own = OwnPorts(service);
  const std::set<int> listening = ListeningPorts();
  return std::any_of(listening.lower_bound(first), listening.upper_bound(last),
                     [&](int port) { return own.count(port) == 0; });
}

}  // namespace
}  // namespace vorn

namespace WebUtils {

int IsPortConflict(const char* service, int first, int last) {
  const vorn::Result<bool> conflict = vorn::IsConflict(service, first, last);
  if (conflict.ok()) return *conflict ? 1 : 0;
  vorn::ToResult(conflict.status());
  return 1;  // a port that nobody can vouch for is not given away
}

}  // namespace WebUtils
