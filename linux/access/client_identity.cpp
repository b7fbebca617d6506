#include "client_identity.h"

#include <strings.h>

#include <algorithm>
#include <charconv>
#include <string_view>

#include "ascii.h"
#include "host_domain.h"
#include "idmap.h"
#include "lines.h"
#include "nfs_configuration.h"
#include "translation_methods.h"
#include "users.h"

namespace vorn {
namespace {

constexpr std::uint32_t kNoID = 4294967295;
constexpr std::uint32_t kNobody = 65534;

std::optional<std::uint32_t> NumberOf(const std::string& text) {
  std::uint32_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [rest, error] = std::from_chars(text.data(), end, number);
  return error == std::errc() && rest == end && number != kNoID ? std::optional(number) : std::nullopt;
}

// The accounts and groups of the box.
struct People {
  std::shared_ptr<const Accounts> accounts;
  std::shared_ptr<const Groups> groups;

  const Account* Named(const std::string& name) const {
    const auto found =
        std::find_if(accounts->begin(), accounts->end(), [&](const Account& account) { return account.name == name; });
    return found == accounts->end() ? nullptr : &*found;
  }

  const Account* WithID(std::uint32_t id) const {
    const auto found = std::find_if(accounts->begin(), accounts->end(),
                                    [id](const Account& account) { return account.user_id == id; });
    return found == accounts->end() ? nullptr : &*found;
  }

  // The groups of an account besides its own one.
  std::vector<std::uint32_t> GroupsOf(const Account& account) const {
    std::vector<std::uint32_t> ids;
    for (const Group& group : *groups) {
      const auto& members = group.members;
      const bool is_member = std::find(members.begin(), members.end(), account.name) != members.end();
      if (is_member && group.group_id != account.group_id) ids.push_back(group.group_id);
    }
    return ids;
  }
};

Result<People> ReadPeople(Box& box) {
  auto accounts = ReadAccounts(box);
  if (!accounts.ok()) return accounts.status();
  auto groups = ReadGroups(box);
  if (!groups.ok()) return groups.status();
  return People{std::move(*accounts), std::move(*groups)};
}

Result<std::vector<std::uint32_t>> GroupIDs(const People& people, const std::vector<std::string>& names) {
  std::vector<std::uint32_t> ids;
  for (const std::string& name : names) {
    std::optional<std::uint32_t> id = NumberOf(name);
    const auto found = std::find_if(people.groups->begin(), people.groups->end(),
                                    [&](const Group& group) { return group.name == name; });
    if (found != people.groups->end()) id = found->group_id;
    if (!id) return Status::Failure(kNoSuchGroup, "the box has no group \"" + name + "\"");
    ids.push_back(*id);
  }
  return ids;
}

// The ids that a client sends with the flavour "sys".
Result<VORN::AccessIdentity> SentIDs(const People& people, const VORN::AccessQuestion& question) {
  const std::optional<std::uint32_t> number = NumberOf(question.user);
  const Account* const account = number ? people.WithID(*number) : people.Named(question.user);
  if (account == nullptr && !number) {
    return Status::Failure(kNoSuchUser, "the box has no user \"" + question.user + "\"");
  }
  VORN::AccessIdentity ids;
  ids.by = "client";
  ids.user_id = number ? *number : account->user_id;
  ids.group_id = account == nullptr ? kNobody : account->group_id;
  if (account != nullptr) ids.groups = people.GroupsOf(*account);
  ids.text = "The server acts as the user and the groups that the client sends.";
  if (question.groups.empty()) return ids;
  Result<std::vector<std::uint32_t>> groups = GroupIDs(people, question.groups);
  if (!groups.ok()) return groups.status();
  ids.group_id = groups->front();
  ids.groups.assign(groups->begin() + 1, groups->end());
  return ids;
}

// With manage-gids, rpc.mountd(8) looks up the groups of the user id on the box.
Status ManageGroups(Box& box, const People& people, VORN::AccessIdentity* ids) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  if (!configuration->Switch("mountd", "manage-gids", false)) return {};
  const Account* const account = people.WithID(ids->user_id);
  ids->groups.clear();
  if (account != nullptr) {
    ids->groups = people.GroupsOf(*account);
    if (account->group_id != ids->group_id) ids->groups.insert(ids->groups.begin(), account->group_id);
  }
  ids->text = "The server acts as the user that the client sends, with the groups that this user has on the box.";
  const std::optional<IniFound> setting = configuration->files().Find("mountd", "manage-gids");
  if (setting) {
    ids->file = setting->file->location();
    ids->line = setting->line;
  }
  return {};
}

// Whether libnfsidmap takes a realm for its own: General/Local-Realms, by default the domain in capital letters.
bool IsLocalRealm(const IDMap& map, const std::string& realm) {
  const std::optional<IniFound> realms = map.files().Find("General", "Local-Realms");
  if (!realms) return realm == UpperAscii(map.domain() ? *map.domain() : HostDomain::OfThisHost().Get());
  for (std::string_view one : PartsOf(realms->value, ',')) {
    one.remove_prefix(std::min(one.find_first_not_of(" \t"), one.size()));
    if (one == realm) return true;
  }
  return false;
}

class PrincipalMapper {
 public:
  PrincipalMapper(const People& people, const IDMap& map, const std::string& principal)
      : people_(people), map_(map), principal_(principal) {}

