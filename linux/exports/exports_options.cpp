#include "exports_options.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdlib>
#include <utility>

namespace vorn {
namespace {

constexpr int kNobody = 65534;

struct AccessSwitch {
  std::string_view word;
  bool ExportAccess::*field;
  bool value;
};

constexpr std::array<AccessSwitch, 8> kAccessSwitches = {{{"ro", &ExportAccess::read_only, true},
                                                          {"rw", &ExportAccess::read_only, false},
                                                          {"root_squash", &ExportAccess::root_squash, true},
                                                          {"no_root_squash", &ExportAccess::root_squash, false},
                                                          {"all_squash", &ExportAccess::all_squash, true},
                                                          {"no_all_squash", &ExportAccess::all_squash, false},
                                                          {"secure", &ExportAccess::insecure, false},
                                                          {"insecure", &ExportAccess::insecure, true}}};

struct OptionSwitch {
  std::string_view word;
  bool ExportOptions::*field;
  bool value;
};

constexpr std::array<OptionSwitch, 4> kOptionSwitches = {{{"sync", &ExportOptions::async, false},
                                                          {"async", &ExportOptions::async, true},
                                                          {"crossmnt", &ExportOptions::crossmnt, true},
                                                          {"nocrossmnt", &ExportOptions::crossmnt, false}}};

constexpr std::array<std::string_view, 19> kOtherWords = {
    "hide",     "nohide",      "wdelay",       "no_wdelay",      "subtree_check", "no_subtree_check",
    "auth_nlm", "no_auth_nlm", "secure_locks", "insecure_locks", "acl",           "no_acl",
    "pnfs",     "no_pnfs",     "nordirplus",   "security_label", "mountpoint",    "mp",
    "fsid=root"};

constexpr std::array<std::string_view, 4> kFreePrefixes = {"mountpoint=", "mp=", "refer=", "replicas="};

// Names whose value exportfs(8) checks.
constexpr std::array<std::string_view, 6> kCheckedNames = {"anonuid", "anongid",     "sec",
                                                           "fsid",    "squash_uids", "squash_gids"};

constexpr std::array<std::pair<std::string_view, std::string_view>, 7> kFlavors = {{{"sys", "sys"},
                                                                                    {"unix", "sys"},
                                                                                    {"krb5", "krb5"},
                                                                                    {"krb5i", "krb5i"},
                                                                                    {"krb5p", "krb5p"},
                                                                                    {"none", "none"},
                                                                                    {"null", "none"}}};

bool StartsWith(std::string_view text, std::string_view prefix) { return text.substr(0, prefix.size()) == prefix; }

// Reads a number as strtol(3) does. Returns whether all of `text` is the number.
bool ReadNumber(const std::string& text, int base, int* number) {
  char* end = nullptr;
  *number = static_cast<int>(std::strtol(text.c_str(), &end, base));
  return !text.empty() && *end == '\0';
}

// Whether `text` is a file system's number, or a UUID: 32 hexadecimal digits with any other characters between them.
bool IsFileSystemID(const std::string& text) {
  int number = 0;
  const auto is_hex = [](unsigned char c) { return std::isxdigit(c) != 0; };
  return ReadNumber(text, 0, &number) || std::count_if(text.begin(), text.end(), is_hex) == 32;
}

// Whether `text` is an id or a range of ids. Either number may be missing, and may begin with a minus sign.
bool IsIDRange(std::string_view text) {
  for (int part = 0; part < 2; ++part) {
    if (!text.empty() && text[0] == '-') text.remove_prefix(1);
    text.remove_prefix(std::min(text.find_first_not_of("0123456789"), text.size()));
  }
  return text.empty();
}

template <typename Table>
bool Contains(const Table& table, std::string_view name) {
  return std::find(table.begin(), table.end(), name) != table.end();
}

template <typename Switches>
bool HasSwitch(const Switches& switches, std::string_view name) {
  return std::any_of(switches.begin(), switches.end(), [name](const auto& s) { return s.word == name; });
}

// Whether `word` is "name=value" with a name that this version does not know.
bool IsUnknownSetting(std::string_view word) {
  const std::string_view name = word.substr(0, std::min(word.find('='), word.size()));
  const auto in_name = [](unsigned char c) { return std::isalnum(c) != 0 || c == '_' || c == '-'; };
  if (name.empty() || name.size() == word.size() || !std::all_of(name.begin(), name.end(), in_name)) return false;
  return !Contains(kCheckedNames, name) && !Contains(kOtherWords, name) && !HasSwitch(kAccessSwitches, name) &&
         !HasSwitch(kOptionSwitches, name);
}

bool IsOtherWord(const std::string& word) {
  if (Contains(kOtherWords, word) || IsUnknownSetting(word)) return true;
  const auto begins = [&word](std::string_view prefix) { return StartsWith(word, prefix); };
  if (std::any_of(kFreePrefixes.begin(), kFreePrefixes.end(), begins)) return true;
  if (begins("fsid=")) return IsFileSystemID(word.substr(5));
  return (begins("squash_uids=") || begins("squash_gids=")) && IsIDRange(std::string_view{word}.substr(12));
}

void AppendWord(std::string* list, std::string_view word) {
  if (!list->empty()) list->push_back(',');
  list->append(word);
}

void AppendAccess(std::string* list, const ExportAccess& access) {
  AppendWord(list, access.read_only ? "ro" : "rw");
  AppendWord(list, access.root_squash ? "root_squash" : "no_root_squash");
  AppendWord(list, access.all_squash ? "all_squash" : "no_all_squash");
  AppendWord(list, access.insecure ? "insecure" : "secure");
}

// Appends flavours that differ, each with its access: "sec=krb5:krb5i,rw,...,sec=sys,ro,...".
void AppendFlavors(std::string* list, const std::vector<ExportFlavor>& flavors) {
  for (std::size_t i = 0; i < flavors.size(); ++i) {
    const bool last_of_its_kind = i + 1 == flavors.size() || !(flavors[i].access == flavors[i + 1].access);
    if (i > 0 && flavors[i].access == flavors[i - 1].access) {
      list->append(":" + flavors[i].name);
    } else {
      AppendWord(list, "sec=" + flavors[i].name);
    }
    if (last_of_its_kind) AppendAccess(list, flavors[i].access);
  }
}

}  // namespace

bool operator==(const ExportAccess& a, const ExportAccess& b) {
  return a.read_only == b.read_only && a.root_squash == b.root_squash && a.all_squash == b.all_squash &&
         a.insecure == b.insecure;
}

bool operator==(const ExportFlavor& a, const ExportFlavor& b) { return a.name == b.name && a.access == b.access; }

bool operator==(const ExportOptions& a, const ExportOptions& b) {
  return a.flavors == b.flavors && a.async == b.async && a.crossmnt == b.crossmnt && a.anon_uid == b.anon_uid &&
         a.anon_gid == b.anon_gid && a.others == b.others;
}

bool ExportOptions::HasOneAccess() const {
  return std::all_of(flavors.begin(), flavors.end(), [this](const auto& f) { return f.access == flavors[0].access; });
}

std::string ExportOptions::Text() const {
  std::string list;
  if (HasOneAccess()) AppendWord(&list, flavors[0].access.read_only ? "ro" : "rw");
  AppendWord(&list, async ? "async" : "sync");
  if (HasOneAccess() && flavors[0].access.insecure) AppendWord(&list, "insecure");
  if (crossmnt) AppendWord(&list, "crossmnt");
  for (const std::string& word : others) AppendWord(&list, word);
  if (HasOneAccess()) {
    AppendWord(&list, flavors[0].access.root_squash ? "root_squash" : "no_root_squash");
    if (flavors[0].access.all_squash) AppendWord(&list, "all_squash");
  }
  if (anon_uid != kNobody) AppendWord(&list, "anonuid=" + std::to_string(anon_uid));
  if (anon_gid != kNobody) AppendWord(&list, "anongid=" + std::to_string(anon_gid));
  if (!HasOneAccess()) {
    AppendFlavors(&list, flavors);
    return list;
  }
  for (std::size_t i = 0; i < flavors.size(); ++i) list.append(i == 0 ? ",sec=" : ":").append(flavors[i].name);
  return list;
}

Status ExportOptionReader::Apply(std::string_view list) {
  current_.clear();
  for (;;) {
    list.remove_prefix(std::min(list.find_first_not_of(" \t"), list.size()));
    if (list.empty()) return {};
    const std::size_t end = std::min(list.find(','), list.size());
    const std::string word(list.substr(0, end));
    Status status = ApplyWord(word);
    if (!status.ok()) return status;
    list.remove_prefix(std::min(end + 1, list.size()));
  }
}

Status ExportOptionReader::ApplyWord(const std::string& word) {
  if (ApplySwitch(word)) return {};
  if (StartsWith(word, "sec=")) return ApplyFlavors(word.substr(4));
  if (StartsWith(word, "anonuid=") && ReadNumber(word.substr(8), 10, &options_.anon_uid)) return {};
  if (StartsWith(word, "anongid=") && ReadNumber(word.substr(8), 10, &options_.anon_gid)) return {};
  if (!IsOtherWord(word)) return Status::Failure(kSyntax, "no such export option: \"" + word + "\"");
  options_.others.push_back(word);
  return {};
}

bool ExportOptionReader::ApplySwitch(std::string_view word) {
  for (const OptionSwitch& s : kOptionSwitches) {
    if (s.word == word) {
      options_.*s.field = s.value;
      return true;
    }
  }
  for (const AccessSwitch& s : kAccessSwitches) {
    if (s.word != word) continue;
    access_.*s.field = s.value;
    for (const std::size_t index : current_) options_.flavors[index].access.*s.field = s.value;
    return true;
  }
  return false;
}

Status ExportOptionReader::ApplyFlavors(const std::string& names) {
  current_.clear();
  for (std::size_t begin = 0; begin <= names.size();) {
    const std::size_t end = std::min(names.find(':', begin), names.size());
    const std::string name = names.substr(begin, end - begin);
    const auto known = std::find_if(kFlavors.begin(), kFlavors.end(), [&](const auto& f) { return f.first == name; });
    if (known == kFlavors.end()) return Status::Failure(kSyntax, "no such security flavour: \"" + name + "\"");
    auto& all = options_.flavors;
    const auto same = std::find_if(all.begin(), all.end(), [&](const auto& f) { return f.name == known->second; });
    current_.push_back(static_cast<std::size_t>(same - all.begin()));
    if (same == all.end()) all.push_back({std::string(known->second), access_});
    begin = end + 1;
  }
  return {};
}

ExportOptions ExportOptionReader::Options() const {
  ExportOptions options = options_;
  if (options.flavors.empty()) options.flavors.push_back({"sys", access_});
  return options;
}

}  // namespace vorn
