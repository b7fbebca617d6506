// The lines of the table of what is exported, which exportfs(8) and this platform write and rpc.mountd(8) reads.
#ifndef VORN_LINUX_EXPORTS_EXPORT_TABLE_H
#define VORN_LINUX_EXPORTS_EXPORT_TABLE_H

#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

// The table of exportfs ("etab").
constexpr char kExportTable[] = "/var/lib/nfs/etab";

// One client of one directory: "/srv/data<TAB>10.0.0.1(rw,sync,...)". The views are valid as long as the text that was
// read.
struct ExportTableLine {
  std::string_view text;     // the line with its line break
  std::string path;          // without escapes
  std::string_view client;   // "*" for every client
  std::string_view options;  // the list between the parentheses
};

// Returns the lines of the table. Fails with kSyntax if one of them is not a line that exportfs writes. The options are
// not checked.
Result<std::vector<ExportTableLine>> ReadExportTable(std::string_view table);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORT_TABLE_H
