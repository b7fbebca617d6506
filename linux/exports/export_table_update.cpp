#include "export_table_update.h"

#include <algorithm>
#include <iterator>
#include <memory>
#include <optional>
#include <unordered_map>
#include <utility>

#include "export_table.h"
#include "exports_client.h"
#include "exports_text.h"
#include "path_resolver.h"

namespace vorn {
namespace {

// Words of an option list that contradict each other, of which the last one counts. The first one is the default.
constexpr std::pair<std::string_view, std::string_view> kOpposites[] = {
    {"hide", "nohide"},
    {"wdelay", "no_wdelay"},
    {"no_subtree_check", "subtree_check"},
    {"secure_locks", "insecure_locks"},
    {"acl", "no_acl"},
    {"no_pnfs", "pnfs"},
};

// Words of one meaning; exportfs(8) writes the second one into the table.
constexpr std::pair<std::string_view, std::string_view> kSynonyms[] = {
    {"auth_nlm", "secure_locks"},
    {"no_auth_nlm", "insecure_locks"},
    {"mp", "mountpoint"},
    {"fsid=root", "fsid=0"},
};

std::string_view UsualWord(std::string_view word) {
  for (const auto& [synonym, usual] : kSynonyms) {
    if (word == synonym) return usual;
  }
  return word;
}

// The other words of an option list in one order, without those that say what is the case anyway.
std::vector<std::string> EffectiveWords(const std::vector<std::string>& words) {
  std::map<std::string_view, std::string_view> effective;
  for (const std::string& written : words) {
    const std::string_view word = UsualWord(written);
    std::string_view name = word.substr(0, word.find('='));
    std::string_view value = word;
    for (const auto& [usual, unusual] : kOpposites) {
      if (word != usual && word != unusual) continue;
      name = usual;
      value = word == usual ? "" : word;
    }
    effective[name] = value;
  }
  std::vector<std::string> result;
  for (const auto& [name, value] : effective) {
    if (!value.empty()) result.emplace_back(value);
  }
  return result;
}

// Numbers option lists, so that two lists of one meaning have one number.
class OptionLists {
 public:
  int NumberOf(ExportOptions options) {
    options.others = EffectiveWords(options.others);
    return numbers_.try_emplace(options.Text(), static_cast<int>(numbers_.size())).first->second;
  }

  // The number of a list in the text of the table; nullopt if it is not one. `list` must stay where it is.
  std::optional<int> NumberOf(std::string_view list) {
    const auto known = lists_.find(list);
    if (known != lists_.end()) return known->second;
    ExportOptionReader reader;
    if (!reader.Apply(list).ok()) return std::nullopt;
    return lists_[list] = NumberOf(reader.Options());
  }

 private:
  std::unordered_map<std::string, int> numbers_;
  std::unordered_map<std::string_view, int> lists_;
};

// exportfs(8) writes the clients of a path by kind, in this order, and those of one kind in the order of the files.
enum class ClientKind { kName, kAddress, kNetwork, kPattern, kNetgroup, kEverybody };

ClientKind KindOf(std::string_view client) {
  if (client == "*") return ClientKind::kEverybody;
  if (client.substr(0, 1) == "@") return ClientKind::kNetgroup;
  if (client.find_first_of("*?[") != std::string_view::npos) return ClientKind::kPattern;
  if (client.find('/') != std::string_view::npos) return ClientKind::kNetwork;
  return IsExportHostName(client) ? ClientKind::kName : ClientKind::kAddress;
}

// One client of one path, in the table or for it.
struct Grant {
  std::string client;
  std::string key;  // ExportClientKey
  ClientKind kind = ClientKind::kAddress;
  int options = 0;        // their number
  std::string_view line;  // of the table, with its line break
  std::string word;       // for a new line
};

Grant MakeGrant(std::string client, int options) {
  Grant grant;
  grant.key = ExportClientKey(client);
  grant.kind = KindOf(client);
  grant.client = std::move(client);
  grant.options = options;
  return grant;
}

using Grants = std::vector<Grant>;
using Table = std::unordered_map<std::string, Grants>;

// The table, as it was read.
struct TableText {
  Table grants;
  std::vector<std::string> paths;  // in the order of their first lines
};

Result<TableText> ReadTable(std::string_view text, OptionLists* options) {
  Result<std::vector<ExportTableLine>> lines = ReadExportTable(text);
  if (!lines.ok()) return lines.status();
  TableText table;
  for (ExportTableLine& line : *lines) {
    const std::optional<int> number = options->NumberOf(line.options);
    if (!number) {
      return Status::Failure(kSyntax, std::string(kExportTable) + ": unexpected line: " + std::string(line.text));
    }
    Grant grant = MakeGrant(std::string(line.client), *number);
    grant.line = line.text;
    Grants& grants = table.grants[line.path];
    if (grants.empty()) table.paths.push_back(std::move(line.path));
    grants.push_back(std::move(grant));
  }
  return table;
}

// The rules of the files for one directory.
struct Rules {
  std::vector<std::pair<const ExportEntry*, int>> entries;  // with the number of their options
  bool has_fault = false;
};

class Planner {
 public:
  Planner(const ExportPaths& paths, const HostAddresses& hosts, const std::set<std::string>& resolved)
      : paths_(paths), hosts_(hosts), resolved_(resolved) {}

