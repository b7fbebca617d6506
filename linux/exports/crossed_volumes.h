// Volumes that an outer share opens to its clients.
#ifndef VORN_LINUX_EXPORTS_CROSSED_VOLUMES_H
#define VORN_LINUX_EXPORTS_CROSSED_VOLUMES_H

#include <string>
#include <vector>

#include "box.h"
#include "export_paths.h"
#include "exports_document.h"
#include "exports_files.h"

namespace vorn {

// A volume with rules of its own that clients of an outer directory reach.
struct CrossedVolume {
  std::string volume;
  std::vector<std::string> clients;  // which the rules of the volume do not name; never empty
};

// Returns the volumes below `path` that the entries with "crossmnt" open to clients which their rules do not name.
// `mounts` are the directories at which a file system is mounted, sorted.
std::vector<CrossedVolume> FindCrossedVolumes(const std::vector<std::string>& mounts,
                                              const std::vector<SharedExportsFile>& files, const std::string& path,
                                              const std::vector<ExportEntry>& entries, const ExportPaths& paths);

// With "crossmnt" (exports(5)) a client of a directory may also use every volume that is mounted below it, whatever
// the rules of that volume say. Returns a sentence for each volume below `path` that has rules of its own, if these do
// not name each client that has crossmnt in `entries`.
std::vector<std::string> DescribeCrossedVolumes(Box& box, const std::vector<SharedExportsFile>& files,
                                                const std::string& path, const std::vector<ExportEntry>& entries);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_CROSSED_VOLUMES_H
