#include "health_input.h"

#include <sys/stat.h>

#include <utility>

#include "box_paths.h"
#include "kernel_statistics.h"
#include "line_numbers.h"
#include "path_resolver.h"

namespace vorn {
namespace {

void ReadShares(HealthInput* input) {
  Result<std::vector<SharedFolder>> shares = ListShares(input->box);
  input->shares_status = shares.status();
  if (!shares.ok()) return;
  input->shares = std::move(*shares);
  for (const SharedFolder& share : input->shares) {
    input->share_at.emplace(share.path, &share);
    input->devices.push_back(DeviceOfFolder(input->box, share.path));
  }
}

void ReadLines(const SharedExportsFile& file, PathResolver* resolver, HealthInput* input) {
  input->lines.push_back(file->document.Lines());
  LineNumbers numbers(file->document.text());
  for (const ExportLine& line : *input->lines.back()) {
    ExportedLine exported{file.get(), &line, numbers.At(line.span.path), resolver->Resolve(line.path), nullptr};
    const auto share = input->share_at.find(exported.directory);
    if (share != input->share_at.end()) exported.share = share->second;
    input->lines_of[exported.directory].push_back(input->exported.size());
    input->exported.push_back(std::move(exported));
  }
}

void ReadExports(HealthInput* input) {
  Result<std::vector<SharedExportsFile>> files = OpenAllExports(input->box);
  input->exports_status = files.status();
  if (!files.ok()) return;
  input->files = std::move(*files);
  const BoxPaths paths(input->box.root());
  PathResolver resolver(paths);
  for (const SharedExportsFile& file : input->files) ReadLines(file, &resolver, input);
}

}  // namespace

std::optional<dev_t> DeviceOfFolder(const Box& box, const std::string& path) {
  const Result<std::string> location = box.root().Locate(path);
  struct stat folder {};
  if (!location.ok() || stat(location->c_str(), &folder) != 0 || !S_ISDIR(folder.st_mode)) return std::nullopt;
  return folder.st_dev;
}

Status CheckKernelIsSeen(const Box& box) {
  if (box.root().is_box() || box.Exists(kKernelStatistics)) return {};
  return Status::Failure(kUnsupported, "The kernel's NFS server cannot be seen from here.");
}

VORN::HealthSubject ExportedLine::Subject() const {
  VORN::HealthSubject subject;
  if (share != nullptr) subject.share = share->name;
  subject.file = file->path;
  subject.line = number;
  return subject;
}

std::string ExportedLine::Name() const { return "Line " + std::to_string(number) + " of " + file->path; }

std::string ExportedLine::Exported() const {
  return share == nullptr ? directory : "the share \"" + share->name + "\"";
}

HealthInput::HealthInput(Box& checked) : box(checked) {
  ReadShares(this);
  ReadExports(this);
}

}  // namespace vorn