  Result<ExportTableUpdate> Plan(const std::vector<SharedExportsFile>& files, std::string_view text) {
    Result<TableText> table = ReadTable(text, &options_);
    if (!table.ok()) return table.status();
    for (const SharedExportsFile& file : files) ReadFile(*file);
    update_.text.reserve(text.size() + 4096);
    for (const std::string& path : table->paths) UpdatePath(path, std::move(table->grants[path]));
    for (const std::string& path : order_) {
      if (table->grants.count(path) == 0) UpdatePath(path, {});
    }
    for (const auto& [client, balance] : clients_) {
      const auto& [before, after] = balance;
      if ((before == 0) != (after == 0)) update_.clients.insert(client);
    }
    return std::move(update_);
  }

 private:
  void ReadFile(const ExportsFile& file) {
    lines_.push_back(file.document.Lines());
    for (const ExportLine& line : *lines_.back()) {
      const std::string path = resolver_.Resolve(line.path);
      if (line.fault) {
        faulty_ += file.document.text().substr(line.span.begin, line.span.end - line.span.begin);
        rules_[path].has_fault = true;
        continue;
      }
      Rules& rules = rules_[path];
      if (rules.entries.empty()) order_.push_back(path);
      for (const ExportEntry& entry : line.entries)
        rules.entries.emplace_back(&entry, options_.NumberOf(entry.options));
    }
  }

  // A faulty line is not understood, so every directory that it names may be meant.
  bool IsKept(const std::string& path, const Rules& rules) const {
    return rules.has_fault || (!faulty_.empty() && faulty_.find(path) != std::string::npos);
  }

  void UpdatePath(const std::string& path, Grants before) {
    const Rules& rules = rules_[path];
    SortByKind(&before);
    Grants after = Wanted(rules, before);
    if (IsKept(path, rules)) AddMissing(before, &after);
    Count(before, after);
    if (!after.empty()) update_.exported.insert(path);
    if (IsSame(before, after)) {
      for (const Grant& grant : before) update_.text += grant.line;
      return;
    }
    update_.changed.insert(path);
    if (after.empty()) update_.left.insert(path);
    const std::string encoded = EncodeExportsWord(path);
    for (const Grant& grant : after) {
      if (grant.line.empty()) {
        update_.text += encoded + "\t" + grant.word + "\n";
      } else {
        update_.text += grant.line;
      }
    }
  }

