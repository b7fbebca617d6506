// The ID map in the form in which the NFS daemons use it.
//
// libnfsidmap takes quadratic time to read a section of idmapd.conf(5), in each daemon and again in its method
// "static". The daemons therefore do not read the mappings from there: they start with a copy of idmapd.conf without
// them, and the plug-in in plugin/ searches a compiled table, which it follows while the daemon runs. idmapd.conf(5)
// remains the only place where mappings are stored.
#ifndef VORN_LINUX_IDMAP_COMPILED_IDMAP_H
#define VORN_LINUX_IDMAP_COMPILED_IDMAP_H

#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

// The settings for which a daemon must be restarted: idmapd.conf(5) without the mappings that the table has. Its first
// lines name the versions of the other files that libnfsidmap reads.
inline constexpr char kDaemonSettingsFile[] = "/var/lib/vorn/idmap/settings";

// Compiles what is stored now: writes the table (mapping_table.h) and kDaemonSettingsFile, each only if it changes.
// The caller must not own the configuration lock. Returns a sentence for each mapping to a user whom the box's
// passwd(5) does not have.
Result<std::vector<std::string>> CompileIDMap(Box& box);

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_COMPILED_IDMAP_H
