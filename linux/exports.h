// The exports file of the box, beside the contract's operations on it.
#ifndef VORN_LINUX_EXPORTS_H
#define VORN_LINUX_EXPORTS_H

#include "status.h"

namespace vorn {

// Whether the export table that exportfs(8) left behind (/var/lib/nfs/etab) is the exports file's, as
// it must be after a reload: exportfs answers success even where it gave up half-way. Fails with
// kServiceFailed and a sentence that names the line of the file and what is wrong with it.
Status CheckExportTable();

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_H
