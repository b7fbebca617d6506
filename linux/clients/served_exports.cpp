#include "served_exports.h"

#include <charconv>
#include <string_view>

#include "host_names.h"
#include "lines.h"

namespace vorn {
namespace {

constexpr char kNoRule[] = "-no-domain-";
constexpr char kService[] = "nfsd";

template <typename Number>
bool ReadNumber(std::string_view text, Number* number) {
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), *number);
  return error == std::errc() && end == text.data() + text.size();
}

using ExportKey = std::pair<std::string, std::string>;

// Reads "/srv/data", "10.0.0.0/24", "65", separated by tabulators.
std::optional<ExportKey> ReadHeading(const std::string& line, std::int64_t* begun) {
  const std::size_t rule = line.find('\t');
  const std::size_t time = line.rfind('\t');
  if (rule == time || !ReadNumber(line.substr(time + 1), begun)) return std::nullopt;
  return ExportKey(UnescapeWord(line.substr(0, rule)), UnescapeWord(line.substr(rule + 1, time - rule - 1)));
}

// Whether the line is "\tname: number".
bool ReadCounter(std::string_view line, std::string_view name, std::uint64_t* number) {
  const std::string begin = "\t" + std::string(name) + ": ";
  return line.substr(0, begin.size()) == begin && ReadNumber(line.substr(begin.size()), number);
}

void ReadAddresses(const std::vector<KernelCache::Entry>& entries, ServedExports* served) {
  for (const KernelCache::Entry& entry : entries) {
    if (entry.words.size() < 3 || entry.words[0] != kService) continue;
    const std::optional<std::string> address = HostAddress(entry.words[1]);
    if (!address) continue;
    if (entry.words[2] == kNoRule) {
      served->refused.insert(*address);
    } else {
      served->rules[*address] = UnescapeWord(entry.words[2]);
    }
  }
}

// "/srv/data client(rw,...)"; without options the rule does not export the path.
void ReadRights(const std::vector<KernelCache::Entry>& entries, ServedExports* served) {
  for (const KernelCache::Entry& entry : entries) {
    const std::size_t options = entry.words.size() < 2 ? std::string::npos : entry.words[1].rfind('(');
    if (options == std::string::npos) continue;
    const std::string rule = UnescapeWord(entry.words[1].substr(0, options));
    const std::string given = "," + entry.words[1].substr(options + 1);
    if (given == ",)") {
      served->unserved[rule].insert(UnescapeWord(entry.words[0]));
    } else if (given.find(",v4root") == std::string::npos) {
      served->paths[rule].insert(UnescapeWord(entry.words[0]));
    }
  }
}

}  // namespace

ExportTraffics ParseExportTraffics(const std::string& text) {
  ExportTraffics traffics;
  std::optional<ExportKey> key;
  ExportTraffic traffic;
  bool has_read = false;
  for (const std::string_view line : LinesOf(text)) {
    if (line.empty() || line[0] == '/') {
      key = line.empty() ? std::nullopt : ReadHeading(std::string(line), &traffic.begun);
      has_read = false;
    }
    if (ReadCounter(line, "io_read", &traffic.bytes_read)) has_read = true;
    if (key && has_read && ReadCounter(line, "io_write", &traffic.bytes_written)) traffics[*key] = traffic;
  }
  return traffics;
}

ServedExports ReadServedExports(const std::vector<KernelCache::Entry>& addresses,
                                const std::vector<KernelCache::Entry>& rights) {
  ServedExports served;
  ReadAddresses(addresses, &served);
  ReadRights(rights, &served);
  return served;
}

}  // namespace vorn
