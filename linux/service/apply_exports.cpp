#include "apply_exports.h"

#include <iterator>
#include <memory>
#include <set>
#include <utility>
#include <vector>

#include "box_paths.h"
#include "export_table_file.h"
#include "export_table_update.h"
#include "exports_files.h"
#include "left_shares.h"
#include "notice.h"

namespace vorn {
namespace {

using Files = std::vector<SharedExportsFile>;
using Lines = std::vector<std::shared_ptr<const std::vector<ExportLine>>>;

// Brings the table up to the state of the files. Returns the difference.
Result<ExportTableUpdate> UpdateTable(Box& box, const ExportsEnvironment& environment, const Files& files,
                                      const HostAddresses& hosts, const std::set<std::string>& resolved) {
  Result<ExportTableFile> table = ExportTableFile::Open(box);
  if (!table.ok()) return table.status();
  Result<ExportTableUpdate> update = PlanExportTable(files, table->text(), BoxPaths(box.root()), hosts, resolved);
  if (!update.ok() || update->changed.empty()) return update;
  if (Status status = table->Replace(update->text); !status.ok()) return status;
  if (Status status = ForgetExports(environment.kernel_caches, *update, environment.write_rights); !status.ok())
    return status;
  return update;
}

void NameFaults(const Files& files) {
  for (const SharedExportsFile& file : files) {
    for (const ExportsFileFault& fault : FindExportFaults({file})) {
      NoticeOnce(file->location, file->version,
                 fault.sentence + "; this line must be mended: until then its exports stay as they are");
    }
  }
}

void NameUnknownHosts(const Files& files, const std::set<std::string>& names) {
  for (const std::string& name : names) {
    NoticeOnce(files.front()->location, files.front()->version,
               "the host \"" + name + "\" of an export rule has no address now; the rule is not applied to it");
  }
}

Lines LinesOf(const Files& files) {
  Lines lines;
  for (const SharedExportsFile& file : files) lines.push_back(file->document.Lines());
  return lines;
}

// Opens the files after the rules of former shares have been dealt with. `lines` owns the lines of the files, so that
// all who ask for them share them.
Result<Files> OpenWithoutLeftShares(Box& box, Lines* lines) {
  Result<Files> files = OpenAllExports(box);
  if (!files.ok()) return files;
  *lines = LinesOf(*files);
  const Result<bool> withdrawn = CheckLeftShares(box, files->front()->document);
  if (!withdrawn.ok()) return withdrawn.status();
  if (!*withdrawn) return files;
  files = OpenAllExports(box);
  if (files.ok()) *lines = LinesOf(*files);
  return files;
}

// Forgets the addresses of names that no rule has any more.
void Prune(const std::set<std::string>& names, HostAddresses* hosts) {
  for (auto host = hosts->begin(); host != hosts->end();) {
    host = names.count(host->first) == 0 ? hosts->erase(host) : std::next(host);
  }
}

}  // namespace

Status ApplyExports(Box& box, const ExportsEnvironment& environment, const std::set<std::string>& resolved) {
  Lines lines;
  const Result<Files> files = OpenWithoutLeftShares(box, &lines);
  if (!files.ok()) return files.status();
  NameFaults(*files);
  Result<HostAddresses> hosts = ReadExportHosts(box);
  if (!hosts.ok()) return hosts.status();
  // Read again after the table was replaced (ForgetExports), because the kernel may learn an address until then.
  AddServedHosts(KernelCache(environment.kernel_caches, kAddressesCache), &*hosts);
  // Rules whose addresses are known are applied before the resolver is asked for others, which may take long.
  Result<ExportTableUpdate> update = UpdateTable(box, environment, *files, *hosts, resolved);
  if (!update.ok()) return update.status();
  if (!update->unresolved.empty()) {
    const std::set<std::string> found = ResolveExportHosts(update->unresolved, environment.resolve, &*hosts);
    if (!found.empty()) update = UpdateTable(box, environment, *files, *hosts, found);
    if (!update.ok()) return update.status();
    NameUnknownHosts(*files, update->unresolved);
  }
  Prune(update->names, &*hosts);
  return StoreExportHosts(box, *hosts);
}

Status RehearseExports(Box& draft) {
  Lines lines;
  const Result<Files> files = OpenWithoutLeftShares(draft, &lines);
  if (files.ok()) NameFaults(*files);
  return files.status();
}

}  // namespace vorn
