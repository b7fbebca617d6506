#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <list>
#include <memory>
#include <thread>

#include "call.h"
#include "captured_log.h"
#include "idmap_judge.h"
#include "nfsconf.h"
#include "processes.h"
#include "status.h"
#include "temporary_root.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Pairs = std::vector<std::pair<std::string, std::string>>;

constexpr char kFile[] = "/etc/idmapd.conf";

struct Free {
  void operator()(_tag_nfs_id_map_* record) const { VORNNFSIDMapFree(record); }
  void operator()(KLIBSZHASH* hash) const { KLIBCSzHashFree(hash); }
  void operator()(KLIBSZLIST* list) const { KLIBCSzListFree(list); }
};
using IDMap = std::unique_ptr<_tag_nfs_id_map_, Free>;

Pairs PairsOf(const KLIBSZHASH* hash) {
  KLIBSZLIST* keys = KLIBCSzListAlloc(0);
  EXPECT_GE(KLIBCSzHashEnumKey(hash, &keys), 0);
  Pairs pairs;
  for (int i = 0; i < keys->count; ++i) {
    const char* key = KLIBCSzListGet(keys, i);
    pairs.emplace_back(key, KLIBCSzHashGetValue(hash, key));
  }
  KLIBCSzListFree(keys);
  return pairs;
}

Pairs Stored(const char* filter = nullptr) {
  KLIBSZHASH* hash = KLIBCSzHashAlloc(0);
  EXPECT_GE(VORNNFSStaticMapGet(&hash, filter), 0);
  Pairs pairs = PairsOf(hash);
  KLIBCSzHashFree(hash);
  return pairs;
}

void SetDomain(_tag_nfs_id_map_* record, const char* domain) {
  std::free(record->domain);
  record->domain = strdup(domain);
}

// The calls of an API request: get, change, set, free.
int Store(const Pairs& mappings, const std::vector<std::string>& gone = {}) {
  const IDMap record(VORNNFSIDMapGet());
  if (record == nullptr) return -1;
  for (const std::string& principal : gone) KLIBCSzHashRemoveKey(record->table, principal.c_str());
  for (const auto& [principal, name] : mappings) {
    EXPECT_GE(KLIBCSzHashSetValue(&record->table, principal.c_str(), name.c_str()), 0);
  }
  return VORNNFSIDMapSet(kFile, record.get());
}

int StoreDomain(const char* domain) {
  const IDMap record(VORNNFSIDMapGet());
  SetDomain(record.get(), domain);
  return VORNNFSIDMapSet(kFile, record.get());
}

std::string DomainNow() {
  const IDMap record(VORNNFSIDMapGet());
  return record == nullptr || record->domain == nullptr ? "none" : record->domain;
}

ino_t InodeOf(const TemporaryRoot& root) {
  struct stat file {};
  return stat(root.At(kFile).c_str(), &file) == 0 ? file.st_ino : 0;
}

TEST(IDMap, OfABoxWithoutAFileHasTheLibrarysDomain) {
  const TemporaryRoot root;
  root.Write("/etc/empty.conf", "");
  EXPECT_EQ(DomainNow(), DomainByLibrary(root.At("/etc/empty.conf")));
  EXPECT_THAT(Stored(), IsEmpty());
  EXPECT_FALSE(root.Read(kFile).has_value());
}

TEST(IDMap, DomainIsThatOfTheLibrary) {
  for (const char* domain : {"example.com", "Example.COM", "a b", "x#y", "'quoted'", "\xc3\xa4.example"}) {
    const TemporaryRoot root;
    root.Write(kFile, "[General]\nVerbosity = 0\n# Domain = localdomain\n");
    ASSERT_EQ(StoreDomain(domain), 0) << domain;
    EXPECT_EQ(DomainNow(), domain);
    EXPECT_EQ(DomainByLibrary(root.At(kFile)), domain);
  }
}

