// Explains what a client may do in a share, and why.
#ifndef VORN_LINUX_ACCESS_EXPLAIN_H
#define VORN_LINUX_ACCESS_EXPLAIN_H

#include <map>
#include <set>
#include <string>
#include <vector>

#include "access.h"
#include "access_checks.h"
#include "box.h"
#include "client_host.h"
#include "export_decision.h"
#include "exports_in_force.h"
#include "host_names.h"
#include "mount_table.h"
#include "status.h"

namespace vorn {

// Explains accesses by one reading of the box, which must outlive it. The caller owns no lock, because the name service
// may take its time. Not thread-safe.
class Explainer {
 public:
  // Asks the name service for the hosts in the rules whose addresses are not remembered.
  static Result<Explainer> Open(Box& box, const NameService& names);

  const ExportsInForce& in_force() const { return in_force_; }
  const NameService& names() const { return names_; }

  // The exports that are at, above or below a directory, in the order of the table.
  const ExportList& ExportsAround(const std::string& directory);

  // Finds a client by an address or a host name.
  ClientHost FindClient(const std::string& client) const { return FindClientHost(client, names_, needs_names_); }

  bool Matches(ClientHost* client, const TableExport& one) { return MatchesExport(client, one, names_, &hosts_); }

  // Answers the question for the folder of a share, and for `client` instead of the client that it names. Fails with
  // kNoSuchUser or kNoSuchGroup.
  Result<VORN::AccessAnswer> Explain(const VORN::AccessQuestion& question, const std::string& path, ClientHost client);

 private:
  friend class Explanation;

  Explainer(Box& box, const NameService& names, ExportsInForce in_force, MountTable mounts);

  // The checks of the service for a version of NFS.
  Result<AccessChecks> ServiceChecks(const std::string& version);

  Box* box_;
  NameService names_;
  ExportsInForce in_force_;
  HostAddresses hosts_;  // those of the exports, and further ones that were asked for
  MountTable mounts_;
  std::set<std::string> mount_points_;
  bool needs_names_;
  std::map<std::string, std::vector<std::size_t>> by_directory_;  // indexes of the exports
  std::map<std::string, ExportList> around_;                      // ExportsAround, by directory
  std::map<std::string, AccessChecks> service_checks_;            // by version
};

// Answers the question for each of the shares, in their order. Fails with ENOENT if there is no such share, and with
// kNoSuchUser or kNoSuchGroup.
Result<std::vector<VORN::AccessAnswer>> ExplainAccesses(Box& box, const NameService& names,
                                                        const VORN::AccessQuestion& question,
                                                        const std::vector<std::string>& shares);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_EXPLAIN_H
