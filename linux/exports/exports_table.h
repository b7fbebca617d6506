// Whether what exportfs(8) exports is what the exports files say.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_TABLE_H
#define VORN_LINUX_EXPORTS_EXPORTS_TABLE_H

#include <vector>

#include "exports_files.h"
#include "status.h"

namespace vorn {

// Compares the files, in the order of exportfs(8), with the table that exportfs made of them (etab), which spells out
// every option and has no links in its paths. Fails with kServiceFailed and the place of the line that causes the
// first difference: exportfs stopped there, or it does not export its client, or with another access. Exports that
// are only in the table are no difference: exportfs(8) makes some for its command line.
Status CompareExportTable(const std::vector<SharedExportsFile>& files, const ExportsDocument& table,
                          const ExportPaths& paths);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_TABLE_H