TEST(IDMap, EmptyDomainIsTheDefaultOne) {
  const TemporaryRoot root;
  const std::string usual = DomainNow();
  ASSERT_EQ(StoreDomain("example.com"), 0);
  ASSERT_EQ(StoreDomain(""), 0);
  EXPECT_EQ(DomainNow(), usual);
  EXPECT_EQ(root.Read(kFile).value_or("").find("Domain"), std::string::npos);
}

TEST(IDMap, MappingsAreHonouredByTheLibrary) {
  const TemporaryRoot root;
  const Pairs mappings = {{"alice@EXAMPLE.COM", "nobody"},
                          {"nfs/box.example@EXAMPLE.COM", "daemon"},
                          {"a b#c;d\"@X", "nobody"},
                          {"'x'@X", "daemon"}};
  std::vector<std::string> principals = {"bob@EXAMPLE.COM"};
  for (const auto& pair : mappings) principals.push_back(pair.first);
  ASSERT_EQ(Store(mappings), 0);
  EXPECT_EQ(Stored(), mappings);
  EXPECT_THAT(MapByLibrary(root.At(kFile), principals), ElementsAre(std::nullopt, 65534U, 1U, 65534U, 1U));
}

TEST(IDMap, KeepsEverythingElseOfTheFile) {
  const TemporaryRoot root;
  root.Write(
      kFile,
      "# the box's own\n[General]\n\nVerbosity = 0\n; Domain = x\n\n[Static]\n# people\nbob@X = daemon ; temporary\n"
      "old@X=nobody\n\n[Mapping]\nNobody-User = nobody\n");
  ASSERT_EQ(Store({{"alice@X", "nobody"}, {"bob@X", "nobody"}}, {"old@X"}), 0);
  EXPECT_EQ(
      root.Read(kFile),
      "# the box's own\n[General]\n\nVerbosity = 0\n; Domain = x\n\n[Static]\n# people\nbob@X = nobody ; temporary\n"
      "alice@X = nobody\n\n[Mapping]\nNobody-User = nobody\n\n[Translation]\nGSS-Methods = static,nsswitch\n");
}

