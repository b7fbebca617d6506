#include "hosts_text.h"

#include <sstream>
#include <utility>

namespace vorn {

std::vector<HostsLine> ReadHosts(const std::string& text) {
  std::vector<HostsLine> hosts;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line.substr(0, line.find('#')));
    HostsLine host;
    words >> host.address;
    for (std::string name; words >> name;) host.names.push_back(name);
    if (!host.names.empty()) hosts.push_back(std::move(host));
  }
  return hosts;
}

}  // namespace vorn
