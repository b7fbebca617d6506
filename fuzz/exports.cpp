// The exports document, fed with anything: it reads, and what it writes reads back and changes nothing
// else.
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "exports_client.h"
#include "exports_document.h"
#include "require.h"

namespace {

std::size_t Faults(const vorn::ExportsDocument& document) {
  std::size_t faults = 0;
  for (const vorn::ExportLine& line : document.Lines()) faults += line.fault.empty() ? 0 : 1;
  return faults;
}

void TryEdit(const vorn::ExportsDocument& document, const std::string& path,
             const std::vector<vorn::ExportEntry>& entries) {
  vorn::ExportsDocument edited = document;
  if (!edited.Replace(path, entries).ok()) {
    Require(edited.text() == document.text());
    return;
  }
  Require(edited.Entries(path) == entries);
  Require(Faults(edited) <= Faults(document));
  vorn::ExportsDocument again(edited.text());
  Require(again.Replace(path, again.Entries(path)).ok());
  Require(again.Entries(path) == entries);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  // The first line is a client, the rest a file.
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const std::string_view client = input.substr(0, input.find('\n'));
  const vorn::ExportsDocument document{std::string(input.substr(client.size()))};
  std::vector<std::string> paths = {"/new"};
  for (const vorn::ExportLine& line : document.Lines()) {
    Require(line.span.begin <= line.span.path && line.span.path < line.span.end);
    if (!line.path.empty() && paths.size() < 4) paths.push_back(line.path);
  }
  for (const std::string& path : paths) {
    std::vector<vorn::ExportEntry> entries = document.Entries(path);
    TryEdit(document, path, {});
    TryEdit(document, path, entries);
    if (!vorn::CheckExportClient(client).ok()) continue;
    entries.push_back({std::string(client), {}, {}});
    TryEdit(document, path, entries);
  }
  return 0;
}
