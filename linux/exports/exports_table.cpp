#include "exports_table.h"

#include <map>
#include <set>
#include <string>
#include <utility>

#include "exports_client.h"

namespace vorn {
namespace {

// The clients of one path by their keys (ExportClientKey).
using Clients = std::map<std::string, ExportOptions>;

std::map<std::string, Clients> ReadTable(const ExportsDocument& table) {
  std::map<std::string, Clients> paths;
  for (const ExportLine& line : table.Lines()) {
    for (const ExportEntry& entry : line.entries) {
      paths[line.path].emplace(ExportClientKey(entry.client), entry.options);
    }
  }
  return paths;
}

bool SameAccess(ExportOptions a, ExportOptions b) {
  a.others.clear();  // the table has more of them, also those that mean nothing
  b.others.clear();
  return a == b;
}

class Comparison {
 public:
  Comparison(const ExportsDocument& table, const ExportPaths& paths) : exported_(ReadTable(table)), paths_(paths) {}

  Status Compare(const ExportsFile& file) {
    const std::vector<ExportLine> lines = file.document.Lines();
    for (const ExportLine& line : lines) {
      if (line.fault && line.fault->ends_file) {
        return Failure(file.Place(line.fault->position), line.fault->reason + "; nothing that follows is exported");
      }
    }
    for (const ExportLine& line : lines) {
      Status status = CompareLine(file, line);
      if (!status.ok()) return status;
    }
    return {};
  }

 private:
  Status CompareLine(const ExportsFile& file, const ExportLine& line) {
    // exportfs keeps a path that does not exist as it is written.
    const std::string path = exported_.count(line.path) != 0 ? line.path : paths_.Resolve(line.path);
    for (const ExportEntry& entry : line.entries) {
      const std::string key = ExportClientKey(entry.client);
      if (!seen_.emplace(path, key).second) continue;  // of two rules for one client the first counts
      const std::string why = WhyNot(exported_[path], key, entry);
      if (!why.empty()) return Failure(file.Place(line.span.path), line.path + ": " + entry.client + " " + why);
    }
    return {};
  }

  static std::string WhyNot(const Clients& exported, const std::string& key, const ExportEntry& entry) {
    const auto found = exported.find(key);
    if (found != exported.end())
      return SameAccess(found->second, entry.options) ? "" : "is exported with another access";
    const Status form = CheckExportClient(entry.client);
    if (!form.ok()) return "is not exported: " + form.reason();
    // etab lists a host by its canonical name, which may differ from the name in the file.
    for (const auto& [name, options] : exported) {
      if (IsExportHostName(entry.client) && IsExportHostName(name) && SameAccess(options, entry.options)) return "";
    }
    return IsExportHostName(entry.client) ? "is not exported: no such host is known" : "is not exported";
  }

  static Status Failure(const std::string& place, const std::string& what) {
    return Status::Failure(kServiceFailed, place + ": " + what);
  }

  std::map<std::string, Clients> exported_;
  const ExportPaths& paths_;
  std::set<std::pair<std::string, std::string>> seen_;
};

}  // namespace

Status CompareExportTable(const std::vector<SharedExportsFile>& files, const ExportsDocument& table,
                          const ExportPaths& paths) {
  Comparison comparison(table, paths);
  for (const SharedExportsFile& file : files) {
    Status status = comparison.Compare(*file);
    if (!status.ok()) return status;
  }
  return {};
}

}  // namespace vorn
