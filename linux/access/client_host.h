// The client of a question, as rpc.mountd(8) sees it.
#ifndef VORN_LINUX_ACCESS_CLIENT_HOST_H
#define VORN_LINUX_ACCESS_CLIENT_HOST_H

#include <string>
#include <vector>

#include "export_decision.h"
#include "export_table_update.h"
#include "host_names.h"

namespace vorn {

struct ClientHost {
  std::vector<std::string> addresses;  // of the question; the first one is the client's; empty if it has none
  bool is_away = false;                // whether the name service did not answer

  // The client's names, the canonical one first. mountd compares them with patterns and netgroups even if they do not
  // lead back to the address. It compares only the client's own address with those of rules, not the other addresses
  // of its name.
  std::vector<std::string> names;

  bool is_name_confirmed = true;  // false if the client's address is none of those that the canonical name has
};

// Whether one of the exports is for a pattern of names or for a netgroup, which take the names of a client.
bool NeedsNames(const ExportList& exports);

// Finds the client of an address or a host name. mountd asks for the names of an address only if `needs_names`: if the
// table has an export for which NeedsNames() is true.
ClientHost FindClientHost(const std::string& client, const NameService& service, bool needs_names);

// Whether mountd takes the client for one of this export's clients. A host name in the table stands for its addresses
// in `hosts`; others are asked for. Sets `is_away` if the name service did not answer.
bool MatchesExport(ClientHost* client, const TableExport& one, const NameService& service, HostAddresses* hosts);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_CLIENT_HOST_H
