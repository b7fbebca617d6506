// Parses and edits any text as an exports document. The edited entries are read back, and nothing else changes.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "exports_client.h"
#include "exports_document.h"
#include "require.h"

namespace {

const vorn::ExportPaths kPaths;

std::size_t Faults(const vorn::ExportsDocument& document) {
  std::size_t faults = 0;
  const auto lines = document.Lines();
  for (const vorn::ExportLine& line : *lines) faults += line.fault ? 1 : 0;
  return faults;
}

bool HasFault(const vorn::ExportsDocument& document, const std::string& path) {
  const auto lines = document.LinesOf(path, kPaths);
  return std::any_of(lines.begin(), lines.end(), [](const vorn::ExportLine& line) { return line.fault.has_value(); });
}

void TryEdit(const vorn::ExportsDocument& document, const std::string& path,
             const std::vector<vorn::ExportEntry>& entries) {
  const auto replaced = document.Replace(path, entries, kPaths);
  if (!replaced.ok()) return;
  Require(entries.empty() || !HasFault(document, path));
  const vorn::ExportsDocument edited(replaced->text());
  Require(edited.Entries(path, kPaths) == entries);
  Require(Faults(edited) <= Faults(document));
  const auto again = edited.Replace(path, edited.Entries(path, kPaths), kPaths);
  Require(again.ok() && vorn::ExportsDocument(again->text()).Entries(path, kPaths) == entries);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  // The first line is a client, the rest a file.
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const std::string_view client = input.substr(0, input.find('\n'));
  const vorn::ExportsDocument document{std::string(input.substr(client.size()))};
  std::vector<std::string> paths = {"/new"};
  const auto lines = document.Lines();
  for (const vorn::ExportLine& line : *lines) {
    Require(line.span.begin <= line.span.path && line.span.path < line.span.end);
    if (line.fault) Require(line.fault->position >= line.span.path && line.fault->position <= line.span.end);
    if (!line.path.empty() && paths.size() < 4) paths.push_back(line.path);
  }
  for (const std::string& path : paths) {
    std::vector<vorn::ExportEntry> entries = document.Entries(path, kPaths);
    TryEdit(document, path, {});
    TryEdit(document, path, entries);
    if (!vorn::CheckExportClient(client).ok()) continue;
    entries.push_back({std::string(client), {}, {}});
    TryEdit(document, path, entries);
  }
  return 0;
}
