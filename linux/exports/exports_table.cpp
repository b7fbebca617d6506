#include "exports_table.h"

#include <map>
#include <optional>
#include <set>

#include "exports_client.h"

namespace vorn {
namespace {

// The clients of one path, by their keys.
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
  Comparison(const ExportsDocument& file, const ExportsDocument& table, const PathResolver& resolve)
      : file_(file), exported_(ReadTable(table)), resolve_(resolve) {}

  Status Compare() {
    const auto lines = file_.Lines();
    for (const ExportLine& line : lines) {
      if (!line.fault.empty()) return Difference(line, line.fault + "; nothing that follows is exported");
    }
    for (const ExportLine& line : lines) {
      Status status = CompareLine(line);
      if (!status.ok()) return status;
    }
    return {};
  }

 private:
  Status CompareLine(const ExportLine& line) {
    const std::string path = exported_.count(line.path) != 0 ? line.path : resolve_(line.path);
    for (const ExportEntry& entry : line.entries) {
      const std::string key = ExportClientKey(entry.client);
      if (!seen_.emplace(path, key).second) continue;  // of two lines for one client the first counts
      const std::string why = WhyNot(exported_[path], key, entry);
      if (!why.empty()) return Difference(line, entry.client + " " + why);
    }
    return {};
  }

  static std::string WhyNot(const Clients& exported, const std::string& key, const ExportEntry& entry) {
    const auto found = exported.find(key);
    if (found != exported.end())
      return SameAccess(found->second, entry.options) ? "" : "is exported with another access";
    const Status form = CheckExportClient(entry.client);
    if (!form.ok()) return "is not exported: " + form.reason();
    // The table has a host's own name, whatever it is called in the file.
    for (const auto& [name, options] : exported) {
      if (IsExportHostName(entry.client) && IsExportHostName(name) && SameAccess(options, entry.options)) return "";
    }
    return IsExportHostName(entry.client) ? "is not exported: no such host is known" : "is not exported";
  }

  Status Difference(const ExportLine& line, const std::string& what) const {
    return Status::Failure(kServiceFailed, "exports file, line " + std::to_string(file_.LineNumber(line.span.begin)) +
                                               " (" + line.path + "): " + what);
  }

  const ExportsDocument& file_;
  std::map<std::string, Clients> exported_;
  const PathResolver& resolve_;
  std::set<std::pair<std::string, std::string>> seen_;
};

}  // namespace

Status CompareExportTable(const ExportsDocument& file, const ExportsDocument& table, const PathResolver& resolve) {
  return Comparison(file, table, resolve).Compare();
}

}  // namespace vorn
