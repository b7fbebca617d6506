#include "exports_rule.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <memory>
#include <utility>

#include "platform_settings.h"
#include "unicode.h"
#include "users.h"

namespace vorn {
namespace {

constexpr std::array<std::pair<const char*, std::int32_t ExportRule::*>, 4> kRuleFlavors = {
    {{"sys", &ExportRule::sys},
     {"krb5", &ExportRule::krb5},
     {"krb5i", &ExportRule::krb5i},
     {"krb5p", &ExportRule::krb5p}}};

std::optional<AccountIDs> FindIDs(const Accounts& accounts, const std::string& name) {
  const std::optional<Account> account = FindAccount(accounts, name);
  if (!account) return std::nullopt;
  return AccountIDs{static_cast<int>(account->user_id), static_cast<int>(account->group_id)};
}

// Returns the widest access that any flavour has, option by option. all_squash squashes root, too.
ExportAccess WidestAccess(const ExportOptions& options) {
  ExportAccess widest{true, true, true, false};
  for (const auto& [name, access] : options.flavors) {
    widest.read_only = widest.read_only && access.read_only;
    widest.root_squash = widest.root_squash && (access.root_squash || access.all_squash);
    widest.all_squash = widest.all_squash && access.all_squash;
    widest.insecure = widest.insecure || access.insecure;
  }
  return widest;
}

std::int32_t SquashOf(const ExportOptions& options, const SquashAccounts& accounts) {
  const ExportAccess access = WidestAccess(options);
  if (access.all_squash) return VORNNFS_SQUASH_ALL_ADMIN;
  if (!access.root_squash) return VORNNFS_SQUASH_ROOT;
  const auto& admin = accounts.admin;
  const bool to_admin = admin && options.anon_uid == admin->user && options.anon_gid == admin->group;
  return to_admin ? VORNNFS_SQUASH_ADMIN : VORNNFS_SQUASH_GUEST;
}

bool SameRule(const ExportRule& a, const ExportRule& b) {
  return std::strcmp(a.client, b.client) == 0 && a.privilege == b.privilege && a.squash == b.squash &&
         a.write_mode == b.write_mode && a.insecure == b.insecure && a.crossmnt == b.crossmnt && a.krb5 == b.krb5 &&
         a.krb5i == b.krb5i && a.krb5p == b.krb5p && a.sys == b.sys;
}

Status Refuse(const ExportRule& rule, const std::string& why) {
  return Status::Failure(kRefusedText, "export rule of \"" + std::string(rule.client) + "\": " + why);
}

Status CheckFields(const ExportRule& rule) {
  const auto is_switch = [](std::int32_t value) { return value == 0 || value == 1; };
  const std::int32_t switches[] = {rule.privilege, rule.write_mode, rule.insecure, rule.crossmnt,
                                   rule.sys,       rule.krb5,       rule.krb5i,    rule.krb5p};
  if (!std::all_of(std::begin(switches), std::end(switches), is_switch))
    return Refuse(rule, "a field is neither 0 nor 1");
  if (rule.squash < VORNNFS_SQUASH_ROOT || rule.squash > VORNNFS_SQUASH_ALL_ADMIN) {
    return Refuse(rule, "there is no such squash mode");
  }
  return {};
}

bool IsSquashedAlike(const std::vector<ExportFlavor>& flavors) {
  const ExportAccess& first = flavors.front().access;
  return std::all_of(flavors.begin(), flavors.end(), [&first](const ExportFlavor& flavor) {
    return flavor.access.root_squash == first.root_squash && flavor.access.all_squash == first.all_squash;
  });
}

std::string MissingAccount(bool is_guest, const SquashAccounts& accounts) {
  return "the box has no account \"" + (is_guest ? accounts.guest_name : accounts.admin_name) +
         "\"; create it, or change the setting " + (is_guest ? "guest_account" : "admin_account") +
         " in /etc/vorn/platform.conf";
}

Status SetSquash(const ExportRule& rule, const SquashAccounts& accounts, ExportOptions* options) {
  if (!IsSquashedAlike(options->flavors)) {
    return Refuse(rule, "its security flavours have different squash options; only the exports file can change them");
  }
  for (ExportFlavor& flavor : options->flavors) {
    flavor.access.root_squash = rule.squash != VORNNFS_SQUASH_ROOT;
    flavor.access.all_squash = rule.squash == VORNNFS_SQUASH_ALL_ADMIN;
  }
  const ExportOptions defaults;
  options->anon_uid = defaults.anon_uid;
  options->anon_gid = defaults.anon_gid;
  if (rule.squash == VORNNFS_SQUASH_ROOT) return {};
  const bool is_guest = rule.squash == VORNNFS_SQUASH_GUEST;
  const auto& account = is_guest ? accounts.guest : accounts.admin;
  if (!account) return Refuse(rule, MissingAccount(is_guest, accounts));
  options->anon_uid = account->user;
  options->anon_gid = account->group;
  return {};
}

bool HasFlavor(const std::vector<ExportFlavor>& flavors, const std::string& name) {
  return std::any_of(flavors.begin(), flavors.end(),
                     [&name](const ExportFlavor& flavor) { return flavor.name == name; });
}

// Makes the flavours those of the rule, and those that the rule has no field for. Flavours that stay keep their
// order, in which the server offers them; new ones follow.
Status SetFlavors(const ExportRule& rule, ExportOptions* options) {
  std::vector<ExportFlavor> flavors;
  for (const ExportFlavor& flavor : options->flavors) {
    const auto field = std::find_if(kRuleFlavors.begin(), kRuleFlavors.end(),
                                    [&flavor](const auto& known) { return known.first == flavor.name; });
    if (field == kRuleFlavors.end() || rule.*field->second != 0) flavors.push_back(flavor);
  }
  for (const auto& [name, field] : kRuleFlavors) {
    if (rule.*field == 0 || HasFlavor(flavors, name)) continue;
    if (!options->HasOneAccess()) {
      return Refuse(rule, "the access of its security flavours differs; only the exports file can add \"" +
                              std::string(name) + "\"");
    }
    flavors.push_back({name, options->flavors.front().access});
  }
  if (flavors.empty()) return Refuse(rule, "it accepts no security flavour");
  options->flavors = std::move(flavors);
  return {};
}

// Applies the fields in which `rule` differs from `before`.
Status ApplyChanges(const ExportRule& before, const ExportRule& rule, const SquashAccounts& accounts,
                    ExportOptions* options) {
  options->async = rule.write_mode == VORNNFS_WRITE_ASYNC;
  options->crossmnt = rule.crossmnt != 0;
  for (ExportFlavor& flavor : options->flavors) {
    if (before.privilege != rule.privilege) flavor.access.read_only = rule.privilege == 0;
    if (before.insecure != rule.insecure) flavor.access.insecure = rule.insecure != 0;
  }
  if (before.squash != rule.squash) {
    if (Status status = SetSquash(rule, accounts, options); !status.ok()) return status;
  }
  return SetFlavors(rule, options);
}

Result<ExportEntry> NewEntry(const ExportRule& rule, const SquashAccounts& accounts) {
  ExportEntry entry{rule.client, {}, {}};
  // exportfs prints a warning unless this default is written out.
  entry.options.others = {"no_subtree_check"};
  entry.options.async = rule.write_mode == VORNNFS_WRITE_ASYNC;
  entry.options.crossmnt = rule.crossmnt != 0;
  entry.options.flavors = {{"sys", {rule.privilege == 0, true, false, rule.insecure != 0}}};
  Status status = SetSquash(rule, accounts, &entry.options);
  if (status.ok()) status = SetFlavors(rule, &entry.options);
  if (!status.ok()) return status;
  return entry;
}

}  // namespace

Result<SquashAccounts> SquashAccounts::Load(Box& box) {
  const auto settings = PlatformSettings::Load(box);
  if (!settings.ok()) return settings.status();
  const auto accounts = ReadAccounts(box);
  if (!accounts.ok()) return accounts.status();
  return SquashAccounts{FindIDs(**accounts, (*settings)->admin_account),
                        FindIDs(**accounts, (*settings)->guest_account), (*settings)->admin_account,
                        (*settings)->guest_account};
}

ExportRule RuleOf(const ExportEntry& entry, const SquashAccounts& accounts) {
  ExportRule rule{};
  ToValidUtf8(entry.client).copy(rule.client, sizeof rule.client - 1);
  rule.privilege = WidestAccess(entry.options).read_only ? 0 : 1;
  rule.squash = SquashOf(entry.options, accounts);
  rule.write_mode = entry.options.async ? VORNNFS_WRITE_ASYNC : VORNNFS_WRITE_SYNC;
  rule.insecure = WidestAccess(entry.options).insecure ? 1 : 0;
  rule.crossmnt = entry.options.crossmnt ? 1 : 0;
  for (const auto& [name, field] : kRuleFlavors) {
    rule.*field = HasFlavor(entry.options.flavors, name) ? 1 : 0;
  }
  return rule;
}

Result<ExportEntry> EntryOf(const ExportRule& rule, const ExportEntry* present, const SquashAccounts& accounts) {
  Status status = CheckFields(rule);
  if (!status.ok()) return status;
  if (present == nullptr) return NewEntry(rule, accounts);
  const ExportRule before = RuleOf(*present, accounts);
  if (SameRule(before, rule)) return *present;
  ExportEntry entry{rule.client, present->options, {}};
  status = ApplyChanges(before, rule, accounts, &entry.options);
  if (!status.ok()) return status;
  // Otherwise saving the same rule once more would be another change.
  if (!present->options.HasOneAccess() && !SameRule(RuleOf(entry, accounts), rule)) {
    return Refuse(rule, "its security flavours would not have the access that it asks for");
  }
  return entry;
}

}  // namespace vorn