TEST(IDMap, StaticComesFirstAmongTheMethodsAndOthersStay) {
  const struct {
    const char* before;
    const char* after;  // the line
  } cases[] = {
      {"", "GSS-Methods = static,nsswitch\n"},
      {"[Translation]\nMethod = umich_ldap,nsswitch\n", "GSS-Methods = static,umich_ldap,nsswitch\n"},
      {"[Translation]\nGSS-Methods = nsswitch, static\n", "GSS-Methods = static,nsswitch\n"},
      {"[Translation]\nGSS-Methods = nsswitch # ours\n", "GSS-Methods = static,nsswitch # ours\n"},
      {"[Translation]\nGSS-Methods =  static, nsswitch\n", "GSS-Methods =  static, nsswitch\n"},
      {"[Translation]\nGSS-Methods = static\n", "GSS-Methods = static\n"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write(kFile, c.before);
    ASSERT_EQ(Store({{"alice@X", "nobody"}}), 0);
    const std::string text = root.Read(kFile).value_or("");
    EXPECT_NE(text.find(c.after), std::string::npos) << text;
  }
}

// The method "vorn" is used where its plug-in is installed, and takes the place of "static".
TEST(IDMap, MappingsUseTheMethodThatIsInstalled) {
  const struct {
    const char* before;
    bool has_plugin;
    const char* after;  // the value of GSS-Methods
  } cases[] = {
      {"", true, "vorn,nsswitch"},
      {"GSS-Methods = static,nsswitch\n", true, "vorn,nsswitch"},
      {"GSS-Methods = umich_ldap,vorn,static\n", true, "vorn,umich_ldap"},
      {"GSS-Methods = vorn, nsswitch\n", true, "vorn, nsswitch"},
      {"GSS-Methods = vorn,nsswitch\n", false, "static,nsswitch"},
      {"GSS-Methods = vorn,static\n", false, "static"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write("/usr/lib/libnfsidmap/static.so", "");
    if (c.has_plugin) root.Write("/usr/lib/libnfsidmap/vorn.so", "");
    root.Write(kFile, "[Translation]\n" + std::string(c.before));
    ASSERT_EQ(Store({{"alice@X", "nobody"}}), 0);
    const std::string text = root.Read(kFile).value_or("");
    EXPECT_NE(text.find("GSS-Methods = " + std::string(c.after) + "\n"), std::string::npos) << text;
  }
}

TEST(IDMap, OtherChangesDoNotExchangeTheMethod) {
  const TemporaryRoot root;
  root.Write("/usr/lib/libnfsidmap/vorn.so", "");
  root.Write(kFile, "[Translation]\nGSS-Methods = static\n[Static]\na@X = nobody\nb@X = nobody\n");
  ASSERT_EQ(Store({}, {"b@X"}), 0);
  ASSERT_EQ(StoreDomain("example.com"), 0);
  EXPECT_NE(root.Read(kFile).value_or("").find("GSS-Methods = static\n"), std::string::npos);
}

TEST(IDMap, ExchangingTheMethodSwitchesNothingOn) {
  const TemporaryRoot root;
  for (const char* method : {"vorn", "static", "nsswitch"}) {
    root.Write("/usr/lib/libnfsidmap/" + std::string(method) + ".so", "");
  }
  root.Write(kFile, "[Translation]\nGSS-Methods = static\n[Static]\na@X = nobody\n");
  VORN::CallContext call({});
  ASSERT_EQ(Store({{"b@X", "nobody"}}), 0);
  EXPECT_THAT(call.warnings(), IsEmpty());
}

TEST(IDMap, WithoutMappingsLeavesTheMethodsAlone) {
  const TemporaryRoot root;
  root.Write(kFile, "[Translation]\nGSS-Methods = nsswitch\n[Static]\na@X = nobody\n");
  ASSERT_EQ(Store({}, {"a@X"}), 0);
  EXPECT_EQ(root.Read(kFile), "[Translation]\nGSS-Methods = nsswitch\n[Static]\n");
}

TEST(IDMap, HasNoRecordForACallerWithoutTheConfigurationLock) {
  const TemporaryRoot root;
  root.Write("/run", "a file where a folder must be");
  EXPECT_EQ(VORNNFSIDMapGet(), nullptr);
  EXPECT_EQ(KLIBCErrGet(), ENOTDIR);
}

TEST(IDMap, UnchangedRecordWritesNothing) {
  const TemporaryRoot root;
  root.Write(kFile,
             "[General]\nDomain = a.example\n[Translation]\nGSS-Methods = static\n[static]\nB@X= daemon\na@x = nobody");
  const ino_t inode = InodeOf(root);
  ASSERT_EQ(Store({}), 0);
  EXPECT_EQ(InodeOf(root), inode);
  const TemporaryRoot empty;
  ASSERT_EQ(Store({}), 0);
  EXPECT_FALSE(empty.Read(kFile).has_value());
}

TEST(IDMap, NeverRevivesALineThatTheLibraryIgnores) {
  const TemporaryRoot root;
  root.Write(kFile, "[Translation]\nGSS-Methods = static\n[Static]\nb@X = daemon\nevil@X = root");
  EXPECT_EQ(Stored(), (Pairs{{"b@X", "daemon"}}));
  ASSERT_EQ(Store({{"a@X", "nobody"}}), 0);
  EXPECT_EQ(Stored(), (Pairs{{"b@X", "daemon"}, {"a@X", "nobody"}}));
  EXPECT_THAT(MapByLibrary(root.At(kFile), {"evil@X", "a@X"}), ElementsAre(std::nullopt, 65534U));
}

TEST(IDMap, RefusesWhatTheFileCannotCarry) {
  const struct {
    const char* principal;
    const char* name;
  } cases[] = {
      {"a=b@X", "nobody"},   {"a@X\nroot@X", "nobody"}, {"a@X", "no\nbody"}, {"#a@X", "nobody"}, {"[a@X", "nobody"},
      {";a", "nobody"},      {" a@X", "nobody"},        {"a@X ", "nobody"},  {"", "nobody"},     {"a@X", ""},
      {"include", "nobody"}, {"a@X", "$HOME"},          {"a\x7f", "nobody"}, {"a@X", "\"'"},     {"B@x", "nobody"}};
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\nb@X = daemon\n");
  const auto before = root.Read(kFile);
  for (const auto& c : cases) {
    EXPECT_LT(Store({{c.principal, c.name}}), 0) << c.principal << " " << c.name;
    EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText) << c.principal << " " << c.name;
    EXPECT_EQ(root.Read(kFile), before) << c.principal << " " << c.name;
  }
  for (const char* domain : {"a\nb", "$HOME", "\x01"}) {
    EXPECT_LT(StoreDomain(domain), 0) << domain;
    EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText) << domain;
    EXPECT_EQ(root.Read(kFile), before) << domain;
  }
}

