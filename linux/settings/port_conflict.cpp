#include "port_conflict.h"

#include <netconfig.h>
#include <rpc/rpc.h>
#include <rpc/rpcb_clnt.h>
#include <rpc/rpcb_prot.h>

#include <algorithm>
#include <fstream>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <utility>

#include "configured_ports.h"
#include "nfs_configuration.h"

namespace vorn {
namespace {

// RFC 1833's program numbers.
constexpr unsigned long kStatusProgram = 100024;
constexpr unsigned long kLockProgram = 100021;

// The two services whose ports are changed together by one request. Their ports can be exchanged, because both
// services are restarted afterwards; equal ports are refused when they are stored.
bool IsExchangeable(const std::string& service) { return service == "nfs_statd" || service == "nfs_nlm"; }

bool IsOwnProgram(const std::string& service, unsigned long program) {
  return IsExchangeable(service) && (program == kStatusProgram || program == kLockProgram);
}

bool IsOwnPort(const std::string& service, const ConfiguredPort& port) {
  return port.service == service || (IsExchangeable(service) && IsExchangeable(port.service));
}

// A protocol ("tcp", "udp"; IPv4 and IPv6 alike) and a port of it.
using Socket = std::pair<std::string, int>;

// The port of a universal address (RFC 5665): the last two numbers of "0.0.0.0.8.1" and "::.8.1" are its bytes.
// 0 for an address of another form.
int PortOf(const std::string& address) {
  const std::size_t low = address.rfind('.');
  const std::size_t high = low == std::string::npos || low == 0 ? low : address.rfind('.', low - 1);
  if (high == std::string::npos) return 0;
  std::istringstream bytes(address.substr(high + 1));
  int most = 0;
  char dot = 0;
  int least = 0;
  bytes >> most >> dot >> least;
  return bytes ? most * 256 + least : 0;
}

// The sockets that rpcbind(8) knows as those of the service, and of the service with which it may exchange ports; none
// if rpcbind does not answer.
std::set<Socket> OwnSockets(const std::string& service) {
  std::set<Socket> own;
  const std::unique_ptr<netconfig, decltype(&freenetconfigent)> local(getnetconfigent("local"), freenetconfigent);
  rpcblist* registered = local ? rpcb_getmaps(local.get(), "localhost") : nullptr;
  for (const rpcblist* entry = registered; entry != nullptr; entry = entry->rpcb_next) {
    const rpcb& map = entry->rpcb_map;
    if (IsOwnProgram(service, map.r_prog)) own.emplace(std::string(map.r_netid).substr(0, 3), PortOf(map.r_addr));
  }
  xdr_free(reinterpret_cast<xdrproc_t>(xdr_rpcblist_ptr), &registered);
  return own;
}

// Adds the local ports of a table of proc(5): "0: 0100007F:0016 00000000:0000 0A ...". `state` is the state of a
// listening socket in that table.
void AddListeners(const char* table, const char* protocol, const std::string& state, std::set<Socket>* sockets) {
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
    if (found != state || colon == std::string::npos) continue;
    sockets->emplace(protocol, std::stoi(local.substr(colon + 1), nullptr, 16));
  }
}

std::set<Socket> ListeningSockets() {
  std::set<Socket> sockets;
  AddListeners("/proc/net/tcp", "tcp", "0A", &sockets);
  AddListeners("/proc/net/tcp6", "tcp", "0A", &sockets);
  AddListeners("/proc/net/udp", "udp", "07", &sockets);
  AddListeners("/proc/net/udp6", "udp", "07", &sockets);
  return sockets;
}

}  // namespace

Result<bool> IsPortTaken(Box& box, const std::string& service, int first, int last) {
  if (first < 1 || last > kLargestPort || first > last) return true;
  const auto within = [&](int port) { return port >= first && port <= last; };
  const auto configured = ReadConfiguredPorts(box);
  if (!configured.ok()) return configured.status();
  const bool taken = std::any_of(configured->begin(), configured->end(), [&](const ConfiguredPort& port) {
    return !IsOwnPort(service, port) && within(port.port);
  });
  if (taken) return true;
  const std::set<Socket> own = OwnSockets(service);
  const std::set<Socket> listening = ListeningSockets();
  return std::any_of(listening.begin(), listening.end(),
                     [&](const Socket& socket) { return within(socket.second) && own.count(socket) == 0; });
}

}  // namespace vorn
