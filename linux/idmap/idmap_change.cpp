// Changing the ID map.
#include <algorithm>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

#include "ascii.h"
#include "configuration_lock.h"
#include "idmap.h"
#include "notice.h"
#include "translation_methods.h"
#include "unicode.h"

namespace vorn {
namespace {

// In bytes: libnfsidmap has room for NFS4_MAX_DOMAIN_LEN (nfsidmap.h) with the terminating NUL.
constexpr std::size_t kLongestDomain = 511;

// In bytes; a principal of a keytab may be as long (KeytabEntry in platform/nfsconf.h).
constexpr std::size_t kLongestPrincipal = 513;

constexpr std::size_t kMostNotices = 1000;

// ---------------------------------------------------------------------------------------------
// The consequences of a change for the file.

struct Mapping {
  std::string principal;
  std::string local_name;
};

struct Plan {
  std::vector<std::string> removed;  // principals as they are in the file
  std::vector<Mapping> put;          // mappings that are added, or that get another local name
};

// The difference between the mappings in force and the wanted ones.
Plan Difference(const IDMap& now, const TextPairs& wanted) {
  Plan plan;
  const auto& pairs = now.mappings()->pairs();
  for (std::size_t i = 0; i < pairs.size(); ++i) {
    const TextPairs::Pair* kept = wanted.Find(pairs[i].first);
    if (kept == nullptr) plan.removed.emplace_back(now.Stored(i).key);
    if (kept != nullptr && kept->second != pairs[i].second) {
      plan.put.push_back({std::string(now.Stored(i).key), kept->second});
    }
  }
  for (const auto& [principal, local_name] : wanted.pairs()) {
    if (now.mappings()->Find(principal) == nullptr) plan.put.push_back({principal, local_name});
  }
  return plan;
}

// Rejects confusable characters: a mapping must be unambiguous to a human reader. A local name is that of an account
// and is not restricted further.
bool MayBeStored(const Mapping& mapping) {
  return IniKey::From(mapping.principal) && IniValue::From(mapping.local_name) &&
         mapping.principal.size() <= kLongestPrincipal && IsPlainText(mapping.principal);
}

// The principals that libnfsidmap cannot distinguish must not both be stored.
Status CheckCase(const Plan& plan, const TextPairs& wanted) {
  if (plan.put.empty()) return {};
  std::unordered_set<std::string> principals;
  for (const auto& [principal, local_name] : wanted.pairs()) {
    if (!principals.insert(LowerAscii(principal)).second)
      return Status::Failure(kRefusedText, "idmapd.conf(5) cannot distinguish two principals that differ only in case");
  }
  return {};
}

Status PutDomain(const std::string& domain, IniDocument* document) {
  if (domain.empty()) {
    document->Remove("General", "Domain");
    return {};
  }
  const std::optional<IniValue> value = IniValue::From(domain);
  if (!value || domain.size() > kLongestDomain || !IsPlainText(domain))
    return Status::Failure(kRefusedText, "idmapd.conf(5) cannot represent the domain");
  document->Set(*IniSection::From("General"), *IniKey::From("Domain"), *value);
  return {};
}

// Static mappings have an effect only through a method for them, and the first method that knows a principal decides.
// Methods that are fine are changed only if the box has a better method for static mappings.
Status PutMethods(const Box& box, const IDMap& now, IniDocument* document) {
  const std::vector<std::string> methods = GSSMethods(now.files());
  const std::string wanted = StaticMethod(box);
  return methods.front() == wanted ? Status() : PutStaticFirst(methods, wanted, document);
}

Status PutMappings(const Box& box, const IDMap& now, const Plan& plan, IniDocument* document) {
  for (const Mapping& mapping : plan.put) {
    if (!MayBeStored(mapping))
      return Status::Failure(kRefusedText, "idmapd.conf(5) cannot represent a principal or its local name");
  }
  for (const std::string& principal : plan.removed) document->Remove("Static", principal);
  const IniSection section = *IniSection::From("Static");
  for (const Mapping& mapping : plan.put) {
    document->Set(section, *IniKey::From(mapping.principal), *IniValue::From(mapping.local_name));
  }
  return plan.put.empty() ? Status() : PutMethods(box, now, document);
}

// ---------------------------------------------------------------------------------------------
// Verifying what is in force.

Status Overridden(const std::optional<IniFound>& setting) {
  if (!setting) return Status::Failure(kOverridden, "the change would have no effect");
  return Status::Failure(kOverridden, setting->Where() + ": " + std::string(setting->key) + " overrides the change");
}

Status VerifyDomain(const IniFiles& files, const std::string& domain) {
  const std::optional<IniFound> found = files.Find("General", "Domain");
  if ((found ? found->value : "") == domain) return {};
  return Overridden(files.FindStored("General", "Domain"));
}

// The mappings in force by principal in lower case.
using Effect = std::unordered_map<std::string, std::string>;

Effect EffectOf(const std::vector<IniFound>& settings) {
  Effect effect;
  for (const IniFound& setting : settings) effect.emplace(LowerAscii(setting.key), setting.value);
  return effect;
}

// The change has exactly its own effect: compared with `before`, the plan is in force and nothing else has changed.
Status VerifyMappings(const IniFiles& files, const Plan& plan, Effect before) {
  for (const std::string& principal : plan.removed) before.erase(LowerAscii(principal));
  for (const Mapping& mapping : plan.put) before[LowerAscii(mapping.principal)] = mapping.local_name;
  std::size_t count = 0;
  for (const IniFound& setting : files.Settings("Static")) {
    const auto wanted = before.find(LowerAscii(setting.key));
    if (wanted == before.end() || wanted->second != setting.value) return Overridden(setting);
    ++count;
  }
  for (const Mapping& mapping : plan.put) {
    if (!files.Find("Static", mapping.principal)) return Overridden(files.FindStored("Static", mapping.principal));
  }
  if (count != before.size()) return Status::Failure(kOverridden, "a mapping would lose its effect");
  if (plan.put.empty() || IsStaticFirst(GSSMethods(files))) return {};
  return Overridden(files.FindStored("Translation", "GSS-Methods"));
}

Status Verify(const IniFiles& files, const IDMap& now, const IDMapChange& change, const Plan& plan) {
  if (change.domain) {
    if (Status status = VerifyDomain(files, *change.domain); !status.ok()) return status;
  }
  return VerifyMappings(files, plan, EffectOf(now.files().Settings("Static")));
}

// Warns if what is in force is not what was planned. The plan was in force in the draft, so another writer has changed
// a file since; the change itself is stored and counts as a success.
void ReadBack(Box& box, const std::string& path, const IDMap& now, const IDMapChange& change, const Plan& plan) {
  const Result<SharedIniFiles> files = IniFiles::Open(box, path);
  if (!files.ok()) {
    Notice("the ID map is stored, but cannot be read back: " + files.status().reason());
    return;
  }
  const Status status = Verify(**files, now, change, plan);
  if (!status.ok()) Notice("the ID map is stored, but another writer changed a file meanwhile: " + status.reason());
  for (const std::string& sentence : MissingPlugins(box, **files)) Notice(sentence);
}

// The mappings that the change of the methods switched on, besides those that were asked for.
void NoticeRevived(const IDMap& now, const Plan& plan) {
  if (plan.put.empty() || IsStaticFirst(GSSMethods(now.files()))) return;
  std::unordered_set<std::string> own;
  for (const std::string& principal : plan.removed) own.insert(LowerAscii(principal));
  for (const Mapping& mapping : plan.put) own.insert(LowerAscii(mapping.principal));
  std::size_t count = 0;
  const auto& pairs = now.mappings()->pairs();
  for (std::size_t i = 0; i < pairs.size(); ++i) {
    const IniFound& stored = now.Stored(i);
    if (own.count(LowerAscii(stored.key)) != 0 || ++count > kMostNotices) continue;
    Notice(stored.Where() + ": the mapping " + pairs[i].first + " = " + pairs[i].second +
           " takes effect, because static mappings now come first");
  }
  if (count > kMostNotices) Notice(std::to_string(count - kMostNotices) + " further mappings take effect");
}

Status PutChange(const Box& box, const IDMap& now, const IDMapChange& change, const Plan& plan, IniDocument* document) {
  if (change.domain) {
    if (Status status = PutDomain(*change.domain, document); !status.ok()) return status;
  }
  return PutMappings(box, now, plan, document);
}

}  // namespace

Status WriteIDMap(Box& box, const std::string& path, const IDMapChange& change) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<std::shared_ptr<const IDMap>> read = ReadIDMap(box, path);
  if (!read.ok()) return read.status();
  const IDMap& now = **read;
  if (Status status = now.files().CheckUnchanged(box); !status.ok()) return status;
  if (const Status& status = now.files().CheckReadable(); !status.ok()) return status;
  const Plan plan = change.mappings == nullptr ? Plan() : Difference(now, *change.mappings);
  if (change.mappings != nullptr) {
    if (Status status = CheckCase(plan, *change.mappings); !status.ok()) return status;
  }
  Result<IniEditor> file = IniEditor::Open(box, path);
  if (!file.ok()) return file.status();
  if (Status status = PutChange(box, now, change, plan, &file->document()); !status.ok()) return status;
  const Result<SharedIniFiles> draft = IniFiles::Open(box, path, IniFiles::Draft{path, file->document().Text()});
  if (!draft.ok()) return draft.status();
  if (Status status = Verify(**draft, now, change, plan); !status.ok()) return status;
  if (Status status = file->Save(); !status.ok()) return status;
  NoticeRevived(now, plan);
  ReadBack(box, path, now, change, plan);
  return {};
}

}  // namespace vorn
