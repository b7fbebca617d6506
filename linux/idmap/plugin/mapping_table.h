// The compiled form of the static mappings: a sorted table that a daemon searches without parsing idmapd.conf(5).
#ifndef VORN_LINUX_IDMAP_PLUGIN_MAPPING_TABLE_H
#define VORN_LINUX_IDMAP_PLUGIN_MAPPING_TABLE_H

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace vorn {

// The file that the daemons read.
inline constexpr char kMappingTableFile[] = "/var/lib/vorn/idmap/mappings";

// From the principal to the name of a local user.
using Mappings = std::vector<std::pair<std::string, std::string>>;

// The text of a table. Principals are compared as libnfsidmap compares them, without regard to ASCII case; of two
// equal ones the first one counts. Strings contain neither NUL bytes nor line feeds, as in idmapd.conf(5).
//
// The first line has a version and the number of mappings. Each further line is a principal in lower case, a NUL byte
// and a local name; the lines are sorted by principal.
std::string RenderMappingTable(const Mappings& mappings);

// Immutable and thread-safe.
class MappingTable {
 public:
  // nullopt if the text is not a complete table.
  static std::optional<MappingTable> Parse(std::string text);

  // The local name; nullopt if the principal is not mapped. Takes logarithmic time.
  std::optional<std::string_view> Find(std::string_view principal) const;

 private:
  struct Row {
    std::string_view principal;
    std::string_view local_name;
  };

  MappingTable() = default;
  bool AddRow(std::string_view line);

  std::unique_ptr<const std::string> text_;  // the rows point into it
  std::vector<Row> rows_;
};

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_PLUGIN_MAPPING_TABLE_H