TEST(IDMap, RefusesInvisibleCharactersAndNamesThatAreTooLong) {
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\nb@X = daemon\n");
  const auto before = root.Read(kFile);
  const std::string longest(513, 'a');
  for (const std::string& principal : {std::string("alice\xe2\x80\xae@X"), std::string("a\xff@X"), longest + "a"}) {
    EXPECT_LT(Store({{principal, "nobody"}}), 0) << principal;
    EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText) << principal;
  }
  for (const std::string& domain : {std::string("a\xe2\x80\x8b.example"), std::string(512, 'a')}) {
    EXPECT_LT(StoreDomain(domain.c_str()), 0) << domain;
    EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText) << domain;
  }
  EXPECT_EQ(root.Read(kFile), before);
  EXPECT_EQ(Store({{longest, "nobody"}}), 0);
  EXPECT_EQ(StoreDomain(std::string(511, 'a').c_str()), 0);
  EXPECT_EQ(DomainByLibrary(root.At(kFile)), std::string(511, 'a'));
}

// ISO 8859-1 in the file.
TEST(IDMap, ShowsAPrincipalThatIsNotUtf8WithReplacementCharacters) {
  const TemporaryRoot root;
  root.Write(kFile, "[Translation]\nGSS-Methods = static\n[Static]\nj\xf6rg@X = daemon\nj\xe4rg@X = nobody\n");
  EXPECT_EQ(Stored(), (Pairs{{"j\xef\xbf\xbdrg@X", "daemon"}, {"j\xef\xbf\xbdrg@X\xef\xbf\xbd", "nobody"}}));
  ASSERT_EQ(Store({{"alice@X", "nobody"}}), 0);
  EXPECT_THAT(MapByLibrary(root.At(kFile), {"j\xf6rg@X", "j\xe4rg@X", "alice@X"}), ElementsAre(1U, 65534U, 65534U));
}

TEST(IDMap, DeletesAndChangesAMappingByThePrincipalThatIsShown) {
  const TemporaryRoot root;
  root.Write(kFile, "[Translation]\nGSS-Methods = static\n[Static]\nj\xf6rg@X = daemon\nj\xe4rg@X = nobody\n");
  ASSERT_EQ(Store({}, {"j\xef\xbf\xbdrg@X\xef\xbf\xbd"}), 0);
  EXPECT_THAT(MapByLibrary(root.At(kFile), {"j\xf6rg@X", "j\xe4rg@X"}), ElementsAre(1U, std::nullopt));
  ASSERT_EQ(Store({}, {"j\xef\xbf\xbdrg@X"}), 0);
  EXPECT_EQ(root.Read(kFile), "[Translation]\nGSS-Methods = static\n[Static]\n");
}

TEST(IDMap, DoesNotSwitchMappingsOnUnlessOneIsCreatedOrChanged) {
  const TemporaryRoot root;
  const std::string text = "[Translation]\nMethod = nsswitch\n[Static]\nmallory@EVIL = root\n";
  root.Write(kFile, text);
  ASSERT_EQ(Store({}, {"unknown@X"}), 0);
  EXPECT_EQ(root.Read(kFile), text);
  ASSERT_EQ(StoreDomain("example.com"), 0);
  EXPECT_THAT(MapByLibrary(root.At(kFile), {"mallory@EVIL"}), ElementsAre(std::nullopt));
}

