// The clients that a change of export rules touches: those that use an export in which their rights would change.
#ifndef VORN_LINUX_CLIENTS_TOUCHED_CLIENTS_H
#define VORN_LINUX_CLIENTS_TOUCHED_CLIENTS_H

#include <cstddef>
#include <set>
#include <string>
#include <vector>

#include "box.h"
#include "rule_changes.h"
#include "status.h"

namespace vorn {

struct TouchedClient {
  std::string address;
  std::string name;     // as VORN::NFSClient
  std::string version;  // of NFS
  std::string path;     // of the export in use
  std::vector<RightChange> rights;

  // Whether rules for the names of hosts may decide otherwise. The name service is not asked, as in all rehearsals.
  bool is_certain = true;
};

struct TouchedClients {
  std::vector<TouchedClient> clients;
  bool is_complete = true;  // false: there was too much to compare
};

// Decides for each client of `real` in each export that it uses, at or below one of `directories`, which rule admits it
// with the files of `real` and with those of `draft`, and returns those whose rights differ. The rules of both are
// those that a start of the service would put into force. Compares at most `most` pairs of a client and a rule, which
// bounds the time of a rehearsal.
Result<TouchedClients> FindTouchedClients(Box& real, Box& draft, const std::set<std::string>& directories,
                                          std::size_t most = 1'000'000);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_TOUCHED_CLIENTS_H
