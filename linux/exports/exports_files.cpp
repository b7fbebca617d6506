#include "exports_files.h"

#include <sys/stat.h>

#include <string_view>

namespace vorn {
namespace {

constexpr char kFolder[] = "/etc/exports.d";
constexpr std::string_view kEnding = ".exports";

bool IsExportsName(std::string_view name) {
  return name.size() > kEnding.size() && name[0] != '.' && name.substr(name.size() - kEnding.size()) == kEnding;
}

bool IsRegularFile(Box& box, const std::string& path) {
  const Result<std::string> location = box.root().Locate(path);
  struct stat stat {};
  return location.ok() && lstat(location->c_str(), &stat) == 0 && S_ISREG(stat.st_mode);
}

}  // namespace

Result<SharedExportsFile> OpenExportsFile(Box& box, const std::string& path) {
  return box.LoadAfter<ExportsFile>(path, [&path](StoredFile file, const ExportsFile* previous) -> Result<ExportsFile> {
    ExportsDocument document = previous == nullptr ? ExportsDocument(std::move(file.text))
                                                   : ExportsDocument(std::move(file.text), previous->document);
    return ExportsFile{path, std::move(file.location), file.version, std::move(document)};
  });
}

Result<std::vector<SharedExportsFile>> OpenAllExports(Box& box) {
  Result<SharedExportsFile> own = OpenExportsFile(box, kExportsFile);
  if (!own.ok()) return own.status();
  std::vector<SharedExportsFile> files = {std::move(*own)};
  const Result<std::shared_ptr<const StoredFolder>> folder = box.List(kFolder);
  if (!folder.ok()) return folder.status();
  for (const std::string& name : (*folder)->names) {
    if (!IsExportsName(name)) continue;
    const std::string path = std::string(kFolder) + "/" + name;
    Result<SharedExportsFile> file = OpenExportsFile(box, path);
    if (file.ok()) {
      files.push_back(std::move(*file));
    } else if (IsRegularFile(box, path)) {
      return file.status();
    }
  }
  return files;
}

std::vector<ExportsFileFault> FindExportFaults(const std::vector<SharedExportsFile>& files) {
  std::vector<ExportsFileFault> faults;
  for (const SharedExportsFile& file : files) {
    const auto lines = file->document.Lines();
    for (const ExportLine& line : *lines) {
      if (!line.fault) continue;
      faults.push_back({file->location, line.path, line.span.begin, line.span.end,
                        file->Place(line.fault->position) + ": " + line.fault->reason, line.fault->ends_file});
    }
  }
  return faults;
}

}  // namespace vorn
