// The firewall table of the NFS service: "inet vorn" of nftables. Only this platform writes the table, and the
// platform writes no other one.
//
// An accept verdict cannot override a drop in another table. This table therefore accepts and drops nothing: it
// sets a mark on packets for the service's configured ports, before the box's own tables see them. A box whose
// policy is to drop accepts these packets with "meta mark & 0x01000000 != 0 accept".
#ifndef VORN_LINUX_HOST_FIREWALL_TABLE_H
#define VORN_LINUX_HOST_FIREWALL_TABLE_H

#include <optional>
#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

struct ConfiguredPort;  // configured_ports.h

inline constexpr char kFirewallFile[] = "/var/lib/vorn/firewall.nft";

// Makes the table match the configured ports, in one transaction, and saves it in /var/lib/vorn/firewall.nft,
// which a unit of the package loads at boot. Does nothing if the box's settings switch the firewall off. Where another
// firewall keeps the ports closed (foreign_firewalls.h), the log says so once, and what to do.
Status UpdateFirewall(Box& box);

// Returns a sentence for each packet filter of another program that keeps one of the ports closed
// (foreign_firewalls.h). nullopt if the filters cannot be read, or the box is only a folder.
std::optional<std::vector<std::string>> DescribeClosedPorts(Box& box, const std::vector<ConfiguredPort>& ports);

}  // namespace vorn

#endif  // VORN_LINUX_HOST_FIREWALL_TABLE_H
