// Whether what exportfs(8) exports is what the exports file says.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_TABLE_H
#define VORN_LINUX_EXPORTS_EXPORTS_TABLE_H

#include <functional>
#include <string>

#include "exports_document.h"
#include "status.h"

namespace vorn {

// Where a path leads once its links are followed; the path itself when that cannot be told.
using PathResolver = std::function<std::string(const std::string&)>;

// Compares a file with the table that exportfs made of it (etab), which spells out every option and
// has no links in its paths. Fails with kServiceFailed, naming the line of the file that caused the
// difference: the one at which exportfs gave up, or whose client it does not export, or exports
// with another access. Further exports in the table are no difference: other files make some.
Status CompareExportTable(const ExportsDocument& file, const ExportsDocument& table, const PathResolver& resolve);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_TABLE_H