  // Returns the grants of the rules, each client once. A grant that the table has is taken from there.
  Grants Wanted(const Rules& rules, const Grants& before) {
    Grants wanted;
    std::set<std::string> seen;
    const auto add = [&](const std::string& client, int options, const ExportEntry& entry) {
      Grant grant = MakeGrant(client, options);
      if (!seen.insert(grant.key).second) return;
      const auto same = std::find_if(before.begin(), before.end(), [&grant](const Grant& present) {
        return present.key == grant.key && present.options == grant.options;
      });
      if (same != before.end())
        grant.line = same->line;
      else
        grant.word = EncodeExportsWord(client + "(" + entry.options.Text() + ")");
      wanted.push_back(std::move(grant));
    };
    bool keeps_names = false;
    for (const auto& [entry, options] : rules.entries) {
      if (!IsExportHostName(entry->client)) {
        add(entry->client, options, *entry);
        continue;
      }
      for (const std::string& client : ClientsOfName(entry->client, before)) add(client, options, *entry);
      keeps_names = keeps_names || AddressesOf(entry->client).empty();
    }
    // The table lists a host by its canonical name, which may be the name of a rule whose address is not known.
    for (const Grant& grant : before) {
      const bool is_wanted = keeps_names && grant.kind == ClientKind::kName && HasOptions(rules, grant.options);
      if (is_wanted && seen.insert(grant.key).second) wanted.push_back(grant);
    }
    SortByKind(&wanted);
    return wanted;
  }

  static bool HasOptions(const Rules& rules, int number) {
    return std::any_of(rules.entries.begin(), rules.entries.end(), [number](const auto& rule) {
      return rule.second == number && IsExportHostName(rule.first->client);
    });
  }

  std::vector<std::string> AddressesOf(const std::string& name) const {
    const auto found = hosts_.find(ExportClientKey(name));
    return found == hosts_.end() ? std::vector<std::string>() : found->second;
  }

  // Returns how the table is to name the host of a rule; empty if that is not known.
  std::vector<std::string> ClientsOfName(const std::string& name, const Grants& before) {
    const std::string key = ExportClientKey(name);
    update_.names.insert(key);
    std::vector<std::string> addresses = AddressesOf(name);
    const auto is_served = [&before](const std::string& client) {
      const std::string served = ExportClientKey(client);
      return std::any_of(before.begin(), before.end(), [&served](const Grant& grant) { return grant.key == served; });
    };
    const bool by_name = is_served(name);
    const bool by_address = std::any_of(addresses.begin(), addresses.end(), is_served);
    const bool is_fresh = resolved_.count(key) != 0;
    if (addresses.empty() || (!by_name && !by_address && !is_fresh)) update_.unresolved.insert(key);
    if (addresses.empty()) return by_name ? std::vector<std::string>{name} : std::vector<std::string>();
    return by_name || by_address || is_fresh ? addresses : std::vector<std::string>();
  }

  static void AddMissing(const Grants& before, Grants* after) {
    for (const Grant& grant : before) {
      const auto is_same = [&grant](const Grant& other) { return other.key == grant.key; };
      if (std::none_of(after->begin(), after->end(), is_same)) after->push_back(grant);
    }
    SortByKind(after);
  }

  // The order counts for clients that may overlap. Host names do not.
  static void SortByKind(Grants* grants) {
    std::stable_sort(grants->begin(), grants->end(), [](const Grant& a, const Grant& b) {
      if (a.kind != b.kind) return a.kind < b.kind;
      return a.kind == ClientKind::kName && a.key < b.key;
    });
  }

  static bool IsSame(const Grants& before, const Grants& after) {
    return std::equal(before.begin(), before.end(), after.begin(), after.end(),
                      [](const Grant& a, const Grant& b) { return a.key == b.key && a.options == b.options; });
  }

  void Count(const Grants& before, const Grants& after) {
    for (const Grant& grant : before) ++clients_[grant.client].first;
    for (const Grant& grant : after) ++clients_[grant.client].second;
  }

  const ExportPaths& paths_;
  const HostAddresses& hosts_;
  const std::set<std::string>& resolved_;
  OptionLists options_;
  PathResolver resolver_{paths_};
  std::vector<std::shared_ptr<const std::vector<ExportLine>>> lines_;  // rules_ refers to their entries
  std::unordered_map<std::string, Rules> rules_;
  std::vector<std::string> order_;                                // of the paths in the files
  std::string faulty_;                                            // the text of all faulty lines
  std::unordered_map<std::string, std::pair<int, int>> clients_;  // how many grants each has before and after
  ExportTableUpdate update_;
};

}  // namespace

Result<ExportTableUpdate> PlanExportTable(const std::vector<SharedExportsFile>& files, std::string_view table,
                                          const ExportPaths& paths, const HostAddresses& hosts,
                                          const std::set<std::string>& resolved) {
  return Planner(paths, hosts, resolved).Plan(files, table);
}

}  // namespace vorn
