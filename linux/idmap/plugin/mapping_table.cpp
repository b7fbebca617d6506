#include "mapping_table.h"

#include <algorithm>

#include "ascii.h"

namespace vorn {
namespace {

constexpr char kVersion[] = "vorn-idmap 1 ";

std::string Heading(std::size_t count) { return kVersion + std::to_string(count); }

// Takes the next line, without its line feed; nullopt if there is no complete line.
std::optional<std::string_view> TakeLine(std::string_view* rest) {
  const std::size_t end = rest->find('\n');
  if (end == std::string_view::npos) return std::nullopt;
  const std::string_view line = rest->substr(0, end);
  rest->remove_prefix(end + 1);
  return line;
}

}  // namespace

std::string RenderMappingTable(const Mappings& mappings) {
  Mappings rows = mappings;
  for (auto& row : rows) row.first = LowerAscii(row.first);
  const auto is_before = [](const auto& a, const auto& b) { return a.first < b.first; };
  const auto is_equal = [](const auto& a, const auto& b) { return a.first == b.first; };
  std::stable_sort(rows.begin(), rows.end(), is_before);
  rows.erase(std::unique(rows.begin(), rows.end(), is_equal), rows.end());
  std::string text = Heading(rows.size()) + '\n';
  for (const auto& [principal, local_name] : rows) text.append(principal).append(1, '\0').append(local_name) += '\n';
  return text;
}

std::optional<MappingTable> MappingTable::Parse(std::string text) {
  MappingTable table;
  table.text_ = std::make_unique<const std::string>(std::move(text));
  std::string_view rest = *table.text_;
  const std::optional<std::string_view> heading = TakeLine(&rest);
  while (const std::optional<std::string_view> line = TakeLine(&rest)) {
    if (!table.AddRow(*line)) return std::nullopt;
  }
  if (!heading || !rest.empty() || *heading != Heading(table.rows_.size())) return std::nullopt;
  return table;
}

bool MappingTable::AddRow(std::string_view line) {
  const std::size_t separator = line.find('\0');
  if (separator == std::string_view::npos) return false;
  const Row row{line.substr(0, separator), line.substr(separator + 1)};
  if (!rows_.empty() && rows_.back().principal >= row.principal) return false;
  rows_.push_back(row);
  return true;
}

std::optional<std::string_view> MappingTable::Find(std::string_view principal) const {
  const std::string wanted = LowerAscii(principal);
  const auto row = std::lower_bound(rows_.begin(), rows_.end(), wanted,
                                    [](const Row& a, const std::string& b) { return a.principal < b; });
  if (row == rows_.end() || row->principal != wanted) return std::nullopt;
  return row->local_name;
}

}  // namespace vorn
