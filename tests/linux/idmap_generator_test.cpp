// Changes of generated idmapd.conf files, compared with the mappings of libnfsidmap before and afterwards: a
// successful change has the requested effect and no other, a refused change leaves every byte, and the list has the
// mappings of the library.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <pwd.h>

#include <algorithm>
#include <cstring>
#include <map>
#include <memory>
#include <sstream>
#include <stdexcept>

#include "captured_log.h"
#include "compiled_idmap.h"
#include "current_box.h"
#include "generated_case.h"
#include "idmap_judge.h"
#include "nfsconf.h"
#include "temporary_root.h"

namespace {

constexpr char kFile[] = "/etc/idmapd.conf";
constexpr char kFolder[] = "/etc/idmapd.conf.d/";
constexpr char kLastFile[] = "/etc/idmapd.conf.d/zz.conf";

const char* const kPrincipals[] = {"alice@X", "bob@X", "Carol@X", "nfs/box@X", "dave@Y", "daemon@X"};
const char* const kNames[] = {"nobody", "daemon", "bin", "sys", "games"};

// ---------------------------------------------------------------------------------------------
// Files.

std::string ValueLine(Chance* chance, const std::string& key, const std::string& value) {
  const char* const forms[] = {"K = V\n", "K=V\n",     " K\t= V ; why\n", "K = \"V\" # x\n", "K = 'V'\r\n",
                               "K =\n",   "K = \"V\n", "# K = V\n",       "K \\\n = V\n",    "K = V\\\n \n",
                               "K = V\n", "K = V\n",   "K = V\n",         "K = $V\n",        "K = $var\n"};
  std::string line = chance->Of(forms);
  for (const auto& [name, text] : {std::pair{std::string("K"), key}, std::pair{std::string("V"), value}}) {
    const std::size_t at = line.find(name);
    if (at != std::string::npos) line.replace(at, 1, text);
  }
  return line;
}

std::string StaticLine(Chance* chance) { return ValueLine(chance, chance->Of(kPrincipals), chance->Of(kNames)); }

std::string OtherLine(Chance* chance) {
  const char* const lines[] = {"[Static]\n",
                               "[static]\n",
                               "[General]\n",
                               "[Static \"x\"]\n",
                               "[Static\n",
                               "[Mapping]\n",
                               "# note\n",
                               "\n",
                               "x y z\n",
                               "include = more\n",
                               "[environment]\nvar = bin\n[Static]\n",
                               "include = -gone\n"};
  return chance->Of(lines);
}

std::string Methods(Chance* chance) {
  const char* const values[] = {"nsswitch", "static", "static,nsswitch", "nsswitch, static", "static,"};
  const char* const keys[] = {"GSS-Methods", "Method"};
  return "[Translation]\n" + ValueLine(chance, chance->Of(keys), chance->Of(values));
}

std::string Domain(Chance* chance) {
  const char* const values[] = {"one.test", "two.test"};
  return "[General]\n" + ValueLine(chance, "Domain", chance->Of(values));
}

std::string FileText(Chance* chance) {
  std::string text;
  if (chance->OneIn(2)) text += Domain(chance);
  if (chance->OneIn(2)) text += Methods(chance);
  if (!chance->OneIn(8)) text += "[Static]\n";
  for (int i = chance->Below(7); i > 0; --i) text += chance->OneIn(4) ? OtherLine(chance) : StaticLine(chance);
  if (chance->OneIn(3)) text += Methods(chance);
  if (chance->OneIn(4)) text += Domain(chance);
  if (chance->OneIn(4)) text += "[Static]\n" + StaticLine(chance);
  if (chance->OneIn(50)) text += "[environment]\nvar = $sys\nsys = $VAR\n";
  if (!text.empty() && chance->OneIn(3)) text.pop_back();
  if (chance->OneIn(25))
    text.insert(static_cast<std::size_t>(chance->Below(static_cast<int>(text.size()) + 1)), 1, '\0');
  return text;
}

GeneratedFiles MakeFiles(Chance* chance) {
  GeneratedFiles files = {{kFile, FileText(chance)}};
  if (chance->OneIn(3)) files.emplace_back(std::string(kFolder) + "10-site.conf", FileText(chance));
  if (chance->OneIn(6)) files.emplace_back(std::string(kFolder) + "9-more.conf", FileText(chance));
  if (chance->OneIn(2)) files.emplace_back("/etc/more", FileText(chance));
  return files;
}

// ---------------------------------------------------------------------------------------------
// The library's view.

using Users = std::map<std::string, std::optional<unsigned>>;  // by principal

Users AskLibrary(const TemporaryRoot& root) {
  const std::vector<std::string> principals(std::begin(kPrincipals), std::end(kPrincipals));
  const auto users = MapByLibrary(root.At(kFile), principals);
  Users result;
  for (std::size_t i = 0; i < principals.size(); ++i) result[principals[i]] = users[i];
  return result;
}

// The library's static mappings, whatever the methods are.
Users AskLibraryForStatic(const TemporaryRoot& root) {
  root.Write(kLastFile, "[Translation]\nMethod = static\nGSS-Methods = static\n");
  Users users = AskLibrary(root);
  std::remove(root.At(kLastFile).c_str());
  return users;
}

// The answers of the method "vorn" to a daemon, which reads the compiled table and the settings without the mappings.
// libnfsidmap loads a method from its own folder; the path leads from there to the build folder.
Users AskPlugin(const TemporaryRoot& root) {
  const std::string text = root.Read(kFile).value_or("");
  root.Write(kLastFile, "[Translation]\nMethod = nsswitch\nGSS-Methods = vorn\n");
  if (!vorn::CompileIDMap(vorn::CurrentBox()).ok()) throw std::runtime_error("the ID map does not compile");
  root.Write(kFile, root.Read(vorn::kDaemonSettingsFile).value_or(""));
  root.Write(kLastFile, "[Translation]\nMethod = nsswitch\nGSS-Methods = ../../../../../../../.." VORN_PLUGIN
                        "\n[vorn]\nMappings = " +
                            root.At("/var/lib/vorn/idmap/mappings") + "\n");
  Users users = AskLibrary(root);
  std::remove(root.At(kLastFile).c_str());
  root.Write(kFile, text);
  return users;
}

std::optional<unsigned> UserId(const std::string& name) {
  const passwd* user = getpwnam(name.c_str());
  return user == nullptr ? std::nullopt : std::optional<unsigned>(user->pw_uid);
}

// ---------------------------------------------------------------------------------------------
// The platform's view, and changes.

struct FreeMap {
  void operator()(_tag_nfs_id_map_* map) const { VORNNFSIDMapFree(map); }
};
using Map = std::unique_ptr<_tag_nfs_id_map_, FreeMap>;

Users Listed(const Map& map) {
  Users users;
  for (const char* principal : kPrincipals) {
    const char* name = KLIBCSzHashGetValue(map->table, principal);
    users[principal] = name == nullptr ? std::nullopt : UserId(name);
  }
  return users;
}

struct Change {
  std::string domain;     // "": not changed
  std::string principal;  // "": not changed
  std::string name;       // "": deleted
};

Change MakeChange(Chance* chance) {
  Change change;
  if (chance->OneIn(3)) {
    change.domain = chance->OneIn(2) ? "new.test" : "one.test";
    return change;
  }
  change.principal = chance->OneIn(5) ? "unknown@X" : chance->Of(kPrincipals);
  if (!chance->OneIn(2)) change.name = chance->Of(kNames);
  return change;
}

bool Apply(const Map& map, const Change& change) {
  if (!change.domain.empty()) {
    std::free(map->domain);
    map->domain = strdup(change.domain.c_str());
  } else if (change.name.empty()) {
    KLIBCSzHashRemoveKey(map->table, change.principal.c_str());
  } else {
    KLIBCSzHashSetValue(&map->table, change.principal.c_str(), change.name.c_str());
  }
  return VORNNFSIDMapSet(kFile, map.get()) >= 0;
}

// ---------------------------------------------------------------------------------------------
// One case.

std::string AllText(const TemporaryRoot& root, const GeneratedFiles& files) {
  std::string text;
  for (const auto& [path, content] : files) text += "--- " + path + "\n" + root.Read(path).value_or("(none)") + "\n";
  return text;
}

bool IsNamed(const std::vector<LogLine>& log, const std::string& principal) {
  return std::any_of(log.begin(), log.end(),
                     [&](const LogLine& line) { return line.text.find(" " + principal + " = ") != std::string::npos; });
}

// Returns whether the change creates or changes a mapping. A mapping that is stored already may have no effect, and
// keeps having none.
bool PutsMapping(const Change& change, const Users& static_before) {
  const auto stored = static_before.find(change.principal);
  return !change.name.empty() && (stored == static_before.end() || stored->second != UserId(change.name));
}

void ExpectOwnEffectOnly(const Change& change, bool puts, const Users& before, const Users& after,
                         const std::vector<LogLine>& log) {
  EXPECT_FALSE(IsNamed(log, change.principal)) << "the change itself is named as a consequence";
  for (const auto& [principal, user] : after) {
    const bool is_same = user == before.at(principal);
    if (principal != change.principal) {
      EXPECT_TRUE(is_same || (puts && IsNamed(log, principal))) << principal << " came alive unnamed";
    } else if (!change.name.empty()) {
      EXPECT_TRUE(puts ? user == UserId(change.name) : is_same) << principal << " has another user";
    }
  }
}

void ExpectOwnMappingOnly(const Change& change, Users before, const Users& after) {
  const bool is_change = before.count(change.principal) != 0;
  if (is_change) before[change.principal] = change.name.empty() ? std::nullopt : UserId(change.name);
  EXPECT_EQ(after, before);
}

struct Views {
  Users in_force;
  Users stored;  // whatever the methods are
};

Views AskForBoth(const TemporaryRoot& root) { return {AskLibrary(root), AskLibraryForStatic(root)}; }

// No daemon starts with such files: a change has no effect, so it must be refused.
void ExpectRefusal(const TemporaryRoot& root, const GeneratedFiles& files) {
  const std::string text_before = AllText(root, files);
  const Map map(VORNNFSIDMapGet());
  ASSERT_NE(map, nullptr) << text_before;
  TakeLog();
  EXPECT_FALSE(Apply(map, {"", "eve@X", "daemon"})) << text_before;
  EXPECT_THAT(LastText(TakeLog()), testing::ContainsRegex("(includes|refers to) itself")) << text_before;
  EXPECT_EQ(AllText(root, files), text_before);
}

// Returns whether the change succeeded.
bool RunChange(const TemporaryRoot& root, const GeneratedFiles& files, const Views& before, const Change& change) {
  const std::string text_before = AllText(root, files);
  EXPECT_EQ(AskPlugin(root), before.stored) << "the plug-in";
  const Map map(VORNNFSIDMapGet());
  if (map == nullptr) {
    ADD_FAILURE() << "no record";
    return false;
  }
  EXPECT_EQ(Listed(map), before.stored) << "what is listed";
  TakeLog();
  const bool done = Apply(map, change);
  const std::vector<LogLine> log = TakeLog();
  SCOPED_TRACE((done ? "done\n" : "refused: " + LastText(log) + "\n") + AllText(root, files));
  if (!done) {
    EXPECT_EQ(AllText(root, files), text_before);
    return false;
  }
  EXPECT_EQ(Tail(root.Read(kFile).value_or("")), Tail(files[0].second)) << "an ignored line";
  const Views after = AskForBoth(root);
  ExpectOwnEffectOnly(change, PutsMapping(change, before.stored), before.in_force, after.in_force, log);
  ExpectOwnMappingOnly(change, before.stored, after.stored);
  if (!change.domain.empty()) {
    EXPECT_EQ(DomainByLibrary(root.At(kFile)), change.domain);
  }
  return true;
}

bool RunCase(unsigned number) {
  Chance chance(number);
  const TemporaryRoot root;
  const GeneratedFiles files = MakeFiles(&chance);
  for (const auto& [path, text] : files) root.Write(path, text);
  const Change change = MakeChange(&chance);
  SCOPED_TRACE("case " + std::to_string(number) + ": " + change.domain + change.principal + " = " + change.name + "\n" +
               AllText(root, files));
  Views before;
  try {
    before = AskForBoth(root);
  } catch (const LibraryCrash&) {
    ExpectRefusal(root, files);
    return false;
  } catch (const std::runtime_error&) {
    return false;  // a plug-in is missing: the library maps nobody
  }
  return RunChange(root, files, before, change);
}

TEST(IDMapGenerator, AChangeHasItsOwnEffectForTheLibraryAndNoOther) { RunCases(150, RunCase); }

}  // namespace
