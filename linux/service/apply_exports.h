// Puts the stored export rules into force while the service runs, changing only what differs.
#ifndef VORN_LINUX_SERVICE_APPLY_EXPORTS_H
#define VORN_LINUX_SERVICE_APPLY_EXPORTS_H

#include <set>
#include <string>

#include "box.h"
#include "export_hosts.h"
#include "kernel_exports.h"
#include "status.h"

namespace vorn {

struct ExportsEnvironment {
  std::string kernel_caches = kKernelCaches;
  HostResolver resolve = ResolveHost;
  RightsWriter write_rights;
};

// Writes the difference between the exports files and the table of what is exported into that table, under the locks
// of exportfs(8), and makes the kernel's server forget what the difference concerns (ForgetExports).
//
// An export that is served stays served, whatever the files have elsewhere: a faulty line changes nothing, and a host
// that the resolver does not know, or a resolver that does not answer, takes nothing from a rule that is in force. The
// log and the warnings of the call name each faulty line and each host without an address, and each exported directory
// that is no share any more (CheckLeftShares).
//
// `resolved` are the keys of host names whose remembered addresses are new.
Status ApplyExports(Box& box, const ExportsEnvironment& environment, const std::set<std::string>& resolved = {});

// Does in a draft of the box what ApplyExports would do in the files of exports(5), and names faulty lines and left
// shares. Neither the table nor a resolver is asked.
Status RehearseExports(Box& draft);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_APPLY_EXPORTS_H
