// The ID map of a box: idmapd.conf(5).
#ifndef VORN_LINUX_IDMAP_IDMAP_H
#define VORN_LINUX_IDMAP_IDMAP_H

#include <optional>
#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

inline constexpr char kIDMapFile[] = "/etc/idmapd.conf";

// A static mapping from a Kerberos principal to the name of a local user.
struct IDMapping {
  std::string principal;
  std::string local_name;
};
using IDMappings = std::vector<IDMapping>;

// The NFSv4 domain that is configured; nullopt if there is none.
Result<std::optional<std::string>> ReadConfiguredDomain(Box& box);

// The domain that applies without a configured one: that of the canonical host name (idmapd.conf(5)). This may
// wait for a name server, so call it without a lock.
std::string DefaultDomain();

// The static mappings, in file order.
Result<IDMappings> ReadIDMappings(Box& box);

// The parts of the ID map that a change stores; nullopt leaves a part as it is.
struct IDMapChange {
  std::optional<std::string> domain;  // "" removes the configured domain
  std::optional<IDMappings> mappings;
};

// Changes the idmapd.conf at `path`, and enables static mappings once there is one. Comments and foreign settings
// stay. Fails with kRefusedText, and writes nothing, for a text that the file cannot represent, that its readers
// have no room for, or that looks like another text; and with kChangedBehind if the file was changed since the
// configuration context of this thread read it.
Status WriteIDMap(Box& box, const std::string& path, const IDMapChange& change);

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_IDMAP_H