bool IsLogged(const std::string& part) {
  for (const LogLine& line : TakeLog()) {
    if (line.text.find(part) != std::string::npos) return true;
  }
  return false;
}

TEST(IDMap, NamesEachMappingThatAChangeSwitchesOn) {
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\nmallory@EVIL = root\n");
  VORN::CallContext call({});
  TakeLog();
  ASSERT_EQ(Store({{"alice@X", "nobody"}}), 0);
  EXPECT_TRUE(IsLogged("idmapd.conf:2: the mapping mallory@EVIL = root takes effect"));
  ASSERT_EQ(call.warnings().size(), 1U) << "the new mapping itself is not named";
  ASSERT_EQ(Store({{"bob@X", "nobody"}}), 0);
  EXPECT_FALSE(IsLogged("takes effect"));
}

TEST(IDMap, NamesNoMappingThatTheChangeIsAbout) {
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\nalice@X = daemon\nmallory@EVIL = root\nbob@X = daemon\n");
  const VORN::CallContext call({});
  ASSERT_EQ(Store({{"alice@X", "nobody"}}, {"bob@X"}), 0);
  EXPECT_THAT(call.warnings(), ElementsAre(testing::HasSubstr("mallory@EVIL = root takes effect")));
}

TEST(IDMap, ReadsTheFilesOfTheFolderAndIncludes) {
  const TemporaryRoot root;
  root.Write(kFile, "[General]\nDomain = a.example\n[Static]\na@X = nobody\nb@X = nobody\ninclude = more\n");
  root.Write("/etc/more", "b@X = daemon\nc@X = daemon\n");
  root.Write("/etc/idmapd.conf.d/site.conf", "[General]\nDomain = b.example\n[Static]\nA@x = daemon\n");
  EXPECT_EQ(DomainNow(), "b.example");
  EXPECT_EQ(DomainByLibrary(root.At(kFile)), "b.example");
  EXPECT_EQ(Stored(), (Pairs{{"b@X", "daemon"}, {"c@X", "daemon"}, {"A@x", "daemon"}}));
}

TEST(IDMap, RefusesAChangeWhileAValueRefersToItself) {
  const TemporaryRoot root;
  const std::string text = "[Translation]\nMethod = static\n[environment]\nx = $x\n[Static]\nalice@X = $x\n";
  root.Write(kFile, text);
  EXPECT_THROW(MapByLibrary(root.At(kFile), {"alice@X"}), LibraryCrash);
  EXPECT_THAT(Stored(), IsEmpty());
  TakeLog();
  EXPECT_LT(Store({{"bob@X", "nobody"}}), 0);
  EXPECT_THAT(LastText(TakeLog()), testing::HasSubstr("idmapd.conf:6: the value of alice@X refers to itself"));
  EXPECT_EQ(root.Read(kFile), text);
}

TEST(IDMap, RefusesAChangeThatAnotherFileOverrides) {
  const TemporaryRoot root;
  const std::string text = "[Translation]\nGSS-Methods = static\n[Static]\na@X = nobody\n";
  root.Write(kFile, text);
  root.Write("/etc/idmapd.conf.d/site.conf", "[General]\nDomain = b.example\n[Static]\nb@X = daemon\n");
  TakeLog();
  EXPECT_LT(StoreDomain("c.example"), 0);
  EXPECT_EQ(KLIBCErrGet(), vorn::kOverridden);
  EXPECT_TRUE(IsLogged("site.conf:2: Domain overrides"));
  EXPECT_LT(Store({}, {"b@X"}), 0);
  EXPECT_TRUE(IsLogged("site.conf:4: b@X overrides"));
  EXPECT_LT(Store({{"b@X", "nobody"}}), 0);
  EXPECT_EQ(root.Read(kFile), text);
  EXPECT_EQ(Store({{"c@X", "nobody"}}, {"a@X"}), 0);
}

TEST(IDMap, SaysThatAPluginIsMissing) {
  const TemporaryRoot root;
  root.Write("/usr/lib/libnfsidmap/static.so", "");
  root.Write(kFile, "[Translation]\nMethod = gone,static\n");
  TakeLog();
  DomainNow();
  EXPECT_TRUE(IsLogged("idmapd.conf:2: Method names \"gone\""));
}

