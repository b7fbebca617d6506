// The exports that clients get, with the lines of the files that they come from.
#ifndef VORN_LINUX_ACCESS_EXPORTS_IN_FORCE_H
#define VORN_LINUX_ACCESS_EXPORTS_IN_FORCE_H

#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "box.h"
#include "export_decision.h"
#include "export_table_update.h"
#include "host_names.h"
#include "status.h"

namespace vorn {

struct ExportsInForce {
  ExportList exports;
  HostAddresses hosts;            // of the host names in the rules
  std::set<std::string> pending;  // directories whose rules in the files are not in force, while the service serves
  bool is_name_service_away = false;
};

// Reads what the table of exports has while the service serves (`is_serving`), otherwise what its start would put
// there. Asks the name service for the hosts in the rules whose addresses are not remembered, up to the first one for
// which it does not answer.
Result<ExportsInForce> ReadExportsInForce(Box& box, const NameService& names, bool is_serving);

// Returns the directories whose rules in the files are not those of `table`, the table of exports. `hosts` are the
// addresses of host names that are known.
Result<std::set<std::string>> FindPendingExports(const std::vector<SharedExportsFile>& files, std::string_view table,
                                                 const ExportPaths& paths, const HostAddresses& hosts);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_EXPORTS_IN_FORCE_H