  ClientIDs Map() const {
    for (const std::string& method : GSSMethods(map_.files())) {
      std::optional<VORN::AccessIdentity> ids;
      if (method == "static" || method == "vorn") ids = ByMapping();
      if (method == "nsswitch") ids = ByName();
      // Our plug-in ends the search at a mapping to a missing account; libnfsidmap's own goes on.
      if (method == "vorn" && ids && ids->by.empty()) return {*ids, true, false};
      if (ids && !ids->by.empty()) return {*ids, false, false};
    }
    VORN::AccessIdentity nobody;
    nobody.by = "nobody";
    nobody.text = "No mapping and no account of the box is for " + principal_ + ".";
    return {nobody, false, true};
  }

 private:
  VORN::AccessIdentity IDsOf(const Account& account, const char* by) const {
    VORN::AccessIdentity ids;
    ids.user_id = account.user_id;
    ids.group_id = account.group_id;
    ids.groups = people_.GroupsOf(account);
    ids.by = by;
    return ids;
  }

  // Without `by` if the mapping names no account. libnfsidmap does not distinguish the case of principals.
  std::optional<VORN::AccessIdentity> ByMapping() const {
    const auto& pairs = map_.mappings()->pairs();
    for (std::size_t at = 0; at < pairs.size(); ++at) {
      if (strcasecmp(pairs[at].first.c_str(), principal_.c_str()) != 0) continue;
      const Account* const account = people_.Named(pairs[at].second);
      if (account == nullptr) return Missing(pairs[at].second);
      VORN::AccessIdentity ids = IDsOf(*account, "static");
      ids.text = "A static mapping makes " + principal_ + " the user " + account->name + ".";
      ids.file = map_.Stored(at).file->location();
      ids.line = map_.Stored(at).line;
      return ids;
    }
    return std::nullopt;
  }

  VORN::AccessIdentity Missing(const std::string& name) const {
    VORN::AccessIdentity ids;
    ids.text = "The server refuses " + principal_ + ", which is mapped to the user " + name + ", who does not exist.";
    return ids;
  }

  std::optional<VORN::AccessIdentity> ByName() const {
    const std::size_t at = principal_.rfind('@');
    if (at == std::string::npos || !IsLocalRealm(map_, principal_.substr(at + 1))) return std::nullopt;
    const Account* const account = people_.Named(principal_.substr(0, at));
    if (account == nullptr) return std::nullopt;
    VORN::AccessIdentity ids = IDsOf(*account, "nsswitch");
    ids.text = "The realm of " + principal_ + " is that of the box, so it is the user " + account->name + ".";
    return ids;
  }

  const People& people_;
  const IDMap& map_;
  const std::string& principal_;
};

std::string IDText(std::uint32_t user, std::uint32_t group) {
  return "user " + std::to_string(user) + " and group " + std::to_string(group);
}

void BecomeAnonymous(const char* by, const std::string& why, const TableExport& rule, VORN::AccessIdentity* identity) {
  identity->by = by;
  identity->text = why + " the server acts as " + IDText(identity->user_id, identity->group_id) + ".";
  identity->file = rule.file;
  identity->line = rule.line;
}

}  // namespace

Result<ClientIDs> FindClientIDs(Box& box, const VORN::AccessQuestion& question) {
  const Result<People> people = ReadPeople(box);
  if (!people.ok()) return people.status();
  if (question.flavor != "sys") {
    const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(box);
    if (!map.ok()) return map.status();
    return PrincipalMapper(*people, **map, question.user).Map();
  }
  Result<VORN::AccessIdentity> ids = SentIDs(*people, question);
  if (!ids.ok()) return ids.status();
  if (Status status = ManageGroups(box, *people, &*ids); !status.ok()) return status;
  return ClientIDs{std::move(*ids), false, false};
}

VORN::AccessIdentity Squash(const ClientIDs& client, const ExportAccess& access, const TableExport& rule) {
  const auto anon_user = static_cast<std::uint32_t>(rule.options.anon_uid);
  const auto anon_group = static_cast<std::uint32_t>(rule.options.anon_gid);
  VORN::AccessIdentity identity = client.identity;
  if (access.all_squash || client.is_nobody) {
    identity.user_id = anon_user;
    identity.group_id = anon_group;
    identity.groups.clear();
    if (access.all_squash) {
      BecomeAnonymous("all_squash", "The rule squashes all users (all_squash), so", rule, &identity);
    } else {
      BecomeAnonymous("nobody", client.identity.text + " The rule's anonymous ids count, so", rule, &identity);
    }
    return identity;
  }
  if (!access.root_squash) return identity;
  const bool is_root = identity.user_id == 0;
  const bool is_root_group = identity.group_id == 0;
  if (is_root) identity.user_id = anon_user;
  if (is_root_group) identity.group_id = anon_group;
  std::replace(identity.groups.begin(), identity.groups.end(), std::uint32_t{0}, anon_group);
  if (is_root || is_root_group) {
    BecomeAnonymous("root_squash", "The rule squashes root (root_squash), so", rule, &identity);
  }
  return identity;
}

}  // namespace vorn
