// The firewalls of other programs in the ruleset of nftables.
#ifndef VORN_LINUX_HOST_FOREIGN_FIREWALLS_H
#define VORN_LINUX_HOST_FOREIGN_FIREWALLS_H

#include <string>
#include <string_view>
#include <vector>

#include "configured_ports.h"

namespace vorn {

// Returns one sentence for each table that drops or rejects whatever it does not accept and does not accept the ports:
// what decides there, and how an administrator opens the ports. `ruleset` is the output of "nft -s list ruleset".
//
// A table counts as open if it accepts the mark of the NFS service (firewall_table.h) or mentions every port. Only
// the policy of a chain and rules without a condition are considered.
std::vector<std::string> FindClosedFirewalls(std::string_view ruleset, const std::vector<ConfiguredPort>& ports);

}  // namespace vorn

#endif  // VORN_LINUX_HOST_FOREIGN_FIREWALLS_H