TEST(IDMap, RefusesToOverwriteAHandEdit) {
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\na@X = nobody\n");
  {
    const IDMap record(VORNNFSIDMapGet());
    root.Write(kFile, "[Static]\na@X = nobody\nhand@X = daemon\n");
    SetDomain(record.get(), "example.com");
    EXPECT_LT(VORNNFSIDMapSet(kFile, record.get()), 0);
    EXPECT_EQ(KLIBCErrGet(), vorn::kChangedBehind);
  }
  EXPECT_EQ(Stored(), (Pairs{{"a@X", "nobody"}, {"hand@X", "daemon"}}));
}

TEST(IDMap, RecordCanBeStoredTwice) {
  const TemporaryRoot root;
  const IDMap record(VORNNFSIDMapGet());
  for (const char* domain : {"a.example", "b.example"}) {
    SetDomain(record.get(), domain);
    EXPECT_EQ(VORNNFSIDMapSet(kFile, record.get()), 0);
  }
  EXPECT_EQ(DomainNow(), "b.example");
}

TEST(IDMap, IsWrittenBelowTheRootAtTheGivenPath) {
  const TemporaryRoot root;
  const IDMap record(VORNNFSIDMapGet());
  SetDomain(record.get(), "a.example");
  ASSERT_EQ(VORNNFSIDMapSet("/etc/other/idmapd.conf", record.get()), 0);
  EXPECT_TRUE(root.Read("/etc/other/idmapd.conf").has_value());
  EXPECT_FALSE(root.Read(kFile).has_value());
  EXPECT_LT(VORNNFSIDMapSet(nullptr, record.get()), 0);
  EXPECT_LT(VORNNFSIDMapSet(kFile, nullptr), 0);
  VORNNFSIDMapFree(nullptr);
}

TEST(IDMap, RecordWithoutDomainOrTableLeavesThemAlone) {
  const TemporaryRoot root;
  root.Write(kFile, "[General]\nDomain = a.example\n[Static]\na@X = nobody\n");
  _tag_nfs_id_map_ record{};
  ASSERT_EQ(VORNNFSIDMapSet(kFile, &record), 0);
  EXPECT_EQ(root.Read(kFile), "[General]\nDomain = a.example\n[Static]\na@X = nobody\n");
}

TEST(IDMap, RecordThatCannotBeReadIsNull) {
  const TemporaryRoot root;
  root.Write("/etc/idmapd.conf/x", "");
  EXPECT_EQ(VORNNFSIDMapGet(), nullptr);
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
  // The failed call owns no lock: another process can take it.
  ChildProcess other([] {
    const VornConf configuration;
    return 0;
  });
  EXPECT_EQ(other.Wait(), 0);
}

TEST(StaticMap, FiltersByPrincipalOrNameInAnyCase) {
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\nalice@EXAMPLE = Ali\nbob@OTHER = bob\n\xc3\xa4nne@X = anne\n");
  EXPECT_EQ(Stored("example"), (Pairs{{"alice@EXAMPLE", "Ali"}}));
  EXPECT_EQ(Stored("BOB"), (Pairs{{"bob@OTHER", "bob"}}));
  EXPECT_EQ(Stored("\xc3\x84"), (Pairs{{"\xc3\xa4nne@X", "anne"}}));
  EXPECT_EQ(Stored("").size(), 3U);
  EXPECT_THAT(Stored("nothing"), IsEmpty());
}

