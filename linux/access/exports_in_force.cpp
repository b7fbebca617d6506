#include "exports_in_force.h"

#include <map>
#include <utility>
#include <vector>

#include "box_paths.h"
#include "export_table.h"
#include "exports_client.h"
#include "exports_files.h"
#include "exports_text.h"
#include "line_numbers.h"
#include "path_resolver.h"

namespace vorn {
namespace {

struct Place {
  std::string file;
  int line = 0;
  std::string written;
};

// Where the clients of directories are written, by directory and key of the client (ExportClientKey).
using Places = std::map<std::pair<std::string, std::string>, Place>;

void AddPlaces(const ExportsFile& file, const HostAddresses& hosts, PathResolver* resolver, Places* places) {
  const auto lines = file.document.Lines();
  LineNumbers numbers(file.document.text());
  for (const ExportLine& line : *lines) {
    const std::string directory = resolver->Resolve(line.path);
    const int number = numbers.At(line.span.path);
    for (const ExportEntry& entry : line.entries) {
      const Place place{file.path, number, entry.client};
      const std::string key = ExportClientKey(entry.client);
      places->try_emplace({directory, key}, place);
      const auto host = hosts.find(key);
      if (host == hosts.end()) continue;
      for (const std::string& address : host->second) places->try_emplace({directory, address}, place);
    }
  }
}

Places FindPlaces(const std::vector<SharedExportsFile>& files, const HostAddresses& hosts, const ExportPaths& paths) {
  PathResolver resolver(paths);
  Places places;
  for (const SharedExportsFile& file : files) AddPlaces(*file, hosts, &resolver, &places);
  return places;
}

Result<ExportList> ReadExports(std::string_view text, const Places& places) {
  const Result<std::vector<ExportTableLine>> lines = ReadExportTable(text);
  if (!lines.ok()) return lines.status();
  ExportList exports;
  for (const ExportTableLine& line : *lines) {
    ExportOptionReader options;
    if (Status status = options.Apply(line.options); !status.ok()) return status;
    TableExport one;
    one.directory = line.path;
    one.client = line.client;
    one.kind = ExportKindOf(one.client);
    one.options = options.Options();
    one.written = one.client;
    const auto place = places.find({one.directory, ExportClientKey(one.client)});
    if (place != places.end()) {
      one.file = place->second.file;
      one.line = place->second.line;
      one.written = place->second.written;
    }
    exports.push_back(std::move(one));
  }
  return exports;
}

std::set<std::string> HostNames(const std::vector<SharedExportsFile>& files) {
  std::set<std::string> names;
  for (const SharedExportsFile& file : files) {
    const auto lines = file->document.Lines();
    for (const ExportLine& line : *lines) {
      for (const ExportEntry& entry : line.entries) {
        if (IsExportHostName(entry.client)) names.insert(ExportClientKey(entry.client));
      }
    }
  }
  return names;
}

// Adds the addresses of the names that `hosts` does not have. Returns the names that have addresses now.
std::set<std::string> AddHosts(const std::set<std::string>& names, const NameService& service, ExportsInForce* result) {
  std::set<std::string> known;
  for (const std::string& name : names) {
    if (result->hosts.count(name) == 0 && !result->is_name_service_away) {
      std::optional<std::vector<std::string>> addresses = service.resolve(name);
      result->is_name_service_away = !addresses.has_value();
      if (addresses && !addresses->empty()) result->hosts[name] = std::move(*addresses);
    }
    if (result->hosts.count(name) != 0) known.insert(name);
  }
  return known;
}

// Returns the addresses of the host of a line of the table; the client of the line if it is no known host name.
// exportfs(8) uses a name of the host also for a rule that names one of its addresses: only this one counts then.
std::vector<std::string> AddressesOf(const ExportTableLine& line, const HostAddresses& addresses,
                                     const Places& places) {
  const std::string key = ExportClientKey(line.client);
  const auto host = addresses.find(key);
  if (host == addresses.end()) return {key};
  std::vector<std::string> named;
  for (const std::string& address : host->second) {
    if (places.count({line.path, address}) != 0) named.push_back(address);
  }
  return named.empty() ? host->second : named;
}

// Returns the table with the addresses of its host names, as a plan lists them, and with the first rule of each host of
// a directory, which counts.
Result<std::string> ByAddress(std::string_view table, const HostAddresses& hosts, const Places& places) {
  const Result<std::vector<ExportTableLine>> lines = ReadExportTable(table);
  if (!lines.ok()) return lines.status();
  std::string text;
  std::set<std::pair<std::string, std::string>> seen;  // directories and addresses
  for (const ExportTableLine& line : *lines) {
    const bool is_name = hosts.count(ExportClientKey(line.client)) != 0;
    for (const std::string& address : AddressesOf(line, hosts, places)) {
      if (!seen.emplace(line.path, address).second) continue;
      text += is_name ? EncodeExportsWord(line.path) + "\t" + address + "(" + std::string(line.options) + ")\n"
                      : std::string(line.text);
    }
  }
  return text;
}

Result<std::set<std::string>> FindPending(const std::vector<SharedExportsFile>& files, std::string_view table,
                                          const ExportPaths& paths, const HostAddresses& hosts, const Places& places) {
  const Result<std::string> by_address = ByAddress(table, hosts, places);
  if (!by_address.ok()) return by_address.status();
  Result<ExportTableUpdate> update = PlanExportTable(files, *by_address, paths, hosts);
  if (!update.ok()) return update.status();
  return std::move(update->changed);
}

}  // namespace

Result<ExportsInForce> ReadExportsInForce(Box& box, const NameService& names, bool is_serving) {
  const Result<std::vector<SharedExportsFile>> files = OpenAllExports(box);
  if (!files.ok()) return files.status();
  const Result<StoredFile> table = box.Read(kExportTable);
  if (!table.ok()) return table.status();
  Result<HostAddresses> hosts = ReadExportHosts(box);
  if (!hosts.ok()) return hosts.status();
  ExportsInForce result;
  result.hosts = std::move(*hosts);
  const std::set<std::string> known = AddHosts(HostNames(*files), names, &result);
  const BoxPaths paths(box.root());
  const Places places = FindPlaces(*files, result.hosts, paths);
  std::string text = table->text;
  if (is_serving) {
    Result<std::set<std::string>> pending = FindPending(*files, text, paths, result.hosts, places);
    if (!pending.ok()) return pending.status();
    result.pending = std::move(*pending);
  } else {
    Result<ExportTableUpdate> update = PlanExportTable(*files, text, paths, result.hosts, known);
    if (!update.ok()) return update.status();
    text = std::move(update->text);
  }
  Result<ExportList> exports = ReadExports(text, places);
  if (!exports.ok()) return exports.status();
  result.exports = std::move(*exports);
  return result;
}

Result<std::set<std::string>> FindPendingExports(const std::vector<SharedExportsFile>& files, std::string_view table,
                                                 const ExportPaths& paths, const HostAddresses& hosts) {
  return FindPending(files, table, paths, hosts, FindPlaces(files, hosts, paths));
}

}  // namespace vorn
