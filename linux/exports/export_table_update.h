// The difference between the exports files and the table of what is exported.
#ifndef VORN_LINUX_EXPORTS_EXPORT_TABLE_UPDATE_H
#define VORN_LINUX_EXPORTS_EXPORT_TABLE_UPDATE_H

#include <map>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "exports_files.h"
#include "status.h"

namespace vorn {

// The addresses of host names as they were last resolved, by the key of the name (ExportClientKey).
using HostAddresses = std::map<std::string, std::vector<std::string>>;

struct ExportTableUpdate {
  std::string text;  // the new table

  // All directories that the new table exports.
  std::set<std::string> exported;

  // The directories whose exports differ between the two tables; of these, the directories that are not exported
  // any more; and every client that the whole table has gained or lost.
  std::set<std::string> changed;
  std::set<std::string> left;
  std::set<std::string> clients;

  // Host names, by their keys. A name in `unresolved` has a rule that is not in force, or that is in force under the
  // host's name: its address is needed. `names` are all names that the files have.
  std::set<std::string> unresolved;
  std::set<std::string> names;
};

// Returns the update that makes the table `table` export what the lines of `files` say. A line of the table that
// already does so stays as it is, byte for byte.
//
// - A faulty line of a file changes nothing: the exports of its directory, and of every directory that its text names,
//   stay in the table. The lines after it are applied, although exportfs(8) would not read them.
// - A host name is written as the addresses that `hosts` has for it, because rpc.mountd resolves a name at every change
//   of the table and withdraws access if that fails. A rule whose client the table already has, by its name or by these
//   addresses, stays in force whether its name can be resolved or not. `resolved` are the names that were resolved for
//   this update. A new rule uses only those.
//
// Fails with kSyntax if the table is not one that exportfs writes.
Result<ExportTableUpdate> PlanExportTable(const std::vector<SharedExportsFile>& files, std::string_view table,
                                          const ExportPaths& paths, const HostAddresses& hosts,
                                          const std::set<std::string>& resolved = {});

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORT_TABLE_UPDATE_H
