// The data that the checks share, read once.
#ifndef VORN_LINUX_HEALTH_HEALTH_INPUT_H
#define VORN_LINUX_HEALTH_HEALTH_INPUT_H

#include <sys/types.h>

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "box.h"
#include "exports_files.h"
#include "health.h"
#include "shares.h"
#include "status.h"

namespace vorn {

// The file system of a folder of the box; nullopt if there is no folder.
std::optional<dev_t> DeviceOfFolder(const Box& box, const std::string& path);

// Fails with the reason if the box is a folder without the files of a kernel's NFS server.
Status CheckKernelIsSeen(const Box& box);

// A line of a file of exports(5).
struct ExportedLine {
  const ExportsFile* file = nullptr;
  const ExportLine* line = nullptr;
  int number = 0;                       // of the line in its file, from 1
  std::string directory;                // to which its path leads, without links
  const SharedFolder* share = nullptr;  // whose folder this is; null if it is none

  VORN::HealthSubject Subject() const;

  // Returns "Line 3 of /etc/exports".
  std::string Name() const;

  // Returns "the share \"data\"", or the directory if it is no share.
  std::string Exported() const;
};

// The status of a part says why it could not be read; it is then empty.
struct HealthInput {
  explicit HealthInput(Box& checked);
  HealthInput(const HealthInput&) = delete;
  HealthInput& operator=(const HealthInput&) = delete;

  Box& box;

  Status shares_status;
  std::vector<SharedFolder> shares;
  std::vector<std::optional<dev_t>> devices;  // the file system of each share; nullopt if its folder does not exist
  std::unordered_map<std::string, const SharedFolder*> share_at;  // by path

  Status exports_status;
  std::vector<SharedExportsFile> files;
  std::vector<std::shared_ptr<const std::vector<ExportLine>>> lines;   // of the files; keeps those of `exported` alive
  std::vector<ExportedLine> exported;                                  // in the order of exportfs(8)
  std::unordered_map<std::string, std::vector<std::size_t>> lines_of;  // a directory: indexes of `exported`
};

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_HEALTH_INPUT_H