TEST(StaticMap, AppendReplacesAndRemoveIgnoresMissingKeys) {
  KLIBSZHASH* table = KLIBCSzHashAlloc(0);
  KLIBSZHASH* pairs = KLIBCSzHashAlloc(0);
  KLIBSZLIST* gone = KLIBCSzListAlloc(0);
  KLIBCSzHashSetValue(&table, "a", "1");
  KLIBCSzHashSetValue(&table, "b", "2");
  KLIBCSzHashSetValue(&pairs, "b", "3");
  KLIBCSzHashSetValue(&pairs, "c", "4");
  EXPECT_EQ(VORNNFSStaticMapAppend(&table, pairs), 0);
  EXPECT_EQ(PairsOf(table), (Pairs{{"a", "1"}, {"b", "3"}, {"c", "4"}}));
  for (const char* principal : {"a", "none", "c"}) KLIBCSzListPush(&gone, principal);
  EXPECT_EQ(VORNNFSStaticMapRemove(table, gone), 0);
  EXPECT_EQ(PairsOf(table), (Pairs{{"b", "3"}}));
  EXPECT_LT(VORNNFSStaticMapAppend(&table, nullptr), 0);
  EXPECT_LT(VORNNFSStaticMapRemove(nullptr, gone), 0);
  EXPECT_LT(VORNNFSStaticMapGet(nullptr, nullptr), 0);
  KLIBCSzHashFree(table);
  KLIBCSzHashFree(pairs);
  KLIBCSzListFree(gone);
}

// Each writer makes mappings of its own and deletes every second one: what was acknowledged must be
// there at the end, and nothing else.
TEST(IDMap, LosesNothingBetweenManyWriters) {
  const TemporaryRoot root;
  root.Write(kFile, "# kept\n");
  constexpr int kProcesses = 8;
  constexpr int kRounds = 10;
  const auto name_of = [](int writer, int thread, int round) {
    return "p" + std::to_string(writer) + "." + std::to_string(thread) + "." + std::to_string(round) + "@X";
  };
  const auto write = [&](int writer, int thread, int* failures) {
    for (int round = 0; round < kRounds; ++round) {
      if (Store({{name_of(writer, thread, round), "nobody"}}) != 0) ++*failures;
      if (round % 2 == 1 && Store({}, {name_of(writer, thread, round - 1)}) != 0) ++*failures;
    }
  };
  std::list<ChildProcess> writers;
  for (int writer = 0; writer < kProcesses; ++writer) {
    writers.emplace_back([&, writer] {
      int failures = 0;
      int other_failures = 0;
      std::thread other(write, writer, 1, &other_failures);
      write(writer, 0, &failures);
      other.join();
      return failures + other_failures;
    });
  }
  for (ChildProcess& writer : writers) EXPECT_EQ(writer.Wait(), 0);
  std::vector<std::string> expected;
  for (int writer = 0; writer < kProcesses; ++writer) {
    for (int thread = 0; thread < 2; ++thread) {
      for (int round = 1; round < kRounds; round += 2) expected.push_back(name_of(writer, thread, round));
    }
  }
  std::vector<std::string> stored;
  for (const auto& pair : Stored()) stored.push_back(pair.first);
  EXPECT_THAT(stored, testing::UnorderedElementsAreArray(expected));
  EXPECT_EQ(root.Read(kFile).value_or("").find("# kept\n"), 0U);
  EXPECT_EQ(root.Names("/etc"), std::vector<std::string>{"idmapd.conf"});
}

// libnfsidmap needs minutes to load this number of mappings, so it reads a file with fewer.
TEST(IDMap, HoldsAHundredThousandMappings) {
  const TemporaryRoot root;
  const auto principal = [](int number) { return "user" + std::to_string(number) + "@EXAMPLE"; };
  Pairs mappings;
  for (int i = 0; i < 100'000; ++i) mappings.emplace_back(principal(i), "nobody");
  ASSERT_EQ(Store(mappings), 0);
  ASSERT_EQ(Store({{principal(5), "daemon"}}, {principal(7)}), 0);
  EXPECT_EQ(Stored().size(), 99'999U);
  std::vector<std::string> gone;
  for (int i = 1'000; i < 100'000; ++i) gone.push_back(principal(i));
  ASSERT_EQ(Store({}, gone), 0);
  EXPECT_THAT(MapByLibrary(root.At(kFile), {principal(5), principal(7), principal(999), principal(1'000)}),
              ElementsAre(1U, std::nullopt, 65534U, std::nullopt));
}

}  // namespace
