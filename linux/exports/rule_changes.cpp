#include "rule_changes.h"

#include <algorithm>
#include <map>
#include <set>
#include <string_view>
#include <utility>

#include "exports_client.h"

namespace vorn {
namespace {

using Access = RightChange::Access;

// The two directions of a change, for example of a switch that is set or cleared.
struct Direction {
  const char* change;
  Access access;
  const char* text;
};

constexpr Direction kRemoved{"removed", Access::kLess, "loses its rule"};
constexpr Direction kAdded{"added", Access::kMore, "gets a rule"};
constexpr Direction kFlavorRemoved{"flavor_removed", Access::kLess, "loses this security flavour"};
constexpr Direction kFlavorAdded{"flavor_added", Access::kMore, "gets this security flavour"};

// The switches of a client with one flavour: the change if it becomes true, and if it becomes false.
constexpr struct {
  bool ExportAccess::*field;
  Direction on;
  Direction off;
} kSwitches[] = {
    {&ExportAccess::read_only,
     {"read_only", Access::kLess, "becomes read-only"},
     {"read_write", Access::kMore, "may write"}},
    {&ExportAccess::root_squash,
     {"root_squashed", Access::kLess, "its root acts as another account"},
     {"root_not_squashed", Access::kMore, "its root acts as root"}},
    {&ExportAccess::all_squash,
     {"all_squashed", Access::kOther, "all its users act as one account"},
     {"all_not_squashed", Access::kOther, "its users act as themselves"}},
    {&ExportAccess::insecure,
     {"any_port", Access::kMore, "may use any source port"},
     {"reserved_ports_only", Access::kLess, "must use a source port below 1024"}},
};

constexpr struct {
  bool ExportOptions::*field;
  Direction on;
  Direction off;
} kOptions[] = {
    {&ExportOptions::crossmnt,
     {"crossmnt", Access::kMore, "also reaches the file systems that are mounted below"},
     {"no_crossmnt", Access::kLess, "no longer reaches the file systems that are mounted below"}},
    {&ExportOptions::async,
     {"async", Access::kOther, "writes are acknowledged before they are on the disk"},
     {"sync", Access::kOther, "writes are acknowledged when they are on the disk"}},
};

constexpr Direction kOtherAccount{"other_account", Access::kOther, "squashed users act as another account"};
constexpr Direction kOtherOptions{"other_options", Access::kOther, "other options change"};

RightChange Made(const Direction& direction, const std::string& flavor = "") {
  return {direction.change, direction.access, flavor, direction.text};
}

const ExportAccess* FindFlavor(const ExportOptions& options, const std::string& name) {
  const auto found = std::find_if(options.flavors.begin(), options.flavors.end(),
                                  [&](const ExportFlavor& flavor) { return flavor.name == name; });
  return found == options.flavors.end() ? nullptr : &found->access;
}

void CompareFlavors(const ExportOptions& before, const ExportOptions& after, std::vector<RightChange>* rights) {
  for (const ExportFlavor& flavor : before.flavors) {
    if (FindFlavor(after, flavor.name) == nullptr) rights->push_back(Made(kFlavorRemoved, flavor.name));
  }
  for (const ExportFlavor& flavor : after.flavors) {
    const ExportAccess* former = FindFlavor(before, flavor.name);
    if (former == nullptr) {
      rights->push_back(Made(kFlavorAdded, flavor.name));
      continue;
    }
    for (const auto& entry : kSwitches) {
      const bool is_on = flavor.access.*entry.field;
      if (is_on != former->*entry.field) rights->push_back(Made(is_on ? entry.on : entry.off, flavor.name));
    }
  }
}

bool Squashes(const ExportOptions& options) {
  return std::any_of(options.flavors.begin(), options.flavors.end(),
                     [](const ExportFlavor& flavor) { return flavor.access.root_squash || flavor.access.all_squash; });
}

std::vector<RightChange> CompareOptions(const ExportOptions& before, const ExportOptions& after) {
  std::vector<RightChange> rights;
  CompareFlavors(before, after, &rights);
  const bool is_same_account = before.anon_uid == after.anon_uid && before.anon_gid == after.anon_gid;
  if (!is_same_account && Squashes(after)) rights.push_back(Made(kOtherAccount));
  for (const auto& option : kOptions) {
    const bool is_on = after.*option.field;
    if (is_on != before.*option.field) rights.push_back(Made(is_on ? option.on : option.off));
  }
  if (before.others != after.others) rights.push_back(Made(kOtherOptions));
  return rights;
}

// The rules of a directory by client. The order is that of the table, not that of the files.
using Rules = std::map<std::string, ExportEntry>;

Rules RulesOf(const std::string& directory, const ExportsDocument& own,
              const std::vector<const ExportsDocument*>& others, const ExportPaths& paths) {
  Rules rules;
  const auto add = [&](const ExportsDocument& document) {
    for (ExportEntry& entry : document.Entries(directory, paths)) {
      std::string key = ExportClientKey(entry.client);
      rules.try_emplace(std::move(key), std::move(entry));
    }
  };
  add(own);
  for (const ExportsDocument* document : others) add(*document);
  return rules;
}

void CompareDirectory(const std::string& directory, const Rules& before, const Rules& after,
                      std::vector<RuleChange>* changes) {
  for (const auto& [key, entry] : before) {
    if (after.count(key) == 0) changes->push_back({directory, entry.client, {Made(kRemoved)}});
  }
  for (const auto& [key, entry] : after) {
    const auto former = before.find(key);
    if (former == before.end()) {
      changes->push_back({directory, entry.client, {Made(kAdded)}});
      continue;
    }
    std::vector<RightChange> rights = CompareOptions(former->second.options, entry.options);
    if (!rights.empty()) changes->push_back({directory, entry.client, std::move(rights)});
  }
}

std::string_view TextOf(const ExportsDocument& document, const ExportLine& line) {
  const std::string_view text = document.text();
  return text.substr(line.span.begin, line.span.end - line.span.begin);
}

// The directories of the lines that only one of the versions has.
std::set<std::string> ChangedDirectories(const ExportsDocument& before, const ExportsDocument& after,
                                         const ExportPaths& paths) {
  const auto old_lines = before.Lines();
  const auto new_lines = after.Lines();
  std::set<std::string_view> old_texts;
  std::set<std::string_view> new_texts;
  for (const ExportLine& line : *old_lines) old_texts.insert(TextOf(before, line));
  for (const ExportLine& line : *new_lines) new_texts.insert(TextOf(after, line));
  std::set<std::string> directories;
  for (const ExportLine& line : *old_lines) {
    if (new_texts.count(TextOf(before, line)) == 0) directories.insert(paths.Resolve(line.path));
  }
  for (const ExportLine& line : *new_lines) {
    if (old_texts.count(TextOf(after, line)) == 0) directories.insert(paths.Resolve(line.path));
  }
  return directories;
}

}  // namespace

std::vector<RightChange> CompareRights(const ExportOptions* before, const ExportOptions* after) {
  if (before == nullptr && after == nullptr) return {};
  if (before == nullptr) return {Made(kAdded)};
  if (after == nullptr) return {Made(kRemoved)};
  return CompareOptions(*before, *after);
}

std::vector<std::string> AllRightChanges() {
  std::vector<std::string> names;
  for (const Direction& one : {kRemoved, kAdded, kFlavorRemoved, kFlavorAdded, kOtherAccount, kOtherOptions}) {
    names.emplace_back(one.change);
  }
  for (const auto& entry : kSwitches) names.insert(names.end(), {entry.on.change, entry.off.change});
  for (const auto& option : kOptions) names.insert(names.end(), {option.on.change, option.off.change});
  return names;
}

std::vector<RuleChange> CompareRules(const ExportsDocument& before, const ExportsDocument& after,
                                     const std::vector<const ExportsDocument*>& others, const ExportPaths& paths) {
  std::vector<RuleChange> changes;
  for (const std::string& directory : ChangedDirectories(before, after, paths)) {
    CompareDirectory(directory, RulesOf(directory, before, others, paths), RulesOf(directory, after, others, paths),
                     &changes);
  }
  return changes;
}

}  // namespace vorn
