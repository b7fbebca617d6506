#include "exports_rule.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <memory>
#include <utility>

#include "platform_settings.h"
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

// The most that one of the flavours may do.
ExportAccess WidestAccess(const ExportOptions& options) {
  ExportAccess widest = options.flavors.front().access;
  for (const ExportFlavor& flavor : options.flavors) {
    widest.read_only = widest.read_only && flavor.access.read_only;
    widest.root_squash = widest.root_squash && flavor.access.root_squash;
    widest.all_squash = widest.all_squash && flavor.access.all_squash;
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

Status SetSquash(const ExportRule& rule, const SquashAccounts& accounts, ExportOptions* options, ExportAccess* access) {
  access->root_squash = rule.squash != VORNNFS_SQUASH_ROOT;
  access->all_squash = rule.squash == VORNNFS_SQUASH_ALL_ADMIN;
  const ExportOptions defaults;
  options->anon_uid = defaults.anon_uid;
  options->anon_gid = defaults.anon_gid;
  if (rule.squash == VORNNFS_SQUASH_ROOT) return {};
  const auto& account = rule.squash == VORNNFS_SQUASH_GUEST ? accounts.guest : accounts.admin;
  if (!account) return Refuse(rule, "the box has no account for its squash mode");
  options->anon_uid = account->user;
  options->anon_gid = account->group;
  return {};
}

// The flavours of the rule, and those it has no field for. The ones that stay keep their order, in
// which the server offers them; new ones follow.
std::vector<ExportFlavor> FlavorsOf(const ExportRule& rule, const std::vector<ExportFlavor>& present,
                                    const ExportAccess& access) {
  std::vector<ExportFlavor> flavors;
  const auto wanted = [&rule](const std::string& name) {
    const auto field =
        std::find_if(kRuleFlavors.begin(), kRuleFlavors.end(), [&](const auto& f) { return f.first == name; });
    return field == kRuleFlavors.end() || rule.*field->second != 0;
  };
  for (const ExportFlavor& flavor : present) {
    if (wanted(flavor.name)) flavors.push_back({flavor.name, access});
  }
  for (const auto& [name, field] : kRuleFlavors) {
    const auto same = [n = name](const ExportFlavor& flavor) { return flavor.name == n; };
    if (rule.*field != 0 && std::none_of(flavors.begin(), flavors.end(), same)) flavors.push_back({name, access});
  }
  return flavors;
}

}  // namespace

Result<SquashAccounts> SquashAccounts::Load(Box& box) {
  const auto settings = PlatformSettings::Load(box);
  if (!settings.ok()) return settings.status();
  const auto accounts = ReadAccounts(box);
  if (!accounts.ok()) return accounts.status();
  return SquashAccounts{FindIDs(**accounts, settings->admin_account), FindIDs(**accounts, settings->guest_account)};
}

ExportRule RuleOf(const ExportEntry& entry, const SquashAccounts& accounts) {
  ExportRule rule{};
  entry.client.copy(rule.client, sizeof rule.client - 1);
  rule.privilege = WidestAccess(entry.options).read_only ? 0 : 1;
  rule.squash = SquashOf(entry.options, accounts);
  rule.write_mode = entry.options.async ? VORNNFS_WRITE_ASYNC : VORNNFS_WRITE_SYNC;
  rule.insecure = entry.options.insecure ? 1 : 0;
  rule.crossmnt = entry.options.crossmnt ? 1 : 0;
  for (const auto& [name, field] : kRuleFlavors) {
    const auto same = [n = name](const ExportFlavor& flavor) { return flavor.name == n; };
    const auto& flavors = entry.options.flavors;
    rule.*field = std::any_of(flavors.begin(), flavors.end(), same) ? 1 : 0;
  }
  return rule;
}

Result<ExportEntry> EntryOf(const ExportRule& rule, const ExportEntry* present, const SquashAccounts& accounts) {
  Status status = CheckFields(rule);
  if (!status.ok()) return status;
  std::optional<ExportRule> before;
  if (present != nullptr) before = RuleOf(*present, accounts);
  if (before && SameRule(*before, rule)) return *present;

  ExportEntry entry{rule.client, {}, {}};
  if (present != nullptr) entry.options = present->options;
  // What exportfs(8) takes as the default anyway, but asks to be told.
  if (present == nullptr) entry.options.others = {"no_subtree_check"};
  ExportAccess access = WidestAccess(entry.options);
  access.read_only = rule.privilege == 0;
  entry.options.async = rule.write_mode == VORNNFS_WRITE_ASYNC;
  entry.options.insecure = rule.insecure != 0;
  entry.options.crossmnt = rule.crossmnt != 0;
  if (!before || before->squash != rule.squash) status = SetSquash(rule, accounts, &entry.options, &access);
  if (!status.ok()) return status;
  const std::vector<ExportFlavor> flavors = present != nullptr ? present->options.flavors : std::vector<ExportFlavor>{};
  entry.options.flavors = FlavorsOf(rule, flavors, access);
  if (entry.options.flavors.empty()) return Refuse(rule, "it accepts no security flavour");
  return entry;
}

}  // namespace vorn
