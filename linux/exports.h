// The exports file of the box, beside the contract's operations on it.
#ifndef VORN_LINUX_EXPORTS_H
#define VORN_LINUX_EXPORTS_H

#include "files.h"
#include "status.h"

namespace vorn {

// What the exports file is now, to be taken before a reload.
Result<FileStamp> ExportsFileStamp();

// Whether the export table that exportfs(8) left behind (/var/lib/nfs/etab) is the exports file's, as
// it must be after a reload: exportfs answers success even where it gave up half-way. Fails with
// kServiceFailed and a sentence that names the line of the file and what is wrong with it. A file that
// is no more what was `reloaded` has been saved by somebody whose own reload follows: nothing is wrong.
Status CheckExportTable(const FileStamp& reloaded);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_H
