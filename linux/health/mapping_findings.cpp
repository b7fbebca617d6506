#include "mapping_findings.h"

#include <cstddef>
#include <memory>
#include <set>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "idmap.h"
#include "lines.h"
#include "translation_methods.h"
#include "users.h"

namespace vorn {
namespace {

constexpr char kNameSources[] = "/etc/nsswitch.conf";
constexpr char kGSSProxy[] = "/proc/net/rpc/use-gss-proxy";

// The accounts of passwd(5): name to user id. Of two lines with one name the first counts.
using UserIDs = std::unordered_map<std::string, unsigned>;

Result<UserIDs> ReadUserIDs(Box& box) {
  const auto accounts = ReadAccounts(box);
  if (!accounts.ok()) return accounts.status();
  UserIDs ids;
  for (const Account& account : **accounts) ids.try_emplace(account.name, account.user_id);
  return ids;
}

VORN::HealthSubject SubjectOf(const Box& box, const IDMap& map, std::size_t at) {
  VORN::HealthSubject subject;
  subject.mapping = map.mappings()->pairs()[at].first;
  subject.file = box.root().OnBox(map.Stored(at).file->location());
  subject.line = map.Stored(at).line;
  return subject;
}

VORN::HealthCall RemoveMapping(const std::string& principal) {
  return {"VORN.Core.FileServ.NFS.IDMap", 1, "delete", {{"id", std::vector<std::string>{principal}}}};
}

// The sources of accounts in nsswitch.conf(5) other than files of the box.
std::set<std::string> RemoteSources(const std::string& text) {
  const std::set<std::string_view> local = {"files", "compat", "systemd", "db"};
  std::set<std::string> remote;
  for (const std::string_view line : LinesOf(text)) {
    const std::vector<std::string_view> words = WordsOf(line.substr(0, line.find('#')));
    if (words.empty() || words[0] != "passwd:") continue;
    for (auto source = words.begin() + 1; source != words.end(); ++source) {
      if (source->front() != '[' && source->back() != ']' && local.count(*source) == 0) remote.emplace(*source);
    }
  }
  return remote;
}

}  // namespace

Status FindMappingsToNobody(const HealthInput& input, Findings* findings) {
  const auto map = ReadIDMap(input.box);
  if (!map.ok()) return map.status();
  if ((*map)->mappings()->size() == 0) return {};
  const Result<StoredFile> sources = input.box.Read(kNameSources);
  if (!sources.ok()) return sources.status();
  if (const std::set<std::string> remote = RemoteSources(sources->text); !remote.empty()) {
    return Status::Failure(kUnsupported, "Accounts may also come from \"" + *remote.begin() + "\" (" + kNameSources +
                                             "), which is not asked.");
  }
  const Result<UserIDs> ids = ReadUserIDs(input.box);
  if (!ids.ok()) return ids.status();
  const auto& pairs = (*map)->mappings()->pairs();
  for (std::size_t at = 0; at < pairs.size(); ++at) {
    const auto& [principal, name] = pairs[at];
    if (ids->count(name) != 0) continue;
    std::string text = principal;
    text.append(" is mapped to the user ").append(name);
    text += ", who does not exist: the server refuses it, or takes it for nobody.";
    findings
        ->Warning(SubjectOf(input.box, **map, at), std::move(text), "Map it to another user, or remove the mapping.")
        .call = RemoveMapping(principal);
  }
  return {};
}

Status FindMappingsToRoot(const HealthInput& input, Findings* findings) {
  const auto map = ReadIDMap(input.box);
  if (!map.ok()) return map.status();
  const Result<UserIDs> ids = ReadUserIDs(input.box);
  if (!ids.ok()) return ids.status();
  const auto& pairs = (*map)->mappings()->pairs();
  for (std::size_t at = 0; at < pairs.size(); ++at) {
    const auto id = ids->find(pairs[at].second);
    if (id == ids->end() || id->second != 0) continue;
    findings
        ->Warning(SubjectOf(input.box, **map, at),
                  pairs[at].first + " is mapped to " + pairs[at].second +
                      ", the superuser: where root is not squashed it may read and change every file.",
                  "Map it to another user, or remove the mapping.")
        .call = RemoveMapping(pairs[at].first);
  }
  return {};
}

Status FindMappingsWithoutEffect(const HealthInput& input, Findings* findings) {
  const auto map = ReadIDMap(input.box);
  if (!map.ok()) return map.status();
  if ((*map)->mappings()->size() == 0) return {};
  if (!IsStaticFirst(GSSMethods((*map)->files()))) {
    findings->Warning(SubjectOf(input.box, **map, 0),
                      "The static mappings do not come first among the methods of idmapd.conf(5): another method may "
                      "map their principals to other users.",
                      "Put \"static\" first in the value of GSS-Methods, in the section Translation.");
  }
  const Result<StoredFile> proxy = input.box.Read(kGSSProxy);
  if (!proxy.ok()) return proxy.status();
  if (!proxy->version.exists) {
    return Status::Failure(kUnsupported, "The kernel does not say here whether gssproxy serves Kerberos.");
  }
  if (proxy->text.substr(0, 1) == "1") {
    findings->Error(SubjectOf(input.box, **map, 0),
                    "gssproxy serves Kerberos here and does not read idmapd.conf(5): the static mappings have no "
                    "effect.",
                    "Disable gssproxy.service and restart nfs-server.service, so that rpc.svcgssd serves.");
  }
  return {};
}

}  // namespace vorn
