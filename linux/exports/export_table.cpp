#include "export_table.h"

#include <algorithm>
#include <optional>

#include "exports_text.h"

namespace vorn {
namespace {

constexpr std::size_t kNone = std::string_view::npos;

// Reads a path as rpc.mountd(8) does. exportfs(8) escapes the unusual bytes of it.
std::string ReadPath(std::string_view text) {
  if (text.find_first_of("\\\"") == kNone) return std::string(text);
  std::string path;
  const bool is_word = ExportsReader(text).ReadWord(kLongestExportPath, &path) == ExportsReader::Found::kWord;
  return is_word ? NormalExportPath(path) : std::string(text);
}

std::optional<ExportTableLine> ReadLine(std::string_view text) {
  const std::size_t tab = text.find('\t');
  if (tab == kNone) return std::nullopt;
  const std::size_t open = text.find('(', tab);
  const std::size_t close = text.rfind(')');
  if (open == kNone || close == kNone || close < open) return std::nullopt;
  const std::string_view client = text.substr(tab + 1, open - tab - 1);
  return ExportTableLine{text, ReadPath(text.substr(0, tab)), client.empty() ? "*" : client,
                         text.substr(open + 1, close - open - 1)};
}

}  // namespace

Result<std::vector<ExportTableLine>> ReadExportTable(std::string_view table) {
  std::vector<ExportTableLine> lines;
  lines.reserve(static_cast<std::size_t>(std::count(table.begin(), table.end(), '\n')) + 1);
  while (!table.empty()) {
    const std::size_t newline = table.find('\n');
    const std::string_view text = table.substr(0, newline == kNone ? table.size() : newline + 1);
    table.remove_prefix(text.size());
    std::optional<ExportTableLine> line = ReadLine(text);
    if (!line) return Status::Failure(kSyntax, std::string(kExportTable) + ": unexpected line: " + std::string(text));
    lines.push_back(std::move(*line));
  }
  return lines;
}

}  // namespace vorn
