// Volumes that an outer share opens to its clients.
#ifndef VORN_LINUX_EXPORTS_CROSSED_VOLUMES_H
#define VORN_LINUX_EXPORTS_CROSSED_VOLUMES_H

#include <string>
#include <vector>

#include "box.h"
#include "exports_document.h"
#include "exports_files.h"

namespace vorn {

// With "crossmnt" (exports(5)) a client of a directory may also use every volume that is mounted below it, whatever
// the rules of that volume say. Returns a sentence for each volume below `path` that has rules of its own, if these do
// not name each client that has crossmnt in `entries`.
std::vector<std::string> DescribeCrossedVolumes(Box& box, const std::vector<SharedExportsFile>& files,
                                                const std::string& path, const std::vector<ExportEntry>& entries);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_CROSSED_VOLUMES_H
