// The text of hosts(5): the names of addresses.
#ifndef VORN_LINUX_TEXT_HOSTS_TEXT_H
#define VORN_LINUX_TEXT_HOSTS_TEXT_H

#include <string>
#include <vector>

namespace vorn {

struct HostsLine {
  std::string address;
  std::vector<std::string> names;  // the canonical one first; never empty
};

// Returns the lines that have an address and a name, in order. The address is not checked.
std::vector<HostsLine> ReadHosts(const std::string& text);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_HOSTS_TEXT_H
